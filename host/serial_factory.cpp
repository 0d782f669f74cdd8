#include "host/serial_factory.h"

#include "host/serial_port.h"

namespace xtok::host {

SerialFactory::SerialFactory(ComMap ports, Notice notice, bool reconnect)
    : HostService("ISerialFactory"),
      ports_(std::move(ports)),
      notice_(std::move(notice)),
      reconnect_(reconnect) {}

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
    {
        std::lock_guard<std::mutex> lock(mutex_);
        port->listen(tap());
        open_.insert(port.get());
    }
    link(LinkChange::Opened, device);
    return port.release();
}

void SerialFactory::Close(ISerialPort* port) {
    auto* serial = static_cast<SerialPort*>(port);
    if (serial) {
        link(LinkChange::Closed, serial->device());
        std::lock_guard<std::mutex> lock(mutex_);
        open_.erase(serial);
    }
    delete serial;
}

void SerialFactory::attach(LineTap* tap) {
    std::lock_guard<std::mutex> lock(mutex_);
    tap_.store(tap, std::memory_order_release);
    for (SerialPort* port : open_) {
        port->listen(tap);
    }
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

void SerialFactory::link(LinkChange change, const std::string& device, const std::string& settings,
                         const std::string& reason) {
    LinkEvent event{change, device, settings, reason, WallClock::now()};
    if (change != LinkChange::Applied && change != LinkChange::Refused) {
        std::lock_guard<std::mutex> lock(mutex_);
        states_[device] = event;
    }
    if (LineTap* listener = tap()) {
        listener->link(event);
    }
}

std::vector<LinkEvent> SerialFactory::lineStates() const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<LinkEvent> states;
    for (const auto& entry : states_) {
        states.push_back(entry.second);
    }
    return states;
}

}  // namespace xtok::host
