#include "tools/tag_values.h"

#include <strings.h>

#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "tools/byte_text.h"
#include "tools/json_line.h"
#include "xtokline/constants.h"
#include "xtokline/protocol.h"

namespace xtok::tools {

namespace {

enum class Kind { Bool, Signed, Unsigned, Float, Text, Hex, Unsupported };

struct Element {
    Kind kind;
    std::size_t width;  // bytes per element in the value buffer
};

Element elementOf(int32_t code) {
    switch (code) {
        case kBoolean:
            return {Kind::Bool, 1};
        case kByte:
            return {Kind::Signed, 1};
        case kShort:
            return {Kind::Signed, 2};
        case kInt:
            return {Kind::Signed, 4};
        case kInt64:
            return {Kind::Signed, 8};
        case kUnsignedByte:
            return {Kind::Unsigned, 1};
        case kUnsignedShort:
            return {Kind::Unsigned, 2};
        case kUnsignedInt:
            return {Kind::Unsigned, 4};
        case kUint64:
            return {Kind::Unsigned, 8};
        case kFloat:
            return {Kind::Float, 4};
        case kDouble:
            return {Kind::Float, 8};
        case kTime:
            return {Kind::Hex, 10};
        default:
            return {Kind::Unsupported, 0};
    }
}

/// Strings and byte blobs are one value; other arrays are lists of elements.
Element layoutOf(const TagShape& shape, std::size_t& count) {
    count = 1;
    if (shape.code == kString) {
        return {Kind::Text, static_cast<std::size_t>(shape.size)};
    }
    if (shape.code == kBinary || shape.code == kTime) {
        return {Kind::Hex, static_cast<std::size_t>(shape.size)};
    }
    Element element = elementOf(shape.elementCode != 0 ? shape.elementCode : shape.code);
    if (element.kind == Kind::Hex) {  // arrays of time stamps: one blob as well
        return {Kind::Hex, static_cast<std::size_t>(shape.size)};
    }
    if (element.kind != Kind::Unsupported && shape.elementCode != 0) {
        count = static_cast<std::size_t>(shape.size) / element.width;
    }
    return element;
}

void putLittleEndian(uint64_t number, std::size_t width, uint8_t* out) {
    for (std::size_t i = 0; i < width; ++i) {
        out[i] = static_cast<uint8_t>(number >> (8 * i));
    }
}

uint64_t getLittleEndian(const uint8_t* in, std::size_t width) {
    uint64_t number = 0;
    for (std::size_t i = 0; i < width; ++i) {
        number |= static_cast<uint64_t>(in[i]) << (8 * i);
    }
    return number;
}

/// Base 10, or 16 after "0x": a leading zero meaning octal would surprise.
bool parseInteger(const std::string& word, bool isSigned, std::size_t width, uint64_t& bits,
                  std::string& error) {
    std::string digits = word;
    bool negative = !digits.empty() && digits[0] == '-';
    if (negative || (!digits.empty() && digits[0] == '+')) {
        digits.erase(0, 1);
    }
    int base = 10;
    if (digits.size() > 2 && digits[0] == '0' && (digits[1] == 'x' || digits[1] == 'X')) {
        base = 16;
        digits.erase(0, 2);
    }
    if (digits.empty() || digits.find_first_of("+- \t") != std::string::npos) {
        error = "'" + word + "' is not a number";
        return false;
    }
    errno = 0;
    char* end = nullptr;
    unsigned long long magnitude = std::strtoull(digits.c_str(), &end, base);
    if (*end != '\0') {
        error = "'" + word + "' is not a number";
        return false;
    }
    unsigned bitsWide = static_cast<unsigned>(width * 8);
    uint64_t limit =
        bitsWide == 64 ? std::numeric_limits<uint64_t>::max() : (uint64_t{1} << bitsWide) - 1;
    uint64_t positiveLimit = isSigned ? limit >> 1 : limit;
    uint64_t negativeLimit = isSigned ? positiveLimit + 1 : 0;
    if (errno == ERANGE || magnitude > (negative ? negativeLimit : positiveLimit)) {
        error = "'" + word + "' is out of range for " + std::to_string(bitsWide) + "-bit " +
                (isSigned ? "signed" : "unsigned") + " values";
        return false;
    }
    bits = negative ? uint64_t{0} - magnitude : magnitude;
    return true;
}

bool parseBool(const std::string& word, uint8_t& bit, std::string& error) {
    static const char* const kTrue[] = {"1", "true", "on"};
    static const char* const kFalse[] = {"0", "false", "off"};
    for (const char* name : kTrue) {
        if (strcasecmp(word.c_str(), name) == 0) {
            bit = 1;
            return true;
        }
    }
    for (const char* name : kFalse) {
        if (strcasecmp(word.c_str(), name) == 0) {
            bit = 0;
            return true;
        }
    }
    error = "'" + word + "' is no boolean (use 0/1, true/false or on/off)";
    return false;
}

bool parseFloat(const std::string& word, std::size_t width, uint8_t* out, std::string& error) {
    errno = 0;
    char* end = nullptr;
    double number = std::strtod(word.c_str(), &end);
    if (word.empty() || *end != '\0') {
        error = "'" + word + "' is not a number";
        return false;
    }
    if (errno == ERANGE || (width == 4 && std::isfinite(number) &&
                            std::fabs(number) > std::numeric_limits<float>::max())) {
        error = "'" + word + "' is out of range";
        return false;
    }
    if (width == 4) {
        float single = static_cast<float>(number);
        std::memcpy(out, &single, sizeof single);
    } else {
        std::memcpy(out, &number, sizeof number);
    }
    return true;
}

bool parseElement(const Element& element, const std::string& word, uint8_t* out,
                  std::string& error) {
    switch (element.kind) {
        case Kind::Bool:
            return parseBool(word, *out, error);
        case Kind::Float:
            return parseFloat(word, element.width, out, error);
        default: {
            uint64_t bits = 0;
            if (!parseInteger(word, element.kind == Kind::Signed, element.width, bits, error)) {
                return false;
            }
            putLittleEndian(bits, element.width, out);
            return true;
        }
    }
}

std::vector<std::string> splitList(const std::string& text) {
    std::vector<std::string> words;
    std::string word;
    for (char c : text + " ") {
        if (c == ' ' || c == ',' || c == '\t') {
            if (!word.empty()) {
                words.push_back(word);
            }
            word.clear();
        } else {
            word += c;
        }
    }
    return words;
}

bool parseText(const TagShape& shape, const std::string& text, std::vector<uint8_t>& value,
               std::string& error) {
    std::string bytes;
    if (!unescapeBytes(text, bytes, error)) {
        return false;
    }
    if (bytes.find('\0') != std::string::npos) {
        error = "a string value ends at its first zero byte; send such data as hex tokens";
        return false;
    }
    // The protocol reads a string up to its zero byte, so one must fit.
    if (bytes.size() + 1 > static_cast<std::size_t>(shape.size)) {
        error = "the value has " + std::to_string(bytes.size()) + " bytes; string-" +
                std::to_string(shape.size) + " holds at most " +
                std::to_string(shape.size > 0 ? shape.size - 1 : 0);
        return false;
    }
    std::memcpy(value.data(), bytes.data(), bytes.size());
    return true;
}

bool parseHex(const std::string& text, std::vector<uint8_t>& value, std::string& error) {
    std::string digits;
    for (char c : text) {
        if (c != ' ' && c != '\t') {
            digits += c;
        }
    }
    std::string bytes;
    std::string escaped;
    for (std::size_t i = 0; i < digits.size(); i += 2) {
        escaped += "\\x" + digits.substr(i, 2);
    }
    if (digits.size() % 2 != 0 || !unescapeBytes(escaped, bytes, error)) {
        error = "'" + text + "' is not hex data (two digits per byte)";
        return false;
    }
    if (bytes.size() != value.size()) {
        error = "the value has " + std::to_string(bytes.size()) + " bytes; the tag takes exactly " +
                std::to_string(value.size());
        return false;
    }
    std::memcpy(value.data(), bytes.data(), bytes.size());
    return true;
}

std::string formatElement(const Element& element, const uint8_t* in) {
    uint64_t bits = getLittleEndian(in, element.width);
    switch (element.kind) {
        case Kind::Bool:
            return *in ? "1" : "0";
        case Kind::Signed: {
            unsigned shift = static_cast<unsigned>(64 - 8 * element.width);
            int64_t number = static_cast<int64_t>(bits << shift) >> shift;  // sign-extends
            return std::to_string(number);
        }
        case Kind::Unsigned:
            return std::to_string(bits);
        default: {
            char text[40];
            if (element.width == 4) {
                float single;
                std::memcpy(&single, in, sizeof single);
                std::snprintf(text, sizeof text, "%.9g", static_cast<double>(single));
            } else {
                double number;
                std::memcpy(&number, in, sizeof number);
                std::snprintf(text, sizeof text, "%.17g", number);
            }
            return text;
        }
    }
}

std::string hexOf(const std::vector<uint8_t>& value) {
    return hexBytes(std::string(value.begin(), value.end()));
}

}  // namespace

TagShape TagShape::of(ITag& tag) {
    return TagShape{tag.GetTypeCode(), tag.GetElementCode(), tag.GetSize()};
}

bool parseValue(const TagShape& shape, const std::string& text, std::vector<uint8_t>& value,
                std::string& error) {
    value.assign(static_cast<std::size_t>(shape.size > 0 ? shape.size : 0), 0);
    std::size_t count = 0;
    Element element = layoutOf(shape, count);
    switch (element.kind) {
        case Kind::Unsupported:
            error = "values of data type code " + std::to_string(shape.code) +
                    " cannot be typed here; use the console's hex read/write";
            return false;
        case Kind::Text:
            return parseText(shape, text, value, error);
        case Kind::Hex:
            return parseHex(text, value, error);
        default:
            break;
    }
    std::vector<std::string> words = splitList(text);
    if (words.size() != count) {
        error = "the tag takes " + std::to_string(count) + (count == 1 ? " value" : " values") +
                ", got " + std::to_string(words.size());
        return false;
    }
    for (std::size_t i = 0; i < count; ++i) {
        if (!parseElement(element, words[i], value.data() + i * element.width, error)) {
            return false;
        }
    }
    return true;
}

std::string stringValue(const std::vector<uint8_t>& value) {
    std::string text(value.begin(), value.end());
    return text.substr(0, text.find('\0'));
}

uint32_t wordValue(const std::vector<uint8_t>& value) {
    return value.size() < 4 ? 0 : static_cast<uint32_t>(getLittleEndian(value.data(), 4));
}

std::string formatValue(const TagShape& shape, const std::vector<uint8_t>& value) {
    std::size_t count = 0;
    Element element = layoutOf(shape, count);
    if (element.kind == Kind::Text) {
        return "\"" + escapeBytes(stringValue(value)) + "\"";
    }
    if (element.kind == Kind::Hex || element.kind == Kind::Unsupported) {
        return hexOf(value);
    }
    std::string text;
    for (std::size_t i = 0; i < count && (i + 1) * element.width <= value.size(); ++i) {
        text += (i ? " " : "") + formatElement(element, value.data() + i * element.width);
    }
    return text;
}

std::string formatValueJson(const TagShape& shape, const std::vector<uint8_t>& value) {
    std::size_t count = 0;
    Element element = layoutOf(shape, count);
    if (element.kind == Kind::Text) {
        return jsonString(stringValue(value));
    }
    if (element.kind == Kind::Hex || element.kind == Kind::Unsupported) {
        return jsonString(hexOf(value));
    }
    std::string json;
    for (std::size_t i = 0; i < count && (i + 1) * element.width <= value.size(); ++i) {
        std::string one = formatElement(element, value.data() + i * element.width);
        if (element.kind == Kind::Bool) {
            one = one == "1" ? "true" : "false";
        } else if (element.kind == Kind::Float &&
                   !std::isfinite(std::strtod(one.c_str(), nullptr))) {
            one = jsonString(one);  // JSON has no inf or nan
        }
        json += (i ? "," : "") + one;
    }
    return shape.elementCode != 0 ? "[" + json + "]" : json;
}

}  // namespace xtok::tools
