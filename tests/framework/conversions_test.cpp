#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "framework/conversions.h"
#include "framework/tag_base.h"

namespace xtok {
namespace {

using Bytes = std::vector<uint8_t>;

struct Case {
    const char* type;
    const char* conversion;
    Bytes in;
    bool ok;
    Bytes out;  // when ok
};

// Runs each case in the given direction on a copy of `in`.
void expectCases(const std::vector<Case>& cases, int32_t direction) {
    for (const Case& c : cases) {
        DataType type;
        ASSERT_TRUE(ParseDataType(c.type, type)) << c.type;
        Bytes bytes = c.in;
        EXPECT_EQ(ApplyConversion(type, bytes.data(), c.conversion, direction), c.ok)
            << c.type << " " << c.conversion;
        if (c.ok) {
            EXPECT_EQ(bytes, c.out) << c.type << " " << c.conversion;
        }
    }
}

TEST(Conversions, SwapsAreTheSameBothWays) {
    const std::vector<Case> cases = {
        {"unsignedByte-3", "swapnibble", {0x12, 0xAB, 0xF0}, true, {0x21, 0xBA, 0x0F}},
        {"short-2", "swap2", {1, 2, 3, 4}, true, {2, 1, 4, 3}},
        {"byte-3", "swap2", {1, 2, 3}, false, {}},
        {"int-2", "swap4", {1, 2, 3, 4, 5, 6, 7, 8}, true, {4, 3, 2, 1, 8, 7, 6, 5}},
        {"byte-6", "swap4", {1, 2, 3, 4, 5, 6}, false, {}},
        {"double", "swap8", {1, 2, 3, 4, 5, 6, 7, 8}, true, {8, 7, 6, 5, 4, 3, 2, 1}},
        {"int", "swap8", {1, 2, 3, 4}, false, {}},
        {"byte-0", "swap4", {}, true, {}},
        {"short", "SWAP2", {1, 2}, false, {}},
        {"short", "", {1, 2}, false, {}},
    };
    expectCases(cases, 0);
    expectCases(cases, 1);
}

TEST(Conversions, BcdReadsDigitPairsFirstByteLowest) {
    expectCases(
        {
            {"short", "bcd", {0x34, 0x12}, true, {0xD2, 0x04}},  // 1234
            {"short-2", "bcd", {0x34, 0x12, 0x78, 0x56}, true, {0xD2, 0x04, 0x2E, 0x16}},
            {"int", "bcd", {0x78, 0x56, 0x34, 0x12}, true, {0x4E, 0x61, 0xBC, 0x00}},
            {"byte", "bcd", {0x1A}, false, {}},
            {"byte", "bcd", {0xA1}, false, {}},
        },
        0);
}

TEST(Conversions, BcdWritesDigitsUnitsFirstWithinRange) {
    expectCases(
        {
            {"short", "bcd", {0xD2, 0x04}, true, {0x34, 0x12}},
            {"unsignedByte", "bcd", {99}, true, {0x99}},
            {"int", "bcd", {0xFF, 0xE0, 0xF5, 0x05}, true, {0x99, 0x99, 0x99, 0x99}},
            {"short", "bcd", {0x10, 0x27}, false, {}},  // 10000
            {"byte", "bcd", {100}, false, {}},
            {"int64", "bcd", {1, 0, 0, 0, 0, 0, 0, 0}, false, {}},
        },
        1);
}

TEST(Conversions, NegByTypeAndBoundedByTheElementCount) {
    const std::vector<Case> cases = {
        {"byte", "neg", {0x05}, true, {0xFB}},
        {"int", "neg", {1, 0, 0, 0}, true, {0xFF, 0xFF, 0xFF, 0xFF}},
        {"int64",
         "neg",
         {0, 1, 0, 0, 0, 0, 0, 0},
         true,
         {0, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}},
        {"float", "neg", {0, 0, 0x80, 0x3F}, true, {0, 0, 0x80, 0xBF}},
        {"double", "neg", {0, 0, 0, 0, 0, 0, 0, 0xC0}, true, {0, 0, 0, 0, 0, 0, 0, 0x40}},
        // four elements of two bytes: only the first two
        {"short-4", "neg", {1, 0, 2, 0, 3, 0, 4, 0}, true, {0xFF, 0xFF, 0xFE, 0xFF, 3, 0, 4, 0}},
        {"int-3",
         "neg",
         {1, 0, 0, 0, 1, 0, 0, 0, 1, 0, 0, 0},
         true,
         {0xFF, 0xFF, 0xFF, 0xFF, 1, 0, 0, 0, 1, 0, 0, 0}},
        {"unsignedShort", "neg", {1, 0}, false, {}},
        {"uint64", "neg", {1, 0, 0, 0, 0, 0, 0, 0}, false, {}},
    };
    expectCases(cases, 0);
    expectCases(cases, 1);
}

TEST(Conversions, InvComplementsUnsignedAndFlipsBits) {
    expectCases(
        {
            {"unsignedShort", "inv", {0xFF, 0x00}, true, {0x00, 0xFF}},
            {"binary-2", "inv", {0x0F, 0x01}, true, {0xF0, 0xFE}},
            {"boolean-3", "inv", {0, 1, 7}, true, {1, 0, 0}},
            {"int", "inv", {1, 2, 3, 4}, false, {}},
            {"byte", "inv", {1}, false, {}},
        },
        0);
}

TagBase tagOf(const char* type) {
    TagBase tag;
    EXPECT_TRUE(ParseDataType(type, tag.dataType)) << type;
    return tag;
}

TEST(Convert, WritingAppliesTheListInOrderReadingInReverse) {
    TagBase tag = tagOf("short(swap2,neg)");
    const uint8_t one[2] = {0x01, 0x00};
    uint8_t raw[2] = {};
    ASSERT_TRUE(tag.Convert(one, raw, 1));  // swap: 00 01, then negate 0x0100
    EXPECT_EQ(raw[0], 0x00);
    EXPECT_EQ(raw[1], 0xFF);
    uint8_t value[2] = {};
    ASSERT_TRUE(tag.Convert(raw, value, 0));
    EXPECT_EQ(0, std::memcmp(value, one, 2));
}

TEST(Convert, AFailingConversionIsNamedAndNothingIsCopied) {
    TagBase tag = tagOf("short-3(swap2,swap4)");
    const uint8_t value[6] = {1, 2, 3, 4, 5, 6};
    uint8_t raw[6] = {9, 9, 9, 9, 9, 9};
    EXPECT_FALSE(tag.Convert(value, raw, 1));
    EXPECT_EQ(tag.errorText, "Conversion error at: swap4");
    EXPECT_EQ(raw[0], 9);
    EXPECT_FALSE(tag.Convert(raw, nullptr, 0));
}

TEST(Convert, BitsUnpackFromAndPackAtTheBitOffset) {
    TagBase tag = tagOf("boolean-3(inv)");
    tag.index = 6;  // bits 6, 7 and 8 of a byte memory
    const uint8_t raw[2] = {0x40, 0xFE};
    uint8_t bits[3] = {};
    ASSERT_TRUE(tag.Convert(raw, bits, 0));
    EXPECT_EQ(bits[0], 0);
    EXPECT_EQ(bits[1], 1);
    EXPECT_EQ(bits[2], 1);
    uint8_t back[2] = {0x00, 0xFF};
    const uint8_t values[3] = {0, 0, 1};
    ASSERT_TRUE(tag.Convert(values, back, 1));
    EXPECT_EQ(back[0], 0xC0);
    EXPECT_EQ(back[1], 0xFE);
}

}  // namespace
}  // namespace xtok
