// The plug-in's only contact with the clock. Time stamps are signed
// milliseconds since 1970-01-01 00:00 UTC.
#pragma once

#include <cstdint>

namespace xtok {

/// A broken-down time; dayOfWeek counts from 0 for Sunday.
struct SystemTime {
    uint16_t year = 0;
    uint16_t month = 0;
    uint16_t dayOfWeek = 0;
    uint16_t day = 0;
    uint16_t hour = 0;
    uint16_t minute = 0;
    uint16_t second = 0;
    uint16_t milliseconds = 0;
};

/// Milliseconds from 1601-01-01 (the file time epoch) to 1970-01-01.
constexpr int64_t kFileTimeEpochOffsetMs = 11644473600000;

/// The current time.
int64_t NowStamp();

/// Local time minus UTC, in milliseconds, as the platform says now.
int64_t LocalOffset();

/// The stamp moved by LocalOffset; 0 (no time) stays 0.
int64_t ToLocal(int64_t stamp);
int64_t ToUtc(int64_t stamp);

/// False outside the years 1601 to 30827, the range of a broken-down time.
bool StampToSystemTime(int64_t stamp, SystemTime& time);

/// False when a field is out of range (dayOfWeek is not looked at).
bool SystemTimeToStamp(const SystemTime& time, int64_t& stamp);

}  // namespace xtok
