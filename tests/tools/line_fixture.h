// A serial line made of a pseudo-terminal pair: the simulated device on one
// end, the real plug-in, loaded through the host's loader, on the other.
#pragma once

#include <gtest/gtest.h>
#include <termios.h>

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <thread>

#include "tests/host/notice_log.h"
#include "tests/host/temp_dir.h"
#include "tools/plugin_session.h"
#include "tools/pty_pair.h"
#include "tools/simulated_device.h"

namespace xtok::tools::test {

using namespace std::chrono_literals;

// Bound for what should take a moment: a loaded machine passes, a hang fails.
constexpr std::chrono::milliseconds kPatience = 5000ms;

/// Asks `condition` until it holds or `patience` runs out.
template <class Condition>
bool eventually(Condition condition, std::chrono::milliseconds patience = kPatience) {
    auto deadline = std::chrono::steady_clock::now() + patience;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= deadline) {
            return false;
        }
        // A short step between looks: the plug-in's queue has no signal to wait on.
        std::this_thread::sleep_for(1ms);
    }
    return true;
}

/// 9600 8N1 RS-232 on `port`, then `framing` (rx_prefix=... gap=...).
inline std::string lineConfig(const std::string& port, const std::string& framing) {
    return "CfgVer=1 model=1 port=" + port +
           " baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232 " + framing;
}

class LineFixture : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_TRUE(openLine(pty_)); }

    static bool openLine(std::unique_ptr<PtyPair>& pty) {
        std::string error;
        pty = PtyPair::open(error);
        EXPECT_NE(pty, nullptr) << error;
        return pty != nullptr;
    }
    void startDevice(DeviceOptions options = {}) {
        device_ = std::make_unique<SimulatedDevice>(pty_->master(), std::move(options));
    }
    /// The plug-in on `port` (default: the line's own end).
    bool startPlugin(const std::string& framing, std::string port = "") {
        SessionOptions options;
        options.pluginPath = XTOK_PLUGIN_PATH;
        options.config = lineConfig(port.empty() ? pty_->slavePath() : port, framing);
        options.statePath = dir_.file("retained.sqlite3");
        options.notice = notices_.sink();
        std::string error;
        session_ = PluginSession::start(options, error);
        EXPECT_NE(session_, nullptr) << error;
        return session_ != nullptr;
    }
    /// The next token the panel side receives, acknowledged.
    std::optional<std::string> nextToken(std::chrono::milliseconds patience = kPatience) {
        Token token;
        std::string error;
        Intake intake = Intake::None;
        eventually([&] { return (intake = session_->takeToken(token, error)) != Intake::None; },
                   patience);
        EXPECT_NE(intake, Intake::Failed) << error;
        return intake == Intake::Token ? std::optional<std::string>(token.text) : std::nullopt;
    }
    uint32_t readUnsigned(const std::string& address) {
        TagValue value;
        std::string error;
        EXPECT_TRUE(session_->read(address, value, error)) << error;
        uint32_t number = 0;
        for (std::size_t i = value.bytes.size(); i-- > 0;) {
            number = number << 8 | value.bytes[i];
        }
        return number;
    }
    /// Writes a typed value; "" when done, else the error.
    std::string write(const std::string& address, const std::string& value) {
        std::string error;
        return session_->write(address, value, error) ? "" : error;
    }
    std::string console(const std::string& line) {
        bool ok = false;
        return session_->command(line, ok);
    }
    /// The line settings as the device end sees them.
    termios lineSettings() {
        termios settings{};
        EXPECT_EQ(tcgetattr(pty_->master(), &settings), 0);
        return settings;
    }

    host::test::TempDir dir_;
    host::test::NoticeLog notices_;
    std::unique_ptr<PtyPair> pty_;
    std::unique_ptr<SimulatedDevice> device_;
    std::unique_ptr<PluginSession> session_;
};

}  // namespace xtok::tools::test
