// The driver's console: its replies are a contract, byte for byte, down to
// where a reply is cut by a short buffer.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

const std::string kFrameworkHelp =
    "help - displays this message\n"
    "info - displays information about the protocol version\n"
    "xml  - displays the protocol xml description\n"
    "read uri - reads data pointed by uri string\n"
    "write uri hexData - writes data pointed by uri string\n"
    "lasterror - displays the last protocol error\n"
    "getmaxtm - displays the max time for executing a single read/write access\n";
const std::string kDriverHelp =
    "connect cmd - set connect ON or OFF\n"
    "get_stat - get status of connection\n"
    "put str - put the token to send\n"
    "get - get the received token\n"
    "get_token_length - get the length of the received token\n"
    "tokens_available - get number of tokens received\n"
    "token_ack - acknowledge reading token - \"token_ack all\" clears the queue\n"
    "set_hexToken ON/OFF - set the hexToken mode\n"
    "set_rxGap value - set the rx gap in ms\n"
    "set_rxPrefix string - set the rx prefix\n"
    "set_rxSuffix string - set the rx suffix\n"
    "set_txPrefix string - set the tx prefix\n"
    "set_txSuffix string - set the tx suffix\n";

struct Line {
    const char* line;
    const char* reply;
    bool result;
    const char* sent = nullptr;  ///< the frame written, as hex; null: nothing
};

class Console : public ProtocolFixture {
protected:
    void run(const std::vector<Line>& lines) {
        for (const Line& l : lines) {
            const std::size_t writes = host.serial().writes().size();
            bool result = !l.result;
            EXPECT_EQ(command(l.line, &result), l.reply) << "'" << l.line << "'";
            EXPECT_EQ(result, l.result) << "'" << l.line << "'";
            const std::vector<std::string> now = host.serial().writes();
            EXPECT_EQ(now.size(), writes + (l.sent ? 1 : 0)) << "'" << l.line << "'";
            if (l.sent && now.size() == writes + 1) {
                EXPECT_EQ(now.back(), hexBytes(l.sent)) << "'" << l.line << "'";
            }
        }
    }
    /// A reply into a buffer of `size` bytes, with guard bytes after it.
    std::string cut(const std::string& line, int32_t size, bool* result = nullptr) {
        std::string buffer(static_cast<std::size_t>(size) + 8, '#');
        const bool ok = protocol->DoCommand(line.c_str(), buffer.data(), size);
        if (result) {
            *result = ok;
        }
        return buffer;
    }
};

TEST_F(Console, ConnectPutAndSetters) {
    ASSERT_TRUE(start("autoConnect=false tx_prefix=02 tx_suffix=03"));
    host.serial().refuseOpen = true;
    run({{"get_stat", "Disconnected", true},
         {"connect ON", "Can't open serial port", true},  // still a successful command
         {"connect", "ERROR: new connect state is missing", false},
         {"connect on", "ERROR: wrong value", false},
         {"connect  ON", "ERROR: wrong value", false},  // two blanks: an empty word
         {"connect OFF", "OK", true},
         {"put abc", "ERROR: serial port is not active for sending", false},
         {"put", "ERROR: string to send is missing", false}});
    host.serial().refuseOpen = false;
    run({{"connect ON", "OK", true},
         {"get_stat", "Connected", true},
         {"connect ON", "OK", true},
         // The rest of the raw line, inner blanks kept.
         {"put a  b ", "OK", true, "02 61 20 20 62 20 03"},
         {"put   x", "OK", true, "02 78 03"},
         {"put ", "OK", true, "02 03"},
         {"set_hexToken", "ERROR: new value is missing", false},
         {"set_hexToken on", "ERROR: wrong value", true},
         {"set_hexToken ON", "OK", true},
         {"put   4142", "OK", true, "02 41 42 03"},
         {"put 41G2", "ERROR: token to send must be in hex format", false},
         {"put 41 42", "ERROR: token to send must be in hex format", false},
         {"set_txPrefix", "ERROR: new value is missing", false},
         {"set_txSuffix", "ERROR: new value is missing", false},
         {"set_txPrefix 0A", "OK", true},
         {"set_txSuffix none", "OK", true},
         {"put 43", "OK", true, "0A 43"},
         {"set_rxGap", "ERROR: new value is missing", false},
         {"set_rxGap abc", "ERROR: wrong value", true},
         {"set_rxPrefix", "ERROR: new value is missing", false},
         {"set_rxSuffix", "ERROR: new value is missing", false},
         {"connect OFF", "OK", true},
         {"get_stat", "Disconnected", true}});
    EXPECT_EQ(host.serial().record().opens, 1);
    EXPECT_EQ(host.serial().record().closes, 1);
}

TEST_F(Console, QueueCommands) {
    ASSERT_TRUE(start("rx_suffix=03"));
    run({{"get", "", true},
         {"tokens_available", "0", true},
         {"get_token_length", "0", true},
         {"token_ack", "OK", true}});
    play("41 03 42 42 03 43 03 44 03");
    run({{"tokens_available", "4", true},
         {"get", "A", true},
         {"get_token_length", "1", true},
         {"token_ack all now", "OK", true},  // not exactly "all": only the head goes
         {"get", "BB", true},
         {"get_token_length", "2", true},
         {"token_ack", "OK", true},
         {"token_ack all", "OK", true},
         {"tokens_available", "0", true},
         {"set_hexToken ON", "OK", true}});
    play("00 0A FF 03");
    run({{"get", "000AFF", true}, {"get_token_length", "6", true}});
}

// Framing and gap set here take effect with the next token; texts are stored
// unchecked and "0G" converts leniently to the byte F0.
TEST_F(Console, FramingAndGapTakeEffectWithTheNextToken) {
    ASSERT_TRUE(start("gap=15"));
    run({{"set_rxPrefix 02", "OK", true}, {"set_rxSuffix 03", "OK", true}});
    settle();
    play("41 02 42 03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"B"});
    EXPECT_EQ(host.serial().record().lastTimeout, 15);
    run({{"set_rxPrefix 0G", "OK", true}, {"set_rxGap 20ms", "OK", true}});
    settle();
    play("02 41 03 F0 43 03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"C"});
    EXPECT_EQ(host.serial().record().lastTimeout, 20);
    run({{"set_rxGap 0", "OK", true}});
    settle();
    play("41");
    EXPECT_EQ(host.serial().record().lastTimeout, 500);
}

TEST_F(Console, HelpAndRepliesCutAtTheBufferThenNotTerminated) {
    ASSERT_TRUE(configure());
    bool result = false;
    EXPECT_EQ(command("help", &result), kFrameworkHelp + kDriverHelp);
    EXPECT_TRUE(result);
    EXPECT_EQ(cut("get_stat", 4, &result), "Disc########");
    EXPECT_TRUE(result);
    EXPECT_EQ(cut("get_stat", 12), "Disconnected########");
    EXPECT_EQ(cut("get_stat", 13).substr(0, 13), std::string("Disconnected") + '\0');
    EXPECT_EQ(cut("connect", 5, &result), "ERROR########");
    EXPECT_FALSE(result);
    const int32_t fw = static_cast<int32_t>(kFrameworkHelp.size());
    for (auto [size, reply] : {std::pair{fw + 5, kFrameworkHelp + "conne"},
                               {10, kFrameworkHelp.substr(0, 10)},
                               {fw, kFrameworkHelp},
                               {0, ""}}) {
        EXPECT_EQ(cut("help", size, &result), reply + "########") << size;
        EXPECT_TRUE(result);
    }
}

TEST_F(Console, WithoutAReplyBufferCommandsStillRun) {
    ASSERT_TRUE(start("autoConnect=false"));
    for (const char* line : {"help", "get_stat", "connect ON", "put A", "getmaxtm"}) {
        EXPECT_TRUE(protocol->DoCommand(line, nullptr, 100)) << line;
    }
    EXPECT_EQ(host.serial().writes(), std::vector<std::string>{"A"});
}

TEST_F(Console, OtherCommandsGoToTheFrameworkConsole) {
    ASSERT_TRUE(start());
    bool result = false;
    EXPECT_EQ(command("getmaxtm", &result), "maxtm = 0 ms\n");
    EXPECT_TRUE(result);
    EXPECT_EQ(command("info").rfind(
                  "Protocol: XTOK (471) v.106\nImplementation: Protocol_XTOK v.100\n", 0),
              0u);
    EXPECT_EQ(command("read 0?tokens_available?unsignedInt"), "00000000\n");
    EXPECT_EQ(command("write 0?SP_Gap?unsignedInt 05000000"), "written ok\n");
    EXPECT_EQ(readInt("SP_Gap"), 5);
    EXPECT_EQ(command("write 0?tokens_available?unsignedInt 05000000"),
              "writing to read_only type");
    // Unknown everywhere: result 0 and the reply untouched.
    for (const char* line : {"Help", "Connect ON", "", " get_stat", "get_stat2"}) {
        EXPECT_EQ(cut(line, 4, &result), "############") << "'" << line << "'";
        EXPECT_FALSE(result) << "'" << line << "'";
    }
}

}  // namespace
}  // namespace xtok::test
