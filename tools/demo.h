// "xtok-host demo": the plug-in at work without any hardware. A simulated
// reader on one end of a pseudo-terminal sends codes now and then; the
// plug-in on the other end receives them, and the demo answers each one as
// a panel project would, showing both directions as they happen.
#pragma once

#include <iosfwd>
#include <string>

namespace xtok::tools {

struct DemoOptions {
    std::string pluginPath;
    long count = 0;        // codes to receive before stopping; 0 until Ctrl-C
    int intervalMs = 700;  // between the reader's codes
    bool monitor = false;  // the line monitor's lines among the demo's
};

/// The exit status.
int runDemo(const DemoOptions& options, std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
