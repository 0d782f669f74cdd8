#include "tools/json_line.h"

#include "tools/byte_text.h"

#include <cstdio>

namespace xtok::tools {

std::string jsonString(const std::string& bytes) {
    return "\"" + escapeBytes(bytes, "\\u%04x") + "\"";
}

void JsonLine::key(const std::string& name) {
    if (!members_.empty()) {
        members_ += ',';
    }
    members_ += jsonString(name) + ':';
}

JsonLine& JsonLine::text(const std::string& name, const std::string& value) {
    return raw(name, jsonString(value));
}

JsonLine& JsonLine::number(const std::string& name, int64_t value) {
    return raw(name, std::to_string(value));
}

JsonLine& JsonLine::flag(const std::string& name, bool value) {
    return raw(name, value ? "true" : "false");
}

JsonLine& JsonLine::raw(const std::string& name, const std::string& json) {
    key(name);
    members_ += json;
    return *this;
}

}  // namespace xtok::tools
