// A simulated reader on the device end of a line: it sends framed codes now
// and then, answers every token it receives with "ACK " and the token, and
// misbehaves on request, the way a test server misbehaves at reserved
// addresses, so that the plug-in can be seen to survive a bad device.
//
// Tokens that make it misbehave (each still counts as received):
//   !garbage       answers bytes that are no frame at all
//   !unterminated  answers a prefix and data, never the suffix
//   !overlong      answers a frame of 1200 data bytes
//   !silent        sends nothing at all (no answers, no codes) until "!talk"
//   !talk          ends the silence; answered as usual
// After garbage, an unterminated or an over-long frame it keeps quiet for
// `settle`, so that the receiver's gap runs out before the next frame.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <deque>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace xtok::tools {

struct DeviceOptions {
    std::string sendPrefix = "\x02";  // framing of what the device sends
    std::string sendSuffix = "\x03";
    std::string receivePrefix = "\x02";  // framing of what it expects
    std::string receiveSuffix = "\x03";  // empty: each burst read is one token
    std::vector<std::string> codes;      // sent in turn, every `interval`
    std::chrono::milliseconds interval{0};
    std::chrono::milliseconds firstCode{300};
    std::chrono::milliseconds settle{600};
    bool answer = true;
};

class SimulatedDevice {
public:
    /// Runs on `fd` (a non-blocking device end, not owned) until destroyed.
    SimulatedDevice(int fd, DeviceOptions options);
    ~SimulatedDevice();
    SimulatedDevice(const SimulatedDevice&) = delete;
    SimulatedDevice& operator=(const SimulatedDevice&) = delete;

    /// Sends `token` framed with the send prefix and suffix.
    void send(const std::string& token);
    /// Sends `bytes` as they stand.
    void sendRaw(const std::string& bytes);

    /// Tokens received so far, in order.
    std::vector<std::string> tokens() const;
    /// Every byte received so far.
    std::string bytes() const;
    /// Waits up to `patience` until at least `count` tokens (bytes) arrived.
    bool waitForTokens(std::size_t count, std::chrono::milliseconds patience) const;
    bool waitForBytes(std::size_t count, std::chrono::milliseconds patience) const;

private:
    using Clock = std::chrono::steady_clock;
    struct Outgoing {
        std::string bytes;
        bool faulty;
    };

    void run();
    int pollTimeoutMs(Clock::time_point now) const;
    void readLine();
    void takeBytes(const std::string& chunk);
    void answer(const std::string& token);
    void queue(Outgoing outgoing);
    void sendCodeIfDue(Clock::time_point now);
    void flush(Clock::time_point now);
    void wake();

    int fd_;
    DeviceOptions options_;
    int wakeRead_ = -1;
    int wakeWrite_ = -1;

    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    bool stopping_ = false;
    std::deque<Outgoing> outbox_;
    std::vector<std::string> tokens_;
    std::string bytes_;

    // The device thread's own state.
    std::string inbox_;
    std::string writing_;  // the rest of a frame the line did not take at once
    bool silent_ = false;
    bool hungUp_ = false;
    std::size_t nextCode_ = 0;
    Clock::time_point codeDue_;
    Clock::time_point quietUntil_;

    std::thread thread_;
};

}  // namespace xtok::tools
