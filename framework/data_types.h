// The fixed table of data types and the data type text of a tag address,
// e.g. "unsignedShort", "byte-16" or "short-4(swap2,neg)".
#pragma once

#include <climits>
#include <cstdint>
#include <string>
#include <vector>

#include "xtokline/constants.h"

namespace xtok {

/// The largest datum a data type text may describe, in bytes: its size in
/// bits, as the bit types count it, still fits 32 bits. A longer text is
/// refused as an unknown type; a tag this large may still fail to get its
/// buffer when it is read, which fails the read with "not enough memory".
constexpr int32_t kMaxDataSize = INT32_MAX / 8;

/// A parsed data type text.
struct DataType {
    int32_t code = 0;
    int32_t elementCode = 0;               ///< non-zero exactly for arrays and strings
    int32_t size = 0;                      ///< bytes; bits for the bit types
    std::vector<std::string> conversions;  ///< in the order written
};

/// False for an unknown name, a "(" without ")" or a size above kMaxDataSize;
/// `type` is then unspecified.
bool ParseDataType(const std::string& text, DataType& type);

/// The inverse of the parse for a code and a total size in bytes: "byte-16"
/// for (kByteArray, 16); "??" for an unknown code.
std::string DataTypeName(int32_t code, int32_t size);

/// The code's bit in a mask of allowed types; 0 for an unknown code.
uint32_t DataTypeBit(int32_t code);

/// Bytes of one value of the code; 0 for arrays, strings, objects and
/// unknown codes.
int32_t ElementSize(int32_t code);

/// Codes whose values are bits, packed in the raw bytes.
bool IsBitType(int32_t code);

/// The code that an element of the datum has: the element code for arrays,
/// the code itself for scalars.
inline int32_t EffectiveElementCode(int32_t code, int32_t elementCode) {
    return elementCode != 0 ? elementCode : code;
}

/// Number of elements of a datum of `size`: 1 for scalars.
int32_t ElementCount(int32_t elementCode, int32_t size);

}  // namespace xtok
