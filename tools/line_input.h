// Where the console's command lines come from: GNU readline with history
// when a person types at a terminal, plain lines from a script otherwise.
#pragma once

#include <memory>
#include <string>
#include <vector>

namespace xtok::tools {

class LineInput {
public:
    virtual ~LineInput() = default;
    /// The next line; false at the end of input (or Ctrl-C on a script).
    virtual bool next(std::string& line) = 0;

    /// Readline with `prompt` when standard input is a terminal, else lines
    /// read as they come.
    static std::unique_ptr<LineInput> fromStdin(const std::string& prompt);
    /// The commands of one text, separated by ";" ("\;" for a literal one).
    static std::unique_ptr<LineInput> fromText(const std::string& text);
};

/// Splits at ";" that is not escaped as "\;".
std::vector<std::string> splitCommands(const std::string& text);

}  // namespace xtok::tools
