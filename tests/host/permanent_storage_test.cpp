// The permanent storage on a real SQLite file in a fresh directory.
#include "host/permanent_storage.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstdlib>
#include <string>
#include <vector>

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
    EXPECT_TRUE(storage->IsStored("XTOK", "empty") && !storage->IsStored("XTOK", "prefix"));
    // A section is listed for people and cleared alone.
    std::vector<StoredEntry> listed;
    std::string error, shown;
    ASSERT_TRUE(storage->list("XTOK", listed, error)) << error;
    for (const StoredEntry& entry : listed) {
        shown += entry.key + "=" + (entry.key == "long" ? "..." : entry.shown) + " ";
    }
    EXPECT_EQ(shown, "baud=9600 empty=\"\" long=... min=-2147483648 off=false on=true ");
    ASSERT_TRUE(storage->clear("XTOK", error)) << error;
    EXPECT_FALSE(storage->IsStored("XTOK", "baud"));
    EXPECT_TRUE(storage->IsStored("other", "prefix"));
}

TEST_F(Storage, ReadTextToNeedsRoomForTheZero) {
    auto storage = open();
    ASSERT_NE(storage, nullptr);
    ASSERT_TRUE(storage->WriteText("XTOK", "suffix", "0D0A"));
    IPermanentStorage2* extended =
        static_cast<IPermanentStorage2*>(storage->GetInterface("IPermanentStorage2"));
    ASSERT_EQ(extended, storage.get());
    EXPECT_EQ(storage->GetInterface("IPermanentStorage"), static_cast<void*>(storage.get()));
    EXPECT_EQ(storage->GetInterface("IPermanentStorage3"), nullptr);

    char buffer[8] = "#######";
    EXPECT_TRUE(extended->ReadTextTo("XTOK", "suffix", buffer, 5));
    EXPECT_STREQ(buffer, "0D0A");
    EXPECT_FALSE(extended->ReadTextTo("XTOK", "suffix", buffer, 4));
    EXPECT_FALSE(extended->ReadTextTo("XTOK", "suffix", buffer, 0));
    EXPECT_FALSE(extended->ReadTextTo("XTOK", "suffix", nullptr, 8));
}

// The state directory the user's environment names, else the home's, else
// none (a service may run without a home); an empty name counts as none.
TEST(StorageFile, TheDefaultFileFollowsTheEnvironment) {
    const char* cases[][3] = {{"/s", "/h", "/s/xtokline/retained.sqlite3"},
                              {"", "/h", "/h/.local/state/xtokline/retained.sqlite3"},
                              {nullptr, "/h", "/h/.local/state/xtokline/retained.sqlite3"},
                              {nullptr, "", ""},
                              {nullptr, nullptr, ""}};
    auto set = [](const char* name, const char* value) {
        value ? setenv(name, value, 1) : unsetenv(name);
    };
    const char* was[] = {std::getenv("XDG_STATE_HOME"), std::getenv("HOME")};
    const std::string saved[] = {was[0] ? was[0] : "", was[1] ? was[1] : ""};
    for (const auto& [state, home, path] : cases) {
        set("XDG_STATE_HOME", state);
        set("HOME", home);
        EXPECT_EQ(defaultStoragePath(), path)
            << (state ? state : "unset") << (home ? home : "unset");
    }
    set("XDG_STATE_HOME", was[0] ? saved[0].c_str() : nullptr);
    set("HOME", was[1] ? saved[1].c_str() : nullptr);
}

}  // namespace
}  // namespace xtok::host
