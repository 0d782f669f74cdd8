#include "tools/json_line.h"

#include <cstdio>

namespace xtok::tools {

std::string jsonString(const std::string& bytes) {
    std::string out = "\"";
    for (char c : bytes) {
        unsigned char byte = static_cast<unsigned char>(c);
        if (c == '"' || c == '\\') {
            out += '\\';
            out += c;
        } else if (c == '\n') {
            out += "\\n";
        } else if (c == '\r') {
            out += "\\r";
        } else if (c == '\t') {
            out += "\\t";
        } else if (byte < 0x20 || byte >= 0x7F) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\u%04x", byte);
            out += escape;
        } else {
            out += c;
        }
    }
    return out + "\"";
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
