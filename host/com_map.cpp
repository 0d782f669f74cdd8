#include "host/com_map.h"

#include <strings.h>

#include <cctype>

namespace xtok::host {

namespace {

/// N of "comN" (any case, N from 1 to 16), or 0.
int portNumber(const std::string& name) {
    if (name.size() < 4 || name.size() > 5 || strncasecmp(name.c_str(), "com", 3) != 0) {
        return 0;
    }
    int number = 0;
    for (std::size_t i = 3; i < name.size(); ++i) {
        if (!std::isdigit(static_cast<unsigned char>(name[i]))) {
            return 0;
        }
        number = number * 10 + (name[i] - '0');
    }
    bool leadingZero = name[3] == '0';
    return !leadingZero && number <= ComMap::kPortCount ? number : 0;
}

}  // namespace

bool ComMap::assign(const std::string& assignment, std::string& error) {
    std::size_t equals = assignment.find('=');
    std::string name = assignment.substr(0, equals);
    int number = portNumber(name);
    if (equals == std::string::npos || number == 0) {
        error = "port assignment '" + assignment + "' must read comN=DEVICE with N from 1 to 16";
        return false;
    }
    std::string device = assignment.substr(equals + 1);
    if (device.empty()) {
        error = "port assignment '" + assignment + "' names no device";
        return false;
    }
    assigned_[number] = device;
    return true;
}

bool ComMap::resolve(const std::string& name, std::string& device, std::string& error) const {
    if (name.find('/') != std::string::npos) {
        device = name;
        return true;
    }
    int number = portNumber(name);
    if (number == 0) {
        error = "unknown port name '" + name + "': use com1 ... com16 or a device path";
        return false;
    }
    auto it = assigned_.find(number);
    device = it != assigned_.end() ? it->second : "/dev/ttyS" + std::to_string(number - 1);
    return true;
}

}  // namespace xtok::host
