// What --version says: this program's version and, when a plug-in is at
// hand, the plug-in's name and version from its description.
#pragma once

#include <string>

#include "tools/plugin_description.h"

namespace xtok::tools {

/// `description` is null when the plug-in at `pluginPath` could not be read.
std::string versionText(const std::string& pluginPath, const PluginDescription* description);

}  // namespace xtok::tools
