#include "framework/conversions.h"

#include <algorithm>
#include <cstring>

#include "framework/scratch_buffer.h"
#include "framework/tag_base.h"

namespace xtok {
namespace {

bool swapNibbles(const DataType&, uint8_t* bytes, int32_t length, bool) {
    for (int32_t i = 0; i < length; ++i) {
        bytes[i] = static_cast<uint8_t>(bytes[i] << 4 | bytes[i] >> 4);
    }
    return true;
}

template <int32_t Group>
bool reverseGroups(const DataType&, uint8_t* bytes, int32_t length, bool) {
    if (length <= 0) {
        return true;
    }
    if (length % Group != 0) {
        return false;
    }
    for (int32_t i = 0; i < length; i += Group) {
        std::reverse(bytes + i, bytes + i + Group);
    }
    return true;
}

uint32_t readLittleEndian(const uint8_t* bytes, int32_t width) {
    uint32_t value = 0;
    for (int32_t i = std::min(width, 4) - 1; i >= 0; --i) {
        value = value << 8 | bytes[i];
    }
    return value;
}

// Fills the whole width: a decoded sum has 32 bits, wider bytes become 0.
void writeLittleEndian(uint32_t value, uint8_t* bytes, int32_t width) {
    for (int32_t i = 0; i < width; ++i) {
        bytes[i] = i < 4 ? static_cast<uint8_t>(value >> (8 * i)) : 0;
    }
}

// Each byte two digits, the first byte the least significant pair.
bool decodeBcd(uint8_t* element, int32_t width) {
    uint32_t sum = 0;
    uint32_t scale = 1;
    for (int32_t i = 0; i < width; ++i) {
        uint32_t high = element[i] >> 4;
        uint32_t low = element[i] & 0x0F;
        if (high > 9 || low > 9) {
            return false;
        }
        sum += (high * 10 + low) * scale;
        scale *= 100;
    }
    writeLittleEndian(sum, element, width);
    return true;
}

bool encodeBcd(uint8_t* element, int32_t width) {
    static const uint32_t kLargest[] = {99, 9999, 999999, 99999999};
    if (width > 4) {
        return false;
    }
    uint32_t value = readLittleEndian(element, width);
    if (value > kLargest[width - 1]) {
        return false;
    }
    uint32_t packed = 0;
    for (int shift = 0; value != 0; shift += 4, value /= 10) {
        packed |= (value % 10) << shift;
    }
    writeLittleEndian(packed, element, width);
    return true;
}

bool bcd(const DataType& type, uint8_t* bytes, int32_t length, bool writing) {
    int32_t width = ElementSize(EffectiveElementCode(type.code, type.elementCode));
    if (width <= 0) {
        return true;
    }
    for (int32_t at = 0; at + width <= length; at += width) {
        if (!(writing ? encodeBcd(bytes + at, width) : decodeBcd(bytes + at, width))) {
            return false;
        }
    }
    return true;
}

void negateTwosComplement(uint8_t* element, int32_t width) {
    unsigned carry = 1;
    for (int32_t i = 0; i < width; ++i) {
        unsigned sum = static_cast<uint8_t>(~element[i]) + carry;
        element[i] = static_cast<uint8_t>(sum);
        carry = sum >> 8;
    }
}

bool negate(const DataType& type, uint8_t* bytes, int32_t length, bool) {
    int32_t code = EffectiveElementCode(type.code, type.elementCode);
    bool signBitOnly = code == kFloat || code == kDouble;
    if (code != kByte && code != kShort && code != kInt && code != kInt64 && !signBitOnly) {
        return false;
    }
    int32_t width = ElementSize(code);
    // The walk is bounded by the element count, not the byte length: an array
    // of N elements of width W has only its first ceil(N/W) elements negated.
    // Devices and projects rely on this, so it stays.
    int32_t count = ElementCount(type.elementCode, length);
    for (int32_t at = 0; at < count && at + width <= length; at += width) {
        if (signBitOnly) {
            bytes[at + width - 1] ^= 0x80;
        } else {
            negateTwosComplement(bytes + at, width);
        }
    }
    return true;
}

bool invert(const DataType& type, uint8_t* bytes, int32_t length, bool) {
    if (IsBitType(type.code)) {
        for (int32_t i = 0; i < length; ++i) {
            bytes[i] = bytes[i] == 0 ? 1 : 0;
        }
        return true;
    }
    switch (EffectiveElementCode(type.code, type.elementCode)) {
        case kUnsignedByte:
        case kUnsignedShort:
        case kUnsignedInt:
        case kBinary:
        case kUint64:
            for (int32_t i = 0; i < length; ++i) {
                bytes[i] = static_cast<uint8_t>(~bytes[i]);
            }
            return true;
        default:
            return false;  // signed values are negated, not inverted
    }
}

struct NamedConversion {
    const char* name;
    bool (*apply)(const DataType& type, uint8_t* bytes, int32_t length, bool writing);
};

const NamedConversion kConversions[] = {
    {"swapnibble", swapNibbles},
    {"swap2", reverseGroups<2>},
    {"swap4", reverseGroups<4>},
    {"swap8", reverseGroups<8>},
    {"bcd", bcd},
    {"neg", negate},
    {"inv", invert},
};

// Bit i of the value is bit (offset + i) of the raw bytes; one byte per bit.
void unpackBits(const uint8_t* raw, int32_t offset, uint8_t* value, int32_t bits) {
    for (int32_t i = 0; i < bits; ++i) {
        int32_t bit = offset + i;
        value[i] = (raw[bit / 8] >> (bit % 8)) & 1;
    }
}

// Changes only the tag's own bits of the raw bytes.
void packBits(const uint8_t* value, int32_t bits, uint8_t* raw, int32_t offset) {
    for (int32_t i = 0; i < bits; ++i) {
        int32_t bit = offset + i;
        uint8_t mask = static_cast<uint8_t>(1u << (bit % 8));
        raw[bit / 8] = static_cast<uint8_t>(value[i] ? raw[bit / 8] | mask : raw[bit / 8] & ~mask);
    }
}

}  // namespace

bool ApplyConversion(const DataType& type, uint8_t* bytes, const std::string& name,
                     int32_t direction) {
    int32_t length = type.size;
    if (!bytes && length > 0) {
        return false;
    }
    for (const NamedConversion& conversion : kConversions) {
        if (name == conversion.name) {
            return conversion.apply(type, bytes, length, direction != 0);
        }
    }
    return false;
}

bool TagBase::ApplyConversion(uint8_t* bytes, const char* name, int32_t direction) {
    return xtok::ApplyConversion(dataType, bytes, name ? name : "", direction);
}

bool TagBase::Convert(const void* source, void* target, int32_t direction) {
    if (!source || !target) {
        return false;
    }
    const int32_t size = std::max(dataType.size, 0);
    const int32_t rawSize = GetRawSize();
    const bool bits = IsBitType(dataType.code);
    const int32_t offset = GetBitOffset();
    ScratchBuffer<256> scratch(std::max(size, rawSize));
    if (!scratch.ok()) {
        SetError(kNoMemoryText);
        return false;
    }
    uint8_t* work = scratch.data();
    const auto& names = dataType.conversions;
    if (direction == 0) {
        if (bits) {
            unpackBits(static_cast<const uint8_t*>(source), offset, work, size);
        } else {
            std::memcpy(work, source, rawSize);
        }
        // Reading undoes the written order: last conversion first.
        for (auto name = names.rbegin(); name != names.rend(); ++name) {
            if (!xtok::ApplyConversion(dataType, work, *name, direction)) {
                SetError("Conversion error at: " + *name);
                return false;
            }
        }
        std::memcpy(target, work, size);
        return true;
    }
    std::memcpy(work, source, size);
    for (const std::string& name : names) {
        if (!xtok::ApplyConversion(dataType, work, name, direction)) {
            SetError("Conversion error at: " + name);
            return false;
        }
    }
    if (bits) {
        packBits(work, size, static_cast<uint8_t*>(target), offset);
    } else {
        std::memcpy(target, work, rawSize);
    }
    return true;
}

}  // namespace xtok
