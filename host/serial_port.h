// One open serial device behind ISerialPort.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "xtokline/host.h"

struct sp_port;

namespace xtok::host {

class SerialFactory;

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
    bool refill(int32_t timeoutMs);
    bool waitWritable();

    std::string device_;
    SerialFactory& factory_;
    // Null when libserialport does not know the device (pseudo-terminals,
    // devices outside sysfs); fd_ is then ours to close.
    sp_port* port_;
    int fd_;
    // Bytes of the last read not handed out yet: one read serves a whole
    // burst, then ReadByte is a copy.
    std::array<uint8_t, 4096> buffer_{};
    std::size_t next_ = 0;
    std::size_t end_ = 0;
};

}  // namespace xtok::host
