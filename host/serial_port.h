// One open serial device behind ISerialPort.
#pragma once

#include <termios.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>

#include "host/line_tap.h"
#include "xtokline/constants.h"
#include "xtokline/host.h"

struct sp_port;

namespace xtok::host {

class SerialFactory;

/// Bytes of the last read(2) not handed out yet: one read serves a whole
/// burst, and each ReadByte after it is a copy out of memory.
class ReadBuffer {
public:
    static constexpr std::size_t kCapacity = 4096;

    bool empty() const { return next_ == end_; }
    /// The next byte; only when not empty().
    uint8_t take() { return bytes_[next_++]; }
    /// Where a read puts new bytes, then filled() with how many it put.
    uint8_t* space() { return bytes_.data(); }
    void filled(std::size_t count) {
        next_ = 0;
        end_ = count;
    }

private:
    std::size_t next_ = 0;
    std::size_t end_ = 0;
    std::array<uint8_t, kCapacity> bytes_{};
};

/// With reconnection on (SerialFactory), a port whose device hung up or
/// failed closes it and opens the same path again every half second from
/// within its reads, until the device is back; the plug-in keeps this object
/// throughout and only sees a silent line meanwhile.
class SerialPort final : public ISerialPort {
public:
    /// Opens `device` for raw transfer. Null with `error` set when it cannot.
    static std::unique_ptr<SerialPort> open(const std::string& device, SerialFactory& factory,
                                            std::string& error);
    ~SerialPort();
    SerialPort(const SerialPort&) = delete;
    SerialPort& operator=(const SerialPort&) = delete;

    // Freed by ISerialFactory::Close only.
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    int32_t Reserved2() override { return 0; }
    int32_t Reserved3() override { return 0; }
    bool Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop, int32_t mode) override;
    int32_t Reserved5() override { return 0; }
    bool ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t flags) override;
    bool Write(const uint8_t* data, int32_t length, int32_t flags) override;

    const std::string& device() const { return device_; }
    /// Tells `tap` what it hears from now on (SerialFactory::attach).
    void listen(LineTap* tap) { tap_.store(tap, std::memory_order_release); }

private:
    using Clock = std::chrono::steady_clock;
    /// An open device file: libserialport's handle where it knows the
    /// device (null for pseudo-terminals and devices outside sysfs, whose
    /// fd is then ours to close). fd -1 when closed.
    struct Device {
        sp_port* port = nullptr;
        int fd = -1;
        // What the device was set to before it was opened here, put back at
        // the close once changed: a terminal used as a port is a terminal
        // again afterwards, as terminal programs leave it.
        termios original{};
        bool restore = false;
    };
    static bool openDevice(const std::string& path, Device& device, std::string& error);
    static void closeDevice(Device& device);

    SerialPort(std::string device, SerialFactory& factory, Device open);
    /// "" when `settings` are applied to the open device, else why not.
    std::string apply(const LineSettings& settings);
    [[gnu::noinline]] bool readWaiting(uint8_t* destination, int32_t timeoutMs);
    bool refill(int32_t timeoutMs);
    void arrived(std::size_t count);
    void lose(const std::string& why);
    bool reopenBefore(Clock::time_point deadline);
    bool reopen();
    std::size_t writeAll(const uint8_t* data, std::size_t total);
    bool waitWritable();

    std::string device_;
    SerialFactory& factory_;
    std::atomic<LineTap*> tap_{nullptr};
    // Writers and Configure come from the runtime's threads while the reader
    // may swap the device for a reopened one.
    std::mutex deviceMutex_;
    Device open_;
    LineSettings settings_{};  // the last applied, for a reopened device
    bool configured_ = false;
    // The reader's own.
    ReadBuffer buffer_;
    bool lost_ = false;
    Clock::time_point nextAttempt_{};
};

}  // namespace xtok::host
