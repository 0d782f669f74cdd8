#include "host/serial_factory.h"

#include "host/serial_port.h"

namespace xtok::host {

SerialFactory::SerialFactory(ComMap ports, Notice notice)
    : HostService("ISerialFactory"), ports_(std::move(ports)), notice_(std::move(notice)) {}

ISerialPort* SerialFactory::Open(const char* name) {
    std::string error;
    std::string device;
    if (!name || !ports_.resolve(name, device, error)) {
        notice_(name ? error : "a port was asked for without a name");
        return nullptr;
    }
    std::unique_ptr<SerialPort> port = SerialPort::open(device, *this, error);
    if (!port) {
        std::string which = device == name ? device : std::string(name) + " (" + device + ")";
        notice_("cannot open " + which + ": " + error);
        return nullptr;
    }
    return port.release();
}

void SerialFactory::Close(ISerialPort* port) {
    delete static_cast<SerialPort*>(port);
}

void SerialFactory::noticeOnce(const std::string& key, const std::string& text) {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        if (!noticed_.insert(key).second) {
            return;
        }
    }
    notice_(text);
}

}  // namespace xtok::host
