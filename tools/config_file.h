// The configuration text of "run --config @FILE": a small regular file, read
// without trusting what the name turns out to be.
#pragma once

#include <cstddef>
#include <string>

namespace xtok::tools {

/// Far beyond any configuration a project editor writes.
constexpr std::size_t kMaxConfigFile = 1 << 20;

/// The whole of `path` into `text`. False with one line in `error` when it
/// cannot be read, is no regular file (a FIFO would block, a device never
/// end) or holds more than kMaxConfigFile bytes.
bool readConfigFile(const std::string& path, std::string& text, std::string& error);

}  // namespace xtok::tools
