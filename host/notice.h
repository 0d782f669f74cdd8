// Where the host says things the plug-in's interfaces have no room for: why a
// port would not open, a feature the device lacks, a task left running.
#pragma once

#include <functional>
#include <string>

namespace xtok::host {

/// Receives one line of text, without a newline. Called from any thread.
using Notice = std::function<void(const std::string&)>;

/// The default: "xtok-host: " + text on stderr.
void printNotice(const std::string& text);

}  // namespace xtok::host
