// The contract's numbers, defined once for the plug-in, its hosts and the
// tests: data type codes of tags, and the codes and record of a serial line's
// settings as ISerialPort::Configure takes them.
#pragma once

#include <cstdint>

namespace xtok {

/// Data type codes (ITag::GetTypeCode, GetElementCode). A data type whose
/// name ends in "-" in a tag address is an array (or string) whose length
/// follows it.
enum DataTypeCode : int32_t {
    kBoolean = 1,
    kByte = 2,
    kShort = 3,
    kInt = 4,
    kUnsignedByte = 5,
    kUnsignedShort = 6,
    kUnsignedInt = 7,
    kFloat = 8,
    kDouble = 9,
    kString = 10,
    kBinary = 11,
    kTime = 12,
    kBooleanArray = 13,
    kByteArray = 14,
    kShortArray = 15,
    kIntArray = 16,
    kUnsignedByteArray = 17,
    kUnsignedShortArray = 18,
    kUnsignedIntArray = 19,
    kFloatArray = 20,
    kDoubleArray = 21,
    kTimeArray = 22,
    kUint64 = 23,
    kInt64 = 24,
    kUint64Array = 25,
    kInt64Array = 26,
    kObject = 27,
};

/// Parity codes, in code order: the names a report shows.
inline constexpr const char* kParityNames[] = {"none", "even", "odd", "mark", "space"};
/// Mode codes, in code order: the names a report shows.
inline constexpr const char* kModeNames[] = {"RS-232", "RS-485", "RS-422", "RS-485P"};
inline constexpr int32_t kParityCount = 5, kModeCount = 4;
static_assert(sizeof kParityNames / sizeof *kParityNames == kParityCount);
static_assert(sizeof kModeNames / sizeof *kModeNames == kModeCount);

/// A serial line's settings as ISerialPort::Configure takes them, in its
/// argument order.
struct LineSettings {
    int32_t baud = 0;
    int32_t parity = 0;  ///< code of kParityNames
    int32_t bits = 0;    ///< data bits, 5 to 8
    int32_t stop = 0;    ///< stop bits, 1 or 2
    int32_t mode = 0;    ///< code of kModeNames
    bool operator==(const LineSettings& o) const {
        return baud == o.baud && parity == o.parity && bits == o.bits && stop == o.stop &&
               mode == o.mode;
    }
};

}  // namespace xtok
