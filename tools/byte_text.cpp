#include "tools/byte_text.h"

#include <cstdio>
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

char simpleEscape(char c) {
    switch (c) {
        case '\\':
            return '\\';
        case '"':
            return '"';
        case 'n':
            return '\n';
        case 'r':
            return '\r';
        case 't':
            return '\t';
        case '0':
            return '\0';
        default:
            return 'x';  // not a simple one
    }
}

}  // namespace

std::string escapeBytes(const std::string& bytes, const char* otherEscape) {
    std::string text;
    for (char c : bytes) {
        unsigned char byte = static_cast<unsigned char>(c);
        if (c == '\\' || c == '"') {
            text += '\\';
            text += c;
        } else if (c == '\n') {
            text += "\\n";
        } else if (c == '\r') {
            text += "\\r";
        } else if (c == '\t') {
            text += "\\t";
        } else if (byte >= 0x20 && byte < 0x7F) {
            text += c;
        } else {
            char escape[8];
            std::snprintf(escape, sizeof escape, otherEscape, byte);
            text += escape;
        }
    }
    return text;
}

std::string hexBytes(const std::string& bytes) {
    std::string text;
    for (char c : bytes) {
        char pair[4];
        std::snprintf(pair, sizeof pair, text.empty() ? "%02X" : " %02X",
                      static_cast<unsigned char>(c));
        text += pair;
    }
    return text;
}

bool unescapeBytes(const std::string& text, std::string& bytes, std::string& error) {
    bytes.clear();
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '\\') {
            bytes += text[i];
            continue;
        }
        if (i + 1 >= text.size()) {
            error = "a lone backslash ends the value; write \\\\ for one";
            return false;
        }
        char kind = text[++i];
        if (kind != 'x') {
            char c = simpleEscape(kind);
            if (c == 'x') {
                error = std::string("unknown escape \\") + kind + " (use \\xHH for any byte)";
                return false;
            }
            bytes += c;
            continue;
        }
        int high = i + 1 < text.size() ? hexDigitValue(text[i + 1]) : -1;
        int low = i + 2 < text.size() ? hexDigitValue(text[i + 2]) : -1;
        if (high < 0 || low < 0) {
            error = "\\x needs two hex digits";
            return false;
        }
        bytes += static_cast<char>(high * 16 + low);
        i += 2;
    }
    return true;
}

}  // namespace xtok::tools
