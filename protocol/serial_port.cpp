#include "protocol/serial_port.h"

namespace xtok {

const char* parityName(int32_t code) {
    return code >= 0 && code < kParityCount ? kParityNames[code] : "none";
}

const char* modeName(int32_t code) {
    return code >= 0 && code < kModeCount ? kModeNames[code] : "RS-232";
}

namespace {

// The code of `name` among the first `count` names.
bool codeOf(const std::string& name, const char* const* names, int32_t count, int32_t& code) {
    for (int32_t i = 0; i < count; ++i) {
        if (name == names[i]) {
            code = i;
            return true;
        }
    }
    return false;
}

}  // namespace

// "space" and "RS-485P" exist only on the reporting side.
bool parityFromName(const std::string& name, int32_t& code) {
    return codeOf(name, kParityNames, 4, code);
}

bool modeFromName(const std::string& name, int32_t& code) {
    return codeOf(name, kModeNames, 3, code);
}

std::string settingsText(const std::string& port, const LineSettings& line) {
    return port + "," + std::to_string(line.baud) + "," + parityName(line.parity) + "," +
           std::to_string(line.bits) + "," + std::to_string(line.stop) + "," + modeName(line.mode);
}

bool SerialPort::Open(const std::string& name, const LineSettings& line) {
    if (!factory_ || IsOpen()) {
        return IsOpen();
    }
    ISerialPort* port = factory_->Open(name.c_str());
    if (!port) {
        return false;
    }
    if (!port->Configure(line.baud, line.parity, line.bits, line.stop, line.mode)) {
        factory_->Close(port);
        return false;
    }
    handle_.store(port, std::memory_order_release);
    return true;
}

void SerialPort::Close() {
    if (ISerialPort* port = handle_.exchange(nullptr)) {
        factory_->Close(port);
    }
}

bool SerialPort::Reconfigure(const LineSettings& line) {
    ISerialPort* port = handle_.load();
    return port && port->Configure(line.baud, line.parity, line.bits, line.stop, line.mode);
}

bool SerialPort::Write(const std::string& frame) {
    ISerialPort* port = handle_.load();
    return port && port->Write(reinterpret_cast<const uint8_t*>(frame.data()),
                               static_cast<int32_t>(frame.size()), 0);
}

}  // namespace xtok
