// The named conversions of a data type text ("short-4(swap2,neg)") and the
// copy between a tag's raw bytes and the runtime's value.
#pragma once

#include <cstdint>
#include <string>

#include "framework/data_types.h"

namespace xtok {

/// Conversion `name` on `type.size` bytes in place: "swapnibble", "swap2",
/// "swap4", "swap8", "bcd", "neg" or "inv". Direction 0 is reading (device to
/// runtime), non-zero writing; only "bcd" tells them apart. False for an
/// unknown name or bytes the conversion cannot take; the bytes may then be
/// partly converted.
bool ApplyConversion(const DataType& type, uint8_t* bytes, const std::string& name,
                     int32_t direction);

}  // namespace xtok
