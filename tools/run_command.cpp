#include "tools/run_command.h"

#include <unistd.h>

#include <ostream>

#include "host/permanent_storage.h"
#include "tools/config_text.h"
#include "tools/console_session.h"
#include "tools/fault_report.h"
#include "tools/line_input.h"

namespace xtok::tools {

namespace {

constexpr int kUsageError = 2;

/// Which device, plug-in and state file this console works with.
void banner(PluginSession& started, const SessionOptions& session, std::ostream& out) {
    const std::string line = started.serialSettings();
    const std::string* port = ConfigText(session.config).find(kPortKey);
    std::string device;
    std::string unused;
    session.ports.resolve(port ? *port : "", device, unused);
    out << "xtok-host: " << started.protocol().GetDisplayName() << " on " << device << " (" << line
        << ")\n  plug-in " << session.pluginPath << "\n  state   "
        << (session.statePath.empty() ? host::defaultStoragePath() : session.statePath)
        << "\nhelp lists the commands, quit leaves" << std::endl;
}

}  // namespace

int runConsole(const RunOptions& options, const SessionOptions& session,
               const PluginDescription& description, const std::vector<std::string>& faults,
               std::ostream& out, std::ostream& err) {
    if (!faults.empty()) {
        reportFaults(faults, options.json, out, err);
        return kUsageError;
    }
    std::string error;
    std::unique_ptr<PluginSession> started = PluginSession::start(session, error);
    if (!started) {
        reportFaults({error}, options.json, out, err);
        return 1;
    }
    bool typed = options.exec.empty() && isatty(STDIN_FILENO);
    std::unique_ptr<LineInput> input =
        options.exec.empty() ? LineInput::fromStdin("xtok> ") : LineInput::fromText(options.exec);
    if (typed && !options.json) {
        banner(*started, session, out);
    }
    ConsoleSession console(*started, description, options.json, out, err);
    return console.run(*input) ? 0 : 1;
}

}  // namespace xtok::tools
