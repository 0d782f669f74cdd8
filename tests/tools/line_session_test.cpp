// The real plug-in on a pseudo-terminal line against the simulated device:
// framing both ways, connecting, line settings, retention, a pulled cable
// and a misbehaving device.
#include <fcntl.h>
#include <unistd.h>

#include <filesystem>

#include "tests/tools/line_fixture.h"

namespace xtok::tools::test {
namespace {

const char* const kTx = "0?tx_token?string-64";
const char* const kConnect = "0?connect?boolean";
const char* const kAvailable = "0?tokens_available?unsignedInt";

struct Framing {
    const char* name;
    const char* config;                      // framing part of the configuration text
    std::string deviceSends;                 // raw bytes, in one burst
    std::vector<std::string> panelReceives;  // in order
    std::string deviceGetsForHello;          // what a tx_token "HELLO" puts on the line
};

// gap=50 keeps the gap-ended tokens quick; the device sends everything at
// once, so each case also shows where one token stops and the next begins.
const Framing kFramings[] = {
    {"NoneEndsAtTheGap", "gap=50", "SCAN 0042", {"SCAN 0042"}, "HELLO"},
    {"PrefixOnlyEndsAtTheNextPrefix",
     "rx_prefix=02 gap=50 tx_prefix=1B",
     "junk\x02"
     "A1\x02"
     "B2",
     {"A1", "B2"},
     "\x1B"
     "HELLO"},
    {"SuffixOnlyEndsAtTheSuffix",
     "rx_suffix=0D0A tx_suffix=0D0A",
     "A1\r\nB2\r\n",
     {"A1", "B2"},
     "HELLO\r\n"},
    {"PrefixAndSuffixSkipWhatLiesBetween",
     "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03",
     "x\x02"
     "A1\x03"
     "noise\x02"
     "B2\x03",
     {"A1", "B2"},
     "\x02"
     "HELLO\x03"},
};

// Names the case in test lists instead of dumping its bytes.
void PrintTo(const Framing& framing, std::ostream* os) {
    *os << framing.name;
}

class Framed : public LineFixture, public ::testing::WithParamInterface<Framing> {};

TEST_P(Framed, TokensAreCutAndFramedAsConfigured) {
    const Framing& framing = GetParam();
    DeviceOptions quiet;
    quiet.answer = false;  // only what the plug-in puts on the line
    startDevice(quiet);
    ASSERT_TRUE(startPlugin(framing.config));
    device_->sendRaw(framing.deviceSends);
    for (const std::string& expected : framing.panelReceives) {
        EXPECT_EQ(nextToken(), expected);
    }
    EXPECT_EQ(readUnsigned(kAvailable), 0u);
    EXPECT_EQ(write(kTx, "HELLO"), "");
    ASSERT_TRUE(device_->waitForBytes(framing.deviceGetsForHello.size(), kPatience));
    EXPECT_EQ(device_->bytes(), framing.deviceGetsForHello);
}

INSTANTIATE_TEST_SUITE_P(Modes, Framed, ::testing::ValuesIn(kFramings),
                         [](const auto& info) { return std::string(info.param.name); });

const char* const kStxEtx = "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03 gap=50";

class Line : public LineFixture {};

TEST_F(Line, ConnectsByTagAndByConsole) {
    startDevice();
    ASSERT_TRUE(startPlugin(std::string(kStxEtx) + " autoConnect=false"));
    EXPECT_EQ(readUnsigned(kConnect), 0u);
    EXPECT_NE(write(kTx, "early").find("Serial port not active for sending"), std::string::npos);

    EXPECT_EQ(write(kConnect, "1"), "");
    EXPECT_EQ(readUnsigned(kConnect), 1u);
    EXPECT_EQ(write(kTx, "by tag"), "");
    EXPECT_EQ(nextToken(), "ACK by tag");
    EXPECT_EQ(write(kConnect, "0"), "");
    EXPECT_EQ(console("get_stat"), "Disconnected");

    EXPECT_EQ(console("connect ON"), "OK");
    EXPECT_EQ(console("get_stat"), "Connected");
    EXPECT_EQ(readUnsigned(kConnect), 1u);
    EXPECT_EQ(console("put by console"), "OK");
    EXPECT_EQ(nextToken(), "ACK by console");
    EXPECT_EQ(console("connect OFF"), "OK");
    EXPECT_EQ(readUnsigned(kConnect), 0u);
    EXPECT_EQ(device_->tokens(), (std::vector<std::string>{"by tag", "by console"}));
}

TEST_F(Line, SerialDoneChangesTheLineOnlyWhenWritten) {
    startDevice();
    ASSERT_TRUE(startPlugin(kStxEtx));
    termios before = lineSettings();
    EXPECT_EQ(cfgetospeed(&before), B9600);

    EXPECT_EQ(write("0?SP_Baud?unsignedInt", "19200"), "");
    EXPECT_EQ(write("0?SP_Par?unsignedByte", "1"), "");
    EXPECT_EQ(write("0?SP_Bits?unsignedByte", "7"), "");
    termios staged = lineSettings();
    EXPECT_EQ(cfgetospeed(&staged), B9600);  // staged only
    EXPECT_EQ(readUnsigned("0?SP_Baud?unsignedInt"), 19200u);

    EXPECT_EQ(write("0?SP_Done?boolean", "1"), "");
    termios after = lineSettings();
    EXPECT_EQ(cfgetospeed(&after), B19200);
    EXPECT_EQ(cfgetispeed(&after), B19200);
    // A pseudo-terminal keeps 8 bits without parity whatever it is told, so
    // the rest shows in what the protocol reports as its active line.
    char active[64] = {};
    session_->protocol().GetSerialSettings(active, sizeof active - 1);
    EXPECT_STREQ(active, (pty_->slavePath() + ",19200,even,7,1,RS-232").c_str());
    // Refused values change nothing; a refusal the plug-in gives no reason
    // for is not passed off under the previous one's.
    EXPECT_NE(write("0?SP_Baud?unsignedInt", "14400").find("illegal baudrate"), std::string::npos);
    EXPECT_EQ(readUnsigned("0?SP_Baud?unsignedInt"), 19200u);
    EXPECT_NE(write("0?SP_Bits?unsignedByte", "9").find("perhaps an older one: illegal baudrate"),
              std::string::npos);
    EXPECT_EQ(readUnsigned("0?SP_Bits?unsignedByte"), 7u);
}

TEST_F(Line, RetainedSettingsSurviveARestartThroughTheStateFile) {
    DeviceOptions device;
    device.sendPrefix = "";
    device.sendSuffix = "\r";
    startDevice(device);
    ASSERT_TRUE(startPlugin(kStxEtx));
    EXPECT_EQ(write("0?SP_Baud?unsignedInt", "38400"), "");
    EXPECT_EQ(write("0?SP_RxPrefix?string-8", "none"), "");
    EXPECT_EQ(write("0?SP_RxSuffix?string-8", "0D"), "");
    EXPECT_EQ(write("0?SP_Done?boolean", "1"), "");
    session_.reset();
    ASSERT_TRUE(std::filesystem::exists(dir_.file("retained.sqlite3")));

    // The same configuration text again: the retained values win over it.
    ASSERT_TRUE(startPlugin(kStxEtx));
    termios line = lineSettings();
    EXPECT_EQ(cfgetospeed(&line), B38400);
    EXPECT_EQ(readUnsigned("0?SP_Baud?unsignedInt"), 38400u);
    device_->send("after restart");  // framed by the device as "...\r"
    EXPECT_EQ(nextToken(), "after restart");
}

TEST_F(Line, SurvivesThePulledCableAndReconnectsByConnect) {
    // The plug-in opens the line by a link, so that a new device can take its
    // place as a new cable would.
    std::string link = dir_.file("line");
    std::filesystem::create_symlink(pty_->slavePath(), link);
    startDevice();
    ASSERT_TRUE(startPlugin(kStxEtx, link));
    EXPECT_EQ(write(kTx, "one"), "");
    EXPECT_EQ(nextToken(), "ACK one");

    device_.reset();
    pty_->closeMaster();
    auto start = std::chrono::steady_clock::now();
    // A dead line: sending fails or goes nowhere, but nothing blocks.
    write(kTx, "into the void");
    EXPECT_EQ(readUnsigned(kAvailable), 0u);
    EXPECT_EQ(readUnsigned(kConnect), 1u);  // the plug-in cannot know
    EXPECT_LT(std::chrono::steady_clock::now() - start, kPatience);

    std::unique_ptr<PtyPair> old = std::move(pty_);
    ASSERT_TRUE(openLine(pty_));
    std::filesystem::remove(link);
    std::filesystem::create_symlink(pty_->slavePath(), link);
    startDevice();
    EXPECT_EQ(write(kConnect, "0"), "");
    EXPECT_EQ(write(kConnect, "1"), "");
    EXPECT_EQ(write(kTx, "two"), "");
    EXPECT_EQ(nextToken(), "ACK two");
    EXPECT_EQ(device_->tokens(), std::vector<std::string>{"two"});
}

// Each fault is followed by an ordinary exchange: its answer must be the very
// next token, so nothing of the fault reached the queue.
struct Fault {
    const char* name;
    const char* trigger;
};
const Fault kFaults[] = {
    {"Garbage", "!garbage"},
    {"UnterminatedFrame", "!unterminated"},
    {"OverlongFrame", "!overlong"},
};

void PrintTo(const Fault& fault, std::ostream* os) {
    *os << fault.name;
}

class Faulty : public LineFixture, public ::testing::WithParamInterface<Fault> {};

TEST_P(Faulty, LeavesNothingBehindAndTheNextTokenThrough) {
    DeviceOptions device;
    device.settle = 200ms;  // well past the plug-in's 50 ms gap
    startDevice(device);
    ASSERT_TRUE(startPlugin(kStxEtx));
    EXPECT_EQ(write(kTx, GetParam().trigger), "");
    EXPECT_EQ(write(kTx, "ping"), "");
    EXPECT_EQ(nextToken(), "ACK ping");
    EXPECT_EQ(readUnsigned(kAvailable), 0u);
    EXPECT_EQ(device_->tokens(), (std::vector<std::string>{GetParam().trigger, "ping"}));
}

INSTANTIATE_TEST_SUITE_P(Device, Faulty, ::testing::ValuesIn(kFaults),
                         [](const auto& info) { return std::string(info.param.name); });

TEST_F(Line, ASilentDeviceIsWaitedOutNotFatal) {
    startDevice();
    ASSERT_TRUE(startPlugin(kStxEtx));
    for (const char* token : {"!silent", "unanswered", "!talk", "again"}) {
        EXPECT_EQ(write(kTx, token), "");
    }
    EXPECT_EQ(nextToken(), "ACK !talk");
    EXPECT_EQ(nextToken(), "ACK again");
    EXPECT_EQ(device_->tokens().size(), 4u);
}

}  // namespace
}  // namespace xtok::tools::test
