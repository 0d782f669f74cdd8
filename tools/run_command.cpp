#include "tools/run_command.h"

#include <poll.h>
#include <unistd.h>

#include <fstream>
#include <ostream>

#include "host/permanent_storage.h"
#include "tools/config_text.h"
#include "tools/console_session.h"
#include "tools/fault_report.h"
#include "tools/interrupt.h"
#include "tools/line_input.h"
#include "tools/monitor_console.h"

namespace xtok::tools {

namespace {

constexpr int kUsageError = 2;
// How long the monitor sleeps at most before it looks for Ctrl-C again.
constexpr int kInterruptCheckMs = 200;

/// Which device, plug-in and state file this console works with.
void banner(PluginSession& started, const SessionOptions& session, std::ostream& out) {
    const std::string line = started.serialSettings();
    const ConfigText config(session.config);
    const std::string* port = config.find(kPortKey);
    std::string device;
    std::string unused;
    session.ports.resolve(port ? *port : "", device, unused);
    out << "xtok-host: " << started.protocol().GetDisplayName() << " on " << device << " (" << line
        << ")\n  plug-in " << session.pluginPath << "\n  state   "
        << (session.statePath.empty() ? host::defaultStoragePath() : session.statePath)
        << "\nhelp lists the commands, quit leaves" << std::endl;
}

/// Prints the monitor's lines as they come until Ctrl-C or its end.
void follow(MonitorConsole& monitor) {
    while (!interruptRequested()) {
        pollfd ready{monitor.fd(), POLLIN, 0};
        poll(&ready, 1, kInterruptCheckMs);
        if (!monitor.print()) {
            break;
        }
    }
}

/// Starts the session with the line monitor following the line from before
/// the start, to see the port open: shown at once with `show`, else only once
/// switched on, though the host then knows every queued token whole and when
/// it arrived. Null, with the failure told, when it does not start.
std::unique_ptr<PluginSession> startFollowed(const RunOptions& options, SessionOptions session,
                                             std::ofstream log, bool show,
                                             std::unique_ptr<MonitorConsole>& monitor,
                                             std::ostream& out, std::ostream& err) {
    session.beforeStart = [&](PluginSession& loaded) {
        monitor = std::make_unique<MonitorConsole>(loaded, options.json, out, err);
        monitor->logTo(std::move(log), options.logPath);
        monitor->stopAfter(options.count);
        show ? monitor->on() : monitor->follow();
    };
    std::string error;
    std::unique_ptr<PluginSession> started = PluginSession::start(session, error);
    if (!started) {
        if (monitor) {
            monitor->print();  // what the line did before the start failed
        }
        reportFaults({error}, options.json, out, err);
    }
    return started;
}

int console(const RunOptions& options, const SessionOptions& session,
            const PluginDescription& description, std::ofstream log, std::ostream& out,
            std::ostream& err) {
    std::unique_ptr<MonitorConsole> monitor;
    std::unique_ptr<PluginSession> started =
        startFollowed(options, session, std::move(log), false, monitor, out, err);
    if (!started) {
        return 1;
    }
    bool typed = options.exec.empty() && isatty(STDIN_FILENO);
    std::unique_ptr<LineInput> input =
        options.exec.empty() ? LineInput::fromStdin("xtok> ") : LineInput::fromText(options.exec);
    if (typed && !options.json) {
        banner(*started, session, out);
    }
    ConsoleSession console(*started, description, options.json, out, err, monitor.get());
    return console.run(*input) ? 0 : 1;
}

int monitor(const RunOptions& options, const SessionOptions& session,
            const PluginDescription& description, std::ofstream log, std::ostream& out,
            std::ostream& err) {
    std::unique_ptr<MonitorConsole> monitor;
    std::unique_ptr<PluginSession> started =
        startFollowed(options, session, std::move(log), true, monitor, out, err);
    if (!started) {
        return 1;
    }
    bool allGood = true;
    if (!options.exec.empty()) {
        ConsoleSession console(*started, description, options.json, out, err, monitor.get());
        allGood = console.run(*LineInput::fromText(options.exec));
    }
    follow(*monitor);
    return allGood ? 0 : 1;
}

}  // namespace

int runSession(const RunOptions& options, bool monitoring, SessionOptions session,
               const PluginDescription& description, std::vector<std::string> faults,
               std::ostream& out, std::ostream& err) {
    std::ofstream log;
    std::string error;
    if (!options.logPath.empty() && !openLog(options.logPath, log, error)) {
        faults.push_back(error);
    }
    if (!faults.empty()) {
        reportFaults(faults, options.json, out, err);
        return kUsageError;
    }
    session.resetRetained = options.resetRetained;
    session.reconnect = options.reconnect;
    return monitoring ? monitor(options, std::move(session), description, std::move(log), out, err)
                      : console(options, std::move(session), description, std::move(log), out, err);
}

}  // namespace xtok::tools
