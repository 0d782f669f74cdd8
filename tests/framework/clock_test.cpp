#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>

#include "framework/clock.h"

namespace xtok {
namespace {

struct Instant {
    int64_t stamp;
    SystemTime time;  // year, month, dayOfWeek, day, hour, minute, second, ms
};

const Instant kInstants[] = {
    {0, {1970, 1, 4, 1, 0, 0, 0, 0}},
    {-1, {1969, 12, 3, 31, 23, 59, 59, 999}},
    {951782400000 + 3723004, {2000, 2, 2, 29, 1, 2, 3, 4}},
    {-kFileTimeEpochOffsetMs, {1601, 1, 1, 1, 0, 0, 0, 0}},
    {253402300799999, {9999, 12, 5, 31, 23, 59, 59, 999}},
};

TEST(Clock, StampsAndBrokenDownTimesBothWays) {
    for (const Instant& i : kInstants) {
        SystemTime time;
        ASSERT_TRUE(StampToSystemTime(i.stamp, time)) << i.stamp;
        EXPECT_EQ(time.year, i.time.year) << i.stamp;
        EXPECT_EQ(time.month, i.time.month) << i.stamp;
        EXPECT_EQ(time.dayOfWeek, i.time.dayOfWeek) << i.stamp;
        EXPECT_EQ(time.day, i.time.day) << i.stamp;
        EXPECT_EQ(time.hour, i.time.hour) << i.stamp;
        EXPECT_EQ(time.minute, i.time.minute) << i.stamp;
        EXPECT_EQ(time.second, i.time.second) << i.stamp;
        EXPECT_EQ(time.milliseconds, i.time.milliseconds) << i.stamp;
        int64_t stamp = 0;
        ASSERT_TRUE(SystemTimeToStamp(i.time, stamp));
        EXPECT_EQ(stamp, i.stamp);
    }
}

TEST(Clock, RefusesWhatNoBrokenDownTimeHolds) {
    SystemTime time;
    EXPECT_FALSE(StampToSystemTime(-kFileTimeEpochOffsetMs - 1, time));
    EXPECT_FALSE(StampToSystemTime(INT64_MAX, time));
    int64_t stamp = 0;
    for (SystemTime bad :
         {SystemTime{2001, 2, 0, 29}, SystemTime{2000, 13, 0, 1}, SystemTime{2000, 1, 0, 0},
          SystemTime{1600, 12, 0, 31}, SystemTime{2000, 1, 0, 1, 24},
          SystemTime{2000, 1, 0, 1, 0, 0, 0, 1000}}) {
        EXPECT_FALSE(SystemTimeToStamp(bad, stamp))
            << bad.year << "-" << bad.month << "-" << bad.day;
    }
}

TEST(Clock, LocalOffsetFollowsTheZone) {
    const char* saved = std::getenv("TZ");
    std::string previous = saved ? saved : "";
    setenv("TZ", "XYZ-2", 1);  // two hours east of UTC, no daylight saving
    tzset();
    EXPECT_EQ(LocalOffset(), 7200000);
    EXPECT_EQ(ToLocal(1000), 7201000);
    EXPECT_EQ(ToUtc(7201000), 1000);
    EXPECT_EQ(ToLocal(0), 0);
    EXPECT_EQ(ToUtc(0), 0);
    if (saved) {
        setenv("TZ", previous.c_str(), 1);
    } else {
        unsetenv("TZ");
    }
    tzset();
}

TEST(Clock, NowIsTheSystemTime) {
    int64_t before = static_cast<int64_t>(std::time(nullptr)) * 1000;
    int64_t now = NowStamp();
    EXPECT_GE(now, before);
    EXPECT_LT(now, before + 2000);
}

}  // namespace
}  // namespace xtok
