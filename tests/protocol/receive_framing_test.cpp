// Cutting the byte stream into tokens: every framing mode, the signed prefix
// comparison and the restart rule, the 1000-byte limit, empty tokens, the gap
// as the read time-out, and a disconnect in the middle of a read. xtok-host's
// framer, which follows the plug-in from outside, finds the same tokens.
#include <gtest/gtest.h>

#include <sstream>
#include <thread>

#include "tests/protocol/protocol_fixture.h"
#include "tools/token_framer.h"
#include "xtokline/text.h"

namespace xtok::test {
namespace {

std::string times(int count, const std::string& text) {
    std::string out;
    while (count-- > 0) {
        out += text;
    }
    return out;
}

struct FramingCase {
    const char* name;
    const char* keys;                 ///< rx_prefix and rx_suffix
    std::string script;               ///< hex bytes, '|' a silence
    std::vector<std::string> tokens;  ///< as hex text, so that every byte compares
};

void PrintTo(const FramingCase& row, std::ostream* out) {
    *out << row.name;
}

const std::string k999 = times(999, "41 "), k1000 = times(1000, "41 ");
const char* const kP = "rx_prefix=02";
const char* const kS = "rx_suffix=03";
const char* const kPS = "rx_prefix=02 rx_suffix=03";

const FramingCase kFraming[] = {
    // No prefix, no suffix: a silence ends a token.
    {"BurstThenSilence", "", "41 42 43", {"414243"}},
    {"EachSilenceEndsAToken", "", "41 | 42 43 | |", {"41", "4243"}},
    {"AnyByteValue", "", "00 0A FF 1F 80", {"000AFF1F80"}},
    {"ThousandBytesAreDelivered", "", k1000, {times(1000, "41")}},
    {"ARunPastAThousandIsDropped", "", k1000 + "41 | 42", {"42"}},
    {"NoneMeansNoFraming", "rx_prefix=none rx_suffix=none", "02 41 03", {"024103"}},
    // Prefix only: the next prefix ends a token.
    {"NextPrefixEndsAToken", kP, "02 41 02 42", {"41", "42"}},
    {"PrefixEmptyToken", kP, "02 02", {""}},
    {"BytesBeforeThePrefixAreSkipped", kP, "41 43 02 41", {"41"}},
    {"PrefixAloneIsNoToken", kP, "02 |", {}},
    {"AfterAGapThePrefixIsHuntedAgain", kP, "02 41 | 42 | 02 43", {"41", "43"}},
    {"TwoBytePrefix", "rx_prefix=0D0A", "0D 0A 41 0D 0A 42 0D 41", {"41", "420D41"}},
    {"SelfOverlappingPrefix", "rx_prefix=4141", "41 41 41", {"41"}},
    {"SelfOverlappingPrefixTwice", "rx_prefix=4141", "41 41 41 41", {"41", "41"}},
    {"SelfOverlappingBetweenTokens", "rx_prefix=4141", "41 41 42 41 41 43", {"42", "43"}},
    // A prefix byte of 0x80 or above is compared signed: it matches only first.
    {"HighSecondPrefixByteNeverMatches", "rx_prefix=0D8A", "0D 8A 41 0D 8A 42 | 0D 8A", {}},
    {"HighFirstPrefixByteMatches", "rx_prefix=8A0D", "8A 0D 41 8A 0D 42", {"41", "42"}},
    // A mismatch restarts at the first prefix byte only.
    {"RestartLooksAtTheFirstByteOnly", "rx_prefix=010102", "01 01 01 02 41", {}},
    {"RestartControl", "rx_prefix=010102", "01 01 02 41", {"41"}},
    {"ARestartCanBeginTheNextMatch", "rx_prefix=0102", "01 01 02 41", {"41"}},
    {"PrefixFrameOfAThousand", kP, "02 " + k999, {times(999, "41")}},
    {"PrefixFramePastAThousandRestarts", kP, "02 " + k1000 + "41 02 42", {"42"}},
    // Suffix only.
    {"SuffixEndsAToken", kS, "41 42 03 43 03", {"4142", "43"}},
    {"SuffixEmptyToken", kS, "03", {""}},
    {"AGapDropsTheBytes", kS, "41 42 | 43 03 44", {"43"}},
    {"TwoByteSuffix", "rx_suffix=0D0A", "41 0D 42 0D 0A", {"410D42"}},
    {"HighSuffixByte", "rx_suffix=8A", "41 8A", {"41"}},
    {"SuffixFrameOfAThousandAndOne", kS, k1000 + "03", {times(1000, "41")}},
    {"SuffixFramePastAThousandIsDropped", kS, k1000 + "41 | 42 03", {"42"}},
    // Prefix and suffix.
    {"Token", kPS, "02 41 42 03", {"4142"}},
    {"BothEmptyToken", kPS, "02 03", {""}},
    {"BytesBeforeBothAreSkipped", kPS, "41 03 02 41 03", {"41"}},
    {"AGapDropsThePartialFrame", kPS, "02 41 | 42 03 | 02 43 03", {"43"}},
    {"AGapInThePrefixDropsIt", "rx_prefix=0D0A rx_suffix=03", "0D | 0A 41 03 0D 0A 42 03", {"42"}},
    {"ASecondPrefixIsData", kPS, "02 02 41 03", {"0241"}},
    {"HighSecondByteWithSuffix", "rx_prefix=0D8A rx_suffix=03", "0D 8A 41 03", {}},
    {"RestartWithSuffix",
     "rx_prefix=010102 rx_suffix=03",
     "01 01 01 02 41 03 01 01 02 42 03",
     {"42"}},
    // The limit counts prefix and suffix and is checked after the suffix.
    {"BothFrameOfAThousandAndOne", kPS, "02 " + k999 + "03", {times(999, "41")}},
    {"BothFramePastAThousandRestarts", kPS, "02 " + k1000 + "03 02 42 03", {"42"}},
};

/// The tokens of xtok-host's framer fed what `play` plays: each piece of
/// the script, then a silence of the (default) gap.
std::vector<std::string> hostFramerTokens(const FramingCase& row) {
    tools::RxFraming rules;
    std::istringstream keys(row.keys);
    for (std::string key; keys >> key;) {
        (key.rfind("rx_prefix=", 0) == 0 ? rules.prefix : rules.suffix) = key.substr(10);
    }
    tools::TokenFramer framer([&] { return rules; });
    std::vector<std::string> tokens;
    tools::FramedToken token;
    std::istringstream pieces(row.script);
    for (std::string piece; std::getline(pieces, piece, '|');) {
        for (char c : hexBytes(piece)) {
            if (framer.byte(static_cast<uint8_t>(c), token)) {
                tokens.push_back(bytesToHexText(token.bytes.data(), token.bytes.size()));
            }
        }
        if (framer.silence(500, token)) {
            tokens.push_back(bytesToHexText(token.bytes.data(), token.bytes.size()));
        }
    }
    return tokens;
}

class Framing : public ProtocolFixture, public ::testing::WithParamInterface<FramingCase> {};

TEST_P(Framing, QueuesTheTokens) {
    ASSERT_TRUE(start(std::string("hex_tokens=true ") + GetParam().keys)) << error();
    play(GetParam().script);
    EXPECT_EQ(takeTokens(), GetParam().tokens);
    EXPECT_EQ(hostFramerTokens(GetParam()), GetParam().tokens);
}

INSTANTIATE_TEST_SUITE_P(Rows, Framing, ::testing::ValuesIn(kFraming),
                         [](const auto& info) { return std::string(info.param.name); });

// The gap is the read time-out; none, 0 or less mean half a second. A longer
// gap is read in half-second slices, and a byte in any slice is kept.
const Scenario kGaps[] = {{"TheGapIsTheReadTimeOut",
                           "start gap=20; play 41 42 | 43; gap; new; start gap=0; play 41; gap; "
                           "new; start; play 41; gap; new; start gap=1; play 41; gap; new; "
                           "start gap=-5; play 41; gap; new; start gap=2000 rx_suffix=03; "
                           "play 41 03 | | | | 42 03; gap; tokens",
                           "20 | 500 | 500 | 1 | 500 | 500 | A,B"}};

INSTANTIATE_TEST_SUITE_P(Receive, Scenarios, ::testing::ValuesIn(kGaps), scenarioName);

class Receive : public ProtocolFixture {};

TEST_F(Receive, NothingIsReadWhileDisconnected) {
    ASSERT_TRUE(start("rx_suffix=03"));
    EXPECT_EQ(command("connect OFF"), "OK");
    host.serial().feed("AB\x03");
    const long reads = host.serial().record().reads, idle = host.tasks().idleSleeps();
    ASSERT_TRUE(eventually([&] { return host.tasks().idleSleeps() >= idle + 3; }));
    EXPECT_EQ(host.serial().record().reads, reads);
    EXPECT_EQ(command("connect ON"), "OK");
    ASSERT_TRUE(host.serial().waitDrained());
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"AB"});
}

// A hung-up line fails every read at once: the task pauses between passes
// instead of spinning, and a new open resumes reception.
TEST_F(Receive, AHungUpLineIsNotSpunOn) {
    ASSERT_TRUE(start("rx_suffix=03"));
    host.serial().hangUp();
    ASSERT_TRUE(eventually([&] { return host.serial().record().hungUp; }));
    const long reads = host.serial().record().reads, idle = host.tasks().idleSleeps();
    ASSERT_TRUE(eventually([&] { return host.tasks().idleSleeps() >= idle + 5; }));
    EXPECT_LE(host.serial().record().reads - reads, 2 * (host.tasks().idleSleeps() - idle) + 2);
    EXPECT_EQ(command("get_stat"), "Connected");
    EXPECT_EQ(command("connect OFF"), "OK");
    EXPECT_EQ(command("connect ON"), "OK");
    play("41 03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"A"});
}

// While the receive task waits inside a read, holding the port's lock,
// "connect OFF" waits for the read to end; the pass then finds the port
// closed at its next byte and drops what it collected.
TEST_F(Receive, ACloseDuringAReadWaitsForItAndDropsTheFrame) {
    ASSERT_TRUE(start());
    host.serial().hold("AB");
    ASSERT_TRUE(host.serial().waitHeld());
    std::string reply;
    std::thread console([&] { reply = command("connect OFF"); });
    ASSERT_TRUE(eventually([&] { return command("get_stat") == "Disconnected"; }));
    host.serial().release('C');
    console.join();
    EXPECT_EQ(reply, "OK");
    EXPECT_EQ(run("cmd connect ON; play 44; tokens"), "OK | D");
}

// A frame never joins bytes from both sides of a disconnect, even when the
// port is open again before the receive task reads on. The queue lock, held
// here, stops the task between two reads of one pass: at its token "A".
TEST_F(Receive, AFrameDoesNotSpanACloseAndAReopen) {
    ASSERT_TRUE(start("rx_prefix=02"));
    host.serial().hold(
        "\x02"
        "A");
    ASSERT_TRUE(host.serial().waitHeld());
    FakeMutex& queue = *host.tasks().mutex(0);
    queue.Lock();
    host.serial().release(0x02);
    std::string replies = command("connect OFF");
    replies += command("connect ON");
    queue.Unlock();
    EXPECT_EQ(replies, "OKOK");
    EXPECT_EQ(run("play 42 02 43 02; tokens"), "A,C");
}

}  // namespace
}  // namespace xtok::test
