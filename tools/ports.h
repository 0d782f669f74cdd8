// "xtok-host ports": the serial ports this machine has.
#pragma once

#include <iosfwd>

namespace xtok::tools {

/// The exit status.
int runPorts(std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
