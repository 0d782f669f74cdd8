// The "run" console: host commands that read and write tags with typed
// values, watch received tokens and show the line settings; every other
// line goes to the plug-in's own console.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "tools/line_input.h"
#include "tools/monitor_console.h"
#include "tools/plugin_description.h"
#include "tools/plugin_session.h"

namespace xtok::tools {

class ConsoleSession {
public:
    /// With `json`, every result is one JSON object on one line of `out`.
    /// `description` is the plug-in's, for "help memorytypes".
    /// With `monitor`, its lines are printed between and during commands.
    ConsoleSession(PluginSession& session, const PluginDescription& description, bool json,
                   std::ostream& out, std::ostream& err, MonitorConsole* monitor = nullptr);

    /// Runs lines until the input ends, "quit", or the monitor's end; true
    /// when none failed.
    bool run(LineInput& input);
    /// One line; false when it failed.
    bool execute(const std::string& line);
    bool quitRequested() const { return quit_; }
    /// Shows what the session has to say beside the commands' results.
    void showMessages();

private:
    bool help(const std::string& line, const std::vector<std::string>& words);
    bool tag(const std::string& line, const std::vector<std::string>& words);
    bool tagRead(const std::string& line, const std::string& address);
    bool tagWrite(const std::string& line, const std::string& address, const std::string& value);
    bool watch(const std::string& line, const std::vector<std::string>& words);
    bool settings(const std::string& line);
    bool resetRetained(const std::string& line);
    bool monitor(const std::string& line, const std::vector<std::string>& words);
    bool passOn(const std::string& line);
    /// The plug-in's info and the state of each line the host opened.
    std::string withLineStates(const std::string& reply);
    /// Prints the monitor's waiting lines; false once it reached its end.
    bool printEvents();

    bool fail(const std::string& line, const std::string& error);
    void report(const std::string& json, const std::string& text);

    PluginSession& session_;
    const PluginDescription& description_;
    bool json_;
    std::ostream& out_;
    std::ostream& err_;
    MonitorConsole* monitor_;
    bool quit_ = false;
};

}  // namespace xtok::tools
