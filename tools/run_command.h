// "xtok-host run": the plug-in on a real line, driven from a console; and
// "xtok-host monitor": the same line shown as it happens.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "tools/line_options.h"

namespace xtok::tools {

struct RunOptions {
    LineOptions line;
    std::string exec;  // "cmd; cmd": run takes them instead of standard input
    bool json = false;
    bool resetRetained = false;
    bool reconnect = false;  // reopen a lost device
    std::string logPath;     // the monitor's lines go here too
    long count = 0;          // monitor: stop after this many tokens (0: Ctrl-C)
};

/// Starts `session` unless there are `faults` (lineFaults'), then runs the
/// console, or with `monitor` the line monitor from the port's opening
/// until Ctrl-C or `options.count` tokens (--exec's commands first). Exit
/// status: 0 when every command succeeded, 1 when one failed or the session
/// could not start, 2 for faults in the arguments.
int runSession(const RunOptions& options, bool monitor, SessionOptions session,
               const PluginDescription& description, std::vector<std::string> faults,
               std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
