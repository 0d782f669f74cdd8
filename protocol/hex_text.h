// Hex text: "none" (no bytes) or pairs of hex digits, high nibble first. The
// form of the framing prefixes and suffixes, and of tokens in hex mode.
#pragma once

#include <cstddef>
#include <string>

namespace xtok {

/// "none", or an even number of 0-9, A-F, a-f (the empty text included).
bool isHexText(const std::string& text);

/// The bytes of a hex text. Meant for texts that passed isHexText; any other
/// text still converts (each character maps to its code minus 48, 55 or 87
/// modulo 256) and an odd last character is ignored, so nothing is refused.
std::string hexTextToBytes(const std::string& text);

/// Two upper-case hex digits per byte.
std::string bytesToHexText(const char* bytes, std::size_t length);

}  // namespace xtok
