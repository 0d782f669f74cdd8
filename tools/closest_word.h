// "did you mean ...?": the known word a mistyped one was most likely meant as.
#pragma once

#include <string>
#include <vector>

namespace xtok::tools {

/// The candidate fewest edits away from `word` (letter case aside), when
/// that is close enough to be a slip of the fingers; else "".
std::string closestWord(const std::string& word, const std::vector<std::string>& candidates);

/// "unknown WHAT 'word'" and, when one is close, "; did you mean 'x'?".
std::string unknownWord(const char* what, const std::string& word,
                        const std::vector<std::string>& candidates);

}  // namespace xtok::tools
