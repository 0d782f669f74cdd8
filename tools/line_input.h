// Where the console's command lines come from: GNU readline with history
// when a person types at a terminal, plain lines from a script otherwise.
#pragma once

#include <memory>
#include <string>
#include <vector>

namespace xtok::tools {

/// Lines that come while the console waits for a command (the line
/// monitor's): printed above the line being typed.
class EventFeed {
public:
    virtual ~EventFeed() = default;
    /// Readable while lines wait; -1 for none.
    virtual int fd() const = 0;
    /// Prints the waiting lines; false once the session is to end.
    virtual bool print() = 0;
};

class LineInput {
public:
    virtual ~LineInput() = default;
    /// The next line; false at the end of input (or Ctrl-C on a script).
    virtual bool next(std::string& line) = 0;
    /// A terminal shows `feed`'s lines while it waits; a script's lines come
    /// at once, and the console prints the feed between them.
    void showWhileWaiting(EventFeed* feed) { feed_ = feed; }

    /// Readline with `prompt` when standard input is a terminal, else lines
    /// read as they come.
    static std::unique_ptr<LineInput> fromStdin(const std::string& prompt);
    /// The commands of one text, separated by ";" ("\;" for a literal one).
    static std::unique_ptr<LineInput> fromText(const std::string& text);

protected:
    EventFeed* feed_ = nullptr;
};

/// Splits at ";" that is not escaped as "\;".
std::vector<std::string> splitCommands(const std::string& text);

}  // namespace xtok::tools
