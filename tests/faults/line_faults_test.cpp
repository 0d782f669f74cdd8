// A line that fails under the receive task and the transmit: read errors and
// a device that hangs up in the middle of a token, and writes the host
// cannot complete. Nothing half-received is queued, what was queued stays
// readable, and the protocol goes on answering.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/faults/fault_fixture.h"

namespace xtok::test::faults {
namespace {

struct ReadErrorCase {
    std::string name;
    std::string keys;
    std::string before, after;  ///< bytes around the failing read
    std::vector<std::string> tokens;
};

void PrintTo(const ReadErrorCase& c, std::ostream* os) {
    *os << c.name;
}

class ReadError : public FaultFixture, public ::testing::WithParamInterface<ReadErrorCase> {};

// A failed read ends a pass like a silence: a token that needs its suffix
// is dropped, one that the gap ends is delivered.
TEST_P(ReadError, InTheMiddleOfATokenEndsItLikeASilence) {
    const ReadErrorCase& c = GetParam();
    ASSERT_TRUE(start(c.keys)) << error();
    host.serial().feed(c.before);
    host.serial().readError();
    play(c.after);
    EXPECT_EQ(takeTokens(), c.tokens);
}

INSTANTIATE_TEST_SUITE_P(
    Framing, ReadError,
    ::testing::Values(ReadErrorCase{"PrefixAndSuffix",
                                    "rx_prefix=02 rx_suffix=03",
                                    "\x02"
                                    "AB",
                                    "C\x03\x02"
                                    "D\x03",
                                    {"D"}},
                      ReadErrorCase{"SuffixOnly", "rx_suffix=03", "AB", "C\x03", {"C"}},
                      ReadErrorCase{"PrefixOnly",
                                    "rx_prefix=02",
                                    "\x02"
                                    "AB",
                                    "C\x02"
                                    "D",
                                    {"AB", "D"}},
                      ReadErrorCase{"NoFraming", "", "AB", "C", {"AB", "C"}}),
    [](const ::testing::TestParamInfo<ReadErrorCase>& info) { return info.param.name; });

class HangUp : public FaultFixture {
protected:
    /// Queues two tokens, then the device hangs up half way through a third.
    void hangUpMidToken() {
        ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
        queueTwoTokens();
        host.serial().feed(
            "\x02"
            "EF");
        host.serial().hangUp();
        ASSERT_TRUE(host.serial().waitDrained());
        ASSERT_TRUE(host.serial().hungUp());
    }
};

TEST_F(HangUp, QueuedTokensStayReadableAndTheHalfTokenIsDropped) {
    hangUpMidToken();
    // Reads of a hung-up line keep failing; the protocol keeps answering.
    const long reads = host.serial().reads();
    ASSERT_TRUE(eventually([&] { return host.serial().reads() > reads + 3; }));
    EXPECT_EQ(command("get_stat"), "Connected");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD"}));
    EXPECT_EQ(readInt("tokens_available"), 0);
}

TEST_F(HangUp, ReconnectingResumesReception) {
    hangUpMidToken();
    EXPECT_TRUE(writeBool("connect", false));
    EXPECT_TRUE(writeBool("connect", true)) << error();
    EXPECT_FALSE(host.serial().hungUp());
    play(
        "\x02"
        "GH\x03");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD", "GH"}));
}

TEST_F(HangUp, StopAndStartResumeReception) {
    hangUpMidToken();
    ASSERT_TRUE(protocol->Stop());
    EXPECT_FALSE(host.serial().isOpen());
    ASSERT_TRUE(protocol->Start()) << error();
    play(
        "\x02"
        "GH\x03");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD", "GH"}));
}

// The host cannot complete a write: a transmit is not told (its result is
// not looked at), the frame was handed over whole, and nothing else changes.
TEST_F(FaultFixture, FailingWritesLeaveTheQueueAndTheLine) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03")) << error();
    queueTwoTokens();
    host.serial().failWrite = true;
    EXPECT_TRUE(writeText("tx_token", "hello")) << error();
    bool result = false;
    EXPECT_EQ(command("put again", &result), "OK");
    EXPECT_TRUE(result);
    EXPECT_EQ(host.serial().writes(), (std::vector<std::string>{"\x02hello\x03",
                                                                "\x02"
                                                                "again\x03"}));
    EXPECT_EQ(command("get_stat"), "Connected");
    play(
        "\x02"
        "EF\x03");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD", "EF"}));
}

}  // namespace
}  // namespace xtok::test::faults
