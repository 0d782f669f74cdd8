#include "protocol/hex_text.h"

namespace xtok {

namespace {

unsigned nibble(unsigned char c) {
    if (c >= '0' && c <= '9') {
        return c - 48u;
    }
    if (c >= 'A' && c <= 'F') {
        return c - 55u;
    }
    // Meant for 'a'-'f'; other characters are not checked here.
    return c - 87u;
}

bool isHexDigit(unsigned char c) {
    return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f');
}

}  // namespace

bool isHexText(const std::string& text) {
    if (text == "none") {
        return true;
    }
    if (text.size() % 2 != 0) {
        return false;
    }
    for (unsigned char c : text) {
        if (!isHexDigit(c)) {
            return false;
        }
    }
    return true;
}

std::string hexTextToBytes(const std::string& text) {
    std::string bytes;
    if (text == "none") {
        return bytes;
    }
    bytes.reserve(text.size() / 2);
    for (std::size_t i = 0; i + 1 < text.size(); i += 2) {
        unsigned high = nibble(static_cast<unsigned char>(text[i]));
        unsigned low = nibble(static_cast<unsigned char>(text[i + 1]));
        bytes.push_back(static_cast<char>((high * 16u + low) & 0xFFu));
    }
    return bytes;
}

std::string bytesToHexText(const char* bytes, std::size_t length) {
    static const char digits[] = "0123456789ABCDEF";
    std::string text(length * 2, '\0');
    for (std::size_t i = 0; i < length; ++i) {
        unsigned char b = static_cast<unsigned char>(bytes[i]);
        text[2 * i] = digits[b >> 4];
        text[2 * i + 1] = digits[b & 0x0F];
    }
    return text;
}

}  // namespace xtok
