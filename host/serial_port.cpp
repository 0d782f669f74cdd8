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

using Clock = std::chrono::steady_clock;

// A write that makes no progress for this long has a stuck line (flow
// control held off, nobody draining a pseudo-terminal); give up instead of
// hanging the writer.
constexpr int kWriteStallMs = 2000;

int remainingMs(Clock::time_point deadline) {
    auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
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

}  // namespace

SerialPort::SerialPort(std::string device, SerialFactory& factory, sp_port* port, int fd)
    : device_(std::move(device)), factory_(factory), port_(port), fd_(fd) {}

// At once, not after the output drains: a line held off by flow control must
// not hang the close.
SerialPort::~SerialPort() {
    if (restore_) {
        restoreTerminal(fd_, original_);
    }
    if (port_) {
        sp_close(port_);
        sp_free_port(port_);
    } else {
        ::close(fd_);
    }
}

// The device's settings are read on a descriptor of its own before
// libserialport opens it, since libserialport sets it raw as it opens. It
// refuses devices it cannot find in sysfs, pseudo-terminals among them, and
// those keep the direct descriptor.
std::unique_ptr<SerialPort> SerialPort::open(const std::string& device, SerialFactory& factory,
                                             std::string& error) {
    int fd = openDirectly(device, error);
    if (fd < 0) {
        return nullptr;
    }
    termios original{};
    const bool known = tcgetattr(fd, &original) == 0;
    sp_port* port = nullptr;
    int shared = -1;
    if (openWithLibserialport(device, port, shared)) {
        ::close(fd);
        fd = shared;
    }
    // Adopted at once so that every failure below closes what was opened,
    // and puts back what libserialport changed.
    std::unique_ptr<SerialPort> opened(new SerialPort(device, factory, port, fd));
    opened->original_ = original;
    opened->restore_ = known && port;
    // Two programs on one line garble each other's frames; the advisory lock
    // is what terminal programs check, and it says "busy" where the kernel
    // would let the second open pass.
    if (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
        error = errno == EWOULDBLOCK ? "in use by another program" : std::strerror(errno);
        return nullptr;
    }
    int flags = fcntl(fd, F_GETFL);
    if (flags < 0 || fcntl(fd, F_SETFL, flags | O_NONBLOCK) != 0) {
        error = std::strerror(errno);
        return nullptr;
    }
    opened->restore_ = known;
    error = makeRaw(fd);
    return error.empty() ? std::move(opened) : nullptr;
}

bool SerialPort::Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop, int32_t mode) {
    LineSettings settings{baud, parity, bits, stop, mode};
    std::string why = checkSettings(settings);
    if (why.empty()) {
        why = port_ ? applyWithLibserialport(port_, settings) : applyWithTermios(fd_, settings);
    }
    if (!why.empty()) {
        factory_.refused(device_ + ": " + why);
        return false;
    }
    why = applyLineMode(fd_, mode);
    if (!why.empty()) {
        // Many adapters switch direction by themselves, so the line may work
        // all the same; say it once per device, not at every reconnection.
        factory_.noticeOnce(device_, device_ + ": " + why + "; using it as it is");
    }
    return true;
}

// Called once per received byte: a copy out of the buffer, with the reading
// and waiting out of line.
bool SerialPort::ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t) {
    if (destination && !buffer_.empty()) {
        *destination = buffer_.take();
        return true;
    }
    return readWaiting(destination, timeoutMs);
}

bool SerialPort::readWaiting(uint8_t* destination, int32_t timeoutMs) {
    if (!destination || !refill(std::max(timeoutMs, 0))) {
        return false;
    }
    *destination = buffer_.take();
    return true;
}

bool SerialPort::refill(int32_t timeoutMs) {
    Clock::time_point deadline = Clock::now() + std::chrono::milliseconds(timeoutMs);
    for (;;) {
        pollfd ready{fd_, POLLIN, 0};
        int count = ::poll(&ready, 1, remainingMs(deadline));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count == 0) {
            return false;
        }
        if (count > 0 && (ready.revents & POLLIN)) {
            ssize_t got = ::read(fd_, buffer_.space(), ReadBuffer::kCapacity);
            if (got > 0) {
                buffer_.filled(static_cast<std::size_t>(got));
                return true;
            }
            if (got < 0 && (errno == EAGAIN || errno == EINTR)) {
                continue;
            }
        }
        // Hung up or failed: the device answers at once from now on, and a
        // receive loop would spin on it. It gets the silent line it would see
        // with the cable pulled: the time-out passes, then false.
        std::this_thread::sleep_until(deadline);
        return false;
    }
}

bool SerialPort::Write(const uint8_t* data, int32_t length, int32_t) {
    if (length < 0 || (!data && length > 0)) {
        return false;
    }
    std::size_t done = 0;
    std::size_t total = static_cast<std::size_t>(length);
    while (done < total) {
        ssize_t put = ::write(fd_, data + done, total - done);
        if (put > 0) {
            done += static_cast<std::size_t>(put);
        } else if (!(put < 0 && (errno == EINTR || (errno == EAGAIN && waitWritable())))) {
            return false;
        }
    }
    return true;
}

bool SerialPort::waitWritable() {
    for (;;) {
        pollfd ready{fd_, POLLOUT, 0};
        int count = ::poll(&ready, 1, kWriteStallMs);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        return count > 0 && (ready.revents & POLLOUT);
    }
}

}  // namespace xtok::host
