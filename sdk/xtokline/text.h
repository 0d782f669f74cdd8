// Text helpers that the plug-in and its hosts both need, header only so that
// each side compiles its own copy: hex text, clamped numbers and trimming.
#pragma once

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace xtok {

/// The value of a hex digit, or -1 for any other character.
inline int hexDigitValue(char c) {
    return c >= '0' && c <= '9'   ? c - '0'
           : c >= 'a' && c <= 'f' ? c - 'a' + 10
           : c >= 'A' && c <= 'F' ? c - 'A' + 10
                                  : -1;
}

/// Hex text: "none" (no bytes) or pairs of hex digits, high nibble first. The
/// form of the framing prefixes and suffixes, and of tokens in hex mode.
inline bool isHexText(const std::string& text) {
    if (text == "none") {
        return true;
    }
    if (text.size() % 2 != 0) {
        return false;
    }
    for (char c : text) {
        if (hexDigitValue(c) < 0) {
            return false;
        }
    }
    return true;
}

/// Appends the bytes of a hex text to `bytes`. Meant for texts that passed
/// isHexText; any other text still converts (each character maps to its
/// code minus 48, 55 or 87, modulo 256) and an odd last character is
/// ignored, so nothing is refused.
inline void appendHexBytes(const std::string& text, std::string& bytes) {
    if (text == "none") {
        return;
    }
    auto nibble = [](unsigned char c) -> unsigned {
        return c >= '0' && c <= '9' ? c - 48u : c >= 'A' && c <= 'F' ? c - 55u : c - 87u;
    };
    for (std::size_t i = 0; i + 1 < text.size(); i += 2) {
        const unsigned high = nibble(static_cast<unsigned char>(text[i]));
        const unsigned low = nibble(static_cast<unsigned char>(text[i + 1]));
        bytes.push_back(static_cast<char>((high * 16u + low) & 0xFFu));
    }
}

inline std::string hexTextToBytes(const std::string& text) {
    std::string bytes;
    appendHexBytes(text, bytes);
    return bytes;
}

/// Two upper-case hex digits per byte.
inline std::string bytesToHexText(const char* bytes, std::size_t length) {
    static const char digits[] = "0123456789ABCDEF";
    std::string text(length * 2, '\0');
    for (std::size_t i = 0; i < length; ++i) {
        const unsigned char b = static_cast<unsigned char>(bytes[i]);
        text[2 * i] = digits[b >> 4];
        text[2 * i + 1] = digits[b & 0x0F];
    }
    return text;
}

/// The number at the start of `text` in `base` (0: decimal, "0x" hex or
/// leading-zero octal), out of range clamped to 32 bits; false when no
/// character was used. `used` receives the count of characters read. errno
/// is left as the caller had it.
inline bool parseClamped(const std::string& text, int base, int32_t& out,
                         std::size_t* used = nullptr) {
    const char* begin = text.c_str();
    char* end = nullptr;
    const int saved = errno;
    const long long value = std::strtoll(begin, &end, base);
    errno = saved;
    if (used) {
        *used = static_cast<std::size_t>(end - begin);
    }
    out = static_cast<int32_t>(value > INT32_MAX   ? INT32_MAX
                               : value < INT32_MIN ? INT32_MIN
                                                   : value);
    return end != begin;
}

/// Blanks, tabs and line ends: what the hosts trim from lines they read.
inline constexpr char kWhiteSpace[] = " \t\r\n";

/// The text without `blanks` at either end: by default blanks and tabs, as
/// the plug-in trims (other white space stays).
inline std::string trimmed(const std::string& text, const char* blanks = " \t") {
    const std::size_t first = text.find_first_not_of(blanks);
    if (first == std::string::npos) {
        return std::string();
    }
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

/// Appends to `pieces` the trimmed texts between each `delimiter`. The last
/// piece is always appended: "" gives one empty piece, "x," gives "x" and "".
inline void splitTrimmed(const std::string& text, char delimiter,
                         std::vector<std::string>& pieces) {
    std::size_t start = 0;
    for (std::size_t p = text.find(delimiter); p != std::string::npos;
         p = text.find(delimiter, start)) {
        pieces.push_back(trimmed(text.substr(start, p - start)));
        start = p + 1;
    }
    pieces.push_back(trimmed(text.substr(start)));
}

}  // namespace xtok
