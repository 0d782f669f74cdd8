// "xtok-host completion bash": a bash completion script made from the
// command line's own definition, so that it offers every command and option
// there is, and no other.
#pragma once

#include <string>

namespace CLI {
class App;
}

namespace xtok::tools {

std::string bashCompletion(const CLI::App& app);

}  // namespace xtok::tools
