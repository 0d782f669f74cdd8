// The options of a command that opens a line: the device, the configuration
// text, one option per configuration key, the port map, the state file and
// the plug-in. The key options are made from the plug-in's description and
// the settings table, so they name what the plug-in reads.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "tools/plugin_description.h"
#include "tools/plugin_session.h"

namespace CLI {
class App;
}

namespace xtok::tools {

struct LineOptions {
    std::string device;
    std::string config;                       // the text, or "@" and a file holding it
    std::map<std::string, std::string> keys;  // configuration key: its option's value
    std::vector<std::string> maps;            // "com1=/dev/ttyUSB0"
    std::string statePath;
    std::string pluginPath;
    std::string instanceName;
};

/// Adds the options to `command`, which then takes unknown ones as extras
/// for lineFaults to report.
void addLineOptions(CLI::App& command, LineOptions& options, const PluginDescription& description);

/// The options' faults, every one: unknown options of `command`, a
/// configuration text that cannot be read, and what checkConfiguration finds
/// in the text the options make. Without any, `session` is ready to start.
std::vector<std::string> lineFaults(const CLI::App& command, const LineOptions& options,
                                    const PluginDescription& description, SessionOptions& session);

}  // namespace xtok::tools
