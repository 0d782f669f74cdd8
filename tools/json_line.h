// One JSON object on one line: what --json prints per command result, so a
// script can read the output line by line.
#pragma once

#include <cstdint>
#include <string>

namespace xtok::tools {

/// A quoted JSON string. Bytes 0x80 and above become \u00XX (read as
/// Latin-1): tokens need not be UTF-8, and the output must stay valid JSON.
std::string jsonString(const std::string& bytes);

class JsonLine {
public:
    JsonLine& text(const std::string& key, const std::string& value);
    JsonLine& number(const std::string& key, int64_t value);
    JsonLine& flag(const std::string& key, bool value);
    /// `json` must already be a JSON value.
    JsonLine& raw(const std::string& key, const std::string& json);
    /// The object, without a newline.
    std::string str() const { return "{" + members_ + "}"; }

private:
    void key(const std::string& name);
    std::string members_;
};

}  // namespace xtok::tools
