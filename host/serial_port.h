// One open serial device behind ISerialPort.
#pragma once

#include <termios.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

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

private:
    SerialPort(std::string device, SerialFactory& factory, sp_port* port, int fd);
    [[gnu::noinline]] bool readWaiting(uint8_t* destination, int32_t timeoutMs);
    bool refill(int32_t timeoutMs);
    bool waitWritable();

    std::string device_;
    SerialFactory& factory_;
    // Null when libserialport does not know the device (pseudo-terminals,
    // devices outside sysfs); fd_ is then ours to close.
    sp_port* port_;
    int fd_;
    // What the device was set to before it was opened here, put back at the
    // close once changed: a terminal used as a port is a terminal again
    // afterwards, as terminal programs leave it.
    termios original_{};
    bool restore_ = false;
    ReadBuffer buffer_;
};

}  // namespace xtok::host
