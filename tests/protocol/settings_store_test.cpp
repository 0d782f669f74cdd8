#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "protocol/retained_store.h"
#include "protocol/staged_store.h"
#include "tests/support/module_session.h"

namespace xtok {
namespace {

using test::FakeHost;
using test::ModuleSession;
using Calls = std::vector<std::string>;

TEST(RetainedStoreKeys, NodeKeysDifferBetweenTheStores) {
    EXPECT_EQ(RetainedStore::fullKey("baud", -1), "baud");
    EXPECT_EQ(RetainedStore::fullKey("baud", 3), "node3_baud");
    EXPECT_EQ(StagedStore::stagedKey("gap", -1), "gap");
    EXPECT_EQ(StagedStore::stagedKey("gap", 2), "gap2");
}

TEST(RetainedStore, WithoutStorageTheFirstDefaultIsCached) {
    FakeHost host;
    host.refuse("IPermanentStorage");
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    int32_t gap = -1;
    store.getInt("gap", -1, 0, gap);
    EXPECT_EQ(gap, 0);
    store.getInt("gap", -1, 5, gap);
    EXPECT_EQ(gap, 0);
    store.setInt("gap", -1, 9, true);  // nothing to write to, still cached
    store.getInt("gap", -1, 5, gap);
    EXPECT_EQ(gap, 9);
}

TEST(RetainedStore, StoredValuesWinAndAreReadOnce) {
    FakeHost host;
    host.storage().put("Line1", "baud", "19200");
    host.storage().put("Line1", "hex_tokens", "1");
    host.storage().put("Line1", "rx_prefix", "0D0A");
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("Line1");
    int32_t baud = 0;
    bool hex = false;
    std::string prefix;
    store.getInt("baud", -1, 9600, baud);
    store.getBool("hex_tokens", -1, false, hex);
    store.getText("rx_prefix", -1, "", prefix);
    EXPECT_EQ(baud, 19200);
    EXPECT_TRUE(hex);
    EXPECT_EQ(prefix, "0D0A");
    EXPECT_EQ(host.storage().calls(),
              (Calls{"IsStored Line1 baud", "ReadInt Line1 baud", "IsStored Line1 hex_tokens",
                     "ReadBool Line1 hex_tokens", "IsStored Line1 rx_prefix",
                     "GetInterface IPermanentStorage2", "ReadTextTo Line1 rx_prefix 256"}));
    host.storage().clearCalls();
    store.getInt("baud", -1, 1, baud);
    EXPECT_TRUE(host.storage().calls().empty());
}

TEST(RetainedStore, NotStoredMeansTheDefaultWithoutARead) {
    FakeHost host;
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    int32_t stop = 0;
    store.getInt("stop", -1, 2, stop);
    EXPECT_EQ(stop, 2);
    EXPECT_EQ(host.storage().calls(), Calls{"IsStored XTOK stop"});
}

TEST(RetainedStore, TextWithoutTheExtendedInterfaceUsesReadText) {
    FakeHost host;
    host.storage().extended = false;
    host.storage().put("XTOK", "tx_suffix", "03");
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    std::string suffix;
    store.getText("tx_suffix", -1, "", suffix);
    EXPECT_EQ(suffix, "03");
    EXPECT_EQ(host.storage().calls().back(), "ReadText XTOK tx_suffix");
}

TEST(RetainedStore, AFailedTextReadGivesTheEmptyText) {
    FakeHost host;
    host.storage().put("XTOK", "rx_suffix", "03");
    host.storage().failReads = true;
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    std::string suffix = "x";
    store.getText("rx_suffix", -1, "FF", suffix);
    EXPECT_EQ(suffix, "");
}

TEST(RetainedStore, SetWritesUnderTheSectionOnlyWhenPersisting) {
    FakeHost host;
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("Line2");
    store.setInt("baud", -1, 19200, true);
    store.setInt("baud", 2, 4800, true);
    store.setBool("hex_tokens", -1, true, true);
    store.setText("rx_prefix", -1, "02", true);
    store.setText("rx_suffix", -1, "03", false);
    EXPECT_EQ(host.storage().calls(),
              (Calls{"WriteInt Line2 baud 19200", "WriteInt Line2 node2_baud 4800",
                     "WriteBool Line2 hex_tokens 1", "WriteText Line2 rx_prefix 02"}));
    std::string suffix;
    store.getText("rx_suffix", -1, "", suffix);
    EXPECT_EQ(suffix, "03");
}

TEST(RetainedStore, AFailedWriteStillCaches) {
    FakeHost host;
    host.storage().failWrites = true;
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    store.setInt("gap", -1, 30, true);
    int32_t gap = 0;
    store.getInt("gap", -1, 0, gap);
    EXPECT_EQ(gap, 30);
}

TEST(StagedStore, FindLeavesOutAloneWhenNothingIsStaged) {
    StagedStore staged;
    int32_t value = 7;
    bool flag = true;
    std::string text = "keep";
    EXPECT_FALSE(staged.findInt("baud", -1, value));
    EXPECT_FALSE(staged.findBool("hex_tokens", -1, flag));
    EXPECT_FALSE(staged.findText("rx_prefix", -1, text));
    EXPECT_EQ(value, 7);
    EXPECT_TRUE(flag);
    EXPECT_EQ(text, "keep");
    staged.stageInt("baud", -1, 19200);
    staged.stageInt("baud", -1, 38400);  // replaces
    EXPECT_TRUE(staged.findInt("baud", -1, value));
    EXPECT_EQ(value, 38400);
    EXPECT_FALSE(staged.findInt("baud", 0, value));
}

TEST(StagedStore, CommitCopiesOneNodeInKeyOrderAndKeepsTheEntries) {
    FakeHost host;
    ModuleSession session(host);
    RetainedStore store;
    store.setSection("XTOK");
    StagedStore staged;
    staged.stageText("rx_prefix", -1, "02");
    staged.stageInt("gap", 2, 50);
    staged.stageBool("hex_tokens", -1, true);
    staged.stageInt("baud", -1, 4800);
    staged.commitTo(store, -1, true);
    EXPECT_EQ(host.storage().calls(),
              (Calls{"WriteInt XTOK baud 4800", "WriteBool XTOK hex_tokens 1",
                     "WriteText XTOK rx_prefix 02"}));
    int32_t baud = 0;
    EXPECT_TRUE(staged.findInt("baud", -1, baud));
    int32_t gap = 0;
    store.getInt("gap", 2, -1, gap);
    EXPECT_EQ(gap, -1);  // node 2's value was not committed
}

}  // namespace
}  // namespace xtok
