#include "framework/clock.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <chrono>
#include <ctime>
#endif

namespace xtok {
namespace {

constexpr int64_t kMsPerDay = 86400000;
// Stamps whose file time (100 ns units since 1601) still fits 63 bits.
constexpr int64_t kFirstStamp = -kFileTimeEpochOffsetMs;
constexpr int64_t kLastStamp = INT64_MAX / 10000 - kFileTimeEpochOffsetMs;

// Days since 1970-01-01 of a proleptic Gregorian date.
int64_t daysFromCivil(int64_t year, int64_t month, int64_t day) {
    year -= month <= 2;
    const int64_t era = (year >= 0 ? year : year - 399) / 400;
    const int64_t yearOfEra = year - era * 400;
    const int64_t dayOfYear = (153 * (month > 2 ? month - 3 : month + 9) + 2) / 5 + day - 1;
    const int64_t dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * 146097 + dayOfEra - 719468;
}

void civilFromDays(int64_t days, SystemTime& time) {
    days += 719468;
    const int64_t era = (days >= 0 ? days : days - 146096) / 146097;
    const int64_t dayOfEra = days - era * 146097;
    const int64_t yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const int64_t dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const int64_t shiftedMonth = (5 * dayOfYear + 2) / 153;
    const int64_t month = shiftedMonth < 10 ? shiftedMonth + 3 : shiftedMonth - 9;
    time.year = static_cast<uint16_t>(yearOfEra + era * 400 + (month <= 2));
    time.month = static_cast<uint16_t>(month);
    time.day = static_cast<uint16_t>(dayOfYear - (153 * shiftedMonth + 2) / 5 + 1);
}

int64_t daysInMonth(int64_t year, int64_t month) {
    return daysFromCivil(month == 12 ? year + 1 : year, month == 12 ? 1 : month + 1, 1) -
           daysFromCivil(year, month, 1);
}

int64_t floorDiv(int64_t a, int64_t b) {
    return a / b - (a % b < 0);
}

}  // namespace

#ifdef _WIN32

namespace {

// A file time (100 ns units since 1601) in milliseconds.
int64_t fileTimeMs(const FILETIME& time) {
    ULARGE_INTEGER units;
    units.LowPart = time.dwLowDateTime;
    units.HighPart = time.dwHighDateTime;
    return static_cast<int64_t>(units.QuadPart / 10000);
}

int64_t systemTimeMs(const SYSTEMTIME& time) {
    FILETIME file{};
    SystemTimeToFileTime(&time, &file);
    return fileTimeMs(file);
}

}  // namespace

int64_t NowStamp() {
    FILETIME now;
    GetSystemTimeAsFileTime(&now);
    return fileTimeMs(now) - kFileTimeEpochOffsetMs;
}

int64_t LocalOffset() {
    // The two readings straddle a tick at worst: the offset is then off by
    // that tick, as on the panel's own runtime.
    SYSTEMTIME local, utc;
    GetLocalTime(&local);
    GetSystemTime(&utc);
    return systemTimeMs(local) - systemTimeMs(utc);
}

#else

namespace {

int64_t msOfBrokenDown(const std::tm& t) {
    return daysFromCivil(t.tm_year + 1900, t.tm_mon + 1, t.tm_mday) * kMsPerDay +
           (t.tm_hour * 3600 + t.tm_min * 60 + t.tm_sec) * int64_t{1000};
}

}  // namespace

int64_t NowStamp() {
    // The system clock counts from 1970-01-01 UTC.
    using namespace std::chrono;
    return duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count();
}

int64_t LocalOffset() {
    // Both views of one instant, so the difference is exactly the zone's
    // offset including daylight saving time in force now.
    std::time_t now = std::time(nullptr);
    std::tm local{};
    std::tm utc{};
    localtime_r(&now, &local);
    gmtime_r(&now, &utc);
    return msOfBrokenDown(local) - msOfBrokenDown(utc);
}

#endif

int64_t ToLocal(int64_t stamp) {
    return stamp == 0 ? 0 : stamp + LocalOffset();
}

int64_t ToUtc(int64_t stamp) {
    return stamp == 0 ? 0 : stamp - LocalOffset();
}

bool StampToSystemTime(int64_t stamp, SystemTime& time) {
    if (stamp < kFirstStamp || stamp > kLastStamp) {
        return false;
    }
    const int64_t days = floorDiv(stamp, kMsPerDay);
    int64_t ms = stamp - days * kMsPerDay;
    civilFromDays(days, time);
    time.dayOfWeek = static_cast<uint16_t>((days % 7 + 11) % 7);  // 1970-01-01 was a Thursday
    time.hour = static_cast<uint16_t>(ms / 3600000);
    time.minute = static_cast<uint16_t>(ms / 60000 % 60);
    time.second = static_cast<uint16_t>(ms / 1000 % 60);
    time.milliseconds = static_cast<uint16_t>(ms % 1000);
    return true;
}

bool SystemTimeToStamp(const SystemTime& time, int64_t& stamp) {
    if (time.year < 1601 || time.year > 30827 || time.month < 1 || time.month > 12 ||
        time.day < 1 || time.day > daysInMonth(time.year, time.month) || time.hour > 23 ||
        time.minute > 59 || time.second > 59 || time.milliseconds > 999) {
        return false;
    }
    stamp = daysFromCivil(time.year, time.month, time.day) * kMsPerDay +
            ((time.hour * 60 + time.minute) * 60 + time.second) * int64_t{1000} + time.milliseconds;
    return true;
}

}  // namespace xtok
