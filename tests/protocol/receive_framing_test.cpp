#include <gtest/gtest.h>

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

/// `count` copies of `text`.
std::string times(int count, const std::string& text) {
    std::string out;
    for (int i = 0; i < count; ++i) {
        out += text;
    }
    return out;
}

struct FramingCase {
    std::string name;
    std::string keys;                 ///< rx_prefix and rx_suffix
    std::string script;               ///< hex bytes, '|' a silence
    std::vector<std::string> tokens;  ///< queued tokens, as hex text
};

void PrintTo(const FramingCase& c, std::ostream* os) {
    *os << c.name;
}

// Tokens are queued as hex text, so that every byte value can be compared.
class Framing : public ProtocolFixture, public ::testing::WithParamInterface<FramingCase> {};

TEST_P(Framing, QueuesTheTokens) {
    start("hex_tokens=true " + GetParam().keys);
    play(GetParam().script);
    EXPECT_EQ(takeTokens(), GetParam().tokens);
}

std::string caseName(const ::testing::TestParamInfo<FramingCase>& info) {
    return info.param.name;
}

INSTANTIATE_TEST_SUITE_P(
    NoPrefixNoSuffix, Framing,
    ::testing::Values(
        FramingCase{"BurstThenSilence", "", "41 42 43", {"414243"}},
        FramingCase{"EachSilenceEndsAToken", "", "41 | 42 43 | |", {"41", "4243"}},
        FramingCase{"SilenceAloneIsNoToken", "", "| |", {}},
        FramingCase{"AnyByteValue", "", "00 0A FF 1F 80", {"000AFF1F80"}},
        FramingCase{"ThousandBytesAreDelivered", "", times(1000, "41 "), {times(1000, "41")}},
        FramingCase{"ARunPastAThousandIsDropped", "", times(1001, "41 ") + "| 42", {"42"}},
        FramingCase{"NoneMeansNoFraming", "rx_prefix=none rx_suffix=none", "02 41 03", {"024103"}}),
    caseName);

INSTANTIATE_TEST_SUITE_P(
    PrefixOnly, Framing,
    ::testing::Values(
        FramingCase{"NextPrefixEndsAToken", "rx_prefix=02", "02 41 02 42", {"41", "42"}},
        FramingCase{"EmptyToken", "rx_prefix=02", "02 02", {""}},
        FramingCase{"BytesBeforeThePrefixAreSkipped", "rx_prefix=02", "41 43 02 41", {"41"}},
        FramingCase{"PrefixAloneIsNoToken", "rx_prefix=02", "02 |", {}},
        FramingCase{
            "AfterAGapThePrefixIsHuntedAgain", "rx_prefix=02", "02 41 | 42 | 02 43", {"41", "43"}},
        FramingCase{"TwoBytePrefix", "rx_prefix=0D0A", "0D 0A 41 0D 0A 42 0D 41", {"41", "420D41"}},
        // A prefix that overlaps itself: the wrapped length takes all after the prefix.
        FramingCase{"SelfOverlappingPrefix", "rx_prefix=4141", "41 41 41", {"41"}},
        FramingCase{"SelfOverlappingPrefixTwice", "rx_prefix=4141", "41 41 41 41", {"41", "41"}},
        FramingCase{"SelfOverlappingPrefixBetweenTokens",
                    "rx_prefix=4141",
                    "41 41 42 41 41 43",
                    {"42", "43"}},
        // A prefix byte of 0x80 or above matches only in first place.
        FramingCase{
            "HighSecondPrefixByteNeverMatches", "rx_prefix=0D8A", "0D 8A 41 0D 8A 42 | 0D 8A", {}},
        FramingCase{
            "HighFirstPrefixByteMatches", "rx_prefix=8A0D", "8A 0D 41 8A 0D 42", {"41", "42"}},
        // A mismatch restarts at the first prefix byte only.
        FramingCase{"RestartLooksAtTheFirstByteOnly", "rx_prefix=010102", "01 01 01 02 41", {}},
        FramingCase{"RestartControl", "rx_prefix=010102", "01 01 02 41", {"41"}},
        FramingCase{"ARestartCanBeginTheNextMatch", "rx_prefix=0102", "01 01 02 41", {"41"}},
        FramingCase{"AFrameOfAThousandBytesIsDelivered",
                    "rx_prefix=02",
                    "02 " + times(999, "41 "),
                    {times(999, "41")}},
        FramingCase{"AFramePastAThousandIsDroppedAndHuntingRestarts",
                    "rx_prefix=02",
                    "02 " + times(1000, "41 ") + "41 02 42",
                    {"42"}}),
    caseName);

INSTANTIATE_TEST_SUITE_P(
    SuffixOnly, Framing,
    ::testing::Values(
        FramingCase{"SuffixEndsAToken", "rx_suffix=03", "41 42 03 43 03", {"4142", "43"}},
        FramingCase{"EmptyToken", "rx_suffix=03", "03", {""}},
        FramingCase{"AGapDropsTheBytes", "rx_suffix=03", "41 42 | 43 03 44", {"43"}},
        FramingCase{"TwoByteSuffix", "rx_suffix=0D0A", "41 0D 42 0D 0A", {"410D42"}},
        FramingCase{"HighSuffixByte", "rx_suffix=8A", "41 8A", {"41"}},
        FramingCase{"AFrameEndingAtByteThousandOneIsDelivered",
                    "rx_suffix=03",
                    times(1000, "41 ") + "03",
                    {times(1000, "41")}},
        FramingCase{"AFramePastAThousandIsDropped",
                    "rx_suffix=03",
                    times(1001, "41 ") + "| 42 03",
                    {"42"}}),
    caseName);

INSTANTIATE_TEST_SUITE_P(
    PrefixAndSuffix, Framing,
    ::testing::Values(
        FramingCase{"Token", "rx_prefix=02 rx_suffix=03", "02 41 42 03", {"4142"}},
        FramingCase{"EmptyToken", "rx_prefix=02 rx_suffix=03", "02 03", {""}},
        FramingCase{"BytesBeforeThePrefixAreSkipped",
                    "rx_prefix=02 rx_suffix=03",
                    "41 03 02 41 03",
                    {"41"}},
        FramingCase{"AGapDropsThePartialFrame",
                    "rx_prefix=02 rx_suffix=03",
                    "02 41 | 42 03 | 02 43 03",
                    {"43"}},
        FramingCase{"AGapInThePrefixDropsIt",
                    "rx_prefix=0D0A rx_suffix=03",
                    "0D | 0A 41 03 0D 0A 42 03",
                    {"42"}},
        FramingCase{"ASecondPrefixIsData", "rx_prefix=02 rx_suffix=03", "02 02 41 03", {"0241"}},
        FramingCase{
            "HighSecondPrefixByteNeverMatches", "rx_prefix=0D8A rx_suffix=03", "0D 8A 41 03", {}},
        FramingCase{
            "HighFirstPrefixByteMatches", "rx_prefix=8A0D rx_suffix=03", "8A 0D 41 03", {"41"}},
        FramingCase{"RestartLooksAtTheFirstByteOnly",
                    "rx_prefix=010102 rx_suffix=03",
                    "01 01 01 02 41 03",
                    {}},
        FramingCase{"RestartControl", "rx_prefix=010102 rx_suffix=03", "01 01 02 41 03", {"41"}},
        FramingCase{"SelfOverlappingPrefix", "rx_prefix=4141 rx_suffix=03", "41 41 41 03", {"41"}},
        // The size limit counts prefix and suffix and is checked after the suffix.
        FramingCase{"AFrameOfAThousandAndOneBytesIsDelivered",
                    "rx_prefix=02 rx_suffix=03",
                    "02 " + times(999, "41 ") + "03",
                    {times(999, "41")}},
        FramingCase{"AFramePastAThousandIsDroppedAndHuntingRestarts",
                    "rx_prefix=02 rx_suffix=03",
                    "02 " + times(1000, "41 ") + "03 02 42 03",
                    {"42"}}),
    caseName);

class ReceiveTiming : public ProtocolFixture,
                      public ::testing::WithParamInterface<std::pair<std::string, int32_t>> {};

TEST_P(ReceiveTiming, TheGapIsTheReadTimeOut) {
    start(GetParam().first);
    play("41 42 | 43");
    std::vector<int32_t> timeouts = host.serial().readTimeouts();
    ASSERT_FALSE(timeouts.empty());
    EXPECT_TRUE(std::all_of(timeouts.begin(), timeouts.end(),
                            [&](int32_t t) { return t == GetParam().second; }));
}

INSTANTIATE_TEST_SUITE_P(Gaps, ReceiveTiming,
                         ::testing::Values(std::make_pair(std::string("gap=20"), 20),
                                           std::make_pair(std::string("gap=0"), 500),
                                           std::make_pair(std::string(""), 500),
                                           std::make_pair(std::string("gap=1"), 1)));

class ReceiveConnection : public ProtocolFixture {
protected:
    int idleSleeps() {
        std::vector<int32_t> s = host.tasks().sleeps();
        return static_cast<int>(std::count(s.begin(), s.end(), 10));
    }
};

TEST_F(ReceiveConnection, NothingIsReadWhileDisconnectedAndReadingGoesOnAfterConnect) {
    start("rx_suffix=03");
    EXPECT_EQ(command("connect OFF"), "OK");
    host.serial().feed(hexBytes("41 42 03"));
    std::size_t reads = host.serial().readTimeouts().size();
    int idle = idleSleeps();
    ASSERT_TRUE(eventually([&] { return idleSleeps() >= idle + 3; }));
    EXPECT_EQ(host.serial().readTimeouts().size(), reads);
    EXPECT_EQ(readInt("tokens_available"), 0);

    EXPECT_EQ(command("connect ON"), "OK");
    ASSERT_TRUE(host.serial().waitDrained());
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"AB"});
}

/// A line that delivers `bytes`, then holds the next read until release():
/// with a byte, or as a time-out. Later reads time out. A test can so act
/// while the receive task waits inside a read, holding the port's lock.
class HeldLine final : public FakeService<ISerialFactory>, public ISerialPort {
public:
    explicit HeldLine(std::string bytes)
        : FakeService("ISerialFactory", 300), bytes_(std::move(bytes)) {}

    ISerialPort* Open(const char*) override { return this; }
    void Close(ISerialPort*) override {}
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    int32_t Reserved2() override { return 0; }
    int32_t Reserved3() override { return 0; }
    bool Configure(int32_t, int32_t, int32_t, int32_t, int32_t) override { return true; }
    int32_t Reserved5() override { return 0; }
    bool Write(const uint8_t*, int32_t, int32_t) override { return true; }

    bool ReadByte(uint8_t* destination, int32_t, int32_t) override {
        std::unique_lock<std::mutex> lock(mutex_);
        if (next_ < bytes_.size()) {
            *destination = static_cast<uint8_t>(bytes_[next_++]);
            return true;
        }
        if (held_ || released_) {
            changed_.wait_for(lock, std::chrono::milliseconds(1));
            return false;
        }
        held_ = true;
        changed_.notify_all();
        changed_.wait(lock, [this] { return released_; });
        if (!with_) {
            return false;
        }
        *destination = *with_;
        return true;
    }

    bool waitHeld() {
        std::unique_lock<std::mutex> lock(mutex_);
        return changed_.wait_for(lock, std::chrono::seconds(5), [this] { return held_; });
    }
    void release(std::optional<uint8_t> byte) {
        std::lock_guard<std::mutex> lock(mutex_);
        with_ = byte;
        released_ = true;
        changed_.notify_all();
    }

private:
    std::string bytes_;
    std::size_t next_ = 0;
    std::mutex mutex_;
    std::condition_variable changed_;
    bool held_ = false, released_ = false;
    std::optional<uint8_t> with_;
};

struct HeldCase {
    std::string name;
    bool disconnect;
    std::optional<uint8_t> release;
    std::vector<std::string> tokens;
};

void PrintTo(const HeldCase& c, std::ostream* os) {
    *os << c.name;
}

class DisconnectDuringRead : public ProtocolFixture,
                             public ::testing::WithParamInterface<HeldCase> {
protected:
    void prepareHost() override {
        host.provide("ISerialFactory", static_cast<ISerialFactory*>(&line));
    }
    void TearDown() override {
        line.release(std::nullopt);  // lets Stop end the task on a failed test too
        ProtocolFixture::TearDown();
    }
    int idleSleeps() {
        std::vector<int32_t> s = host.tasks().sleeps();
        return static_cast<int>(std::count(s.begin(), s.end(), 10));
    }

    HeldLine line{"AB"};
};

// No framing: a gap would deliver the bytes collected so far; a disconnect
// seen at the next byte drops them.
TEST_P(DisconnectDuringRead, EndsThePassAtTheNextByte) {
    const HeldCase& c = GetParam();
    start();
    ASSERT_TRUE(line.waitHeld());  // A and B collected, waiting for more
    int idle = idleSleeps();
    std::string reply;
    std::thread console;
    if (c.disconnect) {
        // "connect OFF" drops the flag at once, then waits for the read's lock.
        console = std::thread([&] { reply = command("connect OFF"); });
        ASSERT_TRUE(eventually([&] { return command("get_stat") == "Disconnected"; }));
    }
    line.release(c.release);
    if (console.joinable()) {
        console.join();
        EXPECT_EQ(reply, "OK");
        // The task is back to idling: the pass is over.
        ASSERT_TRUE(eventually([&] { return idleSleeps() > idle; }));
    } else {
        ASSERT_TRUE(eventually([&] { return readInt("tokens_available") == 1; }));
    }
    EXPECT_EQ(takeTokens(), c.tokens);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, DisconnectDuringRead,
    ::testing::Values(HeldCase{"DisconnectedDropsTheBytes", true, uint8_t{'C'}, {}},
                      HeldCase{"ConnectedGapDeliversThem", false, std::nullopt, {"AB"}}),
    [](const ::testing::TestParamInfo<HeldCase>& info) { return info.param.name; });

}  // namespace
}  // namespace xtok::test
