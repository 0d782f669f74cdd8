#include "framework/data_types.h"

#include <cstddef>

#include "xtokline/text.h"

namespace xtok {
namespace {

struct Row {
    const char* name;
    int32_t elementCode;
    int32_t size;  // 0: element size times the length
};

// Indexed by code - 1; the type bit of a row is 1 << index.
const Row kRows[] = {
    {"boolean", 0, 1},       {"byte", 0, 1},           {"short", 0, 2},        {"int", 0, 4},
    {"unsignedByte", 0, 1},  {"unsignedShort", 0, 2},  {"unsignedInt", 0, 4},  {"float", 0, 4},
    {"double", 0, 8},        {"string-", 2, 0},        {"binary-", 5, 0},      {"time", 0, 10},
    {"boolean-", 1, 0},      {"byte-", 2, 0},          {"short-", 3, 0},       {"int-", 4, 0},
    {"unsignedByte-", 5, 0}, {"unsignedShort-", 6, 0}, {"unsignedInt-", 7, 0}, {"float-", 8, 0},
    {"double-", 9, 0},       {"time-", 12, 0},         {"uint64", 0, 8},       {"int64", 0, 8},
    {"uint64-", 23, 0},      {"int64-", 24, 0},        {"object", 0, 0},
};
constexpr int32_t kRowCount = static_cast<int32_t>(sizeof kRows / sizeof kRows[0]);

const Row* rowOf(int32_t code) {
    return code >= 1 && code <= kRowCount ? &kRows[code - 1] : nullptr;
}

// Leading decimal digits; no sign, so a length is never negative. Stops
// counting once past the maximum so that no text can overflow it.
int64_t leadingNumber(const std::string& text) {
    int64_t value = 0;
    for (char c : text) {
        if (c < '0' || c > '9') {
            break;
        }
        value = value * 10 + (c - '0');
        if (value > kMaxDataSize) {
            break;
        }
    }
    return value;
}

// Splits "type(conv,conv)" into the type part and the conversion names.
bool splitConversions(const std::string& text, std::string& typePart,
                      std::vector<std::string>& conversions) {
    std::size_t open = text.find('(');
    if (open == std::string::npos) {
        typePart = text;
        return true;
    }
    std::size_t close = text.find(')', open + 1);
    if (close == std::string::npos) {
        return false;
    }
    splitTrimmed(text.substr(open + 1, close - open - 1), ',', conversions);
    typePart = trimmed(text.substr(0, open));
    return true;
}

}  // namespace

bool ParseDataType(const std::string& text, DataType& type) {
    std::string typePart;
    type.conversions.clear();
    if (!splitConversions(trimmed(text), typePart, type.conversions)) {
        return false;
    }
    int64_t length = 1;
    std::size_t dash = typePart.find('-');
    if (dash != std::string::npos) {
        length = leadingNumber(typePart.substr(dash + 1));
        typePart.erase(dash + 1);
    }
    for (int32_t code = 1; code <= kRowCount; ++code) {
        const Row& row = kRows[code - 1];
        if (typePart != row.name) {
            continue;
        }
        int64_t size = row.size != 0 ? row.size : ElementSize(row.elementCode) * length;
        if (size > kMaxDataSize) {
            return false;
        }
        type.code = code;
        type.elementCode = row.elementCode;
        type.size = static_cast<int32_t>(size);
        return true;
    }
    return false;
}

std::string DataTypeName(int32_t code, int32_t size) {
    const Row* row = rowOf(code);
    if (!row) {
        return "??";
    }
    if (row->size != 0) {
        return row->name;
    }
    int32_t elementSize = ElementSize(row->elementCode);
    return row->name + std::to_string(elementSize != 0 ? size / elementSize : size);
}

uint32_t DataTypeBit(int32_t code) {
    return rowOf(code) ? 1u << (code - 1) : 0u;
}

int32_t ElementSize(int32_t code) {
    switch (code) {
        case kBoolean:
        case kByte:
        case kUnsignedByte:
            return 1;
        case kShort:
        case kUnsignedShort:
            return 2;
        case kInt:
        case kUnsignedInt:
        case kFloat:
            return 4;
        case kDouble:
        case kUint64:
        case kInt64:
            return 8;
        case kTime:
            return 10;
        default:
            return 0;
    }
}

bool IsBitType(int32_t code) {
    return code == kBoolean || code == kBooleanArray;
}

int32_t ElementCount(int32_t elementCode, int32_t size) {
    int32_t elementSize = ElementSize(elementCode);
    return elementCode != 0 && elementSize != 0 ? size / elementSize : 1;
}

}  // namespace xtok
