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

const Scenario kConsole[] = {
    // "Can't open serial port" is still a successful command; two blanks make
    // an empty word; "put" sends the rest of the raw line, inner blanks kept.
    {"ConnectPutAndSetters",
     "start autoConnect=false tx_prefix=02 tx_suffix=03; fault open; cmd get_stat; "
     "cmd connect ON; cmd connect; cmd connect on; cmd connect  ON; cmd connect OFF; "
     "cmd put abc; cmd put; heal open; cmd connect ON; cmd get_stat; cmd connect ON; "
     "cmd put a  b ; cmd put   x; cmd put ; sent; cmd set_hexToken; cmd set_hexToken on; "
     "cmd set_hexToken ON; cmd put   4142; cmd put 41G2; cmd put 41 42; cmd set_txPrefix; "
     "cmd set_txSuffix; cmd set_txPrefix 0A; cmd set_txSuffix none; cmd put 43; sent; "
     "cmd set_rxGap; cmd set_rxGap abc; cmd set_rxPrefix; cmd set_rxSuffix; cmd connect OFF; "
     "cmd get_stat; opens",
     "Disconnected | Can't open serial port | !ERROR: new connect state is missing | !ERROR: wrong "
     "value | !ERROR: wrong value | OK | !ERROR: serial port is not active for sending | !ERROR: "
     "string to send is missing | OK | Connected | OK | OK | OK | OK | 02612020622003,027803,0203 "
     "| !ERROR: new value is missing | ERROR: wrong value | OK | OK | !ERROR: token to send must "
     "be in hex format | !ERROR: token to send must be in hex format | !ERROR: new value is "
     "missing | !ERROR: new value is missing | OK | OK | OK | 02414203,0A43 | !ERROR: new value is "
     "missing | ERROR: wrong value | !ERROR: new value is missing | !ERROR: new value is missing | "
     "OK | Disconnected | 1/1 com1"},
    // Not exactly "all": only the head goes.
    {"QueueCommands",
     "start rx_suffix=03; cmd get; cmd tokens_available; cmd get_token_length; cmd token_ack; "
     "play 41 03 42 42 03 43 03 44 03; cmd tokens_available; cmd get; cmd get_token_length; "
     "cmd token_ack all now; cmd get; cmd get_token_length; cmd token_ack; cmd token_ack all; "
     "cmd tokens_available; cmd set_hexToken ON; play 00 0A FF 03; cmd get; "
     "cmd get_token_length",
     "'' | 0 | 0 | OK | 4 | A | 1 | OK | BB | 2 | OK | OK | 0 | OK | 000AFF | 6"},
    // Framing and gap set here take effect with the next token; texts are
    // stored unchecked and "0G" converts leniently to the byte F0.
    {"FramingAndGapTakeEffectWithTheNextToken",
     "start gap=15; cmd set_rxPrefix 02; cmd set_rxSuffix 03; settle; play 41 02 42 03; "
     "tokens; gap; cmd set_rxPrefix 0G; cmd set_rxGap 20ms; settle; play 02 41 03 F0 43 03; "
     "tokens; gap; cmd set_rxGap 0; settle; play 41; gap",
     "OK | OK | B | 15 | OK | OK | C | 20 | OK | 500"},
    {"OtherCommandsGoToTheFrameworkConsole",
     "start; cmd info; cmd getmaxtm; cmd read 0?tokens_available?unsignedInt; "
     "cmd write 0?SP_Gap?unsignedInt 05000000; r SP_Gap; "
     "cmd write 0?tokens_available?unsignedInt 05000000",
     "Protocol: XTOK (471) v.106\nImplementation: Protocol_XTOK v.100\nProtocolBase v.100\nProtLib "
     "v.200\nIMultiTask2 v.200\nISerialFactory v.300\nISocketFactory v.100\n | maxtm = 0 ms\n | "
     "00000000\n | written ok\n | 5 | writing to read_only type"},
};

INSTANTIATE_TEST_SUITE_P(Console, Scenarios, ::testing::ValuesIn(kConsole), scenarioName);

class Console : public ProtocolFixture {
protected:
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

TEST_F(Console, HelpAndRepliesCutAtTheBufferThenNotTerminated) {
    ASSERT_TRUE(configure());
    bool result = false;
    EXPECT_EQ(command("help"), kFrameworkHelp + kDriverHelp);
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

}  // namespace
}  // namespace xtok::test
