#include "tools/version.h"

namespace xtok::tools {

std::string versionText(const std::string& pluginPath, const PluginDescription* description) {
    std::string text = std::string("xtok-host ") + XTOK_VERSION;
    if (description) {
        text += "\nplug-in " + description->headerField("Name") + " (" +
                description->headerField("FullName") + ") version " +
                description->headerField("Version") + ": " + pluginPath;
    }
    return text;
}

}  // namespace xtok::tools
