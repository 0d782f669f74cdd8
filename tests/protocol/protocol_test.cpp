// The protocol object: start and stop with its task and port, the
// configuration text and its errors, tag addresses, and its identity.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

const Scenario kLifecycle[] = {
    // Stop before Start has nothing to do; a second Start or Stop neither.
    {"StartOpensThePortAndRunsTheTaskAndStopUndoesBoth",
     "conf; stop; go; go; opens; r connect; stop; stop; opens; tasks; r tokens_available; err; "
     "go; opens",
     "1/0 com1 | 1 | 1/1 com1 | CreateTask 3 0,StopTask 1000 | !Protocol not started | -3 Protocol "
     "not started | 2/1 com1"},
    {"WithoutAutoConnectTheTaskRunsWithThePortClosed",
     "start autoConnect=false; opens; r connect; cmd connect ON; play 41 42; tokens",
     "0/0 - | 0 | OK | AB"},
    {"ThePortIsOpenedWithTheFiveNumbersAndReportedByName",
     "cfg CfgVer=1 model=1 port=com2 baudrate=19200 parity=none bits=7 stopbits=2 mode=RS-485; "
     "go; cfgd; line; opens; new; "
     "cfg CfgVer=1 model=1 port=com3 baudrate=115200 parity=odd bits=8 stopbits=1 mode=RS-422; "
     "go; cfgd; line; new; "
     "cfg CfgVer=1 model=1 port=com16 baudrate=150 parity=mark bits=7 stopbits=1 mode=RS-232; "
     "go; cfgd; line",
     "19200/0/7/2/1 | com2,19200,none,7,2,RS-485 | 1/0 com2 | 115200/2/8/1/2 | "
     "com3,115200,odd,8,1,RS-422 | 150/3/7/1/0 | com16,150,mark,7,1,RS-232"},
};

INSTANTIATE_TEST_SUITE_P(Protocol, Scenarios, ::testing::ValuesIn(kLifecycle), scenarioName);

class Protocol : public ProtocolFixture {};

TEST_F(Protocol, DestroyingARunningProtocolEndsItsTaskAndGivesBackItsLocks) {
    EXPECT_EQ(host.tasks().calls(), (std::vector<std::string>{"CreateMutex 0", "CreateMutex 0"}));
    ASSERT_TRUE(start());
    FakeTask* task = host.tasks().lastTask();
    EXPECT_TRUE(protocol->Stop() && protocol->Start());
    rootObject().factory().DestroyProtocol(protocol);
    protocol = nullptr;
    EXPECT_TRUE(task->waitEnded(0));
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(host.tasks().mutexesAlive(), 0);
}

// Cut at the caller's length, terminated when there is room.
TEST_F(Protocol, SerialSettingsAreCutAtTheCallersLength) {
    ASSERT_TRUE(configure());
    const std::string full = "com1,9600,even,8,1,RS-232";
    for (int32_t length : {0, 5, 25, 26}) {
        std::string buffer(40, 'x');
        EXPECT_TRUE(protocol->GetSerialSettings(buffer.data(), length));
        const std::size_t copied = std::min<std::size_t>(length, full.size());
        EXPECT_EQ(buffer.substr(0, copied + 1),
                  full.substr(0, copied) + (length > 25 ? '\0' : 'x'));
    }
}

TEST_F(Protocol, ConfigurationErrorsSayWhy) {
    const std::pair<std::string, const char*> cases[] = {
        {"model=1 port=com1", "Parser: unknown format"},
        {"CfgVer=1 port=com1", "Parser: parameter 'model' is not found"},
        {"CfgVer=1 model=1 baudrate=9600", "Parser: parameter 'port' is not found"},
        {"CfgVer=1 model=1 port=com1 parity=even", "Parser: parameter 'baudrate' is not found"},
        {"CfgVer=1 model=1 port=com1 baudrate=9600 bits=8",
         "Parser: parameter 'parity' is not found"},
        {"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even stopbits=1",
         "Parser: parameter 'bits' is not found"},
        {"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8",
         "Parser: parameter 'stopbits' is not found"},
        {"CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1",
         "Parser: parameter 'mode' is not found"},
        {kBaseConfig + " token_queue_size=0", "parameter 'token_queue_size' out of range"},
        {kBaseConfig + " token_queue_size=10001", "parameter 'token_queue_size' out of range"},
        {kBaseConfig + " rx_prefix=0 token_queue_size=-5",
         "parameter 'token_queue_size' out of range"},
        {kBaseConfig + " rx_prefix=D0A", "rx_prefix not in hex format"},
        {kBaseConfig + " tx_prefix=1 rx_suffix=0G", "rx_suffix not in hex format"},
        {kBaseConfig + " tx_prefix=zz", "tx_prefix not in hex format"},
        {kBaseConfig + " tx_suffix=NONE", "tx_suffix not in hex format"},
        {kBaseConfig + " hex_tokens=TRUE", "Parser: parameter 'hex_tokens' has illegal value"},
        {kBaseConfig + " autoConnect=1", "Parser: parameter 'autoConnect' has illegal value"},
        {"CfgVer=1 model=1 port=com7 baudrate=4800 bits=8 stopbits=1 parity=space mode=RS-232",
         "Parser: parameter 'parity' has invalid value"},
        {"CfgVer=1 model=1 port=com7 baudrate=4800 bits=8 stopbits=1 parity=EVEN mode=RS-232",
         "Parser: parameter 'parity' has invalid value"},
        {"CfgVer=1 model=1 port=com7 baudrate=4800 bits=8 stopbits=1 parity=none mode=RS-485P",
         "Parser: parameter 'mode' has invalid value"},
    };
    for (const auto& [text, message] : cases) {
        EXPECT_FALSE(protocol->Configure(text.c_str())) << text;
        EXPECT_EQ(code(), -1);
        EXPECT_EQ(error(), message) << text;
    }
    EXPECT_EQ(run("line").substr(0, 10), "com7,4800,");  // what was read before stays
    // A common key under a node's prefix is no entry for it, and no fault.
    EXPECT_TRUE(
        configure("token_queue_size=10000 rx_prefix=0d0A tx_prefix=none gap=0x14 "
                  "Node3::model=7 Node0::rx_suffix=zz"));
    EXPECT_TRUE(configure("token_queue_size=1"));  // a second Configure starts afresh
    EXPECT_NE(protocol->CreateTag("3?connect?boolean"), nullptr) << error();
}

struct UriCase {
    const char* uri;
    const char* reason;  ///< null: made
    int32_t node;
};

TEST_F(Protocol, TagsAreMadeOrRefusedWithTheirReason) {
    const UriCase cases[] = {
        {"0?rx_token", "there must be 3 tag specification fields", 0},
        {"0?rx_token?string-10?x", "there must be 3 tag specification fields", 0},
        {"0??string-10", "memorytype field missing", 0},
        {"0?connect?", "icomType field missing", 0},
        {"3?connect?boolean", "Can't access model", 0},
        {"0?RX_TOKEN?string-10", "Can't access memory type", 0},
        {"0?rx_token?strin-10", "strin-10: data type unknown", 0},
        {"0?rx_token?boolean", "not allowed icom type", 0},
        {"0?tokens_available?int", "not allowed icom type", 0},
        {"0?SP_Par?byte", "not allowed icom type", 0},
        {"0?connect?boolean-8", "not allowed icom type", 0},
        {"?connect?boolean", nullptr, 0},
        {"0x10?connect?boolean", nullptr, 16},
        {"010?connect?boolean", nullptr, 8},
        {"4?connect?boolean", nullptr, 4},
        {"42?tx_token?string-8", nullptr, 42},
        {"0?tx_token?string-1000001", nullptr, 0},
        {"0?tx_token?string-268435456", "string-268435456: data type unknown", 0},
        {"0?SP_Baud?unsignedInt", nullptr, 0},
    };
    ASSERT_TRUE(configure("Node3::model=7 Node4::model=1"));
    EXPECT_EQ(protocol->GetTagProperty(nullptr), 0);
    for (const UriCase& c : cases) {
        ITag* made = protocol->CreateTag(c.uri);
        EXPECT_EQ(made != nullptr, c.reason == nullptr) << c.uri;
        if (made) {
            EXPECT_EQ(protocol->GetTagProperty(made), c.node) << c.uri;
            EXPECT_STREQ(made->GetUri(), c.uri);
            protocol->DeleteTag(made);
        } else {
            EXPECT_EQ(error(), std::string("Tag URI error: ") + c.uri + " - " + c.reason);
        }
    }
    EXPECT_TRUE(tag("0?rx_token?string-8")->IsReadOnly());
    EXPECT_TRUE(tag("0?tx_token?string-8")->IsWriteOnly());
    EXPECT_FALSE(tag("0?connect?boolean")->IsReadOnly() || tag("0?connect?boolean")->IsWriteOnly());
    ASSERT_TRUE(
        protocol->Configure("CfgVer=1 model=2 port=com1 baudrate=9600 parity=even bits=8 "
                            "stopbits=1 mode=RS-232"));
    EXPECT_EQ(protocol->CreateTag("0?connect?boolean"), nullptr);  // no model "2"
}

TEST_F(Protocol, CanJoinTags) {
    ASSERT_TRUE(configure());
    const std::tuple<const char*, const char*, int32_t, bool> cases[] = {
        {"0?rx_token?string-10", "0?rx_token?string-20", 0, true},
        {"0?rx_token?string-10", "0?rx_token?string-20", 1, false},
        {"0?rx_token?string-10", "1?rx_token?string-20", 0, false},
        {"0?rx_token?string-10", "0?tx_token?string-10", 0, false},
        {"0?rx_token_len?unsignedInt", "0?rx_token_len?unsignedInt", 0, true},
        {"0?tokens_available?unsignedInt", "0?tokens_available?unsignedInt", 0, false},
        {"0?SP_RxPrefix?string-4", "0?SP_RxPrefix?string-9999", 0, true},
        {"0?SP_RxPrefix?string-4", "0?SP_RxPrefix?string-10000", 0, false},
    };
    for (const auto& [first, second, flag, joins] : cases) {
        EXPECT_EQ(protocol->CanJoinTags(tag(first), tag(second), flag), joins)
            << first << " + " << second;
    }
}

TEST_F(Protocol, IdentityAndQueryRecord) {
    for (const char* name : {"Protocol_XTOK", "ProtocolBase", "IProtocol7", "IProtocol"}) {
        EXPECT_EQ(protocol->GetInterface(name), static_cast<void*>(protocol)) << name;
    }
    for (const char* name : {"protocol_xtok", "IProtocol8", ""}) {
        EXPECT_EQ(protocol->GetInterface(name), nullptr) << name;
    }
    EXPECT_EQ(
        std::string(protocol->GetClassName()) + protocol->GetName() + protocol->GetDisplayName(),
        "Protocol_XTOKXTOKXtokline");
    EXPECT_EQ((std::vector{protocol->GetImplementationVersion(), protocol->GetVersion(),
                           protocol->GetCode(), protocol->GetConnectionKind(),
                           protocol->GetLineOption(), protocol->GetMaxAccessTime(1)}),
              (std::vector<int32_t>{100, 106, 471, 2, 0, 0}));
    const char* const* names = protocol->GetUriFieldNames();
    EXPECT_EQ(std::string(names[0]) + names[1] + names[2], "nodememorytypedatatype");
    EXPECT_EQ(names[3], nullptr);
    uint8_t record[132] = {3, 0, 0, 0, 0xEE, 0xEE, 0xEE, 0xEE};
    record[128] = 0x5A;
    EXPECT_EQ(protocol->QueryRecord(0, record), 1);
    EXPECT_EQ(record[4] + record[5] + record[6] + record[7], 1);
    record[0] = 2;
    EXPECT_EQ(protocol->QueryRecord(0, record), 1);
    EXPECT_EQ(record[4], 0);
    EXPECT_EQ(protocol->QueryRecord(3, record), 0x5A);
    EXPECT_EQ(protocol->QueryRecord(1, record) + protocol->QueryRecord(4, record), 0);
    EXPECT_EQ(protocol->QueryRecord(0, nullptr) + protocol->QueryRecord(3, nullptr), 0);
}

}  // namespace
}  // namespace xtok::test
