// Data type texts, the named conversions, a tag's datum in its memory and
// the clock: value in, value out.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>

#include "framework/clock.h"
#include "framework/conversions.h"
#include "framework/tag_base.h"
#include "tests/support/slot_call.h"

namespace xtok {
namespace {

using namespace std::string_literals;

// "code/element code/size" and "/name" per conversion, or "refused".
std::string parsed(const std::string& text) {
    DataType type;
    if (!ParseDataType(text, type)) {
        return "refused ";
    }
    std::string shown = std::to_string(type.code) + "/" + std::to_string(type.elementCode) + "/" +
                        std::to_string(type.size);
    for (const std::string& name : type.conversions) {
        shown += "/" + name;
    }
    return shown + " ";
}

TEST(DataTypes, ParseTheTypeOfATagAddress) {
    EXPECT_EQ(parsed(" \tunsignedShort ") + parsed("short-4 ( swap2 ,neg, )") + parsed("byte()"),
              "6/0/2 15/3/8/swap2/neg/ 2/0/1/ ");
    // A dash makes an array; booleans count bits; a length is never negative.
    EXPECT_EQ(parsed("string-20") + parsed("unsignedInt-1") + parsed("boolean-16"),
              "10/2/20 19/7/4 13/1/16 ");
    EXPECT_EQ(parsed("object") + parsed("byte-12abc") + parsed("byte--5"),
              "27/0/0 14/2/12 14/2/0 ");
    EXPECT_EQ(parsed("string-1000000") + parsed("short-500001"), "10/2/1000000 refused ");
    EXPECT_EQ(parsed("byte(swap2") + parsed("Byte") + parsed("") + parsed("object-2") +
                  parsed("byte-99999999999999999999"),
              "refused refused refused refused refused ");
}

TEST(DataTypes, NamesSizesAndBitsAgreeWithTheParse) {
    for (int32_t code = 1; code <= 26; ++code) {
        DataType type;
        const std::string name = DataTypeName(code, 24);
        ASSERT_TRUE(ParseDataType(name, type)) << name;
        EXPECT_EQ(type.code, code) << name;
        EXPECT_EQ(DataTypeBit(code), 1u << (code - 1)) << name;
        EXPECT_EQ(ElementSize(code), type.elementCode == 0 ? type.size : 0) << name;
        EXPECT_EQ(IsBitType(code), code == kBoolean || code == kBooleanArray) << name;
    }
    EXPECT_EQ(DataTypeName(15, 8) + DataTypeName(27, 0) + DataTypeName(6, 99) + DataTypeName(0, 4) +
                  DataTypeName(28, 4),
              "short-4object0unsignedShort????");
    EXPECT_EQ(DataTypeBit(0) + DataTypeBit(28) + ElementSize(0) + ElementSize(28), 0u);
    EXPECT_EQ(ElementCount(kShort, 8) * 10 + ElementCount(0, 8), 41);
}

// The bytes after conversion `name` in `direction` (0 reading, 1 writing,
// 2 either with the same result), or "refused".
std::string converted(const char* type, const char* name, int direction, std::string bytes) {
    std::string results[2];
    for (int way = 0; way < 2; ++way) {
        DataType parsed;
        std::string copy = bytes;
        EXPECT_TRUE(ParseDataType(type, parsed));
        results[way] = ApplyConversion(parsed, reinterpret_cast<uint8_t*>(&copy[0]), name, way)
                           ? copy
                           : "refused";
    }
    return direction < 2 || results[0] == results[1] ? results[direction % 2] : "differs";
}

TEST(Conversions, ConvertInPlaceOrRefuse) {
    EXPECT_EQ(converted("unsignedByte-3", "swapnibble", 2, "\x12\xab\xf0"), "\x21\xba\x0f");
    EXPECT_EQ(converted("short-2", "swap2", 2, "1234"), "2143");
    EXPECT_EQ(converted("int-2", "swap4", 2, "12345678"), "43218765");
    EXPECT_EQ(converted("double", "swap8", 2, "12345678"), "87654321");
    EXPECT_EQ(converted("byte-6", "swap4", 2, "123456") + converted("byte-0", "swap4", 2, ""),
              "refused");
    EXPECT_EQ(converted("short", "SWAP2", 2, "12"), "refused");
    // Binary coded decimal: two digits a byte, the first byte the lowest.
    EXPECT_EQ(converted("short-2", "bcd", 0, "\x34\x12\x78\x56"), "\xd2\x04\x2e\x16"s);
    EXPECT_EQ(converted("int", "bcd", 0, "\x99\x99\x99\x99"), "\xff\xe0\xf5\x05");
    EXPECT_EQ(converted("short", "bcd", 1, "\xd2\x04"s), "\x34\x12");
    EXPECT_EQ(converted("int", "bcd", 1, "\xff\xe0\xf5\x05"), "\x99\x99\x99\x99");
    EXPECT_EQ(converted("byte", "bcd", 0, "\x1a") + converted("short", "bcd", 1, "\x10\x27"),
              "refusedrefused");  // a non-digit; 10000
    EXPECT_EQ(converted("int64", "bcd", 1, "\x01\0\0\0\0\0\0\0"s), "refused");
    EXPECT_EQ(converted("byte", "neg", 2, "\x05") + converted("float", "neg", 2, "\0\0\x80\x3f"s),
              "\xfb\0\0\x80\xbf"s);
    EXPECT_EQ(converted("int64", "neg", 2, "\0\x01\0\0\0\0\0\0"s),
              "\0\xff\xff\xff\xff\xff\xff\xff"s);
    // Only the first ceil(count / width) elements: devices rely on it.
    EXPECT_EQ(converted("short-4", "neg", 2, "\x01\0\x02\0\x03\0\x04\0"s),
              "\xff\xff\xfe\xff\x03\0\x04\0"s);
    EXPECT_EQ(converted("binary-2", "inv", 2, "\x0f\x01") +
                  converted("boolean-3", "inv", 2, "\0\x01\x07"s),
              "\xf0\xfe\x01\0\0"s);
    EXPECT_EQ(converted("unsignedShort", "neg", 2, "\x01\0"s) + converted("int", "inv", 2, "1234"),
              "refusedrefused");
    DataType type;
    ParseDataType("short", type);
    EXPECT_FALSE(ApplyConversion(type, nullptr, "swap2", 0));
}

TagBase tagOf(const char* type, int32_t index = 0) {
    TagBase tag;
    EXPECT_TRUE(ParseDataType(type, tag.dataType)) << type;
    tag.index = index;
    return tag;
}

TEST(TagBase, ConvertsWritingInListOrderReadingInReverse) {
    TagBase tag = tagOf("short(swap2,neg)");
    std::string raw(2, '?'), value(2, '?');
    ASSERT_TRUE(tag.Convert("\x01\0", &raw[0], 1));  // 00 01, then -0x0100
    ASSERT_TRUE(tag.Convert(raw.data(), &value[0], 0));
    EXPECT_EQ(raw + value, "\0\xff\x01\0"s);

    TagBase bad = tagOf("short-3(swap2,swap4)");
    std::string untouched(6, '?');
    EXPECT_FALSE(bad.Convert("123456", &untouched[0], 1));
    EXPECT_EQ(bad.errorText + untouched, "Conversion error at: swap4??????");
    EXPECT_FALSE(bad.Convert("123456", nullptr, 0) || bad.ApplyConversion(nullptr, nullptr, 0));

    TagBase bits = tagOf("boolean-3(inv)", 6);  // bits 6, 7 and 8
    std::string three(3, '?'), back = "\0\xff"s;
    ASSERT_TRUE(bits.Convert("\x40\xfe", &three[0], 0));
    ASSERT_TRUE(bits.Convert("\0\0\x01", &back[0], 1));
    EXPECT_EQ(three + back, "\0\x01\x01\xc0\xfe"s);  // only the tag's own bits change
}

// "byte address, bit offset, raw size" through the tag's slots.
std::string placed(int32_t unitType, int32_t address, int32_t index, const char* type) {
    MemoryType memory;
    memory.naturalType = unitType;
    TagBase tag = tagOf(type, index);
    tag.memoryType = unitType ? &memory : nullptr;
    tag.address = address;
    void* slots = static_cast<ITag*>(&tag);
    return std::to_string(test::callSlot<int32_t>(slots, 2)) + " " +
           std::to_string(test::callSlot<int32_t>(slots, 3)) + " " +
           std::to_string(test::callSlot<int32_t>(slots, 8)) + ", ";
}

TEST(TagBase, PlacesItsDatumInItsMemoryType) {
    // Bit 13 of word 2, then bits of a bit memory.
    EXPECT_EQ(placed(kUnsignedShort, 2, 13, "boolean") + placed(kBoolean, 13, 0, "boolean"),
              "5 5 1, 1 5 1, ");
    EXPECT_EQ(placed(kBoolean, 4, 0, "boolean-8") + placed(kBoolean, 0, 0, "boolean-8") +
                  placed(kBoolean, 2, 0, "byte"),
              "0 4 2, 0 0 1, 2 2 1, ");
    // Array index times element size.
    EXPECT_EQ(placed(kUnsignedShort, 1, 0, "short-2") + placed(kByte, 0, 3, "short-4") +
                  placed(kUnsignedShort, 3, 1, "int"),
              "2 0 4, 6 3 8, 10 1 4, ");
    EXPECT_EQ(placed(kByte, 0, -3, "boolean") + placed(0, 3, 0, "short"), "0 5 1, 3 0 2, ");
}

// "year-month-day weekday hh:mm:ss.mmm" (checked to convert back), or "refused".
std::string brokenDown(int64_t stamp) {
    SystemTime t;
    if (!StampToSystemTime(stamp, t)) {
        return "refused";
    }
    char text[64];
    std::snprintf(text, sizeof text, "%04d-%02d-%02d %d %02d:%02d:%02d.%03d", t.year, t.month,
                  t.day, t.dayOfWeek, t.hour, t.minute, t.second, t.milliseconds);
    int64_t back = -1;
    EXPECT_TRUE(SystemTimeToStamp(t, back) && back == stamp) << text;
    return text;
}

TEST(Clock, StampsAndBrokenDownTimesBothWays) {
    EXPECT_EQ(brokenDown(-1), "1969-12-31 3 23:59:59.999");
    EXPECT_EQ(brokenDown(951782400000 + 3723004), "2000-02-29 2 01:02:03.004");
    EXPECT_EQ(brokenDown(-kFileTimeEpochOffsetMs), "1601-01-01 1 00:00:00.000");
    EXPECT_EQ(brokenDown(253402300799999), "9999-12-31 5 23:59:59.999");
    EXPECT_EQ(brokenDown(-kFileTimeEpochOffsetMs - 1) + brokenDown(INT64_MAX), "refusedrefused");
    int64_t stamp = -1;
    EXPECT_TRUE(SystemTimeToStamp(SystemTime{1970, 1, 0, 1}, stamp) && stamp == 0);
    for (SystemTime bad :
         {SystemTime{2001, 2, 0, 29}, SystemTime{2000, 13, 0, 1}, SystemTime{2000, 1, 0, 0},
          SystemTime{1600, 12, 0, 31}, SystemTime{30828, 1, 0, 1}, SystemTime{2000, 1, 0, 1, 24},
          SystemTime{2000, 1, 0, 1, 0, 60}, SystemTime{2000, 1, 0, 1, 0, 0, 60},
          SystemTime{2000, 1, 0, 1, 0, 0, 0, 1000}}) {
        EXPECT_FALSE(SystemTimeToStamp(bad, stamp)) << bad.year << "-" << bad.month;
    }
}

TEST(Clock, LocalTimeFollowsTheZoneAndNowIsTheSystemTime) {
    const char* saved = std::getenv("TZ");
    const std::string previous = saved ? saved : "";
    setenv("TZ", "XYZ-2", 1);  // two hours east of UTC, no daylight saving
    tzset();
    EXPECT_EQ(LocalOffset(), 7200000);
    EXPECT_EQ(ToLocal(1000) + ToUtc(7201000) * 10 + ToLocal(0) + ToUtc(0), 7201000 + 10000);
    saved ? setenv("TZ", previous.c_str(), 1) : unsetenv("TZ");
    tzset();
    const int64_t before = static_cast<int64_t>(std::time(nullptr)) * 1000;
    const int64_t now = NowStamp();
    EXPECT_TRUE(now >= before && now < before + 2000) << now - before;
}

}  // namespace
}  // namespace xtok
