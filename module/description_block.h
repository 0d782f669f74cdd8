// The protocol description block carried inside the library: a header line,
// a size line, the zlib-compressed XML description and an end marker, each
// ending in a zero byte. Tools find it by scanning the library file for the
// header's marker. The library itself never inflates or reads it.
#pragma once

#include <cstddef>

namespace xtok {

/// First byte of the block (the header's marker).
const char* descriptionBlock();
/// Length of the whole block in bytes, end marker and its zero included.
std::size_t descriptionBlockSize();
/// The size line "compressedXML=N", followed by its zero byte and the N
/// compressed bytes; what the protocol's GetXmlDescription hands out.
const char* descriptionSizeLine();

}  // namespace xtok
