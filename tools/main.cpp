// xtok-host: the xtokline plug-in on a PC, loaded exactly as a panel runtime
// loads it. Subcommands: demo, run, monitor, describe, ports.
#include <CLI/CLI.hpp>
#include <cstdlib>
#include <cstring>
#include <iostream>

#include "tools/demo.h"
#include "tools/describe.h"
#include "tools/interrupt.h"
#include "tools/plugin_path.h"
#include "tools/ports.h"
#include "tools/run_command.h"
#include "xtokline/text.h"

namespace {

using namespace xtok::tools;

constexpr int kUsageError = 2;

/// CLI11 explains in several lines; a wrong argument deserves one.
int usageError(const CLI::ParseError& e) {
    std::string what = e.what();
    std::replace(what.begin(), what.end(), '\n', ' ');
    std::cerr << "xtok-host: " << what << " (xtok-host --help explains)" << std::endl;
    return kUsageError;
}

/// A whole number above 0, said in one short line when it is not.
std::string positive(std::string& value) {
    int32_t number = 0;
    std::size_t used = 0;
    return xtok::parseClamped(value, 10, number, &used) && used == value.size() && number > 0
               ? ""
               : "must be a whole number above 0, not '" + value + "'";
}

/// CLI11 takes an unknown first word for a stray argument and asks for a
/// subcommand; say what is wrong instead.
bool knownCommand(int argc, char** argv) {
    if (argc < 2 || argv[1][0] == '-') {
        return true;
    }
    static const char* const kCommands[] = {"demo", "run", "monitor", "describe", "ports"};
    for (const char* name : kCommands) {
        if (std::strcmp(argv[1], name) == 0) {
            return true;
        }
    }
    std::cerr << "xtok-host: unknown command '" << argv[1]
              << "'; the commands are demo, run, monitor, describe and ports" << std::endl;
    return false;
}

/// --plugin when given, else the plug-in beside this program.
bool pluginPath(std::string& path) {
    std::string error;
    if (!path.empty() || findDefaultPlugin(path, error)) {
        return true;
    }
    std::cerr << "xtok-host: " << error << std::endl;
    return false;
}

/// The options of a session on a line, which run and monitor share.
void addSessionOptions(CLI::App& command, RunOptions& run) {
    command.add_option("--config", run.config, "Configuration text, or @FILE holding it")
        ->required();
    command.add_option("--map", run.maps,
                       "Device of a port name, e.g. com1=/dev/ttyUSB0 (repeatable)");
    command.add_option("--state", run.statePath,
                       "SQLite file for retained settings (default: "
                       "$XDG_STATE_HOME/xtokline/retained.sqlite3)");
    command.add_option("--plugin", run.pluginPath, "The plug-in file (default: beside xtok-host)");
    command.add_option("--instance", run.instanceName,
                       "Instance name, under which settings are retained (default: XTOK)");
    command.add_option(
        "--exec", run.exec,
        "Commands separated by ';' (\\; for one inside a value): run takes them instead of "
        "standard input, monitor runs them first");
    command.add_flag("--json", run.json, "One JSON object per result or event, one per line");
    command.add_flag("--reconnect", run.reconnect,
                     "Reopen the device when it comes back after a hang-up or failure");
    command.add_option("--log", run.logPath, "Append the monitor's lines to this file as well");
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{
        "xtok-host loads the xtokline serial token plug-in as an operator panel's runtime "
        "does, on this PC's serial ports."};
    app.require_subcommand(1);
    app.footer("Exit status: 0 success, 1 a failure, 2 unusable arguments.");

    DemoOptions demo;
    CLI::App* demoCommand =
        app.add_subcommand("demo",
                           "A simulated reader on a pseudo-terminal, driven through the plug-in; "
                           "no hardware needed");
    demoCommand->add_option("--count", demo.count, "Stop after this many codes (default: Ctrl-C)")
        ->check(CLI::Validator(positive, "N"));
    demoCommand
        ->add_option("--interval", demo.intervalMs, "Milliseconds between the reader's codes")
        ->check(CLI::Range(20, 60000))
        ->capture_default_str();
    demoCommand->add_option("--plugin", demo.pluginPath,
                            "The plug-in file (default: beside xtok-host)");
    demoCommand->add_flag("--monitor", demo.monitor,
                          "Show the line as it happens too, as xtok-host monitor does");

    RunOptions run;
    CLI::App* runCommand = app.add_subcommand(
        "run",
        "The plug-in on a serial line with a console: typed tag reads and writes, "
        "watch, settings, and the plug-in's own commands");
    runCommand->footer(
        "Console: tag read ADDRESS, tag write ADDRESS VALUE, watch [--count N] [--timeout S], "
        "settings, monitor [on|off], help, quit; any other line goes to the plug-in's own console. "
        "help "
        "explains the values. Exit status 1 when any command failed.");
    addSessionOptions(*runCommand, run);

    RunOptions monitor;
    long monitorCount = 0;
    CLI::App* monitorCommand = app.add_subcommand(
        "monitor",
        "The plug-in on a serial line, showing it as it happens: bytes both ways, tokens "
        "with what ended them, link changes and queue drops, until Ctrl-C");
    addSessionOptions(*monitorCommand, monitor);
    monitorCommand->add_option("--count", monitorCount, "Stop after this many tokens")
        ->check(CLI::Validator(positive, "N"));

    std::string describePath;
    bool wholeXml = false;
    CLI::App* describeCommand = app.add_subcommand(
        "describe", "The description a plug-in file carries: identity, parameters, memory types");
    describeCommand->add_option("plugin", describePath,
                                "The plug-in file (default: beside xtok-host)");
    describeCommand->add_flag("--xml", wholeXml, "Print the whole XML description");

    CLI::App* portsCommand = app.add_subcommand("ports", "The serial ports of this machine");

    if (!knownCommand(argc, argv)) {
        return kUsageError;
    }
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& e) {
        return e.get_exit_code() == 0 ? app.exit(e) : usageError(e);
    }

    catchInterrupts();
    if (*portsCommand) {
        return runPorts(std::cout, std::cerr);
    }
    if (*describeCommand) {
        return pluginPath(describePath) ? runDescribe(describePath, wholeXml, std::cout, std::cerr)
                                        : 1;
    }
    if (*demoCommand) {
        return pluginPath(demo.pluginPath) ? runDemo(demo, std::cout, std::cerr) : 1;
    }
    if (*monitorCommand) {
        return pluginPath(monitor.pluginPath)
                   ? runMonitor(monitor, monitorCount, std::cout, std::cerr)
                   : 1;
    }
    return pluginPath(run.pluginPath) ? runConsole(run, std::cout, std::cerr) : 1;
}
