// Typed values of tags: the text a person types for a tag's data type turned
// into the tag's value buffer, and back.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace xtok {
class ITag;
}

namespace xtok::tools {

/// What a value buffer holds, as the tag reports it.
struct TagShape {
    int32_t code = 0;         // data type code, 1 boolean ... 27 object
    int32_t elementCode = 0;  // non-zero for arrays and strings
    int32_t size = 0;         // value bytes (bits, one byte each, for the bit types)

    static TagShape of(ITag& tag);
};

/// Fills `value` (shape.size bytes) from `text`:
///  - numbers in decimal, or hexadecimal after 0x; booleans 0/1/true/false/on/off;
///  - strings as they stand with the escapes of unescapeBytes, and a zero byte
///    left at the end;
///  - arrays as one number per element, separated by blanks or commas;
///  - binary and time data as hex digits, blanks allowed between bytes.
/// False with `error` set when the text does not fit the type.
bool parseValue(const TagShape& shape, const std::string& text, std::vector<uint8_t>& value,
                std::string& error);

/// A value for a person: numbers, 1/0 for booleans, strings quoted and
/// escaped (up to their zero byte), hex digits for binary data.
std::string formatValue(const TagShape& shape, const std::vector<uint8_t>& value);

/// The same value as a JSON value.
std::string formatValueJson(const TagShape& shape, const std::vector<uint8_t>& value);

/// The text of a string value: its bytes up to the first zero byte.
std::string stringValue(const std::vector<uint8_t>& value);

/// A 32-bit number's value (unsignedInt, int); 0 for a shorter value.
uint32_t wordValue(const std::vector<uint8_t>& value);

}  // namespace xtok::tools
