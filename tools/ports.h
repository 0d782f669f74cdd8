// "xtok-host ports": the serial ports this machine has.
#pragma once

#include <iosfwd>

namespace xtok::tools {

/// The exit status. With `json`, one result: {"ok":true,"ports":[{"name":
/// "/dev/ttyUSB0","transport":"usb 0403:6001","description":"..."},...]}.
int runPorts(bool json, std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
