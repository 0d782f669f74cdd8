// Line settings as they reach a real pseudo-terminal: the port under test
// opens the slave side by its path, the test holds the master side.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <termios.h>
#include <unistd.h>

#include <ostream>
#include <string>
#include <vector>

#include "host/serial_factory.h"
#include "host/serial_line.h"

namespace xtok::host {
namespace {

struct Line {
    int32_t baud, parity, bits, stop;
    speed_t speed;
    tcflag_t flags;  // of CSIZE, PARENB, PARODD, CMSPAR, CSTOPB
};

// ctest names a row by its line settings rather than its bytes.
void PrintTo(const Line& line, std::ostream* out) {
    *out << line.baud << "/" << line.parity << "/" << line.bits << "/" << line.stop;
}

class Lines : public ::testing::TestWithParam<Line> {
protected:
    void SetUp() override {
        master_ = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
        ASSERT_TRUE(master_ >= 0 && grantpt(master_) == 0 && unlockpt(master_) == 0);
        port_ = factory_.Open(ptsname(master_));
        ASSERT_NE(port_, nullptr) << (notices_.empty() ? "" : notices_.front());
    }
    void TearDown() override {
        factory_.Close(port_);
        close(master_);
    }

    std::vector<std::string> notices_;
    SerialFactory factory_{ComMap(), [this](const std::string& text) { notices_.push_back(text); }};
    int master_ = -1;
    ISerialPort* port_ = nullptr;
};

TEST_P(Lines, ReachTheDevice) {
    const Line& line = GetParam();
    termios decided{};
    ASSERT_TRUE(setLineBits(decided, {line.baud, line.parity, line.bits, line.stop, 0}));
    EXPECT_EQ(decided.c_cflag & (CSIZE | PARENB | PARODD | CMSPAR | CSTOPB), line.flags);

    ASSERT_TRUE(port_->Configure(line.baud, line.parity, line.bits, line.stop, 0));
    termios applied{};
    ASSERT_EQ(tcgetattr(master_, &applied), 0);  // the master reads the slave's settings
    EXPECT_EQ(cfgetospeed(&applied), line.speed);
    EXPECT_EQ(cfgetispeed(&applied), line.speed);
    // A pseudo-terminal forces eight bits without parity enable; the rest stays.
    constexpr tcflag_t kKept = PARODD | CMSPAR | CSTOPB;
    EXPECT_EQ(applied.c_cflag & kKept, line.flags & kKept);
    EXPECT_TRUE(notices_.empty());
}

INSTANTIATE_TEST_SUITE_P(
    Host, Lines,
    ::testing::Values(Line{9600, 0, 8, 1, B9600, CS8}, Line{19200, 1, 7, 1, B19200, CS7 | PARENB},
                      Line{115200, 2, 8, 2, B115200, CS8 | PARENB | PARODD | CSTOPB},
                      Line{1200, 3, 7, 1, B1200, CS7 | PARENB | PARODD | CMSPAR},
                      Line{4800, 4, 5, 2, B4800, CS5 | PARENB | CMSPAR | CSTOPB},
                      Line{921600, 0, 6, 1, B921600, CS6}));

}  // namespace
}  // namespace xtok::host
