// xtok-host: the xtokline plug-in on a PC, loaded exactly as a panel runtime
// loads it. Subcommands: demo, run, monitor, describe, ports, completion.
#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstring>
#include <iostream>

#include "tools/closest_word.h"
#include "tools/completion.h"
#include "tools/demo.h"
#include "tools/describe.h"
#include "tools/fault_report.h"
#include "tools/interrupt.h"
#include "tools/plugin_path.h"
#include "tools/ports.h"
#include "tools/run_command.h"
#include "tools/terminal_state.h"
#include "tools/version.h"
#include "xtokline/text.h"

namespace {

using namespace xtok::tools;

constexpr int kUsageError = 2;

/// CLI11 explains in several lines; a wrong argument deserves one.
int usageError(const CLI::ParseError& e, bool json) {
    std::string what = e.what();
    std::replace(what.begin(), what.end(), '\n', ' ');
    reportFaults({what + " (xtok-host --help explains)"}, json, std::cout, std::cerr);
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
bool knownCommand(const CLI::App& app, int argc, char** argv, bool json) {
    if (argc < 2 || argv[1][0] == '-') {
        return true;
    }
    std::vector<std::string> names;
    for (const CLI::App* command : app.get_subcommands([](const CLI::App*) { return true; })) {
        names.push_back(command->get_name());
    }
    if (std::find(names.begin(), names.end(), argv[1]) != names.end()) {
        return true;
    }
    std::string all;
    for (const std::string& name : names) {
        all += (all.empty() ? "" : ", ") + name;
    }
    reportFaults({unknownWord("command", argv[1], names) + " (the commands: " + all + ")"}, json,
                 std::cout, std::cerr);
    return false;
}

CLI::App* addDemo(CLI::App& app, DemoOptions& demo) {
    CLI::App* command = app.add_subcommand(
        "demo",
        "A simulated reader on a pseudo-terminal, driven through the plug-in; no hardware "
        "needed");
    command->add_option("--count", demo.count, "Stop after this many codes (default: Ctrl-C)")
        ->check(CLI::Validator(positive, "N"));
    command->add_option("--interval", demo.intervalMs, "Milliseconds between the reader's codes")
        ->check(CLI::Range(20, 60000))
        ->capture_default_str();
    command->add_option("--plugin", demo.pluginPath,
                        "The plug-in file (default: beside xtok-host)");
    command->add_flag("--monitor", demo.monitor,
                      "Show the line as it happens too, as xtok-host monitor does");
    return command;
}

/// A session on a line, which run and monitor share.
CLI::App* addSession(CLI::App& app, const char* name, const char* what, RunOptions& run,
                     const PluginDescription& description) {
    CLI::App* command = app.add_subcommand(name, what);
    addLineOptions(*command, run.line, description);
    command->add_flag("--reset-retained", run.resetRetained,
                      "Forget the settings SP_Done retained for the instance before starting");
    command->add_option(
        "--exec", run.exec,
        "Commands separated by ';' (\\; for one inside a value): run takes them instead of "
        "standard input, monitor runs them first");
    command->add_flag("--json", run.json, "One JSON object per result or event, one per line");
    command->add_flag("--reconnect", run.reconnect,
                      "Reopen the device when it comes back after a hang-up or failure");
    command->add_option("--log", run.logPath, "Append the monitor's lines to this file as well");
    return command;
}

CLI::App* addRun(CLI::App& app, RunOptions& run, const PluginDescription& description) {
    CLI::App* command =
        addSession(app, "run",
                   "The plug-in on a serial line with a console: typed tag reads and writes, "
                   "watch, settings, a monitor of the line, and the plug-in's own commands. "
                   "Without --config the editor's defaults fill the line; options set single "
                   "keys.",
                   run, description);
    command->footer(
        "Console: tag read ADDRESS, tag write ADDRESS VALUE, watch [--count N] [--timeout S], "
        "settings, monitor [on|off], reset-retained, help [datatypes|memorytypes], quit; any "
        "other line goes to the plug-in's own console. Exit status 1 when any command failed.");
    return command;
}

CLI::App* addMonitor(CLI::App& app, RunOptions& monitor, const PluginDescription& description) {
    CLI::App* command =
        addSession(app, "monitor",
                   "The plug-in on a serial line, showing it as it happens: bytes both ways, "
                   "tokens with what ended them, link changes and queue drops, until Ctrl-C",
                   monitor, description);
    command->add_option("--count", monitor.count, "Stop after this many tokens")
        ->check(CLI::Validator(positive, "N"));
    return command;
}

int startSession(const CLI::App& command, RunOptions& run, bool monitor,
                 const PluginAtHand& plugin) {
    if (!plugin.described) {
        reportFaults({plugin.error}, run.json, std::cout, std::cerr);
        return 1;
    }
    run.line.pluginPath = plugin.path;
    SessionOptions session;
    std::vector<std::string> faults = lineFaults(command, run.line, plugin.description, session);
    return runSession(run, monitor, std::move(session), plugin.description, std::move(faults),
                      std::cout, std::cerr);
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

void addVersions(CLI::App& app, const PluginAtHand& plugin) {
    auto text = [&plugin] {
        return versionText(plugin.path, plugin.described ? &plugin.description : nullptr);
    };
    app.set_version_flag("--version", text);
    for (CLI::App* command : app.get_subcommands([](CLI::App*) { return true; })) {
        command->set_version_flag("--version", text);
    }
}

}  // namespace

int main(int argc, char** argv) {
    keepTerminalSettings();
    const bool json = std::find_if(argv + 1, argv + argc, [](const char* a) {
                          return std::strcmp(a, "--json") == 0;
                      }) != argv + argc;
    const PluginAtHand plugin = findPluginAtHand(argc, argv);
    CLI::App app{
        "xtok-host loads the xtokline serial token plug-in as an operator panel's runtime "
        "does, on this PC's serial ports.",
        "xtok-host"};
    app.require_subcommand(1);
    app.footer("Exit status: 0 success, 1 a failure, 2 unusable arguments.");

    DemoOptions demo;
    CLI::App* demoCommand = addDemo(app, demo);
    RunOptions run;
    CLI::App* runCommand = addRun(app, run, plugin.description);
    RunOptions monitor;
    CLI::App* monitorCommand = addMonitor(app, monitor, plugin.description);

    std::string describePath;
    bool wholeXml = false;
    CLI::App* describeCommand = app.add_subcommand(
        "describe", "The description a plug-in file carries: identity, parameters, memory types");
    describeCommand->add_option("plugin", describePath,
                                "The plug-in file (default: beside xtok-host)");
    describeCommand->add_flag("--xml", wholeXml, "Print the whole XML description");

    bool portsJson = false;
    CLI::App* portsCommand = app.add_subcommand("ports", "The serial ports of this machine");
    portsCommand->add_flag("--json", portsJson, "One JSON object with the ports");

    CLI::App* completionCommand = app.add_subcommand(
        "completion", "A completion script: source <(xtok-host completion bash)");
    completionCommand->add_option("shell", "The shell; bash is the one there is")
        ->required()
        ->check(CLI::IsMember({"bash"}));
    addVersions(app, plugin);

    if (!knownCommand(app, argc, argv, json)) {
        return kUsageError;
    }
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& e) {
        return e.get_exit_code() == 0 ? app.exit(e) : usageError(e, json);
    }

    catchInterrupts();
    if (*completionCommand) {
        std::cout << bashCompletion(app);
        return 0;
    }
    if (*portsCommand) {
        return runPorts(portsJson, std::cout, std::cerr);
    }
    if (*describeCommand) {
        return pluginPath(describePath) ? runDescribe(describePath, wholeXml, std::cout, std::cerr)
                                        : 1;
    }
    if (*demoCommand) {
        return pluginPath(demo.pluginPath) ? runDemo(demo, std::cout, std::cerr) : 1;
    }
    if (*monitorCommand) {
        return startSession(*monitorCommand, monitor, true, plugin);
    }
    return startSession(*runCommand, run, false, plugin);
}
