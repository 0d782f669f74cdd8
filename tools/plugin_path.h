// Where xtok-host finds the plug-in when --plugin does not say.
#pragma once

#include <string>

#include "tools/plugin_description.h"

namespace xtok::tools {

/// The plug-in of this program's own build or installation: the installed
/// layout (bin/ beside lib/) first, then the build tree (the plug-in one
/// directory up from tools/). False with `error` naming the places looked at.
bool findDefaultPlugin(std::string& path, std::string& error);

/// The plug-in a command line names with --plugin, else the one of this
/// program, with its description read. A command reads it before its own
/// arguments: the description makes the options of a command that opens a line.
struct PluginAtHand {
    std::string path;
    PluginDescription description;
    bool described = false;
    std::string error;  // why it is not described
};

PluginAtHand findPluginAtHand(int argc, char** argv);

}  // namespace xtok::tools
