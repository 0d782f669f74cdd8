// Text helpers shared by the configuration reader, the consoles, tag
// creation and the data type texts.
#pragma once

#include <string>
#include <vector>

namespace xtok {

/// The text without blanks and tabs at either end (other white space stays).
std::string trimmed(const std::string& text);

/// Appends to `pieces` the trimmed texts between each `delimiter`. The last
/// piece is always appended: "" gives one empty piece, "x," gives "x" and "".
void splitTrimmed(const std::string& text, char delimiter, std::vector<std::string>& pieces);

}  // namespace xtok
