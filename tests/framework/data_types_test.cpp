#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "framework/data_types.h"

namespace xtok {
namespace {

struct Parse {
    const char* text;
    bool ok;
    int32_t code;
    int32_t elementCode;
    int32_t size;
    std::vector<std::string> conversions;
};

const Parse kParses[] = {
    {"unsignedShort", true, 6, 0, 2, {}},
    {" \tbyte-16 ", true, 14, 2, 16, {}},
    {"short-4(swap2)", true, 15, 3, 8, {"swap2"}},
    {"short-4 ( swap2 ,neg, )", true, 15, 3, 8, {"swap2", "neg", ""}},
    {"byte()", true, 2, 0, 1, {""}},
    {"string-20", true, 10, 2, 20, {}},
    {"int-3", true, 16, 4, 12, {}},
    {"unsignedInt-1", true, 19, 7, 4, {}},  // a dash makes an array
    {"boolean-16", true, 13, 1, 16, {}},    // bits
    {"time-2", true, 22, 12, 20, {}},
    {"int64-2", true, 26, 24, 16, {}},
    {"object", true, 27, 0, 0, {}},
    {"byte-", true, 14, 2, 0, {}},
    {"byte-abc", true, 14, 2, 0, {}},
    {"byte-12abc", true, 14, 2, 12, {}},
    {"byte--5", true, 14, 2, 0, {}},  // never a negative length
    {"string-1000000", true, 10, 2, 1000000, {}},
    {"(swap2", false, 0, 0, 0, {}},
    {"byte(", false, 0, 0, 0, {}},
    {"byte(swap2", false, 0, 0, 0, {}},
    {"Byte", false, 0, 0, 0, {}},
    {"bytes", false, 0, 0, 0, {}},
    {"", false, 0, 0, 0, {}},
    {"object-2", false, 0, 0, 0, {}},
    {"string-1000001", false, 0, 0, 0, {}},
    {"short-500001", false, 0, 0, 0, {}},
    {"byte-99999999999", false, 0, 0, 0, {}},
    {"int-2147483647", false, 0, 0, 0, {}},
};

TEST(ParseDataType, Table) {
    for (const Parse& p : kParses) {
        DataType type;
        ASSERT_EQ(ParseDataType(p.text, type), p.ok) << p.text;
        if (p.ok) {
            EXPECT_EQ(type.code, p.code) << p.text;
            EXPECT_EQ(type.elementCode, p.elementCode) << p.text;
            EXPECT_EQ(type.size, p.size) << p.text;
            EXPECT_EQ(type.conversions, p.conversions) << p.text;
        }
    }
}

TEST(DataTypeName, IsTheInverseOfTheParseForEveryCode) {
    for (int32_t code = 1; code <= 26; ++code) {
        DataType type;
        std::string name = DataTypeName(code, 24);
        ASSERT_TRUE(ParseDataType(name, type)) << name;
        EXPECT_EQ(type.code, code) << name;
        EXPECT_EQ(DataTypeBit(code), 1u << (code - 1)) << name;
    }
    EXPECT_EQ(DataTypeName(14, 16), "byte-16");
    EXPECT_EQ(DataTypeName(15, 8), "short-4");
    EXPECT_EQ(DataTypeName(13, 16), "boolean-16");
    EXPECT_EQ(DataTypeName(27, 0), "object0");  // a size-0 row always shows its size
    EXPECT_EQ(DataTypeName(6, 99), "unsignedShort");
    EXPECT_EQ(DataTypeName(99, 4), "??");
    EXPECT_EQ(DataTypeName(0, 4), "??");
    EXPECT_EQ(DataTypeBit(0), 0u);
    EXPECT_EQ(DataTypeBit(28), 0u);
}

TEST(DataTypes, ElementSizesAndBitTypes) {
    const int32_t kSizes[28] = {0, 1, 1, 2, 4, 1, 2, 4, 4, 8, 0, 0, 10, 0,
                                0, 0, 0, 0, 0, 0, 0, 0, 0, 8, 8, 0, 0,  0};
    for (int32_t code = 0; code < 28; ++code) {
        EXPECT_EQ(ElementSize(code), kSizes[code]) << code;
        EXPECT_EQ(IsBitType(code), code == 1 || code == 13) << code;
    }
    EXPECT_EQ(ElementCount(3, 8), 4);
    EXPECT_EQ(ElementCount(0, 8), 1);
    EXPECT_EQ(ElementCount(27, 8), 1);
}

}  // namespace
}  // namespace xtok
