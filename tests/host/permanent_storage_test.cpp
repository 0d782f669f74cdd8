// The permanent storage on a real SQLite file in a fresh directory.
#include "host/permanent_storage.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "tests/host/temp_dir.h"

namespace xtok::host {
namespace {

class Storage : public ::testing::Test {
protected:
    std::unique_ptr<PermanentStorage> open() {
        std::string error;
        auto storage = PermanentStorage::open(path_, error);
        EXPECT_NE(storage, nullptr) << error;
        return storage;
    }

    test::TempDir dir_;
    std::string path_ = dir_.file("state/xtokline/retained.sqlite3");
};

TEST_F(Storage, KeepsEachTypeAcrossReopening) {
    const std::string longText(10000, 'x');
    {
        auto storage = open();
        ASSERT_TRUE(
            storage && storage->WriteInt("XTOK", "baud", 19200) &&
            storage->WriteInt("XTOK", "min", INT32_MIN) && storage->WriteBool("XTOK", "on", true) &&
            storage->WriteBool("XTOK", "off", false) && storage->WriteText("XTOK", "empty", "") &&
            storage->WriteText("XTOK", "long", longText.c_str()) &&
            storage->WriteText("other", "prefix", "ÄÖ\xff") &&
            storage->WriteInt("XTOK", "baud", 9600));  // the last write wins
    }
    auto storage = open();
    ASSERT_NE(storage, nullptr);
    EXPECT_EQ(storage->ReadInt("XTOK", "baud") + storage->ReadInt("XTOK", "min"), 9600 + INT32_MIN);
    EXPECT_TRUE(storage->ReadBool("XTOK", "on") && !storage->ReadBool("XTOK", "off"));
    EXPECT_EQ(storage->ReadText("XTOK", "long"), longText);
    EXPECT_STREQ(storage->ReadText("other", "prefix"), "ÄÖ\xff");
    EXPECT_STREQ(storage->ReadText("other", "none"), "");  // not the text read before
    // Read into the caller's buffer only with room for the zero: "ÄÖ\xff" is 5 bytes.
    auto* extended = static_cast<IPermanentStorage2*>(storage->GetInterface("IPermanentStorage2"));
    char text[6] = "#####";
    ASSERT_TRUE(extended && !extended->ReadTextTo("other", "prefix", text, 5));
    EXPECT_TRUE(extended->ReadTextTo("other", "prefix", text, 6) && text == std::string("ÄÖ\xff"));
    EXPECT_TRUE(storage->IsStored("XTOK", "empty") && !storage->IsStored("XTOK", "prefix"));
}

}  // namespace
}  // namespace xtok::host
