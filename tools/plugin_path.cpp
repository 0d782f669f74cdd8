#include "tools/plugin_path.h"

#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <vector>

namespace xtok::tools {

bool findDefaultPlugin(std::string& path, std::string& error) {
    std::error_code failed;
    std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", failed);
    if (failed) {
        error = "cannot tell where xtok-host lives (" + failed.message() + "); give --plugin";
        return false;
    }
    std::filesystem::path here = self.parent_path();
    // Relative paths fixed at build time, so that an installation can be
    // moved as a whole.
    const std::vector<std::filesystem::path> candidates = {
        here / XTOK_PLUGIN_FROM_BINDIR / XTOK_PLUGIN_FILE,
        here / ".." / XTOK_PLUGIN_FILE,
    };
    std::string looked;
    for (const std::filesystem::path& candidate : candidates) {
        std::filesystem::path normal = candidate.lexically_normal();
        if (std::filesystem::is_regular_file(normal, failed)) {
            path = normal.string();
            return true;
        }
        looked += (looked.empty() ? "" : ", ") + normal.string();
    }
    error = "no plug-in beside xtok-host (looked for " + looked + "); give --plugin PATH";
    return false;
}

namespace {

/// The value of `--name VALUE` or `--name=VALUE`, "" without one.
std::string valueOf(int argc, char** argv, const std::string& name) {
    for (int i = 1; i < argc; ++i) {
        if (argv[i] == name && i + 1 < argc) {
            return argv[i + 1];
        }
        if (std::strncmp(argv[i], (name + "=").c_str(), name.size() + 1) == 0) {
            return argv[i] + name.size() + 1;
        }
    }
    return "";
}

}  // namespace

PluginAtHand findPluginAtHand(int argc, char** argv) {
    PluginAtHand plugin;
    plugin.path = valueOf(argc, argv, "--plugin");
    plugin.described = (!plugin.path.empty() || findDefaultPlugin(plugin.path, plugin.error)) &&
                       readDescription(plugin.path, plugin.description, plugin.error);
    return plugin;
}

}  // namespace xtok::tools
