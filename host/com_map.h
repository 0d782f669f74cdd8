// Which device file a runtime's port name ("com1" ... "com16") stands for.
#pragma once

#include <map>
#include <string>

namespace xtok::host {

class ComMap {
public:
    static constexpr int kPortCount = 16;

    /// Takes an assignment "comN=/dev/path" (N from 1 to 16). False with
    /// `error` set when it is malformed; then nothing changes.
    bool assign(const std::string& assignment, std::string& error);

    /// The device for a port name: an assigned "comN", else /dev/ttyS(N-1);
    /// a name with a "/" is a device path already. False with `error` set for
    /// any other name.
    bool resolve(const std::string& name, std::string& device, std::string& error) const;

private:
    std::map<int, std::string> assigned_;
};

}  // namespace xtok::host
