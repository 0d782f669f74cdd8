#include "tools/run_command.h"

#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <ostream>
#include <sstream>

#include "tools/console_session.h"
#include "tools/interrupt.h"
#include "tools/line_input.h"
#include "tools/monitor_console.h"
#include "tools/plugin_session.h"

namespace xtok::tools {

namespace {

constexpr int kUsageError = 2;
// How long the monitor sleeps at most before it looks for Ctrl-C again.
constexpr int kInterruptCheckMs = 200;

bool configText(const std::string& option, std::string& text, std::string& error) {
    if (option.empty() || option[0] != '@') {
        text = option;
        return true;
    }
    std::string path = option.substr(1);
    std::ifstream file(path, std::ios::binary);
    std::ostringstream content;
    if (!file || !(content << file.rdbuf())) {
        error = "cannot read the configuration file " + path + ": " + std::strerror(errno);
        return false;
    }
    text = content.str();
    return true;
}

/// What `run` and `monitor` take alike, checked before anything starts;
/// the log file is opened here too. False with one line on `err`.
bool prepare(const RunOptions& options, SessionOptions& session, std::ofstream& log,
             std::ostream& err) {
    std::string error;
    session.pluginPath = options.pluginPath;
    session.statePath = options.statePath;
    session.instanceName = options.instanceName;
    session.reconnect = options.reconnect;
    bool usable = configText(options.config, session.config, error);
    for (const std::string& map : options.maps) {
        usable = usable && session.ports.assign(map, error);
    }
    usable = usable && (options.logPath.empty() || openLog(options.logPath, log, error));
    if (!usable) {
        err << "xtok-host: " << error << std::endl;
    }
    return usable;
}

std::unique_ptr<PluginSession> start(const SessionOptions& options, std::ostream& err) {
    std::string error;
    std::unique_ptr<PluginSession> started = PluginSession::start(options, error);
    if (!started) {
        err << "xtok-host: " << error << std::endl;
    }
    return started;
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

}  // namespace

int runConsole(const RunOptions& options, std::ostream& out, std::ostream& err) {
    SessionOptions session;
    std::ofstream log;
    if (!prepare(options, session, log, err)) {
        return kUsageError;
    }
    std::unique_ptr<PluginSession> started = start(session, err);
    if (!started) {
        return 1;
    }
    MonitorConsole monitor(*started, options.json, out, err);
    monitor.logTo(std::move(log), options.logPath);
    bool typed = options.exec.empty() && isatty(STDIN_FILENO);
    std::unique_ptr<LineInput> input =
        options.exec.empty() ? LineInput::fromStdin("xtok> ") : LineInput::fromText(options.exec);
    if (typed && !options.json) {
        char line[256] = {};
        started->protocol().GetSerialSettings(line, sizeof line - 1);
        out << "xtok-host: " << started->protocol().GetDisplayName() << " on " << line
            << "; help lists the commands, quit leaves" << std::endl;
    }
    ConsoleSession console(*started, options.json, out, err, &monitor);
    return console.run(*input) ? 0 : 1;
}

int runMonitor(const RunOptions& options, long count, std::ostream& out, std::ostream& err) {
    SessionOptions session;
    std::ofstream log;
    if (!prepare(options, session, log, err)) {
        return kUsageError;
    }
    std::unique_ptr<MonitorConsole> monitor;
    // On before the start, to see the port open and its settings applied.
    session.beforeStart = [&](PluginSession& loaded) {
        monitor = std::make_unique<MonitorConsole>(loaded, options.json, out, err);
        monitor->logTo(std::move(log), options.logPath);
        monitor->stopAfter(count);
        monitor->on();
    };
    std::unique_ptr<PluginSession> started = start(session, err);
    if (!started) {
        if (monitor) {
            monitor->print();  // what the line did before the start failed
        }
        return 1;
    }
    bool allGood = true;
    if (!options.exec.empty()) {
        ConsoleSession console(*started, options.json, out, err, monitor.get());
        allGood = console.run(*LineInput::fromText(options.exec));
    }
    follow(*monitor);
    return allGood ? 0 : 1;
}

}  // namespace xtok::tools
