// The token protocol driven through the dlopen'ed library by slot numbers
// only, as a panel runtime drives it; the library calls the host's services
// by their slot numbers in turn.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstring>

#include "tests/support/fake_host.h"
#include "tests/support/plugin_library.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

constexpr int kConfigure = 4, kCreateTag = 5, kStart = 8, kStop = 9, kReadTag = 10, kWriteTag = 11,
              kLastErrorText = 21, kXmlDescription = 26, kDoCommand = 30;
using Text = std::array<char, 64>;
const uint8_t kOne = 1;

// Module Init and one configured protocol, undone in reverse order.
class Runtime {
public:
    // Module slots 4 Init, 5 Exit; factory slots 4 CreateProtocol, 5 DestroyProtocol.
    Runtime(FakeHost& host, const std::string& parameters) : host_(host) {
        bool held = module && callSlot<int32_t>(module, 4, static_cast<IServiceProvider*>(&host));
        protocol = held ? callSlot<void*>(factory, 4, "XTOK") : nullptr;
        ok = protocol && call(kConfigure, (kLine + parameters).c_str());
    }
    ~Runtime() {
        if (protocol) {
            call(kStop);
            callSlot<void>(factory, 5, protocol);
        }
        if (module) {
            callSlot<void>(module, 5);
        }
    }
    template <class R = bool, class... Args>
    R call(int slot, Args... args) {
        return callSlot<R>(protocol, slot, args...);
    }
    std::string error() { return protocol ? call<const char*>(kLastErrorText) : lib.error(); }
    void* tag(const std::string& uri) { return call<void*>(kCreateTag, uri.c_str()); }
    template <class T>  // uint32_t or Text
    T read(void* tag) {
        T value{};
        EXPECT_TRUE(call(kReadTag, tag, static_cast<void*>(&value))) << error();
        return value;
    }

    /// The device sends `frame`; the panel polls, reads and acknowledges the
    /// token, then answers: the token and what the line then carries.
    std::string exchange(const std::string& frame, const char* answer) {
        FakeSerialFactory& line = host_.serial();
        line.feed(frame);
        EXPECT_TRUE(line.waitDrained());
        void* available = tag("0?tokens_available?unsignedInt");
        EXPECT_EQ(read<uint32_t>(available), 1u);
        const uint32_t length = read<uint32_t>(tag("0?rx_token_len?unsignedInt"));
        std::string token = read<Text>(tag("0?rx_token?string-64")).data();
        EXPECT_EQ(length, token.size());
        EXPECT_TRUE(call(kWriteTag, tag("0?token_ack?boolean"), &kOne));
        EXPECT_EQ(read<uint32_t>(available), 0u);
        Text value{};
        std::copy(answer, answer + std::strlen(answer), value.begin());
        const std::size_t before = line.written().size();
        EXPECT_TRUE(call(kWriteTag, tag("0?tx_token?string-16"), value.data()));
        return token + " " + line.written().substr(before);
    }

    static inline const std::string kLine =
        "CfgVer=1 model=1 port=com2 baudrate=19200 parity=odd bits=7 stopbits=2 mode=RS-485 ";
    PluginLibrary lib;
    void* module = lib.rootInterface("IProtModule");
    void* factory = lib.rootInterface("IProtocolFactory");
    void* protocol = nullptr;
    bool ok = false;
    FakeHost& host_;
};

// A panel's day: a refused port and a retry, the console, a token each way,
// settings applied with SP_Done; then the library is loaded afresh, so that
// only the host's storage carries the settings over, and hex mode, now on,
// shows every byte of a binary token.
TEST(Lifecycle, APanelsDayByTheSlotNumbers) {
    FakeHost host;
    {
        Runtime rt(host, "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=0D0A");
        ASSERT_TRUE(rt.ok) << rt.error();
        host.serial().refuseOpen = true;
        EXPECT_FALSE(rt.call(kStart));
        host.serial().refuseOpen = false;
        EXPECT_TRUE(rt.call(kStart)) << rt.error();
        Text reply{};
        EXPECT_TRUE(rt.call(kDoCommand, "get_stat", reply.data(), int32_t{64}));
        EXPECT_STREQ(reply.data(), "Connected");
        // The protocol hands out the size line of the block, right after its header.
        EXPECT_STREQ(
            rt.call<const char*>(kXmlDescription) - 77,
            "<<ICOM_XML_START>>Name=XTOK?FullName=Xtokline?Version=106?Platform=PX40_WCE6");
        EXPECT_EQ(rt.exchange("\2HELLO\3", "WORLD"), "HELLO \2WORLD\r\n");
        const uint32_t rate = 57600;
        EXPECT_TRUE(rt.call(kWriteTag, rt.tag("0?SP_Baud?unsignedInt"), &rate));
        EXPECT_TRUE(rt.call(kWriteTag, rt.tag("0?SP_HexTokens?boolean"), &kOne));
        EXPECT_TRUE(rt.call(kWriteTag, rt.tag("0?SP_Done?boolean"), &kOne));
    }
    EXPECT_EQ(host.serial().configured(),
              (std::vector<LineSettings>{{19200, 2, 7, 2, 1}, {57600, 2, 7, 2, 1}}));
    Runtime rt(host, "rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03");
    ASSERT_TRUE(rt.ok && rt.call(kStart)) << rt.error();
    EXPECT_EQ(host.serial().configured().back().baud, 57600);
    EXPECT_EQ(rt.exchange(std::string("\2\0\n\377A\3", 6), "4142"), "000AFF41 \2AB\3");
}

}  // namespace
}  // namespace xtok::test
