// xtok-host: the xtokline plug-in on a PC, loaded exactly as a panel runtime
// loads it. Subcommands: demo, run, describe, ports.
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
#include "tools/terminal_state.h"
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
    static const char* const kCommands[] = {"demo", "run", "describe", "ports"};
    for (const char* name : kCommands) {
        if (std::strcmp(argv[1], name) == 0) {
            return true;
        }
    }
    std::cerr << "xtok-host: unknown command '" << argv[1]
              << "'; the commands are demo, run, describe and ports" << std::endl;
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

}  // namespace

int main(int argc, char** argv) {
    keepTerminalSettings();
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

    RunOptions run;
    CLI::App* runCommand = app.add_subcommand(
        "run",
        "The plug-in on a serial line with a console: typed tag reads and writes, "
        "watch, settings, and the plug-in's own commands");
    runCommand->footer(
        "Console: tag read ADDRESS, tag write ADDRESS VALUE, watch [--count N] [--timeout S], "
        "settings, reset-retained, help, quit; any other line goes to the plug-in's own "
        "console. help explains the values. Exit status 1 when any command failed.");
    runCommand->add_option("--config", run.config, "Configuration text, or @FILE holding it")
        ->required();
    runCommand->add_option("--map", run.maps,
                           "Device of a port name, e.g. com1=/dev/ttyUSB0 (repeatable)");
    runCommand->add_option("--state", run.statePath,
                           "SQLite file for retained settings (default: "
                           "$XDG_STATE_HOME/xtokline/retained.sqlite3)");
    runCommand->add_option("--plugin", run.pluginPath,
                           "The plug-in file (default: beside xtok-host)");
    runCommand->add_option("--instance", run.instanceName,
                           "Instance name, under which settings are retained (default: XTOK)");
    runCommand->add_option(
        "--exec", run.exec,
        "Commands separated by ';' (\\; for one inside a value) instead of standard input");
    runCommand->add_flag("--json", run.json, "One JSON object per result, one per line");
    runCommand->add_flag("--reset-retained", run.resetRetained,
                         "Forget the settings SP_Done retained for the instance before starting");

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
    return pluginPath(run.pluginPath) ? runConsole(run, std::cout, std::cerr) : 1;
}
