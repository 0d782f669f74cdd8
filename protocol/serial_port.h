// The protocol's serial port over the host's ISerialFactory, and the codes in
// which it holds parity and mode.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>

#include "xtokline/constants.h"
#include "xtokline/host.h"

namespace xtok {

/// Names for reports; unknown codes print as "none" and "RS-232".
const char* parityName(int32_t code);
const char* modeName(int32_t code);
/// Only the names a configuration may use: none, even, odd, mark; and
/// RS-232, RS-485, RS-422. False for anything else.
bool parityFromName(const std::string& name, int32_t& code);
bool modeFromName(const std::string& name, int32_t& code);

/// "port,baud,parity,bits,stop,mode", e.g. "com1,9600,even,8,1,RS-232".
std::string settingsText(const std::string& port, const LineSettings& line);

class SerialPort {
public:
    explicit SerialPort(ISerialFactory* factory) : factory_(factory) {}
    ~SerialPort() { Close(); }
    SerialPort(const SerialPort&) = delete;
    SerialPort& operator=(const SerialPort&) = delete;

    // Open, Close, Reconfigure and Write run with queueLock held (Open and
    // Close with portLock too), or before the receive task starts; ReadByte
    // with portLock held. So no call finds the port freed under it.

    /// Opens and configures; a port whose settings the host refuses is
    /// closed again and the open fails.
    bool Open(const std::string& name, const LineSettings& line);
    void Close();
    bool IsOpen() const { return handle_.load() != nullptr; }
    /// Applies new settings to the open port; false when closed or refused.
    bool Reconfigure(const LineSettings& line);

    /// One byte with a time-out.
    bool ReadByte(uint8_t* destination, int32_t timeoutMs) {
        ISerialPort* port = handle_.load(std::memory_order_acquire);
        return port && port->ReadByte(destination, timeoutMs, 0);
    }
    /// Sends a frame; false when closed or the write failed.
    bool Write(const std::string& frame);

private:
    ISerialFactory* factory_;
    // Atomic because IsOpen is asked without a lock.
    std::atomic<ISerialPort*> handle_{nullptr};
};

}  // namespace xtok
