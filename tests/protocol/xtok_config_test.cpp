#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "protocol/xtok_config.h"

namespace xtok {
namespace {

const std::string kRequired =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

struct Failing {
    std::string text;
    std::string message;
};

void PrintTo(const Failing& c, std::ostream* os) {
    *os << c.message;
}

class ConfigFailure : public ::testing::TestWithParam<Failing> {};

TEST_P(ConfigFailure, SaysWhy) {
    XtokConfig config;
    EXPECT_FALSE(config.Parse(GetParam().text));
    EXPECT_EQ(config.GetLastError(), GetParam().message);
}

INSTANTIATE_TEST_SUITE_P(
    RequiredKeys, ConfigFailure,
    ::testing::Values(
        Failing{"model=1 port=com1", "Parser: unknown format"},
        Failing{"CfgVer=1 port=com1", "Parser: parameter 'model' is not found"},
        Failing{"CfgVer=1 model=1 baudrate=9600", "Parser: parameter 'port' is not found"},
        Failing{"CfgVer=1 model=1 port=com1 parity=even",
                "Parser: parameter 'baudrate' is not found"},
        Failing{"CfgVer=1 model=1 port=com1 baudrate=9600 bits=8",
                "Parser: parameter 'parity' is not found"},
        Failing{"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even stopbits=1",
                "Parser: parameter 'bits' is not found"},
        Failing{"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8",
                "Parser: parameter 'stopbits' is not found"},
        Failing{"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1",
                "Parser: parameter 'mode' is not found"}));

INSTANTIATE_TEST_SUITE_P(
    RangesAndHexChecks, ConfigFailure,
    ::testing::Values(
        Failing{kRequired + " token_queue_size=0", "parameter 'token_queue_size' out of range"},
        Failing{kRequired + " token_queue_size=10001", "parameter 'token_queue_size' out of range"},
        Failing{kRequired + " token_queue_size=-5", "parameter 'token_queue_size' out of range"},
        // The range check comes before the hex checks.
        Failing{kRequired + " rx_prefix=0 token_queue_size=0",
                "parameter 'token_queue_size' out of range"},
        Failing{kRequired + " rx_prefix=D0A", "rx_prefix not in hex format"},
        Failing{kRequired + " rx_suffix=0G", "rx_suffix not in hex format"},
        Failing{kRequired + " tx_prefix=zz", "tx_prefix not in hex format"},
        Failing{kRequired + " tx_suffix=NONE", "tx_suffix not in hex format"},
        // Only the first bad text, in the order rx, then tx, is reported.
        Failing{kRequired + " tx_prefix=1 rx_suffix=1", "rx_suffix not in hex format"},
        Failing{kRequired + " hex_tokens=TRUE", "Parser: parameter 'hex_tokens' has illegal value"},
        Failing{kRequired + " autoConnect=1",
                "Parser: parameter 'autoConnect' has illegal value"}));

TEST(Config, DefaultsOfTheOptionalKeys) {
    XtokConfig config;
    ASSERT_TRUE(config.Parse(kRequired)) << config.GetLastError();
    const XtokCommonParams& c = config.GetCommon();
    EXPECT_EQ(c.port, "com1");
    EXPECT_EQ(c.baudrate, 9600);
    EXPECT_EQ(c.parity, "even");
    EXPECT_EQ(c.bits, 8);
    EXPECT_EQ(c.stopbits, 1);
    EXPECT_EQ(c.mode, "RS-232");
    EXPECT_EQ(c.rx_prefix, "");
    EXPECT_EQ(c.rx_suffix, "");
    EXPECT_EQ(c.gap, 0);
    EXPECT_EQ(c.tx_prefix, "");
    EXPECT_EQ(c.tx_suffix, "");
    EXPECT_FALSE(c.hex_tokens);
    EXPECT_EQ(c.token_queue_size, 100);
    EXPECT_TRUE(c.autoConnect);
}

TEST(Config, OptionalKeysAreRead) {
    XtokConfig config;
    ASSERT_TRUE(config.Parse(kRequired +
                             " rx_prefix=02 rx_suffix=0d0a gap=0x14 tx_prefix=none tx_suffix="
                             " hex_tokens=true token_queue_size=10000 autoConnect=false"))
        << config.GetLastError();
    const XtokCommonParams& c = config.GetCommon();
    EXPECT_EQ(c.rx_prefix, "02");
    EXPECT_EQ(c.rx_suffix, "0d0a");
    EXPECT_EQ(c.gap, 20);
    EXPECT_EQ(c.tx_prefix, "none");
    EXPECT_EQ(c.tx_suffix, "");
    EXPECT_TRUE(c.hex_tokens);
    EXPECT_EQ(c.token_queue_size, 10000);
    EXPECT_FALSE(c.autoConnect);
}

TEST(Config, ParityAndModeTextsAreKeptForTheProtocolToDecode) {
    XtokConfig config;
    std::string text =
        "CfgVer=1 model=1 port=/dev/ttyUSB0 baudrate=115200 parity=mark bits=7 "
        "stopbits=2 mode=RS-485";
    ASSERT_TRUE(config.Parse(text));
    EXPECT_EQ(config.GetCommon().parity, "mark");
    EXPECT_EQ(config.GetCommon().mode, "RS-485");
    EXPECT_EQ(config.GetCommon().port, "/dev/ttyUSB0");
}

TEST(Config, NodeSectionsAndFindNode) {
    XtokConfig config;
    ASSERT_TRUE(config.Parse(kRequired + " Node3::model=7 Node5::x=1 Node3::y=2"));
    ASSERT_EQ(config.nodes().size(), 2u);
    EXPECT_EQ(config.FindNode(3).number, 3);
    EXPECT_EQ(config.FindNode(3).model, "7");
    EXPECT_EQ(config.FindNode(5).model, "1");  // no model of its own: the common one
    const XtokNode& unknown = config.FindNode(42);
    EXPECT_EQ(unknown.number, -1);
    EXPECT_EQ(unknown.model, "1");
}

TEST(Config, WithoutNodeSectionsEveryNodeIsTheDefault) {
    XtokConfig config;
    ASSERT_TRUE(
        config.Parse("CfgVer=1 model=2 port=com1 baudrate=9600 parity=even bits=8 "
                     "stopbits=1 mode=RS-232"));
    EXPECT_TRUE(config.nodes().empty());
    EXPECT_EQ(config.FindNode(0).model, "2");
}

TEST(Config, ParsingAgainStartsAfresh) {
    XtokConfig config;
    ASSERT_TRUE(config.Parse(kRequired + " Node1::model=1 gap=5"));
    ASSERT_TRUE(config.Parse(kRequired));
    EXPECT_TRUE(config.nodes().empty());
    EXPECT_EQ(config.GetCommon().gap, 0);
}

TEST(Config, WhatWasReadBeforeAFailureStays) {
    XtokConfig config;
    EXPECT_FALSE(config.Parse("CfgVer=1 model=1 port=com4 baudrate=4800"));
    EXPECT_EQ(config.GetCommon().port, "com4");
    EXPECT_EQ(config.GetCommon().baudrate, 4800);
}

}  // namespace
}  // namespace xtok
