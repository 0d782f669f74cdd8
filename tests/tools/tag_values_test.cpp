// Typed values as a person types them, against the value buffers the
// plug-in's tags take: sizes, ranges, byte order, strings and their zero.
#include "tools/tag_values.h"

#include <gtest/gtest.h>

#include "tools/monitor_lines.h"
#include "tools/token_view.h"

namespace xtok::tools {
namespace {

using Bytes = std::vector<uint8_t>;

// Shapes as the plug-in's tags report them (code, element code, size).
const TagShape kBoolean{1, 0, 1}, kByte{2, 0, 1}, kShort{3, 0, 2}, kUnsignedInt{7, 0, 4},
    kFloat{8, 0, 4}, kDouble{9, 0, 8}, kString8{10, 2, 8}, kBinary4{11, 5, 4}, kBooleans3{13, 1, 3},
    kShorts2{15, 3, 4}, kUint64{23, 0, 8}, kInt64{24, 0, 8}, kObject{27, 0, 0};

struct Parsed {
    const char* what;
    TagShape shape;
    std::string text;
    Bytes expected;  // empty: refused, with `error` in the message
    const char* error;
};

const Parsed kParsed[] = {
    {"baud rate", kUnsignedInt, "19200", {0x00, 0x4B, 0, 0}, ""},
    {"hex", kUnsignedInt, "0x10", {0x10, 0, 0, 0}, ""},
    {"leading zero is decimal", kUnsignedInt, "010", {10, 0, 0, 0}, ""},
    {"largest unsigned", kUnsignedInt, "4294967295", {0xFF, 0xFF, 0xFF, 0xFF}, ""},
    {"one past", kUnsignedInt, "4294967296", {}, "out of range"},
    {"negative unsigned", kUnsignedInt, "-1", {}, "out of range"},
    {"trailing letters", kUnsignedInt, "12abc", {}, "not a number"},
    {"nothing", kUnsignedInt, "", {}, "takes 1 value, got 0"},
    {"two for one", kUnsignedInt, "1 2", {}, "takes 1 value, got 2"},
    {"smallest byte", kByte, "-128", {0x80}, ""},
    {"byte too big", kByte, "128", {}, "out of range"},
    {"byte too small", kByte, "-129", {}, "out of range"},
    {"short", kShort, "-2", {0xFE, 0xFF}, ""},
    {"smallest int64", kInt64, "-9223372036854775808", {0, 0, 0, 0, 0, 0, 0, 0x80}, ""},
    {"int64 too big", kInt64, "9223372036854775808", {}, "out of range"},
    {"largest uint64", kUint64, "18446744073709551615", Bytes(8, 0xFF), ""},
    {"uint64 too big", kUint64, "18446744073709551616", {}, "out of range"},
    {"boolean word", kBoolean, "on", {1}, ""},
    {"boolean any case", kBoolean, "FALSE", {0}, ""},
    {"boolean two", kBoolean, "2", {}, "no boolean"},
    {"float", kFloat, "1.5", {0x00, 0x00, 0xC0, 0x3F}, ""},
    {"float too big", kFloat, "1e39", {}, "out of range"},
    {"largest float", kFloat, "3.4028234663852886e38", {0xFF, 0xFF, 0x7F, 0x7F}, ""},
    {"double holds it", kDouble, "1e39", {0x1D, 0x4A, 0x9C, 0xF4, 0x87, 0x82, 0x07, 0x48}, ""},
    {"string", kString8, "HELLO", {'H', 'E', 'L', 'L', 'O', 0, 0, 0}, ""},
    {"string escapes", kString8, "A\\x02\\\\", {'A', 0x02, '\\', 0, 0, 0, 0, 0}, ""},
    {"string full", kString8, "1234567", {'1', '2', '3', '4', '5', '6', '7', 0}, ""},
    {"string leaves no zero", kString8, "12345678", {}, "holds at most 7"},
    {"string unknown escape", kString8, "bad\\q", {}, "unknown escape"},
    {"string cut escape", kString8, "bad\\x4", {}, "two hex digits"},
    {"string zero byte", kString8, "a\\x00b", {}, "zero byte"},
    {"binary", kBinary4, "DE AD be ef", {0xDE, 0xAD, 0xBE, 0xEF}, ""},
    {"binary short", kBinary4, "DEAD", {}, "exactly 4"},
    {"binary not hex", kBinary4, "XYZW1234", {}, "not hex"},
    {"binary odd", kBinary4, "DEADBEE", {}, "not hex"},
    {"bit array", kBooleans3, "1,0 true", {1, 0, 1}, ""},
    {"bit array short", kBooleans3, "1 0", {}, "takes 3 values, got 2"},
    {"short array", kShorts2, "1, -1", {1, 0, 0xFF, 0xFF}, ""},
    {"object", kObject, "x", {}, "cannot be typed"},
};

TEST(TagValues, ParseTextIntoTheTagsBuffer) {
    for (const Parsed& c : kParsed) {
        Bytes value;
        std::string error;
        bool ok = parseValue(c.shape, c.text, value, error);
        if (c.expected.empty()) {
            EXPECT_FALSE(ok) << c.what;
            EXPECT_NE(error.find(c.error), std::string::npos) << c.what << ": " << error;
        } else {
            EXPECT_TRUE(ok) << c.what << ": " << error;
            EXPECT_EQ(value, c.expected) << c.what;
        }
    }
}

struct Shown {
    const char* what;
    TagShape shape;
    Bytes value;
    const char* text;
    const char* json;
};

const Shown kShown[] = {
    {"boolean", kBoolean, {1}, "1", "true"},
    {"string up to its zero",
     kString8,
     {'O', 'K', 0x02, 0, 'x', 0, 0, 0},
     "\"OK\\x02\"",
     "\"OK\\u0002\""},
    {"high bytes stay valid JSON",
     kString8,
     {0xE9, 0, 0, 0, 0, 0, 0, 0},
     "\"\\xE9\"",
     "\"\\u00e9\""},
    {"bit array", kBooleans3, {1, 0, 1}, "1 0 1", "[true,false,true]"},
    {"short array", kShorts2, {1, 0, 0xFF, 0xFF}, "1 -1", "[1,-1]"},
    {"binary", kBinary4, {0xDE, 0xAD, 0xBE, 0xEF}, "DE AD BE EF", "\"DE AD BE EF\""},
    {"float", kFloat, {0x00, 0x00, 0xC0, 0x3F}, "1.5", "1.5"},
    {"infinity is no JSON number", kFloat, {0x00, 0x00, 0x80, 0x7F}, "inf", "\"inf\""},
};

TEST(TagValues, ShowValuesForPeopleAndAsJson) {
    for (const Shown& c : kShown) {
        EXPECT_EQ(formatValue(c.shape, c.value), c.text) << c.what;
        EXPECT_EQ(formatValueJson(c.shape, c.value), c.json) << c.what;
    }
}

// Times to the millisecond, and the monitor's word when the console fell
// behind, for people and as JSON.
TEST(MonitorLines, TimesAndDroppedLines) {
    const auto at = std::chrono::system_clock::time_point(std::chrono::milliseconds(1999));
    EXPECT_EQ(isoTime(at), "1970-01-01T00:00:01.999Z");
    EXPECT_EQ(clockText(at).substr(8), ".999");
    EXPECT_NE(linesDroppedLine(3, false).find(" 3 lines dropped: the console fell behind"),
              std::string::npos);
    EXPECT_NE(linesDroppedLine(3, true).find("\"linesDropped\":3}"), std::string::npos);
}

}  // namespace
}  // namespace xtok::tools
