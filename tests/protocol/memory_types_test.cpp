// The memory types a panel reads and writes: the queue of received tokens,
// transmit, connect, and the SP_ settings staged until SP_Done applies and
// retains them.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

using Tokens = std::vector<std::string>;

class MemoryTypes : public ProtocolFixture {
protected:
    /// Leaves a known last error, to tell a write that sets none.
    void markError() {
        writeInt("tokens_available", 1);
        ASSERT_EQ(error(), "writing to read_only type");
    }
    void expectError(const std::string& text, int32_t expectedCode = -1) {
        EXPECT_EQ(code(), expectedCode);
        EXPECT_EQ(error(), text);
    }
};

TEST_F(MemoryTypes, EveryTypeReadsItsValue) {
    ASSERT_TRUE(protocol->Configure(
        "CfgVer=1 model=1 port=com1 baudrate=9600 parity=odd bits=7 stopbits=2 mode=RS-422 "
        "rx_prefix=0D rx_suffix=0A gap=25 tx_prefix=02 tx_suffix=03 token_queue_size=7"));
    ASSERT_TRUE(protocol->Start());
    const std::vector<std::pair<std::string, std::size_t>> tags = {
        {"0?SP_Baud?unsignedInt", 4},
        {"0?SP_Par?unsignedByte", 1},
        {"0?SP_Bits?unsignedByte", 1},
        {"0?SP_Stop?unsignedByte", 1},
        {"0?SP_Mode?unsignedByte", 1},
        {"0?SP_RxPrefix?string-3", 3},
        {"0?SP_TxSuffix?string-3", 3},
        {"0?SP_Gap?unsignedInt", 4},
        {"0?SP_HexTokens?boolean", 1},
        {"0?SP_TokenQueueSize?unsignedInt", 4},
        {"0?SP_Done?boolean", 1},
        {"0?connect?boolean", 1},
        {"0?token_ack?boolean", 1},
        {"0?tx_token?string-2", 2},
        {"0?tokens_available?unsignedInt", 4},
        {"0?rx_token?string-3", 3},
        {"0?rx_token_len?unsignedInt", 4}};
    // An empty queue; rx_token_len then writes only its first byte.
    EXPECT_EQ(readHex(tags),
              "80250000 02 07 02 02 304400 303300 19000000 00 07000000 00 01 00 "
              "0000 00000000 000000 00000000");
    play("0D 41 42 0A 0D 43 0A");
    EXPECT_EQ(readHex({{"0?tokens_available?unsignedInt", 4},
                       {"0?rx_token?string-3", 3},
                       {"0?rx_token?string-3", 3},
                       {"0?rx_token_len?unsignedInt", 4}}),
              "02000000 414200 414200 02000000");  // reading does not consume
    EXPECT_TRUE(writeBool("token_ack", true));
    EXPECT_EQ(readText("rx_token"), "C");
}

TEST_F(MemoryTypes, TextsMustFitTheTagWithTheirZero) {
    ASSERT_TRUE(start("rx_suffix=03 tx_suffix=0D0A tx_prefix=0D0A"));
    play("31 32 33 03 31 32 33 34 03");
    EXPECT_EQ(readText("rx_token", 4), "123");
    EXPECT_TRUE(writeBool("token_ack", true));
    EXPECT_EQ(readText("rx_token", 4), std::nullopt);
    expectError("token too long");
    EXPECT_EQ(readText("rx_token", 5), "1234");  // it stays at the head
    for (auto [type, message] : {std::pair{"SP_TxSuffix", "tx suffix too long to read"},
                                 {"SP_TxPrefix", "tx prefix too long to read"}}) {
        EXPECT_EQ(readText(type, 4), std::nullopt) << type;
        expectError(message);
        EXPECT_EQ(readText(type, 5), "0D0A") << type;
    }
}

TEST_F(MemoryTypes, RawTokensReadUpToAZeroByteAndKeepTheFormTheyWereQueuedIn) {
    ASSERT_TRUE(start("rx_suffix=03"));
    play("41 00 42 03");
    EXPECT_EQ(command("set_hexToken ON"), "OK");
    play("00 0A FF 03");
    EXPECT_EQ(command("set_hexToken OFF"), "OK");
    EXPECT_EQ(readText("rx_token"), "A");
    EXPECT_EQ(readInt("rx_token_len"), 3);
    EXPECT_TRUE(writeBool("token_ack", false));  // the value written does not matter
    EXPECT_EQ(readText("rx_token"), "000AFF");
    EXPECT_EQ(readInt("rx_token_len"), 6);
}

TEST_F(MemoryTypes, RefusedAccesses) {
    ASSERT_TRUE(configure());
    EXPECT_EQ(readInt("tokens_available"), std::nullopt);
    expectError("Protocol not started", -3);
    EXPECT_FALSE(writeText("tx_token", "A"));
    expectError("Protocol not started", -3);
    ASSERT_TRUE(protocol->Start());
    for (const char* uri :
         {"0?rx_token?string-8", "0?rx_token_len?unsignedInt", "0?tokens_available?unsignedInt"}) {
        EXPECT_FALSE(write(uri, "\1\0\0\0\0\0\0\0")) << uri;
        expectError("writing to read_only type");
    }
    EXPECT_FALSE(protocol->ReadTagRaw(tag("0?rx_token_len?unsignedInt"), nullptr, 4));
    expectError("illegal memtype to read");
    EXPECT_FALSE(writeText("SP_RxPrefix", "02", 10000));
    expectError("writing after the end of memory type");
    EXPECT_TRUE(writeText("SP_RxPrefix", "02", 9999));
}

// Each staging write is checked, then read back staged while the line still
// runs as configured; refused values stage nothing.
TEST_F(MemoryTypes, SettingsAreValidatedAndStagedWithoutApplying) {
    struct Case {
        const char* type;
        char kind;  ///< 'i' integer, 'b' byte, 'o' boolean, 't' text
        int32_t number;
        const char* text;
        const char* refusal;  ///< null: accepted; "": refused with no message
    };
    const Case cases[] = {
        {"SP_Baud", 'i', 19200, "", nullptr},
        {"SP_Baud", 'i', 115200, "", nullptr},
        {"SP_Baud", 'i', 14400, "", "illegal baudrate intValue"},
        {"SP_Par", 'b', 4, "", nullptr},
        {"SP_Par", 'b', 5, "", ""},
        {"SP_Bits", 'b', 7, "", nullptr},
        {"SP_Bits", 'b', 9, "", ""},
        {"SP_Stop", 'b', 2, "", nullptr},
        {"SP_Stop", 'b', 0, "", ""},
        {"SP_Mode", 'b', 2, "", nullptr},
        {"SP_Mode", 'b', 3, "", ""},
        {"SP_RxPrefix", 't', 0, "0d0A", nullptr},
        {"SP_RxPrefix", 't', 0, "none", nullptr},
        {"SP_RxPrefix", 't', 0, "", nullptr},
        {"SP_RxPrefix", 't', 0, "0D0", "Rx prefix value is not hex format"},
        {"SP_RxSuffix", 't', 0, "0G", "Rx suffix value is not hex format"},
        {"SP_TxPrefix", 't', 0, "NONE", "Tx prefix value is not hex format"},
        {"SP_TxSuffix", 't', 0, "0 ", "Tx suffix value is not hex format"},
        {"SP_Gap", 'i', 1234, "", nullptr},
        {"SP_HexTokens", 'o', 1, "", nullptr},
        {"SP_TokenQueueSize", 'i', 50000, "", nullptr},
    };
    ASSERT_TRUE(start());
    for (const Case& c : cases) {
        SCOPED_TRACE(std::string(c.type) + " " + std::to_string(c.number) + " " + c.text);
        markError();
        const bool ok = c.kind == 'i'   ? writeInt(c.type, c.number)
                        : c.kind == 'b' ? writeByte(c.type, static_cast<uint8_t>(c.number))
                        : c.kind == 'o' ? writeBool(c.type, c.number != 0)
                                        : writeText(c.type, c.text);
        EXPECT_EQ(ok, c.refusal == nullptr);
        EXPECT_EQ(error(), c.refusal && *c.refusal ? c.refusal : "writing to read_only type");
        if (!c.refusal) {
            EXPECT_EQ(c.kind == 't'   ? readText(c.type).value_or("?")
                      : c.kind == 'i' ? std::to_string(readInt(c.type).value_or(-1))
                      : c.kind == 'b' ? std::to_string(readByte(c.type).value_or(-1))
                                      : std::to_string(readBool(c.type).value_or(false)),
                      c.kind == 't' ? c.text : std::to_string(c.number));
        }
    }
    EXPECT_EQ(readInt("SP_Baud"), 115200);
    EXPECT_EQ(readByte("SP_Stop"), 2);
    EXPECT_EQ(readText("SP_RxPrefix"), "");
    EXPECT_EQ(host.serial().configured().size(), 1u);
    EXPECT_EQ(settingsText(), "com1,9600,even,8,1,RS-232");
    EXPECT_EQ(host.storage().writes(), 0);
}

// SP_Done applies every staged value, retains it under the instance name and
// empties the queue; a new protocol over the same storage starts with them.
TEST_F(MemoryTypes, DoneAppliesRetainsAndSurvivesARestart) {
    protocol->SetInstanceName("Line2");
    ASSERT_TRUE(start());
    play("41 | 42");
    for (auto [type, value] :
         {std::pair{"SP_Par", 2}, {"SP_Bits", 7}, {"SP_Stop", 2}, {"SP_Mode", 1}}) {
        ASSERT_TRUE(writeByte(type, static_cast<uint8_t>(value)));
    }
    for (auto [type, text] : {std::pair{"SP_RxPrefix", "02"},
                              {"SP_RxSuffix", "03"},
                              {"SP_TxPrefix", "05"},
                              {"SP_TxSuffix", "06"}}) {
        ASSERT_TRUE(writeText(type, text));
    }
    ASSERT_TRUE(writeInt("SP_Baud", 19200) && writeInt("SP_Gap", 30) &&
                writeBool("SP_HexTokens", true) && writeInt("SP_TokenQueueSize", 2));
    ASSERT_TRUE(writeBool("SP_Done", false));  // the value written does not matter
    ASSERT_EQ(host.serial().configured().size(), 2u);
    EXPECT_TRUE((host.serial().configured()[1] == LineSettings{19200, 2, 7, 2, 1}));
    EXPECT_EQ(settingsText(), "com1,19200,odd,7,2,RS-485");
    EXPECT_EQ(readInt("tokens_available"), 0);
    EXPECT_EQ(host.storage().get("Line2", "tx_prefix") + host.storage().get("Line2", "gap") +
                  host.storage().get("Line2", "hex_tokens"),
              "05301");
    EXPECT_FALSE(host.storage().has("XTOK", "baud"));
    // Framing, gap, hex mode and queue size are live from the next pass.
    settle();
    play("02 41 03 02 42 03 02 43 03");
    EXPECT_EQ(host.serial().record().lastTimeout, 30);
    EXPECT_EQ(takeTokens(), (Tokens{"42", "43"}));
    ASSERT_TRUE(writeText("tx_token", "4142"));
    EXPECT_EQ(host.serial().writes().back(), hexBytes("05 41 42 06"));
    destroy();
    create();
    protocol->SetInstanceName("Line2");
    ASSERT_TRUE(start());
    EXPECT_TRUE((host.serial().configured().back() == LineSettings{19200, 2, 7, 2, 1}));
    EXPECT_EQ(readInt("SP_TokenQueueSize"), 2);
    play("41 02 44 03");
    EXPECT_EQ(takeTokens(), Tokens{"44"});
}

TEST_F(MemoryTypes, DoneReconfiguresOnlyOnAChangeAndAClosedPortAtItsNextOpen) {
    ASSERT_TRUE(start("autoConnect=false"));
    ASSERT_TRUE(writeInt("SP_Baud", 9600));  // the value already in use
    ASSERT_TRUE(writeBool("SP_Done", true));
    ASSERT_TRUE(writeInt("SP_Baud", 57600));
    ASSERT_TRUE(writeBool("SP_Done", true));
    EXPECT_TRUE(host.serial().configured().empty());
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_EQ(host.serial().configured(), (std::vector<LineSettings>{{57600, 1, 8, 1, 0}}));
    ASSERT_TRUE(writeInt("SP_Baud", 57600));
    ASSERT_TRUE(writeBool("SP_Done", true));
    EXPECT_EQ(host.serial().configured().size(), 1u);
}

TEST_F(MemoryTypes, RetainedValuesWinOverTheConfigurationAtStart) {
    for (auto [key, value] : {std::pair{"baud", "19200"},
                              {"parity", "4"},
                              {"mode", "3"},
                              {"rx_prefix", "02"},
                              {"rx_suffix", "03"},
                              {"hex_tokens", "1"}}) {
        host.storage().put("XTOK", key, value);
    }
    host.storage().put("Other", "baud", "38400");
    const std::string longSuffix(600, 'A');  // any length comes back
    host.storage().put("XTOK", "tx_suffix", longSuffix);
    ASSERT_TRUE(start("rx_prefix=AA rx_suffix=BB"));
    EXPECT_EQ(settingsText(), "com1,19200,space,8,1,RS-485P");
    EXPECT_EQ(readText("SP_RxPrefix"), "02");
    EXPECT_EQ(readText("SP_TxSuffix", 700), longSuffix);
    play("AA 41 BB 02 41 42 03");
    EXPECT_EQ(takeTokens(), Tokens{"4142"});
    host.storage().put("XTOK", "baud", "57600");  // read once, at the first Start
    ASSERT_TRUE(protocol->Stop() && protocol->Start());
    EXPECT_TRUE((host.serial().configured().back() == LineSettings{19200, 4, 8, 1, 3}));
    EXPECT_EQ(host.storage().writes(), 0);
}

TEST_F(MemoryTypes, TransmitFramesTheToken) {
    struct Case {
        const char *keys, *token, *frame, *refusal;
    };
    const Case cases[] = {
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "4a4B", "02 4A 4B 03", nullptr},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "41G2", "",
         "token to send must be in hex format"},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "414", "",
         "token to send must be in hex format"},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "none", "02 03", nullptr},
        {"tx_prefix=02 tx_suffix=03", "AB", "02 41 42 03", nullptr},
        {"tx_prefix=none tx_suffix=0D0A", "4142", "34 31 34 32 0D 0A", nullptr},
        {"", "A B", "41 20 42", nullptr},
        {"autoConnect=false hex_tokens=true", "4", "", "token to send must be in hex format"},
        {"autoConnect=false", "41", "", "Serial port not active for sending"},
    };
    for (const Case& c : cases) {
        destroy();
        create();
        ASSERT_TRUE(start(c.keys));
        const std::size_t before = host.serial().writes().size();
        EXPECT_EQ(writeText("tx_token", c.token), !c.refusal) << c.keys << " " << c.token;
        const Tokens writes = host.serial().writes();
        EXPECT_EQ(Tokens(writes.begin() + before, writes.end()),
                  c.refusal ? Tokens{} : Tokens{hexBytes(c.frame)});
        EXPECT_EQ(error(), c.refusal ? c.refusal : "") << c.token;
    }
    host.serial().failWrite = true;  // a failed write is not reported
    EXPECT_TRUE(writeBool("connect", true) && writeText("tx_token", "41"));
}

TEST_F(MemoryTypes, ConnectOpensAndClosesAndTheStateThatHoldsIsSentAsAToken) {
    ASSERT_TRUE(start("autoConnect=false tx_prefix=02 tx_suffix=03"));
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_EQ((std::vector{readBool("connect"), std::optional(host.serial().isOpen())}),
              (std::vector<std::optional<bool>>{true, true}));
    ASSERT_TRUE(writeBool("connect", true));  // 1 while connected goes out as the byte 01
    EXPECT_EQ(host.serial().writes(), Tokens{hexBytes("02 01 03")});
    ASSERT_TRUE(writeBool("connect", false));
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_FALSE(writeBool("connect", false));
    expectError("Serial port not active for sending");
    EXPECT_EQ(command("set_hexToken ON"), "OK");  // the byte 01 is no hex text
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_FALSE(writeBool("connect", true));
    expectError("token to send must be in hex format");
    EXPECT_EQ(host.serial().record().opens, 2);
}

TEST_F(MemoryTypes, AFullQueueDropsItsOldestTokenOnePerPush) {
    ASSERT_TRUE(start("token_queue_size=3 rx_suffix=03"));
    play("41 03 42 03 43 03 44 03");
    EXPECT_EQ(takeTokens(), (Tokens{"B", "C", "D"}));
    EXPECT_TRUE(writeBool("token_ack", true));  // acknowledging an empty queue succeeds
    EXPECT_EQ(code(), 1);
    play("41 03 42 03 43 03");
    ASSERT_TRUE(writeInt("SP_TokenQueueSize", 0));  // SP_Done empties the queue, too
    ASSERT_TRUE(writeBool("SP_Done", true));
    play("41 03 42 03 43 03");
    EXPECT_EQ(takeTokens(), Tokens{"C"});
    play("44 03");
    ASSERT_TRUE(protocol->Stop() && protocol->Start());  // the queue outlives a restart
    EXPECT_EQ(takeTokens(), Tokens{"D"});
}

}  // namespace
}  // namespace xtok::test
