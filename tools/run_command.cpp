#include "tools/run_command.h"

#include <unistd.h>

#include <ostream>

#include "tools/config_file.h"
#include "tools/console_session.h"
#include "tools/line_input.h"
#include "tools/plugin_session.h"

namespace xtok::tools {

namespace {

constexpr int kUsageError = 2;

bool configText(const std::string& option, std::string& text, std::string& error) {
    if (option.empty() || option[0] != '@') {
        text = option;
        return true;
    }
    return readConfigFile(option.substr(1), text, error);
}

}  // namespace

int runConsole(const RunOptions& options, std::ostream& out, std::ostream& err) {
    SessionOptions session;
    std::string error;
    session.pluginPath = options.pluginPath;
    session.statePath = options.statePath;
    session.instanceName = options.instanceName;
    session.resetRetained = options.resetRetained;
    bool usable = configText(options.config, session.config, error);
    for (const std::string& map : options.maps) {
        usable = usable && session.ports.assign(map, error);
    }
    if (!usable) {
        err << "xtok-host: " << error << std::endl;
        return kUsageError;
    }
    std::unique_ptr<PluginSession> started = PluginSession::start(session, error);
    if (!started) {
        err << "xtok-host: " << error << std::endl;
        return 1;
    }
    bool typed = options.exec.empty() && isatty(STDIN_FILENO);
    std::unique_ptr<LineInput> input =
        options.exec.empty() ? LineInput::fromStdin("xtok> ") : LineInput::fromText(options.exec);
    if (typed && !options.json) {
        out << "xtok-host: " << started->protocol().GetDisplayName() << " on "
            << started->serialSettings() << "; help lists the commands, quit leaves" << std::endl;
    }
    ConsoleSession console(*started, options.json, out, err);
    return console.run(*input) ? 0 : 1;
}

}  // namespace xtok::tools
