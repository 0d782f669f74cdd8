// The memory types a panel reads and writes: the queue of received tokens,
// transmit, connect, and the SP_ settings staged until SP_Done applies and
// retains them.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

const Scenario kMemoryTypes[] = {
    {"EveryTypeReadsItsValue",
     "cfg CfgVer=1 model=1 port=com1 baudrate=9600 parity=odd bits=7 stopbits=2 mode=RS-422 "
     "rx_prefix=0D rx_suffix=0A gap=25 tx_prefix=02 tx_suffix=03 token_queue_size=7; go; "
     "r SP_Baud; r SP_Par; r SP_Bits; r SP_Stop; r SP_Mode; r SP_RxPrefix?string-3; "
     "r SP_TxSuffix?string-3; r SP_Gap; r SP_HexTokens; r SP_TokenQueueSize; r SP_Done; "
     "r connect; r token_ack; r tx_token?string-2; r tokens_available; r rx_token?string-3; "
     "r rx_token_len; play 0D 41 42 0A 0D 43 0A; r tokens_available; r rx_token?string-3; "
     "r rx_token?string-3; r rx_token_len; w token_ack 1; r rx_token",
     "9600 | 2 | 7 | 2 | 2 | 0D | 03 | 25 | 0 | 7 | 0 | 1 | 0 | '' | 0 | '' | 0 | 2 | AB | AB | 2 "
     "| C"},
    {"TextsMustFitTheTagWithTheirZero",
     "start rx_suffix=03 tx_suffix=0D0A tx_prefix=0D0A; play 31 32 33 03 31 32 33 34 03; "
     "r rx_token?string-4; w token_ack 1; r rx_token?string-4; err; r rx_token?string-5; "
     "r SP_TxSuffix?string-4; r SP_TxSuffix?string-5; r SP_TxPrefix?string-4; "
     "r SP_TxPrefix?string-5",
     "123 | !token too long | -1 token too long | 1234 | !tx suffix too long to read | 0D0A | !tx "
     "prefix too long to read | 0D0A"},
    {"RawTokensReadUpToAZeroByteAndKeepTheFormTheyWereQueuedIn",
     "start rx_suffix=03; play 41 00 42 03; cmd set_hexToken ON; play 00 0A FF 03; "
     "cmd set_hexToken OFF; r rx_token; r rx_token_len; w token_ack 0; r rx_token; r rx_token_len",
     "OK | OK | A | 3 | 000AFF | 6"},
    {"RefusedAccesses",
     "conf; r tokens_available; err; w tx_token A; err; go; w rx_token?string-8 x; err; "
     "w rx_token_len 1; w tokens_available 1; w SP_RxPrefix?string-10000 02; "
     "w SP_RxPrefix?string-9999 02",
     "!Protocol not started | -3 Protocol not started | !Protocol not started | -3 Protocol not "
     "started | !writing to read_only type | -1 writing to read_only type | !writing to read_only "
     "type | !writing to read_only type | !writing after the end of memory type"},
    // Refused codes set no error of their own: the one before stands.
    {"SettingsAreValidatedAndStagedWithoutApplying",
     "start; w SP_Baud 19200; r SP_Baud; w SP_Baud 115200; w SP_Baud 14400; w SP_Par 4; "
     "w tokens_available 1; w SP_Par 5; w SP_Bits 7; w SP_Bits 9; w SP_Stop 2; w SP_Stop 0; "
     "w SP_Mode 2; w SP_Mode 3; w SP_RxPrefix 0d0A; r SP_RxPrefix; w SP_RxPrefix?string-3 02; "
     "r SP_RxPrefix; w SP_RxPrefix none; "
     "r SP_RxPrefix; w SP_RxPrefix ; r SP_RxPrefix; w SP_RxPrefix 0D0; w SP_RxSuffix 0G; "
     "w SP_TxPrefix NONE; w SP_TxSuffix 0 ; w SP_Gap 1234; w SP_HexTokens 1; "
     "w SP_TokenQueueSize 50000; r SP_Baud; r SP_Par; r SP_Bits; r SP_Stop; r SP_Mode; "
     "r SP_Gap; r SP_HexTokens; r SP_TokenQueueSize; cfgd; line; stored baud",
     "19200 | !illegal baudrate intValue | !writing to read_only type | !writing to read_only type "
     "| !writing to read_only type | !writing to read_only type | !writing to read_only type | "
     "0d0A | 02 | none | '' | !Rx prefix value is not hex format | !Rx suffix value is not hex "
     "format | "
     "!Tx prefix value is not hex format | !Tx suffix value is not hex format | 115200 | 4 | 7 | 2 "
     "| 2 | 1234 | 1 | 50000 | 9600/1/8/1/0 | com1,9600,even,8,1,RS-232 | -"},
    // SP_Done applies every staged value, retains it under the instance name
    // and empties the queue; a new protocol over the same storage starts with
    // them. Framing, gap, hex mode and queue size are live from the next pass.
    {"DoneAppliesRetainsAndSurvivesARestart",
     "inst Line2; start; play 41 | 42; w SP_Par 2; w SP_Bits 7; w SP_Stop 2; w SP_Mode 1; "
     "w SP_RxPrefix 02; w SP_RxSuffix 03; w SP_TxPrefix 05; w SP_TxSuffix 06; "
     "w SP_Baud 19200; w SP_Gap 30; w SP_HexTokens 1; w SP_TokenQueueSize 2; w SP_Done 0; "
     "cfgd; line; r tokens_available; stored tx_prefix; stored gap; stored hex_tokens; "
     "settle; play 02 41 03 02 42 03 02 43 03; gap; tokens; w tx_token 4142; sent; new; "
     "start; cfgd; r SP_TokenQueueSize; play 41 02 44 03; tokens",
     "9600/1/8/1/0,19200/2/7/2/1 | com1,19200,odd,7,2,RS-485 | 0 | 05 | 30 | 1 | 30 | 42,43 | "
     "05414206 | 19200/2/7/2/1 | 2 | 44"},
    {"DoneReconfiguresOnlyOnAChangeAndAClosedPortAtItsNextOpen",
     "start autoConnect=false; w SP_Baud 9600; w SP_Done 1; w SP_Baud 57600; w SP_Done 1; "
     "cfgd; w connect 1; cfgd; w SP_Baud 57600; w SP_Done 1; cfgd; w SP_Gap 30; w SP_Done 1; "
     "cfgd; w SP_Baud 19200; w SP_Done 1; cfgd",
     "- | 57600/1/8/1/0 | - | - | 19200/1/8/1/0"},
    {"TransmitFramesTheToken",
     "start tx_prefix=02 tx_suffix=03 hex_tokens=true; w tx_token 4a4B; w tx_token 41G2; "
     "w tx_token 414; w tx_token none; sent; "
     "new; start tx_prefix=02 tx_suffix=03; w tx_token AB; sent; "
     "new; start tx_prefix=none tx_suffix=0D0A; w tx_token 4142; sent; "
     "new; start; w tx_token A B; sent; "
     "new; start autoConnect=false hex_tokens=true; w tx_token 4; "
     "new; start autoConnect=false; w tx_token 41; sent; "
     "fault write; w connect 1; w tx_token 41; sent",
     "!token to send must be in hex format | !token to send must be in hex format | 024A4B03,0203 "
     "| 02414203 | 343134320D0A | 412042 | !token to send must be in hex format | !Serial port not "
     "active for sending | - | 3431"},
    // A 1 written while connected goes out as the byte 01, which is no hex text.
    {"ConnectOpensAndClosesAndTheStateThatHoldsIsSentAsAToken",
     "start autoConnect=false tx_prefix=02 tx_suffix=03; w connect 1; r connect; opens; "
     "w connect 1; sent; w connect 0; opens; w connect 0; cmd set_hexToken ON; w connect 1; "
     "w connect 1; opens",
     "1 | 1/0 com1 | 020103 | 1/1 com1 | !Serial port not active for sending | OK | !token to send "
     "must be in hex format | 2/1 com1"},
    // Sixteen tokens taken, then one more of the same length in the place of
    // the first.
    {"ASecondRoundOfTheQueueHoldsTheNewTokens",
     "start rx_suffix=03; play 41 03 42 03 43 03 44 03 45 03 46 03 47 03 48 03 49 03 4A 03 4B 03 "
     "4C 03 4D 03 4E 03 4F 03 50 03; tokens; play 5A 03; tokens",
     "A,B,C,D,E,F,G,H,I,J,K,L,M,N,O,P | Z"},
    // SP_Done empties the queue too, and the queue outlives a restart.
    {"AFullQueueDropsItsOldestTokenOnePerPush",
     "start token_queue_size=3 rx_suffix=03; play 41 03 42 03 43 03 44 03; tokens; "
     "w token_ack 1; err; play 41 03 42 03 43 03; w SP_TokenQueueSize 0; w SP_Done 1; "
     "play 41 03 42 03 43 03; tokens; play 44 03; stop; go; tokens",
     "B,C,D | 1  | C | D"},
};

INSTANTIATE_TEST_SUITE_P(MemoryTypes, Scenarios, ::testing::ValuesIn(kMemoryTypes), scenarioName);

class MemoryTypes : public ProtocolFixture {};

TEST_F(MemoryTypes, RetainedValuesWinOverTheConfigurationAtStart) {
    const std::string longSuffix(600, 'A');  // any length comes back
    host.storage().put("Other", "baud", "38400");
    EXPECT_EQ(run("store baud 19200; store parity 4; store mode 3; store rx_prefix 02; "
                  "store rx_suffix 03; store hex_tokens 1; store tx_suffix " +
                  longSuffix + "; start rx_prefix=AA rx_suffix=BB; line; r SP_RxPrefix"),
              "com1,19200,space,8,1,RS-485P | 02");
    EXPECT_EQ(read("SP_TxSuffix?string-700"), longSuffix);
    // Read once, at the first Start.
    EXPECT_EQ(run("play AA 41 BB 02 41 42 03; tokens; store baud 57600; stop; go; cfgd"),
              "4142 | 19200/4/8/1/3,19200/4/8/1/3");
    EXPECT_EQ(host.storage().writes(), 0);
}

TEST_F(MemoryTypes, AReadOrWriteWithoutABufferFails) {
    ASSERT_TRUE(start());
    EXPECT_FALSE(protocol->ReadTagRaw(tag("0?rx_token_len?unsignedInt"), nullptr, 4));
    EXPECT_EQ(error(), "illegal memtype to read");
    EXPECT_FALSE(protocol->WriteTag(tag("0?SP_Gap?unsignedInt"), nullptr));
    EXPECT_EQ(error(), "illegal memtype to write");
}

}  // namespace
}  // namespace xtok::test
