// The token protocol through the dlopen'ed library and slot numbers only,
// as a panel runtime drives it.
#include <gtest/gtest.h>

#include <chrono>
#include <cstring>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/fake_host.h"
#include "tests/support/plugin_library.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

// Protocol slots, as a runtime numbers them.
enum Slot {
    kConfigure = 4,
    kCreateTag = 5,
    kDeleteTag = 6,
    kStart = 8,
    kStop = 9,
    kReadTag = 10,
    kWriteTag = 11,
    kGetName = 18,
    kLastErrorCode = 20,
    kLastErrorText = 21,
    kVersion = 22,
    kCode = 23,
    kDisplayName = 24,
    kXml = 26,
    kInstanceName = 28,
    kSetInstanceName = 29,
    kDoCommand = 30,
    kSerialSettings = 54
};

const std::string kLine =
    "CfgVer=1 model=1 port=com2 baudrate=19200 parity=odd bits=7 stopbits=2 mode=RS-485 ";

// One runtime session: module Init, a protocol, and everything undone after.
class Runtime {
public:
    explicit Runtime(FakeHost& host) {
        EXPECT_TRUE(lib.loaded()) << lib.error();
        module = lib.rootInterface("IProtModule");
        factory = lib.rootInterface("IProtocolFactory");
        EXPECT_EQ(callSlot<int32_t>(module, 4, static_cast<IServiceProvider*>(&host)), 1);
    }
    ~Runtime() {
        destroy();
        callSlot<void>(module, 5);
    }
    void* create() {
        protocol = callSlot<void*>(factory, 4, "XTOK");
        return protocol;
    }
    void destroy() {
        if (protocol) {
            callSlot<bool>(protocol, kStop);
            callSlot<void>(factory, 5, protocol);
            protocol = nullptr;
        }
    }
    bool configure(const std::string& text) {
        return callSlot<bool>(protocol, kConfigure, text.c_str());
    }
    bool start() { return callSlot<bool>(protocol, kStart); }
    void* tag(const std::string& uri) {
        void* t = callSlot<void*>(protocol, kCreateTag, uri.c_str());
        EXPECT_NE(t, nullptr) << uri << ": " << error();
        return t;
    }
    std::string error() { return callSlot<const char*>(protocol, kLastErrorText); }
    uint32_t readInt(void* t) {
        uint32_t value = 0xDEADBEEF;
        EXPECT_TRUE(callSlot<bool>(protocol, kReadTag, t, static_cast<void*>(&value))) << error();
        return value;
    }
    std::string readText(void* t, std::size_t size) {
        std::vector<char> value(size, 'x');
        EXPECT_TRUE(callSlot<bool>(protocol, kReadTag, t, static_cast<void*>(value.data())))
            << error();
        return std::string(value.data(), strnlen(value.data(), size));
    }
    bool write(void* t, const void* value) { return callSlot<bool>(protocol, kWriteTag, t, value); }
    // The runtime polls; a bounded deadline keeps a failure from hanging.
    bool waitTokens(void* available, uint32_t count) {
        auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (readInt(available) != count) {
            if (std::chrono::steady_clock::now() > deadline) {
                return false;
            }
            std::this_thread::yield();
        }
        return true;
    }

    PluginLibrary lib;
    void* module = nullptr;
    void* factory = nullptr;
    void* protocol = nullptr;
};

std::vector<char> textValue(const std::string& text, std::size_t size) {
    std::vector<char> value(size, '\0');
    std::memcpy(value.data(), text.data(), std::min(size, text.size()));
    return value;
}

TEST(ProtocolBySlot, IdentityAndDescription) {
    FakeHost host;
    Runtime rt(host);
    ASSERT_NE(rt.create(), nullptr);
    void* p = rt.protocol;
    EXPECT_STREQ(callSlot<const char*>(p, kGetName), "XTOK");
    EXPECT_EQ(callSlot<int32_t>(p, kVersion), 106);
    EXPECT_EQ(callSlot<int32_t>(p, kCode), 471);
    EXPECT_STREQ(callSlot<const char*>(p, kDisplayName), "Xtokline");
    EXPECT_STREQ(callSlot<const char*>(p, kInstanceName), "XTOK");
    EXPECT_EQ(callSlot<int32_t>(p, kLastErrorCode), 1);
    EXPECT_EQ(callSlot<void*>(p, 1, "IProtocol4"), p);
    EXPECT_EQ(callSlot<void*>(p, 1, "Protocol_XTOK"), p);
    const char* sizeLine = callSlot<const char*>(p, kXml);
    ASSERT_NE(sizeLine, nullptr);
    EXPECT_EQ(std::string(sizeLine).rfind("compressedXML=", 0), 0u);
    // The header sits right before the size line in the library's memory.
    EXPECT_STREQ(sizeLine - 77,
                 "<<ICOM_XML_START>>Name=XTOK?FullName=Xtokline?Version=106?Platform=PX40_WCE6");
}

TEST(ProtocolBySlot, LifecycleWithARefusedPortThenARetry) {
    FakeHost host;
    Runtime rt(host);
    ASSERT_NE(rt.create(), nullptr);
    ASSERT_TRUE(rt.configure(kLine));
    char settings[64] = {};
    EXPECT_TRUE(callSlot<bool>(rt.protocol, kSerialSettings, settings, int32_t{sizeof settings}));
    EXPECT_STREQ(settings, "com2,19200,odd,7,2,RS-485");

    host.serial().refuseOpen = true;
    EXPECT_FALSE(rt.start());
    EXPECT_EQ(callSlot<int32_t>(rt.protocol, kLastErrorCode), -1);
    EXPECT_EQ(rt.error(), "Can't open serial port");
    EXPECT_EQ(host.tasks().tasksCreated(), 0);

    host.serial().refuseOpen = false;
    EXPECT_TRUE(rt.start());
    EXPECT_TRUE(rt.start());
    ASSERT_EQ(host.serial().configured().size(), 1u);
    EXPECT_TRUE((host.serial().configured()[0] == LineSettings{19200, 2, 7, 2, 1}));
    EXPECT_EQ(host.tasks().calls().back(), "CreateTask 3 0");
    EXPECT_TRUE(callSlot<bool>(rt.protocol, kStop));
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_TRUE(callSlot<bool>(rt.protocol, kStop));
    rt.destroy();
    EXPECT_EQ(host.tasks().mutexesAlive(), 0);
}

TEST(ProtocolBySlot, ConfigurationErrorsAreReported) {
    FakeHost host;
    Runtime rt(host);
    ASSERT_NE(rt.create(), nullptr);
    EXPECT_FALSE(rt.configure("CfgVer=1 model=1 baudrate=9600"));
    EXPECT_EQ(rt.error(), "Parser: parameter 'port' is not found");
    EXPECT_EQ(callSlot<int32_t>(rt.protocol, kLastErrorCode), -1);
    EXPECT_FALSE(
        rt.configure("CfgVer=1 model=1 port=com1 baudrate=9600 parity=space bits=8 "
                     "stopbits=1 mode=RS-232"));
    EXPECT_EQ(rt.error(), "Parser: parameter 'parity' has invalid value");
}

struct Exchange {
    const char* name;
    std::string framing;
    std::string deviceSends;
    std::string token;     // as rx_token reads it
    std::string answer;    // written to tx_token
    std::string lineGets;  // what the device receives
};

void PrintTo(const Exchange& e, std::ostream* os) {
    *os << e.name;
}

class TypicalExchange : public ::testing::TestWithParam<Exchange> {};

TEST_P(TypicalExchange, DeviceTokenInPanelAnswerOut) {
    const Exchange& e = GetParam();
    FakeHost host;
    Runtime rt(host);
    ASSERT_NE(rt.create(), nullptr);
    ASSERT_TRUE(rt.configure(kLine + e.framing)) << rt.error();
    void* available = rt.tag("0?tokens_available?unsignedInt");
    void* length = rt.tag("0?rx_token_len?unsignedInt");
    void* token = rt.tag("0?rx_token?string-64");
    void* ack = rt.tag("0?token_ack?boolean");
    void* send = rt.tag("0?tx_token?string-16");
    ASSERT_TRUE(rt.start()) << rt.error();

    host.serial().feed(e.deviceSends);
    ASSERT_TRUE(rt.waitTokens(available, 1));
    EXPECT_EQ(rt.readInt(length), e.token.size());
    EXPECT_EQ(rt.readText(token, 64), e.token);
    uint8_t one = 1;
    EXPECT_TRUE(rt.write(ack, &one)) << rt.error();
    EXPECT_EQ(rt.readInt(available), 0u);

    std::vector<char> answer = textValue(e.answer, 16);
    EXPECT_TRUE(rt.write(send, answer.data())) << rt.error();
    EXPECT_EQ(host.serial().written(), e.lineGets);
    callSlot<void>(rt.protocol, kDeleteTag, token);
}

INSTANTIATE_TEST_SUITE_P(
    RawAndHex, TypicalExchange,
    ::testing::Values(
        Exchange{"raw", "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=0D0A",
                 "\x02"
                 "HELLO"
                 "\x03",
                 "HELLO", "WORLD",
                 "\x02"
                 "WORLD\r\n"},
        Exchange{"hex", "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03 hex_tokens=true",
                 std::string("\x02\x00\x0A\xFF\x41\x03", 6), "000AFF41", "4142",
                 "\x02"
                 "AB"
                 "\x03"}),
    [](const ::testing::TestParamInfo<Exchange>& info) { return info.param.name; });

TEST(ProtocolBySlot, SettingsChangedAtRunTimeSurviveARestart) {
    FakeHost host;
    {
        Runtime rt(host);
        ASSERT_NE(rt.create(), nullptr);
        callSlot<void>(rt.protocol, kSetInstanceName, "Scanner");
        ASSERT_TRUE(rt.configure(kLine));
        ASSERT_TRUE(rt.start());
        void* baud = rt.tag("0?SP_Baud?unsignedInt");
        void* prefix = rt.tag("0?SP_RxPrefix?string-10");
        void* done = rt.tag("0?SP_Done?boolean");
        uint32_t rate = 57600;
        EXPECT_TRUE(rt.write(baud, &rate));
        std::vector<char> stx = textValue("02", 10);
        EXPECT_TRUE(rt.write(prefix, stx.data()));
        EXPECT_EQ(host.serial().configured().size(), 1u);  // staged, not applied yet
        uint8_t one = 1;
        EXPECT_TRUE(rt.write(done, &one));
        ASSERT_EQ(host.serial().configured().size(), 2u);
        EXPECT_EQ(host.serial().configured()[1].baud, 57600);
    }
    EXPECT_EQ(host.storage().get("Scanner", "baud"), "57600");
    {
        Runtime rt(host);
        ASSERT_NE(rt.create(), nullptr);
        callSlot<void>(rt.protocol, kSetInstanceName, "Scanner");
        ASSERT_TRUE(rt.configure(kLine));
        ASSERT_TRUE(rt.start());
        EXPECT_EQ(host.serial().configured().back().baud, 57600);
        void* prefix = rt.tag("0?SP_RxPrefix?string-10");
        EXPECT_EQ(rt.readText(prefix, 10), "02");
    }
}

TEST(ProtocolBySlot, ConsoleThroughDoCommand) {
    FakeHost host;
    Runtime rt(host);
    ASSERT_NE(rt.create(), nullptr);
    ASSERT_TRUE(rt.configure(kLine + "autoConnect=false"));
    ASSERT_TRUE(rt.start());
    char reply[64] = {};
    EXPECT_TRUE(callSlot<bool>(rt.protocol, kDoCommand, "get_stat", reply, int32_t{sizeof reply}));
    EXPECT_STREQ(reply, "Disconnected");
    EXPECT_TRUE(
        callSlot<bool>(rt.protocol, kDoCommand, "connect ON", reply, int32_t{sizeof reply}));
    EXPECT_STREQ(reply, "OK");
    EXPECT_TRUE(host.serial().isOpen());
    EXPECT_TRUE(callSlot<bool>(rt.protocol, kDoCommand, "getmaxtm", reply, int32_t{sizeof reply}));
    EXPECT_STREQ(reply, "maxtm = 0 ms\n");
}

}  // namespace
}  // namespace xtok::test
