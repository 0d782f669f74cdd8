// Where xtok-host finds the plug-in when --plugin does not say.
#pragma once

#include <string>

namespace xtok::tools {

/// The plug-in of this program's own build or installation: the installed
/// layout (bin/ beside lib/) first, then the build tree (the plug-in one
/// directory up from tools/). False with `error` naming the places looked at.
bool findDefaultPlugin(std::string& path, std::string& error);

}  // namespace xtok::tools
