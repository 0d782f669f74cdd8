// "xtok-host run": the plug-in on a real line, driven from a console.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "tools/line_options.h"

namespace xtok::tools {

struct RunOptions {
    LineOptions line;
    std::string exec;  // "cmd; cmd" instead of standard input
    bool json = false;
    bool resetRetained = false;
};

/// Starts `session` unless there are `faults` (lineFaults'), then runs the
/// console. Exit status: 0 when every command succeeded, 1 when one failed
/// or the session could not start, 2 for faults in the arguments.
int runConsole(const RunOptions& options, const SessionOptions& session,
               const PluginDescription& description, const std::vector<std::string>& faults,
               std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
