// What a monitor of the serial line hears from the host's ports: bytes as
// they come off the line and as the plug-in takes them, silences, transmits
// and changes of the link. The plug-in knows nothing of it.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>

namespace xtok::host {

using WallClock = std::chrono::system_clock;

enum class LinkChange { Opened, Closed, Lost, Reconnected, Applied, Refused };

/// "opened", "closed", "lost", "reconnected", "settings applied", "settings refused".
const char* linkChangeName(LinkChange change);

struct LinkEvent {
    LinkChange change = LinkChange::Closed;
    std::string device;
    std::string settings;  ///< "9600,none,8,1,RS-232" where settings are concerned
    std::string reason;    ///< why the line was lost or settings refused
    WallClock::time_point at;
};

/// Called on whichever thread reads, writes, opens or closes the port, often
/// with the plug-in's locks held: a tap returns quickly and never calls into
/// the plug-in.
class LineTap {
public:
    virtual ~LineTap() = default;
    /// What one read(2) took off the line, at `at`.
    virtual void received(const uint8_t* bytes, std::size_t count, WallClock::time_point at) = 0;
    /// A byte a ReadByte handed to the plug-in.
    virtual void delivered(uint8_t byte) = 0;
    /// A ReadByte that waited `timeoutMs` and found nothing.
    virtual void timedOut(int32_t timeoutMs) = 0;
    /// `written` of the `asked` bytes at `data` went onto the line.
    virtual void sent(const uint8_t* data, std::size_t written, std::size_t asked,
                      WallClock::time_point at) = 0;
    virtual void link(const LinkEvent& event) = 0;
};

}  // namespace xtok::host
