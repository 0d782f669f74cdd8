// Permanent storage that fails to read or to write: the protocol starts and
// applies settings regardless; what the storage could not keep is lost only
// for the next start, never for the running protocol.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/faults/fault_fixture.h"

namespace xtok::test::faults {
namespace {

// A retained text that cannot be read back is the empty text, with or
// without the extended interface; the configured value does not return.
class StorageReadFails : public FaultFixture, public ::testing::WithParamInterface<bool> {};

TEST_P(StorageReadFails, RetainedTextsFallBackToEmptyAndTheProtocolRuns) {
    host.storage().extended = GetParam();
    host.storage().put("XTOK", "tx_prefix", "0D");
    host.storage().put("XTOK", "rx_suffix", "0A");
    host.storage().failReads = true;
    ASSERT_TRUE(start("tx_prefix=02 rx_suffix=03")) << error();
    EXPECT_EQ(readText("SP_TxPrefix"), "");
    EXPECT_EQ(readText("SP_RxSuffix"), "");
    // No suffix now: the gap ends a token.
    play("AB");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"AB"});
    EXPECT_TRUE(writeText("tx_token", "x"));
    EXPECT_EQ(host.serial().written(), "x");
}

INSTANTIATE_TEST_SUITE_P(Interfaces, StorageReadFails, ::testing::Bool(),
                         [](const ::testing::TestParamInfo<bool>& info) {
                             return std::string(info.param ? "Extended" : "Basic");
                         });

TEST_F(FaultFixture, FailedStorageWritesKeepSettingsWhileTheProtocolLives) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    host.storage().failWrites = true;
    ASSERT_TRUE(writeInt("SP_Gap", 25));
    ASSERT_TRUE(writeText("SP_TxPrefix", "0D"));
    EXPECT_TRUE(writeBool("SP_Done", true)) << error();
    // Tried, refused, and not reported: the settings are in force anyway.
    const std::vector<std::string> calls = host.storage().calls();
    EXPECT_NE(std::find(calls.begin(), calls.end(), "WriteInt XTOK gap 25"), calls.end());
    EXPECT_FALSE(host.storage().has("XTOK", "gap"));
    EXPECT_EQ(readInt("SP_Gap"), 25);
    EXPECT_TRUE(writeText("tx_token", "x"));
    EXPECT_EQ(host.serial().written(), "\x0dx");
    // SP_Done empties the queue, storage or not; the line goes on.
    EXPECT_EQ(readInt("tokens_available"), 0);
    play(
        "\x02"
        "EF\x03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"EF"});

    // A stop and start keeps them: they are held, not re-read.
    ASSERT_TRUE(protocol->Stop());
    ASSERT_TRUE(protocol->Start()) << error();
    EXPECT_EQ(readInt("SP_Gap"), 25);
    EXPECT_EQ(readText("SP_TxPrefix"), "0D");
}

}  // namespace
}  // namespace xtok::test::faults
