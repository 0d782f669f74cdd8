// Serial ports over real pseudo-terminal pairs: the port under test opens the
// slave side by its path; the test plays the device on the master side.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <ostream>
#include <string>
#include <thread>

#include "host/serial_factory.h"
#include "host/serial_line.h"
#include "tests/host/notice_log.h"
#include "tests/host/temp_dir.h"

namespace xtok::host {
namespace {

using Clock = std::chrono::steady_clock;

// Bound for what should be immediate: a loaded machine passes, a hang fails.
constexpr int kPatienceMs = 5000;

long long millisecondsSince(Clock::time_point start) {
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start).count();
}

class Pty : public ::testing::Test {
protected:
    void SetUp() override {
        master_ = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
        ASSERT_TRUE(master_ >= 0 && grantpt(master_) == 0 && unlockpt(master_) == 0);
        slave_ = ptsname(master_);
        port_ = factory_.Open(slave_.c_str());
        ASSERT_NE(port_, nullptr) << notices_.lines().front();
    }
    void TearDown() override {
        factory_.Close(port_);
        close(master_);
    }

    std::string deviceReceives(std::size_t count) {
        std::string got(count, '\0');
        std::size_t done = 0;
        pollfd ready{master_, POLLIN, 0};
        while (done < count && poll(&ready, 1, kPatienceMs) > 0) {
            ssize_t n = read(master_, &got[done], count - done);
            done += n > 0 ? static_cast<std::size_t>(n) : count;
        }
        return got;
    }
    std::string portReceives(std::size_t count) {
        std::string got;
        uint8_t byte;
        while (got.size() < count && port_->ReadByte(&byte, kPatienceMs, 0)) {
            got.push_back(static_cast<char>(byte));
        }
        return got;
    }
    termios lineSettings() {
        termios settings{};
        int fd = open(slave_.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
        EXPECT_EQ(tcgetattr(fd, &settings), 0);
        close(fd);
        return settings;
    }

    test::NoticeLog notices_;
    SerialFactory factory_{ComMap(), notices_.sink()};
    int master_ = -1;
    std::string slave_;
    ISerialPort* port_ = nullptr;
};

TEST_F(Pty, CarriesLongStreamsOfEveryByteValueBothWays) {
    termios raw = lineSettings();
    EXPECT_EQ(raw.c_lflag & (ICANON | ECHO | ISIG), 0u);
    EXPECT_EQ(raw.c_oflag & OPOST, 0u);
    std::string stream;
    for (int i = 0; i < 100000; ++i) {
        stream.push_back(static_cast<char>(i * 7 + i / 256));
    }
    // Far more than the line buffers hold: both ends must go on after partial
    // transfers, so the device side runs on a second thread.
    std::string echoed;
    std::thread device([&] { echoed = deviceReceives(stream.size()); });
    EXPECT_TRUE(port_->Write(reinterpret_cast<const uint8_t*>(stream.data()),
                             static_cast<int32_t>(stream.size()), 0));
    device.join();
    EXPECT_EQ(echoed, stream);
    device = std::thread(
        [&] { EXPECT_EQ(write(master_, stream.data(), stream.size()), ssize_t(stream.size())); });
    EXPECT_EQ(portReceives(stream.size()), stream);
    device.join();
}

TEST_F(Pty, OneReadServesABurstAndHangUpEndsReadsWithoutSpinning) {
    ASSERT_EQ(write(master_, "abc", 3), 3);
    uint8_t byte = 0;
    ASSERT_TRUE(port_->ReadByte(&byte, kPatienceMs, 0));
    close(master_);
    master_ = -1;
    // The rest of the burst came with the first byte; the device file itself
    // has nothing but errors left.
    EXPECT_EQ(portReceives(2), "bc");
    Clock::time_point start = Clock::now();
    EXPECT_FALSE(port_->ReadByte(&byte, 40, 0));
    EXPECT_GE(millisecondsSince(start), 39);  // waited like a silent line, no spinning
    EXPECT_LT(millisecondsSince(start), kPatienceMs);
    EXPECT_FALSE(port_->Write(&byte, 1, 0));
}

struct Line {
    int32_t baud, parity, bits, stop;
    speed_t speed;
    tcflag_t flags;  // of CSIZE, PARENB, PARODD, CMSPAR, CSTOPB
};

// ctest names a row by its line settings rather than its bytes.
void PrintTo(const Line& line, std::ostream* out) {
    *out << line.baud << "/" << line.parity << "/" << line.bits << "/" << line.stop;
}

class Lines : public Pty, public ::testing::WithParamInterface<Line> {};

TEST_P(Lines, ReachTheDevice) {
    const Line& line = GetParam();
    termios decided{};
    ASSERT_TRUE(setLineBits(decided, {line.baud, line.parity, line.bits, line.stop, 0}));
    EXPECT_EQ(decided.c_cflag & (CSIZE | PARENB | PARODD | CMSPAR | CSTOPB), line.flags);

    ASSERT_TRUE(port_->Configure(line.baud, line.parity, line.bits, line.stop, 0));
    termios applied = lineSettings();
    EXPECT_EQ(cfgetospeed(&applied), line.speed);
    EXPECT_EQ(cfgetispeed(&applied), line.speed);
    // A pseudo-terminal forces eight bits without parity enable; the rest stays.
    constexpr tcflag_t kKept = PARODD | CMSPAR | CSTOPB;
    EXPECT_EQ(applied.c_cflag & kKept, line.flags & kKept);
    EXPECT_TRUE(notices_.lines().empty());
}

INSTANTIATE_TEST_SUITE_P(
    Host, Lines,
    ::testing::Values(Line{9600, 0, 8, 1, B9600, CS8}, Line{19200, 1, 7, 1, B19200, CS7 | PARENB},
                      Line{115200, 2, 8, 2, B115200, CS8 | PARENB | PARODD | CSTOPB},
                      Line{1200, 3, 7, 1, B1200, CS7 | PARENB | PARODD | CMSPAR},
                      Line{4800, 4, 5, 2, B4800, CS5 | PARENB | CMSPAR | CSTOPB},
                      Line{921600, 0, 6, 1, B921600, CS6}));

TEST_F(Pty, RefusesSettingsItCannotApplyAndSaysWhy) {
    ASSERT_TRUE(port_->Configure(19200, 1, 7, 1, 0));
    const int32_t refused[][5] = {{0, 0, 8, 1, 0},    {9600, 5, 8, 1, 0}, {9600, 0, 4, 1, 0},
                                  {9600, 0, 9, 1, 0}, {9600, 0, 8, 3, 0}, {9600, 0, 8, 1, 4},
                                  {12345, 0, 8, 1, 0}};  // no termios code for it
    for (const auto& s : refused) {
        EXPECT_FALSE(port_->Configure(s[0], s[1], s[2], s[3], s[4])) << s[0] << " " << s[1];
    }
    EXPECT_EQ(notices_.count(slave_), 7);
    termios unchanged = lineSettings();
    EXPECT_EQ(cfgetospeed(&unchanged), B19200);
}

TEST(SerialFactory, TellsWhyAPortDoesNotOpen) {
    test::TempDir dir;
    std::ofstream(dir.file("plain")) << "not a device";
    const std::pair<std::string, std::string> cases[] = {
        {"ttyUSB0", "unknown port name"},
        {dir.file("missing"), "No such file"},
        {dir.file("plain"), "not a serial device"},
    };
    for (const auto& [name, reason] : cases) {
        test::NoticeLog notices;
        SerialFactory factory(ComMap(), notices.sink());
        EXPECT_EQ(factory.Open(name.c_str()), nullptr) << name;
        EXPECT_EQ(notices.count(reason), 1) << name;
    }
}

}  // namespace
}  // namespace xtok::host
