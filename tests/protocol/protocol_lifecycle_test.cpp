#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

class Lifecycle : public ProtocolFixture {
protected:
    std::vector<std::string> taskCalls() {
        std::vector<std::string> out;
        for (const std::string& c : host.tasks().calls()) {
            if (c.rfind("CreateTask", 0) == 0 || c.rfind("StopTask", 0) == 0) {
                out.push_back(c);
            }
        }
        return out;
    }
};

TEST_F(Lifecycle, StartOpensThePortAndRunsTheTaskAndStopUndoesBoth) {
    start();
    EXPECT_TRUE(host.serial().isOpen());
    EXPECT_EQ(host.serial().openedNames(), std::vector<std::string>{"com1"});
    EXPECT_EQ(readBool("connect"), true);
    ASSERT_NE(host.tasks().lastTask(), nullptr);

    // A second Start changes nothing.
    EXPECT_TRUE(protocol->Start());
    EXPECT_EQ(host.serial().opens(), 1);
    EXPECT_EQ(host.tasks().tasksCreated(), 1);

    EXPECT_TRUE(protocol->Stop());
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(taskCalls(), (std::vector<std::string>{"CreateTask 3 0", "StopTask 1000"}));
    EXPECT_TRUE(host.tasks().lastTask()->waitEnded(0));
    EXPECT_EQ(readInt("tokens_available"), std::nullopt);
    EXPECT_EQ(code(), -3);

    // Stop again, and Start again after Stop.
    EXPECT_TRUE(protocol->Stop());
    EXPECT_EQ(taskCalls().size(), 2u);
    EXPECT_TRUE(protocol->Start());
    EXPECT_EQ(host.serial().opens(), 2);
    EXPECT_EQ(host.tasks().tasksCreated(), 2);
}

TEST_F(Lifecycle, DestroyingARunningProtocolEndsItsTaskAndClosesThePort) {
    start();
    FakeTask* task = host.tasks().lastTask();
    rootObject().factory().DestroyProtocol(protocol);
    protocol = nullptr;
    EXPECT_TRUE(task->waitEnded(0));
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(host.tasks().mutexesAlive(), 0);
}

TEST_F(Lifecycle, StopBeforeStartDoesNothing) {
    ASSERT_TRUE(configure());
    EXPECT_TRUE(protocol->Stop());
    EXPECT_TRUE(taskCalls().empty());
    EXPECT_EQ(host.serial().closes(), 0);
}

TEST_F(Lifecycle, AFailedOpenFailsStartAndALaterStartTriesAgain) {
    ASSERT_TRUE(configure());
    host.serial().refuseOpen = true;
    EXPECT_FALSE(protocol->Start());
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Can't open serial port");
    EXPECT_TRUE(taskCalls().empty());
    EXPECT_EQ(readBool("connect"), std::nullopt);  // still not started
    EXPECT_EQ(error(), "Protocol not started");

    // Settings the host refuses fail the same way, and the port is closed again.
    host.serial().refuseOpen = false;
    host.serial().failConfigure = true;
    EXPECT_FALSE(protocol->Start());
    EXPECT_EQ(error(), "Can't open serial port");
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_TRUE(taskCalls().empty());

    host.serial().failConfigure = false;
    EXPECT_TRUE(protocol->Start());
    EXPECT_TRUE(host.serial().isOpen());
    EXPECT_EQ(taskCalls(), std::vector<std::string>{"CreateTask 3 0"});
}

TEST_F(Lifecycle, WithoutAutoConnectTheTaskRunsWithThePortClosed) {
    start("autoConnect=false");
    EXPECT_EQ(host.serial().opens(), 0);
    EXPECT_EQ(taskCalls(), std::vector<std::string>{"CreateTask 3 0"});
    EXPECT_EQ(readBool("connect"), false);
    // The idle task sleeps instead of reading.
    EXPECT_TRUE(eventually([&] {
        auto s = host.tasks().sleeps();
        return std::count(s.begin(), s.end(), 10) >= 2;
    }));
    EXPECT_TRUE(host.serial().readTimeouts().empty());

    EXPECT_EQ(command("connect ON"), "OK");
    EXPECT_TRUE(host.serial().isOpen());
    play("41 42");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"AB"});
}

TEST_F(Lifecycle, ATaskTheHostCannotMakeLeavesTheProtocolStartedWithoutReceiving) {
    host.tasks().refuseTasks = true;
    start();
    EXPECT_EQ(readInt("tokens_available"), 0);
    EXPECT_TRUE(protocol->Stop());
    EXPECT_FALSE(host.serial().isOpen());
}

TEST_F(Lifecycle, AStopTheHostTimesOutStillClosesThePort) {
    start();
    host.tasks().stopTimesOut = true;
    EXPECT_TRUE(protocol->Stop());
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(readBool("connect"), std::nullopt);
    // The task still runs, idle on the closed port, until the destructor ends it.
    host.tasks().stopTimesOut = false;
    destroy();
    EXPECT_TRUE(host.tasks().lastTask()->waitEnded(0));
}

TEST_F(Lifecycle, ThePortIsOpenedWithTheFiveNumbers) {
    struct Case {
        std::string keys;
        LineSettings line;
        std::string text;
    };
    const Case cases[] = {
        {"port=com1 baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232",
         {9600, 0, 8, 1, 0},
         "com1,9600,none,8,1,RS-232"},
        {"port=com2 baudrate=19200 parity=even bits=7 stopbits=2 mode=RS-485",
         {19200, 1, 7, 2, 1},
         "com2,19200,even,7,2,RS-485"},
        {"port=com3 baudrate=115200 parity=odd bits=8 stopbits=1 mode=RS-422",
         {115200, 2, 8, 1, 2},
         "com3,115200,odd,8,1,RS-422"},
        {"port=com16 baudrate=150 parity=mark bits=7 stopbits=1 mode=RS-232",
         {150, 3, 7, 1, 0},
         "com16,150,mark,7,1,RS-232"},
    };
    for (const Case& c : cases) {
        destroy();
        create();
        ASSERT_TRUE(protocol->Configure(("CfgVer=1 model=1 " + c.keys).c_str())) << error();
        ASSERT_TRUE(protocol->Start()) << error();
        EXPECT_TRUE(host.serial().configured().back() == c.line) << c.keys;
        EXPECT_EQ(host.serial().openedNames().back(), c.text.substr(0, c.text.find(',')));
        char text[64] = {};
        EXPECT_TRUE(protocol->GetSerialSettings(text, sizeof text));
        EXPECT_EQ(std::string(text), c.text);
    }
}

TEST_F(Lifecycle, ConfigureRefusesUnknownParityAndModeNames) {
    struct Case {
        std::string keys, message;
    };
    const Case cases[] = {
        {"parity=space mode=RS-232", "Parser: parameter 'parity' has invalid value"},
        {"parity=EVEN mode=RS-232", "Parser: parameter 'parity' has invalid value"},
        {"parity=even mode=RS-485P", "Parser: parameter 'mode' has invalid value"},
        {"parity=even mode=rs-232", "Parser: parameter 'mode' has invalid value"},
    };
    for (const Case& c : cases) {
        std::string text = "CfgVer=1 model=1 port=com7 baudrate=4800 bits=8 stopbits=1 " + c.keys;
        EXPECT_FALSE(protocol->Configure(text.c_str())) << c.keys;
        EXPECT_EQ(code(), -1) << c.keys;
        EXPECT_EQ(error(), c.message) << c.keys;
    }
    // What came before the bad name is taken all the same.
    char text[64] = {};
    protocol->GetSerialSettings(text, sizeof text);
    EXPECT_EQ(std::string(text).substr(0, 10), "com7,4800,");

    EXPECT_FALSE(protocol->Configure("CfgVer=1 model=1 baudrate=9600"));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Parser: parameter 'port' is not found");
}

TEST_F(Lifecycle, SerialSettingsTextIsCutAtTheCallersLength) {
    ASSERT_TRUE(configure());
    const std::string full = "com1,9600,even,8,1,RS-232";
    for (int32_t length :
         {0, 1, 5, static_cast<int32_t>(full.size()), static_cast<int32_t>(full.size()) + 1}) {
        std::vector<char> buffer(40, 'x');
        EXPECT_TRUE(protocol->GetSerialSettings(buffer.data(), length)) << length;
        std::size_t copied = std::min<std::size_t>(static_cast<std::size_t>(length), full.size());
        EXPECT_EQ(std::string(buffer.data(), copied), full.substr(0, copied)) << length;
        // Terminated only when the text fits with its zero.
        char after = buffer[copied];
        EXPECT_EQ(after, static_cast<std::size_t>(length) > full.size() ? '\0' : 'x') << length;
    }
}

TEST_F(Lifecycle, LocksAreMadeWithTheProtocolAndDestroyedWithIt) {
    EXPECT_EQ(host.tasks().calls(), (std::vector<std::string>{"CreateMutex 0", "CreateMutex 0"}));
    start();
    destroy();
    std::vector<std::string> calls = host.tasks().calls();
    std::vector<std::string> destroyed;
    for (const std::string& c : calls) {
        if (c.rfind("DestroyMutex", 0) == 0) {
            destroyed.push_back(c);
        }
    }
    // The queue's lock was made first and goes first.
    EXPECT_EQ(destroyed, (std::vector<std::string>{"DestroyMutex 1", "DestroyMutex 2"}));
    EXPECT_EQ(host.tasks().mutexesAlive(), 0);
    EXPECT_FALSE(host.serial().isOpen());
}

TEST_F(Lifecycle, Identity) {
    for (const char* name : {"Protocol_XTOK", "ProtocolBase", "IProtocol7", "IProtocol6",
                             "IProtocol5", "IProtocol4", "IProtocol3", "IProtocol2", "IProtocol"}) {
        EXPECT_EQ(protocol->GetInterface(name), static_cast<void*>(protocol)) << name;
    }
    for (const char* name : {"protocol_xtok", "IProtocol8", "Protocol_XTOK ", ""}) {
        EXPECT_EQ(protocol->GetInterface(name), nullptr) << name;
    }
    EXPECT_STREQ(protocol->GetClassName(), "Protocol_XTOK");
    EXPECT_EQ(protocol->GetImplementationVersion(), 100);
    EXPECT_STREQ(protocol->GetName(), "XTOK");
    EXPECT_EQ(protocol->GetVersion(), 106);
    EXPECT_EQ(protocol->GetCode(), 471);
    EXPECT_STREQ(protocol->GetDisplayName(), "Xtokline");
    EXPECT_EQ(protocol->GetConnectionKind(), 2);
    EXPECT_EQ(protocol->GetLineOption(), 0);
    EXPECT_EQ(protocol->GetMaxAccessTime(1), 0);
    EXPECT_NE(protocol->GetXmlDescription(), nullptr);
    const char* const* names = protocol->GetUriFieldNames();
    ASSERT_NE(names, nullptr);
    EXPECT_STREQ(names[0], "node");
    EXPECT_STREQ(names[1], "memorytype");
    EXPECT_STREQ(names[2], "datatype");
    EXPECT_EQ(names[3], nullptr);
    EXPECT_EQ(code(), 1);
    EXPECT_EQ(error(), "");
}

TEST_F(Lifecycle, QueryRecord) {
    uint8_t record[132] = {};
    int32_t kind = 3;
    std::memcpy(record, &kind, 4);
    std::memset(record + 4, 0xEE, 4);
    record[128] = 0x5A;
    EXPECT_EQ(protocol->QueryRecord(0, record), 1);
    int32_t answer = -1;
    std::memcpy(&answer, record + 4, 4);
    EXPECT_EQ(answer, 1);

    kind = 2;
    std::memcpy(record, &kind, 4);
    EXPECT_EQ(protocol->QueryRecord(0, record), 1);
    std::memcpy(&answer, record + 4, 4);
    EXPECT_EQ(answer, 0);

    EXPECT_EQ(protocol->QueryRecord(3, record), 0x5A);
    EXPECT_EQ(protocol->QueryRecord(1, record), 0);
    EXPECT_EQ(protocol->QueryRecord(4, record), 0);
}

TEST_F(Lifecycle, CanJoinTags) {
    ASSERT_TRUE(configure());
    struct Case {
        std::string first, second;
        int32_t flag;
        bool joins;
    };
    const Case cases[] = {
        {"0?rx_token?string-10", "0?rx_token?string-20", 0, true},
        {"0?rx_token?string-10", "0?rx_token?string-20", 1, false},
        {"0?rx_token?string-10", "1?rx_token?string-20", 0, false},
        {"0?rx_token?string-10", "0?tx_token?string-10", 0, false},
        {"0?rx_token_len?unsignedInt", "0?rx_token_len?unsignedInt", 0, true},
        // Types read element by element never join.
        {"0?tokens_available?unsignedInt", "0?tokens_available?unsignedInt", 0, false},
        {"0?connect?boolean", "0?connect?boolean", 0, false},
        // The block read count bounds the span.
        {"0?SP_RxPrefix?string-4", "0?SP_RxPrefix?string-9999", 0, true},
        {"0?SP_RxPrefix?string-4", "0?SP_RxPrefix?string-10000", 0, false},
    };
    for (const Case& c : cases) {
        ITag* a = tag(c.first);
        ITag* b = tag(c.second);
        ASSERT_TRUE(a && b);
        EXPECT_EQ(protocol->CanJoinTags(a, b, c.flag), c.joins) << c.first << " + " << c.second;
    }
}

// Values the operator changed at run time outlive a restart.
TEST_F(Lifecycle, RetainedValuesWinOverTheConfigurationAtStart) {
    host.storage().put("XTOK", "baud", "19200");
    // Codes a configuration cannot give: parity space, mode RS-485P.
    host.storage().put("XTOK", "parity", "4");
    host.storage().put("XTOK", "mode", "3");
    host.storage().put("XTOK", "rx_prefix", "02");
    host.storage().put("XTOK", "rx_suffix", "03");
    host.storage().put("XTOK", "hex_tokens", "1");
    start("rx_prefix=AA rx_suffix=BB");
    ASSERT_EQ(host.serial().configured().size(), 1u);
    EXPECT_TRUE((host.serial().configured()[0] == LineSettings{19200, 4, 8, 1, 3}));
    char text[64] = {};
    protocol->GetSerialSettings(text, sizeof text);
    EXPECT_STREQ(text, "com1,19200,space,8,1,RS-485P");
    EXPECT_EQ(readInt("SP_Baud"), 19200);
    EXPECT_EQ(readText("SP_RxPrefix"), "02");
    play("AA 41 BB 02 41 42 03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"4142"});
}

TEST_F(Lifecycle, RetainedValuesLiveUnderTheInstanceName) {
    host.storage().put("XTOK", "baud", "19200");
    host.storage().put("Line2", "baud", "38400");
    protocol->SetInstanceName("Line2");
    start();
    EXPECT_TRUE((host.serial().configured()[0] == LineSettings{38400, 1, 8, 1, 0}));
    for (const std::string& c : host.storage().calls()) {
        EXPECT_EQ(c.find(" XTOK "), std::string::npos) << c;
        EXPECT_NE(c.rfind("Write", 0), 0u) << "Start only reads: " << c;
    }
    // Read once per protocol: a later Start keeps what the first one read.
    host.storage().put("Line2", "baud", "57600");
    ASSERT_TRUE(protocol->Stop());
    ASSERT_TRUE(protocol->Start());
    EXPECT_TRUE((host.serial().configured().back() == LineSettings{38400, 1, 8, 1, 0}));
}

}  // namespace
}  // namespace xtok::test
