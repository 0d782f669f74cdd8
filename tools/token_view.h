// How a received token is shown: a time stamp, its text and its bytes.
#pragma once

#include <chrono>
#include <string>

#include "tools/plugin_session.h"

namespace xtok::tools {

/// Local wall-clock time "HH:MM:SS.mmm", for people.
std::string clockText(std::chrono::system_clock::time_point when);
/// UTC "YYYY-MM-DDTHH:MM:SS.mmmZ", for machines.
std::string isoTime(std::chrono::system_clock::time_point when);

/// `"AB\x00"  41 42 00`: the bytes as escaped text, then as hex; `""` for none.
std::string bytesView(const std::string& bytes);

/// `"text"  41 42 43  (3 bytes)`, saying so when the text is not the whole
/// token.
std::string tokenLine(const Token& token);

}  // namespace xtok::tools
