#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "params/param_parser.h"

namespace xtok {
namespace {

const int32_t kMax = std::numeric_limits<int32_t>::max();
const int32_t kMin = std::numeric_limits<int32_t>::min();

// ---- Converters -------------------------------------------------------------

struct IntCase {
    const char* value;
    int32_t expected;
};

class ParamToInt : public ::testing::TestWithParam<IntCase> {};

TEST_P(ParamToInt, ReadsLikeStrtolWithBaseZero) {
    int32_t out = -7;
    EXPECT_TRUE(toInt(GetParam().value, out));
    EXPECT_EQ(out, GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(
    Values, ParamToInt,
    ::testing::Values(IntCase{"9600", 9600}, IntCase{"0x2580", 9600}, IntCase{"0X2580", 9600},
                      IntCase{"010", 8}, IntCase{"08", 0}, IntCase{"0", 0}, IntCase{"abc", 0},
                      IntCase{"", 0}, IntCase{"0x", 0}, IntCase{"-12", -12}, IntCase{"+7", 7},
                      IntCase{" 42", 42}, IntCase{"12abc", 12}, IntCase{"1.9", 1},
                      IntCase{"2147483647", kMax}, IntCase{"-2147483648", kMin},
                      // Out of range saturates instead of wrapping.
                      IntCase{"2147483648", kMax}, IntCase{"0xFFFFFFFF", kMax},
                      IntCase{"4294967297", kMax}, IntCase{"-2147483649", kMin},
                      IntCase{"999999999999999999999999", kMax},
                      IntCase{"-999999999999999999999999", kMin}));

TEST(ParamToBool, AcceptsOnlyTheExactWords) {
    bool out = false;
    EXPECT_TRUE(toBool("true", out));
    EXPECT_TRUE(out);
    EXPECT_TRUE(toBool("false", out));
    EXPECT_FALSE(out);
    for (const char* refused : {"True", "TRUE", "FALSE", "1", "0", "", "yes", "truee", "true "}) {
        out = true;
        EXPECT_FALSE(toBool(refused, out)) << refused;
        EXPECT_TRUE(out) << "refused value overwrote the output: " << refused;
    }
}

TEST(ParamToString, TurnsEachNbspIntoOneSpace) {
    const std::pair<const char*, const char*> cases[] = {
        {"a&nbsp;&nbsp;b", "a  b"},
        {"&nbsp;", " "},
        {"&nbsp;nbsp;", " nbsp;"},
        {"&&nbsp;nbsp;", "& nbsp;"},
        {"&nbsp", "&nbsp"},
        {"&NBSP;", "&NBSP;"},
        {"", ""},
        {"com1", "com1"},
    };
    for (const auto& c : cases) {
        std::string out = "old";
        EXPECT_TRUE(toString(c.first, out));
        EXPECT_EQ(out, c.second) << c.first;
    }
}

TEST(ParamToFloat, ReadsLikeAtof) {
    double out = -1;
    EXPECT_TRUE(toFloat("1.5", out));
    EXPECT_DOUBLE_EQ(out, 1.5);
    EXPECT_TRUE(toFloat("-2.5e3x", out));
    EXPECT_DOUBLE_EQ(out, -2500.0);
    EXPECT_TRUE(toFloat("abc", out));
    EXPECT_DOUBLE_EQ(out, 0.0);
    EXPECT_TRUE(toFloat("1e999", out));
    EXPECT_TRUE(std::isinf(out));
}

// ---- Typed readers ----------------------------------------------------------

TEST(ParamReaders, ConvertWhatTheLookupFound) {
    ParamParser parser(
        "CfgVer=1 baudrate=0x2580 bits=abc hex_tokens=TRUE autoConnect=false "
        "rx_prefix=a&nbsp;&nbsp;b");
    int32_t n = -1;
    EXPECT_EQ(readInt(parser, "baudrate", -1, n, PARAM_NODE_INDEPENDENT), PARAM_OK);
    EXPECT_EQ(n, 9600);
    EXPECT_EQ(readInt(parser, "bits", -1, n, PARAM_NODE_INDEPENDENT), PARAM_OK);
    EXPECT_EQ(n, 0);
    std::string s;
    EXPECT_EQ(readString(parser, "rx_prefix", -1, s, 0), PARAM_OK);
    EXPECT_EQ(s, "a  b");
    bool b = true;
    EXPECT_EQ(readBool(parser, "autoConnect", -1, b, 0), PARAM_OK);
    EXPECT_FALSE(b);
}

TEST(ParamReaders, LeaveTheOutputAloneOnFailure) {
    ParamParser parser("CfgVer=1 hex_tokens=TRUE Node2::gap=5 Node2::port=com3");
    bool b = true;
    EXPECT_EQ(readBool(parser, "hex_tokens", -1, b, 0), PARAM_ILLEGAL_VALUE);
    EXPECT_TRUE(b);
    int32_t n = 77;
    EXPECT_EQ(readInt(parser, "gap", -1, n, PARAM_NODE_DEPENDENT), PARAM_NOT_APPLICABLE);
    EXPECT_EQ(readInt(parser, "gap", 2, n, PARAM_NODE_INDEPENDENT), PARAM_CANT_BE_PREFIXED);
    EXPECT_EQ(readInt(parser, "bits", -1, n, 0), PARAM_NOT_FOUND);
    EXPECT_EQ(n, 77);
    std::string s = "com1";
    EXPECT_EQ(readString(parser, "port", 2, s, 3), PARAM_INVALID_SPEC);
    EXPECT_EQ(s, "com1");
}

// ---- Reporting getters and messages ---------------------------------------

TEST(ParamErrorText, NamesTheParameterAndTheReason) {
    const std::pair<int, const char*> cases[] = {
        {PARAM_NOT_FOUND, "Parser: parameter 'baudrate' is not found"},
        {PARAM_ILLEGAL_VALUE, "Parser: parameter 'baudrate' has illegal value"},
        {PARAM_CANT_BE_PREFIXED, "Parser: parameter 'baudrate' can't be prefixed"},
        {PARAM_CANT_BE_NODE_INDEPENDENT, "Parser: parameter 'baudrate' can't be node independent"},
        {PARAM_INVALID_SPEC, "Parser: parameter 'baudrate' has invalid internal specification"},
        {PARAM_NOT_APPLICABLE, "Parser: parameter 'baudrate' has unknown error"},
        {PARAM_OK, "Parser: parameter 'baudrate' has unknown error"},
        {7, "Parser: parameter 'baudrate' has unknown error"},
        {-1, "Parser: parameter 'baudrate' has unknown error"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(paramErrorText(c.first, "baudrate"), c.second) << c.first;
    }
}

const char kConfig[] =
    "CfgVer=1 model=1 port=com2 hex_tokens=TRUE Node2::gap=5 Node4::model=3 bits=010";

struct GetterCase {
    const char* name;
    int32_t node;
    int flags;
    bool optional;
    bool ok;
    const char* error;  // "before" when the error text must stay untouched
};

class ParamGetters : public ::testing::TestWithParam<GetterCase> {};

TEST_P(ParamGetters, SucceedOrExplain) {
    const GetterCase& c = GetParam();
    ParamParser parser(kConfig);
    std::string error = "before";
    int32_t n = 100;
    EXPECT_EQ(getParamInt(parser, c.name, c.node, n, c.flags, c.optional, error), c.ok);
    EXPECT_EQ(error, c.error);
    if (!c.ok) {
        EXPECT_EQ(n, 100);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Codes, ParamGetters,
    ::testing::Values(GetterCase{"bits", -1, PARAM_NODE_INDEPENDENT, false, true, "before"},
                      GetterCase{"stopbits", -1, PARAM_NODE_INDEPENDENT, true, true, "before"},
                      GetterCase{"stopbits", -1, PARAM_NODE_INDEPENDENT, false, false,
                                 "Parser: parameter 'stopbits' is not found"},
                      GetterCase{"gap", -1, PARAM_NODE_DEPENDENT, false, true, "before"},
                      GetterCase{"bits", -1, PARAM_NODE_DEPENDENT, true, false,
                                 "Parser: parameter 'bits' can't be node independent"},
                      GetterCase{"gap", 2, PARAM_NODE_INDEPENDENT, true, false,
                                 "Parser: parameter 'gap' can't be prefixed"},
                      GetterCase{"bits", -1, 3, true, false,
                                 "Parser: parameter 'bits' has invalid internal specification"}));

TEST(ParamGetters, RefusedBooleanFailsEvenWhenOptional) {
    ParamParser parser(kConfig);
    std::string error;
    bool b = false;
    EXPECT_FALSE(getParamBool(parser, "hex_tokens", -1, b, PARAM_NODE_INDEPENDENT, true, error));
    EXPECT_EQ(error, "Parser: parameter 'hex_tokens' has illegal value");
    EXPECT_FALSE(b);
}

TEST(ParamGetters, MissingOptionalKeepsThePresetValue) {
    ParamParser parser(kConfig);
    std::string error;
    std::string s = "preset";
    EXPECT_TRUE(getParamString(parser, "rx_prefix", -1, s, PARAM_NODE_INDEPENDENT, true, error));
    EXPECT_EQ(s, "preset");
    bool b = true;
    EXPECT_TRUE(getParamBool(parser, "autoConnect", -1, b, PARAM_NODE_INDEPENDENT, true, error));
    EXPECT_TRUE(b);
    EXPECT_EQ(error, "");
}

// The one user's pass over a complete configuration: models per node, then
// the common parameters.
TEST(ParamGetters, ReadAWholeConfiguration) {
    ParamParser parser(
        "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232 "
        "rx_suffix=0D0A Node1::model=2");
    ASSERT_TRUE(parser.formatKnown());
    std::string error;
    std::string model;
    ASSERT_TRUE(getParamString(parser, "model", -1, model, 0, false, error));
    EXPECT_EQ(model, "1");
    ASSERT_EQ(parser.nodeCount(), 1);
    ASSERT_TRUE(getParamString(parser, "model", parser.nodeAt(0), model, 0, false, error));
    EXPECT_EQ(model, "2");

    std::string port, parity, mode, rxSuffix;
    int32_t baud = 0, bits = 0, stopbits = 0;
    const int common = PARAM_NODE_INDEPENDENT;
    EXPECT_TRUE(getParamString(parser, "port", -1, port, common, false, error));
    EXPECT_TRUE(getParamInt(parser, "baudrate", -1, baud, common, false, error));
    EXPECT_TRUE(getParamString(parser, "parity", -1, parity, common, false, error));
    EXPECT_TRUE(getParamInt(parser, "bits", -1, bits, common, false, error));
    EXPECT_TRUE(getParamInt(parser, "stopbits", -1, stopbits, common, false, error));
    EXPECT_TRUE(getParamString(parser, "mode", -1, mode, common, false, error));
    EXPECT_TRUE(getParamString(parser, "rx_suffix", -1, rxSuffix, common, true, error));
    EXPECT_EQ(error, "");
    EXPECT_EQ(port + "/" + parity + "/" + mode + "/" + rxSuffix, "com1/even/RS-232/0D0A");
    EXPECT_EQ(baud, 9600);
    EXPECT_EQ(bits, 8);
    EXPECT_EQ(stopbits, 1);
}

}  // namespace
}  // namespace xtok
