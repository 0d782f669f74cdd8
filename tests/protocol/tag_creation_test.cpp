#include <gtest/gtest.h>

#include <string>

#include "framework/protocol_base.h"
#include "protocol/xtok_tag.h"
#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

struct UriCase {
    std::string uri;
    std::string reason;  ///< empty: the tag is made
    int32_t node = 0;
};

void PrintTo(const UriCase& c, std::ostream* os) {
    *os << c.uri;
}

class TagCreation : public ProtocolFixture, public ::testing::WithParamInterface<UriCase> {};

TEST_P(TagCreation, MadeOrRefusedWithItsReason) {
    // Node 3 names a model the protocol does not have.
    ASSERT_TRUE(configure("Node3::model=7 Node4::model=1")) << error();
    const UriCase& c = GetParam();
    ITag* made = protocol->CreateTag(c.uri.c_str());
    if (c.reason.empty()) {
        ASSERT_NE(made, nullptr) << error();
        EXPECT_EQ(protocol->GetTagProperty(made), c.node);
        EXPECT_STREQ(made->GetUri(), c.uri.c_str());
    } else {
        EXPECT_EQ(made, nullptr);
        EXPECT_EQ(code(), -1);
        EXPECT_EQ(error(), "Tag URI error: " + c.uri + " - " + c.reason);
        EXPECT_TRUE(static_cast<ProtocolBase*>(protocol)->Tags().empty());
    }
}

INSTANTIATE_TEST_SUITE_P(
    Checks, TagCreation,
    ::testing::Values(UriCase{"0?rx_token", "there must be 3 tag specification fields"},
                      UriCase{"0?rx_token?string-10?x", "there must be 3 tag specification fields"},
                      UriCase{"rx_token", "there must be 3 tag specification fields"},
                      UriCase{"0??string-10", "memorytype field missing"},
                      // The memory type is checked before the data type.
                      UriCase{"0??", "memorytype field missing"},
                      UriCase{"0?connect?", "icomType field missing"},
                      UriCase{"3?connect?boolean", "Can't access model"},
                      UriCase{"0?RX_TOKEN?string-10", "Can't access memory type"},
                      UriCase{"0?rx_tokens?string-10", "Can't access memory type"},
                      UriCase{"0?rx_token?strin-10", "strin-10: data type unknown"},
                      UriCase{"0?rx_token?string-10(swap2", "string-10(swap2: data type unknown"},
                      UriCase{"0?rx_token?boolean", "not allowed icom type"},
                      UriCase{"0?tokens_available?int", "not allowed icom type"},
                      UriCase{"0?SP_Par?byte", "not allowed icom type"},
                      UriCase{"0?connect?boolean-8", "not allowed icom type"}));

INSTANTIATE_TEST_SUITE_P(
    Made, TagCreation,
    ::testing::Values(UriCase{"?connect?boolean", "", 0}, UriCase{"0?rx_token?string-10", "", 0},
                      // Node numbers read as C literals; unknown nodes use the default record.
                      UriCase{"0x10?connect?boolean", "", 16},
                      UriCase{"010?connect?boolean", "", 8}, UriCase{"4?connect?boolean", "", 4},
                      UriCase{"42?tx_token?string-8", "", 42},
                      UriCase{"0?SP_Par?unsignedByte", "", 0},
                      UriCase{"0?SP_Baud?unsignedInt", "", 0},
                      UriCase{"0?token_ack?boolean", "", 0}));

TEST(TagCreationModel, WithoutAModelOfThatNameNoTagIsMade) {
    FakeHost host;
    ModuleSession session(host);
    IProtocol7* protocol = rootObject().factory().CreateProtocol("XTOK");
    ASSERT_NE(protocol, nullptr);
    ASSERT_TRUE(protocol->Configure(
        "CfgVer=1 model=2 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232"));
    EXPECT_EQ(protocol->CreateTag("0?connect?boolean"), nullptr);
    EXPECT_STREQ(protocol->GetLastErrorText(),
                 "Tag URI error: 0?connect?boolean - Can't access model");
    rootObject().factory().DestroyProtocol(protocol);
}

class SettingsTags : public ProtocolFixture {};

TEST_F(SettingsTags, OnlyTheSpTypesAreSettingsTags) {
    const std::pair<const char*, bool> cases[] = {
        {"0?SP_Gap?unsignedInt", true},
        {"0?SP_Done?boolean", true},
        {"0?SP_TokenQueueSize?unsignedInt", true},
        {"0?SP_RxPrefix?string-8", true},
        {"0?SP_HexTokens?boolean", true},
        {"0?connect?boolean", false},
        {"0?tx_token?string-8", false},
        {"0?tokens_available?unsignedInt", false},
    };
    for (const auto& [uri, settings] : cases) {
        ITag* made = tag(uri);
        ASSERT_NE(made, nullptr);
        EXPECT_EQ(static_cast<XtokTag*>(made)->isSettingsTag(), settings) << uri;
    }
}

TEST_F(SettingsTags, ReadOnlyAndWriteOnlyFollowTheMemoryType) {
    ITag* rx = tag("0?rx_token?string-8");
    ITag* tx = tag("0?tx_token?string-8");
    ITag* connect = tag("0?connect?boolean");
    ASSERT_TRUE(rx && tx && connect);
    EXPECT_TRUE(rx->IsReadOnly());
    EXPECT_FALSE(rx->IsWriteOnly());
    EXPECT_TRUE(tx->IsWriteOnly());
    EXPECT_FALSE(tx->IsReadOnly());
    EXPECT_FALSE(connect->IsReadOnly());
    EXPECT_FALSE(connect->IsWriteOnly());
}

}  // namespace
}  // namespace xtok::test
