#include "tools/console_session.h"

#include <cstdlib>
#include <ostream>

#include "tools/help_topics.h"
#include "tools/interrupt.h"
#include "tools/json_line.h"
#include "tools/monitor_lines.h"
#include "tools/settings_view.h"
#include "tools/token_view.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

using Clock = std::chrono::steady_clock;

// How often "watch" asks the queue: well below what a person notices.
constexpr std::chrono::milliseconds kWatchPoll{10};

const char* const kHostHelp =
    "Commands of xtok-host (typed values):\n"
    "  tag read ADDRESS           read a tag, e.g. tag read 0?tokens_available?unsignedInt\n"
    "  tag write ADDRESS VALUE    write a tag, e.g. tag write 0?tx_token?string-64 HELLO\n"
    "                             or tag write 0?SP_Baud?unsignedInt 19200\n"
    "  watch [--count N] [--timeout SECONDS]\n"
    "                             show received tokens (time, text, hex) and acknowledge\n"
    "                             them, until Ctrl-C, N tokens or the time-out\n"
    "  settings                   each setting: active and where from, staged, retained\n"
    "  reset-retained             forget the settings SP_Done retained for this\n"
    "                             instance and start the plug-in anew with the\n"
    "                             configured ones\n"
    "  monitor [on|off]           show the line as it happens: bytes both ways, tokens\n"
    "                             with what ended them, link changes, queue drops\n"
    "                             (alone: switches it on or off)\n"
    "  help                       this text and the plug-in's console commands\n"
    "  help datatypes             the data types of a tag address\n"
    "  help memorytypes           the plug-in's memory types\n"
    "  quit                       leave (also exit, or the end of input)\n"
    "Values: numbers in decimal or 0x hex; booleans 0/1, true/false, on/off;\n"
    "strings as the rest of the line (\"quotes\" keep outer blanks) with the escapes\n"
    "\\xHH \\n \\r \\t \\\\; arrays as numbers separated by blanks or commas; binary as hex.\n"
    "Any other line goes to the plug-in's console, whose read and write take\n"
    "raw hex data:\n";

std::vector<std::string> splitWords(const std::string& line) {
    std::vector<std::string> words;
    std::size_t at = 0;
    while ((at = line.find_first_not_of(" \t", at)) != std::string::npos) {
        std::size_t end = line.find_first_of(" \t", at);
        words.push_back(line.substr(at, end - at));
        at = end;
    }
    return words;
}

/// What follows the first `skip` words of `line`, as typed.
std::string restAfterWords(const std::string& line, int skip) {
    std::size_t at = 0;
    for (int i = 0; i < skip; ++i) {
        at = line.find_first_not_of(" \t", at);
        at = at == std::string::npos ? at : line.find_first_of(" \t", at);
        if (at == std::string::npos) {
            return "";
        }
    }
    std::size_t start = line.find_first_not_of(" \t", at);
    if (start == std::string::npos) {
        return "";
    }
    std::string rest = line.substr(start);
    if (rest.size() >= 2 && rest.front() == '"' && rest.back() == '"') {
        return rest.substr(1, rest.size() - 2);
    }
    return rest;
}

bool parseCount(const std::string& text, long& number) {
    int32_t whole = 0;
    std::size_t used = 0;
    const bool ok = parseClamped(text, 10, whole, &used) && used == text.size() && whole > 0;
    number = whole;
    return ok;
}

bool parseSeconds(const std::string& text, double& seconds) {
    char* end = nullptr;
    seconds = std::strtod(text.c_str(), &end);
    return !text.empty() && *end == '\0' && seconds > 0 && seconds < 1e7;
}

}  // namespace

ConsoleSession::ConsoleSession(PluginSession& session, const PluginDescription& description,
                               bool json, std::ostream& out, std::ostream& err,
                               MonitorConsole* monitor)
    : session_(session),
      description_(description),
      json_(json),
      out_(out),
      err_(err),
      monitor_(monitor) {}

bool ConsoleSession::run(LineInput& input) {
    bool allGood = true;
    std::string line;
    showMessages();
    input.showWhileWaiting(monitor_);
    while (!quit_ && input.next(line)) {
        printEvents();  // what happened before the command, first
        allGood = execute(line) && allGood;
        showMessages();
        out_.flush();
        quit_ = !printEvents() || quit_;
    }
    printEvents();
    return allGood;
}

// As the host's notices are: a line on standard error, or an event among
// the results under --json.
void ConsoleSession::showMessages() {
    for (const SessionMessage& message : session_.takeMessages()) {
        if (json_) {
            out_ << JsonLine()
                        .text("event", message.warning ? "warning" : "notice")
                        .text("text", message.text)
                        .str()
                 << '\n';
        } else {
            err_ << "xtok-host: " << (message.warning ? "warning: " : "") << message.text
                 << std::endl;
        }
    }
}

bool ConsoleSession::printEvents() {
    return !monitor_ || monitor_->print();
}

bool ConsoleSession::execute(const std::string& raw) {
    std::string line = trimmed(raw, kWhiteSpace);
    if (line.empty() || line[0] == '#') {
        return true;
    }
    std::vector<std::string> words = splitWords(line);
    const std::string& word = words[0];
    if (word == "quit" || word == "exit") {
        quit_ = true;
        return true;
    }
    if (word == "help") {
        return help(line, words);
    }
    if (word == "tag") {
        return tag(line, words);
    }
    if (word == "watch") {
        return watch(line, words);
    }
    if (word == "settings") {
        return settings(line);
    }
    if (word == "reset-retained") {
        return resetRetained(line);
    }
    if (word == "monitor" && monitor_) {
        return monitor(line, words);
    }
    // As typed but for the margins: "put" sends the rest of its line,
    // trailing blanks included.
    std::string typed = raw.substr(raw.find_first_not_of(" \t"));
    return passOn(typed.substr(0, typed.find_last_not_of("\r\n") + 1));
}

bool ConsoleSession::fail(const std::string& line, const std::string& error) {
    if (json_) {
        out_ << JsonLine().text("command", line).flag("ok", false).text("error", error).str()
             << '\n';
    } else {
        err_ << "error: " << error << '\n';
    }
    return false;
}

void ConsoleSession::report(const std::string& json, const std::string& text) {
    if (json_) {
        out_ << json << '\n';
    } else if (!text.empty()) {
        out_ << text << (text.back() == '\n' ? "" : "\n");
    }
}

bool ConsoleSession::help(const std::string& line, const std::vector<std::string>& words) {
    JsonLine json;
    json.text("command", line).flag("ok", true);
    const std::string topic = words.size() > 1 ? words[1] : "";
    if (topic == "datatypes") {
        report(json.raw("datatypes", dataTypesJson()).str(), dataTypesText());
    } else if (topic == "memorytypes") {
        report(json.raw("memorytypes", memoryTypesJson(description_)).str(),
               memoryTypesText(description_));
    } else if (words.size() == 1) {
        bool ok = false;
        const std::string text = kHostHelp + session_.command("help", ok);
        report(json.text("help", text).str(), text);
    } else {
        return fail(line, "help takes datatypes or memorytypes, or nothing");
    }
    return true;
}

bool ConsoleSession::tag(const std::string& line, const std::vector<std::string>& words) {
    if (words.size() >= 3 && words[1] == "read") {
        if (words.size() > 3) {
            return fail(line, "tag read takes one address, e.g. tag read 0?connect?boolean");
        }
        return tagRead(line, words[2]);
    }
    if (words.size() >= 3 && words[1] == "write") {
        if (words.size() == 3) {
            return fail(line, "tag write needs a value after the address");
        }
        return tagWrite(line, words[2], restAfterWords(line, 3));
    }
    return fail(line, "use tag read ADDRESS or tag write ADDRESS VALUE");
}

bool ConsoleSession::tagRead(const std::string& line, const std::string& address) {
    TagValue value;
    std::string error;
    if (!session_.read(address, value, error)) {
        return fail(line, error);
    }
    report(JsonLine()
               .text("command", line)
               .flag("ok", true)
               .text("address", address)
               .raw("value", formatValueJson(value.shape, value.bytes))
               .str(),
           formatValue(value.shape, value.bytes));
    return true;
}

bool ConsoleSession::tagWrite(const std::string& line, const std::string& address,
                              const std::string& value) {
    std::string error;
    if (!session_.write(address, value, error)) {
        return fail(line, error);
    }
    report(JsonLine().text("command", line).flag("ok", true).text("address", address).str(), "ok");
    return true;
}

bool ConsoleSession::watch(const std::string& line, const std::vector<std::string>& words) {
    long count = 0;
    double seconds = 0;
    std::string secondsText;
    for (std::size_t i = 1; i < words.size(); i += 2) {
        bool hasValue = i + 1 < words.size();
        if (words[i] == "--count" && hasValue && parseCount(words[i + 1], count)) {
            continue;
        }
        if (words[i] == "--timeout" && hasValue && parseSeconds(words[i + 1], seconds)) {
            secondsText = words[i + 1];
            continue;
        }
        return fail(line, "use watch [--count N] [--timeout SECONDS] with N and SECONDS above 0");
    }
    bool timed = seconds > 0;
    Clock::time_point deadline =
        Clock::now() + std::chrono::milliseconds(static_cast<int64_t>(seconds * 1000));
    long seen = 0;
    while ((count == 0 || seen < count) && (!timed || Clock::now() < deadline)) {
        Token token;
        std::string error;
        Intake intake = session_.takeToken(token, error);
        if (intake == Intake::Failed) {
            return fail(line, error);
        }
        if (intake == Intake::Token) {
            ++seen;
            JsonLine json;
            json.text("command", line)
                .flag("ok", true)
                .text("time", isoTime(token.arrived))
                .text("token", token.text)
                .number("length", token.length)
                .text("hex", bytesToHexText(token.text.data(), token.text.size()));
            if (token.length > token.text.size()) {
                json.flag("whole", false);
            }
            report(json.str(), clockText(token.arrived) + "  " + tokenLine(token));
            out_.flush();
        } else if (!printEvents() || pauseUnlessInterrupted(kWatchPoll)) {
            break;
        }
    }
    takeInterrupt();  // Ctrl-C ended the watch, not the session
    if (count > 0 && seen < count && timed && Clock::now() >= deadline) {
        return fail(line, std::to_string(seen) + " of " + std::to_string(count) +
                              " tokens arrived within " + secondsText + " s");
    }
    if (json_) {
        out_ << JsonLine().text("command", line).flag("ok", true).number("tokens", seen).str()
             << '\n';
    }
    return true;
}

bool ConsoleSession::settings(const std::string& line) {
    const std::string active = session_.serialSettings();
    report(JsonLine()
               .text("command", line)
               .flag("ok", true)
               .text("active", active)
               .raw("settings", settingsJson(session_.settings()))
               .str(),
           settingsText(session_.settings(), active));
    return true;
}

bool ConsoleSession::resetRetained(const std::string& line) {
    std::string cleared;
    std::string error;
    if (!session_.resetRetained(cleared, error)) {
        return fail(line, error);
    }
    report(JsonLine().text("command", line).flag("ok", true).text("reply", cleared).str(), cleared);
    return true;
}

bool ConsoleSession::monitor(const std::string& line, const std::vector<std::string>& words) {
    const bool toggle = words.size() == 1;
    if (!toggle && (words.size() > 2 || (words[1] != "on" && words[1] != "off"))) {
        return fail(line, "use monitor on, monitor off, or monitor alone to switch it");
    }
    if (toggle ? !monitor_->isOn() : words[1] == "on") {
        monitor_->on();
    } else {
        monitor_->off();
    }
    const bool on = monitor_->isOn();
    report(JsonLine().text("command", line).flag("ok", true).flag("monitor", on).str(),
           on ? "monitor on" : "monitor off");
    return true;
}

std::string ConsoleSession::withLineStates(const std::string& reply) {
    std::string text = reply.empty() || reply.back() == '\n' ? reply : reply + "\n";
    for (const host::LinkEvent& state : session_.lineStates()) {
        text += lineStateText(state) + "\n";
    }
    return text;
}

bool ConsoleSession::passOn(const std::string& line) {
    bool ok = false;
    std::string reply = session_.command(line, ok);
    if (ok && line.substr(0, line.find(' ')) == "info") {
        reply = withLineStates(reply);
    }
    if (!ok) {
        // The consoles begin their error replies with the word; it is said already.
        std::string why = trimmed(reply, kWhiteSpace);
        for (const char* lead : {"ERROR: ", "error: "}) {
            if (why.rfind(lead, 0) == 0) {
                why.erase(0, std::string(lead).size());
            }
        }
        return fail(line, line.substr(0, line.find(' ')) + ": " + why);
    }
    report(JsonLine().text("command", line).flag("ok", true).text("reply", reply).str(), reply);
    return true;
}

}  // namespace xtok::tools
