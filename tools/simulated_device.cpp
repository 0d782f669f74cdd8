#include "tools/simulated_device.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "tools/interrupt.h"

namespace xtok::tools {

namespace {

// Bytes that frame nothing; the framing bytes of the line are left out by
// garbage() so that the fault is "noise", not a stray frame.
const std::string kNoise("\x00\x7F\xFF\x80\x1B[2J\x55\xAA garbage \x0D\x0A", 20);

// A hung-up line has nothing to wait on; look again this often.
constexpr int kHangUpRetryMs = 20;

int millisecondsUntil(std::chrono::steady_clock::time_point when,
                      std::chrono::steady_clock::time_point now) {
    auto left = std::chrono::ceil<std::chrono::milliseconds>(when - now).count();
    return static_cast<int>(std::max<decltype(left)>(left, 0));
}

}  // namespace

SimulatedDevice::SimulatedDevice(int fd, DeviceOptions options)
    : fd_(fd), options_(std::move(options)) {
    int pipeFds[2] = {-1, -1};
    if (pipe2(pipeFds, O_NONBLOCK | O_CLOEXEC) == 0) {
        wakeRead_ = pipeFds[0];
        wakeWrite_ = pipeFds[1];
    }
    Clock::time_point now = Clock::now();
    codeDue_ = now + options_.firstCode;
    quietUntil_ = now;
    InterruptsBlocked forTheMainThread;
    thread_ = std::thread([this] { run(); });
}

SimulatedDevice::~SimulatedDevice() {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        stopping_ = true;
    }
    wake();
    thread_.join();
    if (wakeRead_ >= 0) {
        ::close(wakeRead_);
        ::close(wakeWrite_);
    }
}

void SimulatedDevice::send(const std::string& token) {
    queue({options_.sendPrefix + token + options_.sendSuffix, false});
}

void SimulatedDevice::sendRaw(const std::string& bytes) {
    queue({bytes, false});
}

std::vector<std::string> SimulatedDevice::tokens() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return tokens_;
}

std::string SimulatedDevice::bytes() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return bytes_;
}

bool SimulatedDevice::waitForTokens(std::size_t count, std::chrono::milliseconds patience) const {
    std::unique_lock<std::mutex> lock(mutex_);
    return changed_.wait_for(lock, patience, [&] { return tokens_.size() >= count; });
}

bool SimulatedDevice::waitForBytes(std::size_t count, std::chrono::milliseconds patience) const {
    std::unique_lock<std::mutex> lock(mutex_);
    return changed_.wait_for(lock, patience, [&] { return bytes_.size() >= count; });
}

void SimulatedDevice::queue(Outgoing outgoing) {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        outbox_.push_back(std::move(outgoing));
    }
    wake();
}

void SimulatedDevice::wake() {
    char one = 1;
    // A full pipe already holds a wake-up; nothing is lost.
    [[maybe_unused]] ssize_t ignored = ::write(wakeWrite_, &one, 1);
}

void SimulatedDevice::run() {
    for (;;) {
        {
            std::lock_guard<std::mutex> lock(mutex_);
            if (stopping_) {
                return;
            }
        }
        Clock::time_point now = Clock::now();
        int timeout = pollTimeoutMs(now);
        short events = static_cast<short>(POLLIN | (writing_.empty() ? 0 : POLLOUT));
        pollfd ready[2] = {{hungUp_ ? -1 : fd_, events, 0}, {wakeRead_, POLLIN, 0}};
        int count = ::poll(
            ready, 2,
            hungUp_ ? std::min(timeout < 0 ? kHangUpRetryMs : timeout, kHangUpRetryMs) : timeout);
        if (count < 0 && errno != EINTR) {
            return;  // nothing left to wait on; the destructor still joins
        }
        char drain[64];
        while (ready[1].revents && ::read(wakeRead_, drain, sizeof drain) > 0) {
        }
        hungUp_ = false;  // looked at again below
        if (ready[0].revents & (POLLIN | POLLHUP | POLLERR)) {
            readLine();
        }
        now = Clock::now();
        sendCodeIfDue(now);
        flush(now);
    }
}

int SimulatedDevice::pollTimeoutMs(Clock::time_point now) const {
    int timeout = -1;
    auto earliest = [&](Clock::time_point when) {
        int ms = millisecondsUntil(when, now);
        timeout = timeout < 0 ? ms : std::min(timeout, ms);
    };
    if (!options_.codes.empty() && options_.interval.count() > 0 && !silent_) {
        earliest(codeDue_);
    }
    bool pending = false;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        pending = !outbox_.empty();
    }
    if (pending && writing_.empty()) {
        earliest(quietUntil_);
    }
    return timeout;
}

void SimulatedDevice::readLine() {
    char buffer[4096];
    for (;;) {
        ssize_t got = ::read(fd_, buffer, sizeof buffer);
        if (got > 0) {
            takeBytes(std::string(buffer, static_cast<std::size_t>(got)));
            continue;
        }
        if (got < 0 && errno == EINTR) {
            continue;
        }
        // EAGAIN: all read. End of file or EIO: the other end is gone.
        hungUp_ = got == 0 || (errno != EAGAIN && errno != EWOULDBLOCK);
        return;
    }
}

void SimulatedDevice::takeBytes(const std::string& chunk) {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        bytes_ += chunk;
    }
    changed_.notify_all();
    inbox_ += chunk;
    const std::string& prefix = options_.receivePrefix;
    const std::string& suffix = options_.receiveSuffix;
    for (;;) {
        std::size_t start = 0;
        if (!prefix.empty()) {
            std::size_t found = inbox_.find(prefix);
            if (found == std::string::npos) {
                // Keep what may be the start of a prefix cut by the read.
                inbox_.erase(0, inbox_.size() - std::min(inbox_.size(), prefix.size() - 1));
                return;
            }
            start = found + prefix.size();
        }
        std::size_t end = suffix.empty() ? inbox_.size() : inbox_.find(suffix, start);
        if (end == std::string::npos) {
            return;
        }
        std::string token = inbox_.substr(start, end - start);
        inbox_.erase(0, suffix.empty() ? inbox_.size() : end + suffix.size());
        {
            std::lock_guard<std::mutex> lock(mutex_);
            tokens_.push_back(token);
        }
        changed_.notify_all();
        answer(token);
        if (suffix.empty()) {
            return;
        }
    }
}

void SimulatedDevice::answer(const std::string& token) {
    const std::string& prefix = options_.sendPrefix;
    const std::string& suffix = options_.sendSuffix;
    if (token == "!talk") {
        silent_ = false;
    } else if (silent_) {
        return;
    }
    if (!options_.answer) {
        return;
    }
    if (token == "!silent") {
        silent_ = true;
    } else if (token == "!garbage") {
        std::string noise;
        std::copy_if(kNoise.begin(), kNoise.end(), std::back_inserter(noise), [&](char c) {
            return prefix.find(c) == std::string::npos && suffix.find(c) == std::string::npos;
        });
        queue({noise, true});
    } else if (token == "!unterminated") {
        queue({prefix + "UNTERMINATED", true});
    } else if (token == "!overlong") {
        queue({prefix + std::string(1200, 'X') + suffix, true});
    } else {
        std::string reply = "ACK " + token;
        queue({prefix + reply + suffix, false});
    }
}

void SimulatedDevice::sendCodeIfDue(Clock::time_point now) {
    if (options_.codes.empty() || options_.interval.count() <= 0 || silent_ || now < codeDue_) {
        return;
    }
    const std::string& code = options_.codes[nextCode_++ % options_.codes.size()];
    queue({options_.sendPrefix + code + options_.sendSuffix, false});
    codeDue_ = std::max(codeDue_ + options_.interval, now);
}

void SimulatedDevice::flush(Clock::time_point now) {
    for (;;) {
        if (writing_.empty()) {
            if (now < quietUntil_) {
                return;
            }
            Outgoing next;
            {
                std::lock_guard<std::mutex> lock(mutex_);
                if (outbox_.empty()) {
                    return;
                }
                next = std::move(outbox_.front());
                outbox_.pop_front();
            }
            writing_ = next.bytes;
            if (next.faulty) {
                quietUntil_ = now + options_.settle;
            }
        }
        ssize_t put = ::write(fd_, writing_.data(), writing_.size());
        if (put > 0) {
            writing_.erase(0, static_cast<std::size_t>(put));
        } else if (put < 0 && errno == EINTR) {
            continue;
        } else if (put < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) {
            return;  // the loop waits for POLLOUT
        } else {
            writing_.clear();  // the line is gone: what was on it is lost, as on a cable
            return;
        }
    }
}

}  // namespace xtok::tools
