// The line monitor's events as lines. For people: the local time, the kind,
// and bytes as their text with hex beside it. With JSON: one object per
// event, its bytes in a "hex" field and its time in ISO form.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>

#include "host/line_tap.h"
#include "tools/token_framer.h"

namespace xtok::tools {

using WallTime = std::chrono::system_clock::time_point;

/// Bytes that came off the line.
std::string receivedLine(const std::string& bytes, WallTime at, bool json);
/// `bytes` went onto the line, of `asked` bytes to send.
std::string sentLine(const std::string& bytes, std::size_t asked, WallTime at, bool json);
/// A token the plug-in framed, stamped with the arrival of its last byte.
std::string tokenEventLine(const FramedToken& token, WallTime at, bool json);
std::string linkLine(const host::LinkEvent& event, bool json);
/// A token arrived at a full queue, whose oldest token was dropped.
std::string queueDropLine(long droppedSoFar, int32_t limit, WallTime at, bool json);
/// Lines the console did not take in time.
std::string linesDroppedLine(std::size_t count, bool json);

/// A line's latest state for the console's info, e.g.
/// "line: /dev/ttyUSB0 lost at 12:00:01 (hang-up)".
std::string lineStateText(const host::LinkEvent& latest);

}  // namespace xtok::tools
