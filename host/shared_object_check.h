// What can be told about a plug-in file before dlopen maps it: a file that
// dlopen would crash on (segments past its end fault inside the loader) or
// could never load (another machine's code) is refused in plain words.
#pragma once

#include <string>

namespace xtok::host {

/// "" when `path` may be loaded, else why not: missing, no regular file, no
/// shared object, built for another machine or word size, or truncated.
std::string sharedObjectProblem(const std::string& path);

}  // namespace xtok::host
