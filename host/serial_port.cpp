#include "host/serial_port.h"

#include <fcntl.h>
#include <libserialport.h>
#include <poll.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>

#include "host/serial_factory.h"
#include "host/serial_line.h"

namespace xtok::host {

namespace {

// A write that makes no progress for this long has a stuck line (flow
// control held off, nobody draining a pseudo-terminal); give up instead of
// hanging the writer.
constexpr int kWriteStallMs = 2000;
// How often a lost device is tried again: an adapter plugged back in is
// found within about this long, and a missing one costs one open(2) each time.
constexpr std::chrono::milliseconds kReopenInterval{500};

int remainingMs(std::chrono::steady_clock::time_point deadline) {
    auto left =
        std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now())
            .count();
    return static_cast<int>(std::max<decltype(left)>(left, 0));
}

bool openWithLibserialport(const std::string& device, sp_port*& port, int& fd) {
    if (sp_get_port_by_name(device.c_str(), &port) != SP_OK) {
        port = nullptr;
        return false;
    }
    if (sp_open(port, SP_MODE_READ_WRITE) != SP_OK || sp_get_port_handle(port, &fd) != SP_OK) {
        sp_close(port);
        sp_free_port(port);
        port = nullptr;
        return false;
    }
    return true;
}

int openDirectly(const std::string& device, std::string& error) {
    int fd = ::open(device.c_str(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) {
        error = std::strerror(errno);
    }
    return fd;
}

/// Why a read found the line gone, from what poll(2) and read(2) answered;
/// readable with nothing to read is the end of the device's data.
std::string failure(int polled, short events, ssize_t got) {
    if (polled < 0 || got < 0) {
        return std::string(polled < 0 ? "poll" : "read") + " error: " + std::strerror(errno);
    }
    return events & (POLLHUP | POLLIN) ? "hang-up" : "line error";
}

}  // namespace

SerialPort::SerialPort(std::string device, SerialFactory& factory, Device open)
    : device_(std::move(device)), factory_(factory), open_(open) {}

// At once, not after the output drains: a line held off by flow control must
// not hang the close.
SerialPort::~SerialPort() {
    closeDevice(open_);
}

// The device's settings are read on a descriptor of its own before
// libserialport opens it, since libserialport sets it raw as it opens. It
// refuses devices it cannot find in sysfs, pseudo-terminals among them, and
// those keep the direct descriptor.
bool SerialPort::openDevice(const std::string& path, Device& device, std::string& error) {
    device = Device{};
    device.fd = openDirectly(path, error);
    if (device.fd < 0) {
        return false;
    }
    const bool known = tcgetattr(device.fd, &device.original) == 0;
    int shared = -1;
    if (openWithLibserialport(path, device.port, shared)) {
        ::close(device.fd);
        device.fd = shared;
    }
    // Put back what libserialport changed, whatever fails below.
    device.restore = known && device.port;
    // Two programs on one line garble each other's frames; the advisory lock
    // is what terminal programs check, and it says "busy" where the kernel
    // would let the second open pass.
    int flags = -1;
    if (::flock(device.fd, LOCK_EX | LOCK_NB) != 0) {
        error = errno == EWOULDBLOCK ? "in use by another program" : std::strerror(errno);
    } else if ((flags = fcntl(device.fd, F_GETFL)) < 0 ||
               fcntl(device.fd, F_SETFL, flags | O_NONBLOCK) != 0) {
        error = std::strerror(errno);
    } else {
        device.restore = known;  // ours now: what it was is put back at the close
        error = makeRaw(device.fd);
    }
    if (!error.empty()) {
        closeDevice(device);
    }
    return error.empty();
}

void SerialPort::closeDevice(Device& device) {
    if (device.restore) {
        restoreTerminal(device.fd, device.original);
    }
    if (device.port) {
        sp_close(device.port);
        sp_free_port(device.port);
    } else if (device.fd >= 0) {
        ::close(device.fd);
    }
    device = Device{};
}

std::unique_ptr<SerialPort> SerialPort::open(const std::string& device, SerialFactory& factory,
                                             std::string& error) {
    Device opened;
    if (!openDevice(device, opened, error)) {
        return nullptr;
    }
    return std::unique_ptr<SerialPort>(new SerialPort(device, factory, opened));
}

bool SerialPort::Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop, int32_t mode) {
    LineSettings settings{baud, parity, bits, stop, mode};
    std::string why = checkSettings(settings);
    if (why.empty()) {
        std::lock_guard<std::mutex> lock(deviceMutex_);
        // A device closed while lost takes the settings when it is back.
        why = open_.fd >= 0 ? apply(settings) : "";
        settings_ = why.empty() ? settings : settings_;
        configured_ = configured_ || why.empty();
    }
    if (!why.empty()) {
        factory_.refused(device_ + ": " + why);
        factory_.link(LinkChange::Refused, device_, describeLine(settings), why);
        return false;
    }
    factory_.link(LinkChange::Applied, device_, describeLine(settings));
    return true;
}

std::string SerialPort::apply(const LineSettings& settings) {
    std::string why = open_.port ? applyWithLibserialport(open_.port, settings)
                                 : applyWithTermios(open_.fd, settings);
    std::string mode = why.empty() ? applyLineMode(open_.fd, settings.mode) : "";
    if (!mode.empty()) {
        // Many adapters switch direction by themselves, so the line may work
        // all the same; say it once per device, not at every reconnection.
        factory_.noticeOnce(device_, device_ + ": " + mode + "; using it as it is");
    }
    return why;
}

// Called once per received byte: a copy out of the buffer, with the reading,
// the waiting and a monitor's tap out of line.
bool SerialPort::ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t) {
    // Relaxed: only whether a tap listens; the slow path takes it properly.
    if (destination && !buffer_.empty() && !tap_.load(std::memory_order_relaxed)) {
        *destination = buffer_.take();
        return true;
    }
    return readWaiting(destination, timeoutMs);
}

bool SerialPort::readWaiting(uint8_t* destination, int32_t timeoutMs) {
    if (!destination) {
        return false;
    }
    if (buffer_.empty() && !refill(std::max(timeoutMs, 0))) {
        if (LineTap* tap = tap_.load(std::memory_order_acquire)) {
            tap->timedOut(timeoutMs);
        }
        return false;
    }
    *destination = buffer_.take();
    if (LineTap* tap = tap_.load(std::memory_order_acquire)) {
        tap->delivered(*destination);
    }
    return true;
}

bool SerialPort::refill(int32_t timeoutMs) {
    const Clock::time_point deadline = Clock::now() + std::chrono::milliseconds(timeoutMs);
    for (;;) {
        if (lost_ && factory_.reconnects() && !reopenBefore(deadline)) {
            return false;
        }
        pollfd ready{open_.fd, POLLIN, 0};
        int count = ::poll(&ready, 1, remainingMs(deadline));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count == 0) {
            return false;
        }
        ssize_t got = 0;
        if (count > 0 && (ready.revents & POLLIN)) {
            got = ::read(open_.fd, buffer_.space(), ReadBuffer::kCapacity);
            if (got > 0) {
                arrived(static_cast<std::size_t>(got));
                return true;
            }
            if (got < 0 && (errno == EAGAIN || errno == EINTR)) {
                continue;
            }
        }
        if (!lost_) {
            lose(failure(count, ready.revents, got));
        }
        if (!factory_.reconnects()) {
            // The device answers at once from now on, and a receive loop
            // would spin on it. It gets the silent line it would see with
            // the cable pulled: the time-out passes, then false.
            std::this_thread::sleep_until(deadline);
            return false;
        }
    }
}

void SerialPort::arrived(std::size_t count) {
    buffer_.filled(count);
    if (LineTap* tap = tap_.load(std::memory_order_acquire)) {
        tap->received(buffer_.space(), count, WallClock::now());
    }
}

void SerialPort::lose(const std::string& why) {
    lost_ = true;
    nextAttempt_ = Clock::now() + kReopenInterval;
    if (factory_.reconnects()) {
        // Closed at once: an adapter plugged in again gets its old name back
        // only once nobody holds the old device.
        std::lock_guard<std::mutex> lock(deviceMutex_);
        closeDevice(open_);
    }
    factory_.link(LinkChange::Lost, device_, "", why);
}

// The silence of a pulled cable until `deadline`, with the device tried
// again whenever an attempt is due; true once it is back.
bool SerialPort::reopenBefore(Clock::time_point deadline) {
    for (;;) {
        std::this_thread::sleep_until(std::min(deadline, nextAttempt_));
        if (Clock::now() < nextAttempt_) {
            return false;
        }
        if (reopen()) {
            return true;
        }
        nextAttempt_ = Clock::now() + kReopenInterval;
    }
}

bool SerialPort::reopen() {
    Device fresh;
    std::string why;
    if (!openDevice(device_, fresh, why)) {
        return false;
    }
    std::string settings;
    {
        std::lock_guard<std::mutex> lock(deviceMutex_);
        open_ = fresh;
        why = configured_ ? apply(settings_) : "";
        if (!why.empty()) {
            closeDevice(open_);
            return false;
        }
        settings = configured_ ? describeLine(settings_) : "";
    }
    lost_ = false;
    factory_.link(LinkChange::Reconnected, device_, settings);
    return true;
}

bool SerialPort::Write(const uint8_t* data, int32_t length, int32_t) {
    if (length < 0 || (!data && length > 0)) {
        return false;
    }
    const WallClock::time_point at = WallClock::now();
    const std::size_t total = static_cast<std::size_t>(length);
    std::size_t done = 0;
    {
        std::lock_guard<std::mutex> lock(deviceMutex_);
        done = writeAll(data, total);
    }
    if (LineTap* tap = tap_.load(std::memory_order_acquire)) {
        tap->sent(data, done, total, at);
    }
    return done == total;
}

std::size_t SerialPort::writeAll(const uint8_t* data, std::size_t total) {
    std::size_t done = 0;
    while (done < total) {
        ssize_t put = ::write(open_.fd, data + done, total - done);
        if (put > 0) {
            done += static_cast<std::size_t>(put);
        } else if (!(put < 0 && (errno == EINTR || (errno == EAGAIN && waitWritable())))) {
            break;
        }
    }
    return done;
}

bool SerialPort::waitWritable() {
    for (;;) {
        pollfd ready{open_.fd, POLLOUT, 0};
        int count = ::poll(&ready, 1, kWriteStallMs);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        return count > 0 && (ready.revents & POLLOUT);
    }
}

}  // namespace xtok::host
