// "xtok-host run": the plug-in on a real line, driven from a console; and
// "xtok-host monitor": the same line shown as it happens.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

namespace xtok::tools {

struct RunOptions {
    std::string config;             // the text, or "@" and a file holding it
    std::vector<std::string> maps;  // "com1=/dev/ttyUSB0"
    std::string statePath;
    std::string pluginPath;
    std::string instanceName;
    std::string exec;  // "cmd; cmd" instead of standard input
    bool json = false;
    bool reconnect = false;  // reopen a lost device
    std::string logPath;     // the monitor's lines go here too
};

/// Exit status: 0 when every command succeeded, 1 when one failed or the
/// session could not start, 2 for unusable arguments.
int runConsole(const RunOptions& options, std::ostream& out, std::ostream& err);

/// The line monitor from the port's opening until Ctrl-C or `count` tokens
/// (0: no count); --exec's commands run first. Exit status as runConsole's.
int runMonitor(const RunOptions& options, long count, std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
