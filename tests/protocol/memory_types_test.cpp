#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "protocol/token_queue.h"
#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

const std::string kDigits = "31 32 33 34 35 36 37 38 39 ";

class MemoryRead : public ProtocolFixture {};

TEST_F(MemoryRead, EveryTypeReadsItsValue) {
    ASSERT_TRUE(protocol->Configure(
        "CfgVer=1 model=1 port=com1 baudrate=9600 parity=odd bits=8 stopbits=1 mode=RS-232 "
        "rx_prefix=0D rx_suffix=0A gap=25 tx_prefix=02 tx_suffix=03 token_queue_size=7"));
    ASSERT_TRUE(protocol->Start());
    EXPECT_EQ(readInt("SP_Baud"), 9600);
    EXPECT_EQ(readByte("SP_Par"), 2);
    EXPECT_EQ(readByte("SP_Bits"), 8);
    EXPECT_EQ(readByte("SP_Stop"), 1);
    EXPECT_EQ(readByte("SP_Mode"), 0);
    EXPECT_EQ(readText("SP_RxPrefix"), "0D");
    EXPECT_EQ(readText("SP_RxSuffix"), "0A");
    EXPECT_EQ(readText("SP_TxPrefix"), "02");
    EXPECT_EQ(readText("SP_TxSuffix"), "03");
    EXPECT_EQ(readInt("SP_Gap"), 25);
    EXPECT_EQ(readBool("SP_HexTokens"), false);
    EXPECT_EQ(readInt("SP_TokenQueueSize"), 7);
    EXPECT_EQ(readBool("SP_Done"), false);
    EXPECT_EQ(readBool("connect"), true);
    EXPECT_EQ(readBool("token_ack"), false);
    EXPECT_EQ(readText("tx_token"), "");
    // An empty queue.
    EXPECT_EQ(readInt("tokens_available"), 0);
    EXPECT_EQ(readText("rx_token"), "");
    EXPECT_EQ(readInt("rx_token_len"), 0);

    play("0D 41 42 0A 0D 43 0A");
    EXPECT_EQ(readInt("tokens_available"), 2);
    // Reading does not consume.
    EXPECT_EQ(readText("rx_token"), "AB");
    EXPECT_EQ(readText("rx_token"), "AB");
    EXPECT_EQ(readInt("rx_token_len"), 2);
    EXPECT_TRUE(writeBool("token_ack", true));
    EXPECT_EQ(readText("rx_token"), "C");
    EXPECT_EQ(readInt("rx_token_len"), 1);
    EXPECT_EQ(readInt("tokens_available"), 1);

    EXPECT_EQ(command("connect OFF"), "OK");
    EXPECT_EQ(readBool("connect"), false);
}

TEST_F(MemoryRead, ATokenMustFitTheTagWithItsZero) {
    start("rx_suffix=03");
    play(kDigits + "03");
    EXPECT_EQ(readText("rx_token", 10), "123456789");
    EXPECT_TRUE(writeBool("token_ack", true));

    play(kDigits + "30 03");
    EXPECT_EQ(readText("rx_token", 10), std::nullopt);
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "token too long");
    // It stays at the head for a larger tag.
    EXPECT_EQ(readInt("tokens_available"), 1);
    EXPECT_EQ(readText("rx_token", 11), "1234567890");
}

TEST_F(MemoryRead, RawTokensReadAsTextUpToAZeroByteAndHexTokensReadWhole) {
    start("rx_suffix=03");
    play("41 00 42 03");
    EXPECT_EQ(readText("rx_token"), "A");
    EXPECT_EQ(readInt("rx_token_len"), 3);
    EXPECT_TRUE(writeBool("token_ack", true));

    EXPECT_EQ(command("set_hexToken ON"), "OK");
    play("00 0A FF 1F 03");
    EXPECT_EQ(readText("rx_token"), "000AFF1F");
    EXPECT_EQ(readInt("rx_token_len"), 8);
}

TEST_F(MemoryRead, AQueuedTokenKeepsTheFormItWasQueuedIn) {
    start("rx_suffix=03");
    play("41 03");
    EXPECT_EQ(command("set_hexToken ON"), "OK");
    play("41 03");
    EXPECT_EQ(command("set_hexToken OFF"), "OK");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"A", "41"}));
}

TEST_F(MemoryRead, SettingsTextsMustFitTheTagWithTheirZero) {
    start("rx_prefix=0D0A rx_suffix=0D0A tx_prefix=0D0A tx_suffix=0D0A");
    const std::pair<const char*, const char*> cases[] = {
        {"SP_RxPrefix", "rx prefix too long to read"},
        {"SP_RxSuffix", "rx suffix too long to read"},
        {"SP_TxPrefix", "tx prefix too long to read"},
        {"SP_TxSuffix", "tx suffix too long to read"},
    };
    for (const auto& [type, message] : cases) {
        EXPECT_EQ(readText(type, 4), std::nullopt) << type;
        EXPECT_EQ(code(), -1) << type;
        EXPECT_EQ(error(), message) << type;
        EXPECT_EQ(readText(type, 5), "0D0A") << type;
    }
}

TEST_F(MemoryRead, NothingIsReadOrWrittenBeforeStart) {
    ASSERT_TRUE(configure());
    ITag* t = tag(intUri("tokens_available"));
    uint8_t buffer[8] = {};
    EXPECT_FALSE(protocol->ReadTagRaw(t, buffer, 4));
    EXPECT_EQ(code(), -3);
    EXPECT_EQ(error(), "Protocol not started");
    EXPECT_FALSE(writeText("tx_token", "A"));
    EXPECT_EQ(code(), -3);
    EXPECT_EQ(error(), "Protocol not started");
    EXPECT_FALSE(writeInt("SP_Gap", 5));
    EXPECT_EQ(code(), -3);
}

class MemoryWrite : public ProtocolFixture {
protected:
    /// Leaves a known last error, to tell a write that sets none.
    void markError() {
        writeInt("tokens_available", 1);
        ASSERT_EQ(error(), "writing to read_only type");
    }
};

TEST_F(MemoryWrite, ReadOnlyTypesRefuseWrites) {
    start();
    EXPECT_FALSE(writeText("rx_token", "A"));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "writing to read_only type");
    EXPECT_FALSE(writeInt("rx_token_len", 1));
    EXPECT_FALSE(writeInt("tokens_available", 1));
    EXPECT_EQ(error(), "writing to read_only type");
}

TEST_F(MemoryWrite, AWriteBeyondTheMemoryTypeIsRefused) {
    start();
    EXPECT_FALSE(writeText("SP_RxPrefix", "02", 10000));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "writing after the end of memory type");
    EXPECT_TRUE(writeText("SP_RxPrefix", "02", 9999));
}

// Each staging write is checked, then read back staged while the line
// still runs as configured.
TEST_F(MemoryWrite, SettingsAreValidatedAndStagedWithoutApplying) {
    struct Case {
        std::string type;
        char kind;  ///< 'i' integer, 'b' byte, 'o' boolean, 't' text
        int32_t number;
        std::string text;
        bool accepted;
        std::string message;  ///< on refusal; empty: no message, the last error stays
    };
    const Case cases[] = {
        {"SP_Baud", 'i', 19200, "", true, ""},
        {"SP_Baud", 'i', 115200, "", true, ""},
        {"SP_Baud", 'i', 14400, "", false, "illegal baudrate intValue"},
        {"SP_Par", 'b', 4, "", true, ""},
        {"SP_Par", 'b', 5, "", false, ""},
        {"SP_Bits", 'b', 7, "", true, ""},
        {"SP_Bits", 'b', 9, "", false, ""},
        {"SP_Stop", 'b', 2, "", true, ""},
        {"SP_Stop", 'b', 0, "", false, ""},
        {"SP_Mode", 'b', 2, "", true, ""},
        {"SP_Mode", 'b', 3, "", false, ""},
        {"SP_RxPrefix", 't', 0, "0d0A", true, ""},
        {"SP_RxPrefix", 't', 0, "none", true, ""},
        {"SP_RxPrefix", 't', 0, "", true, ""},
        {"SP_RxPrefix", 't', 0, "0D0", false, "Rx prefix value is not hex format"},
        {"SP_RxSuffix", 't', 0, "0G", false, "Rx suffix value is not hex format"},
        {"SP_TxPrefix", 't', 0, "NONE", false, "Tx prefix value is not hex format"},
        {"SP_TxSuffix", 't', 0, "0 ", false, "Tx suffix value is not hex format"},
        {"SP_Gap", 'i', 1234, "", true, ""},
        {"SP_HexTokens", 'o', 1, "", true, ""},
        {"SP_TokenQueueSize", 'i', 50000, "", true, ""},
    };
    start();
    for (const Case& c : cases) {
        SCOPED_TRACE(c.type + " " + std::to_string(c.number) + " '" + c.text + "'");
        markError();
        bool ok = c.kind == 'i'   ? writeInt(c.type, c.number)
                  : c.kind == 'b' ? writeByte(c.type, static_cast<uint8_t>(c.number))
                  : c.kind == 'o' ? writeBool(c.type, c.number != 0)
                                  : writeText(c.type, c.text);
        EXPECT_EQ(ok, c.accepted);
        if (c.message.empty()) {
            EXPECT_EQ(error(), "writing to read_only type");
        } else {
            EXPECT_EQ(code(), -1);
            EXPECT_EQ(error(), c.message);
        }
        if (c.accepted && c.kind == 't') {
            EXPECT_EQ(readText(c.type), c.text);
        } else if (c.accepted) {
            int32_t back = c.kind == 'i'   ? readInt(c.type).value_or(-1)
                           : c.kind == 'b' ? readByte(c.type).value_or(-1)
                                           : readBool(c.type).value_or(false);
            EXPECT_EQ(back, c.number);
        }
    }
    // Refused values staged nothing: the last accepted ones stand.
    EXPECT_EQ(readInt("SP_Baud"), 115200);
    EXPECT_EQ(readByte("SP_Par"), 4);
    EXPECT_EQ(readByte("SP_Bits"), 7);
    EXPECT_EQ(readByte("SP_Stop"), 2);
    EXPECT_EQ(readText("SP_RxPrefix"), "");
    EXPECT_EQ(host.serial().configured().size(), 1u);
    char text[64] = {};
    protocol->GetSerialSettings(text, sizeof text);
    EXPECT_STREQ(text, "com1,9600,even,8,1,RS-232");
}

TEST_F(MemoryWrite, DoneAppliesTheStagedSettingsRetainsThemAndClearsTheQueue) {
    start();
    play("41 | 42");
    ASSERT_EQ(readInt("tokens_available"), 2);

    ASSERT_TRUE(writeInt("SP_Baud", 19200));
    ASSERT_TRUE(writeByte("SP_Par", 2));
    ASSERT_TRUE(writeByte("SP_Bits", 7));
    ASSERT_TRUE(writeByte("SP_Stop", 2));
    ASSERT_TRUE(writeByte("SP_Mode", 1));
    ASSERT_TRUE(writeText("SP_RxPrefix", "02"));
    ASSERT_TRUE(writeText("SP_RxSuffix", "03"));
    ASSERT_TRUE(writeText("SP_TxPrefix", "05"));
    ASSERT_TRUE(writeText("SP_TxSuffix", "06"));
    ASSERT_TRUE(writeInt("SP_Gap", 30));
    ASSERT_TRUE(writeBool("SP_HexTokens", true));
    ASSERT_TRUE(writeInt("SP_TokenQueueSize", 2));
    for (const std::string& call : host.storage().calls()) {
        EXPECT_NE(call.rfind("Write", 0), 0u) << "staging wrote " << call;
    }
    host.storage().clearCalls();

    ASSERT_TRUE(writeBool("SP_Done", true));
    ASSERT_EQ(host.serial().configured().size(), 2u);
    EXPECT_TRUE((host.serial().configured()[1] == LineSettings{19200, 2, 7, 2, 1}));
    char text[64] = {};
    protocol->GetSerialSettings(text, sizeof text);
    EXPECT_STREQ(text, "com1,19200,odd,7,2,RS-485");
    EXPECT_EQ(readInt("tokens_available"), 0);
    EXPECT_EQ(host.storage().calls(),
              (std::vector<std::string>{
                  "WriteInt XTOK baud 19200", "WriteInt XTOK bits 7", "WriteInt XTOK gap 30",
                  "WriteBool XTOK hex_tokens 1", "WriteInt XTOK mode 1", "WriteInt XTOK parity 2",
                  "WriteText XTOK rx_prefix 02", "WriteText XTOK rx_suffix 03",
                  "WriteInt XTOK stop 2", "WriteInt XTOK token_queue_size 2",
                  "WriteText XTOK tx_prefix 05", "WriteText XTOK tx_suffix 06"}));

    // Framing, gap, hex mode and queue size are live from the next pass.
    settle();
    play("02 41 03 02 42 03 02 43 03");
    EXPECT_EQ(host.serial().readTimeouts().back(), 30);
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"42", "43"}));
    ASSERT_TRUE(writeText("tx_token", "4142"));
    EXPECT_EQ(host.serial().writes().back(), hexBytes("05 41 42 06"));

    // A new protocol over the same storage starts with the retained values.
    destroy();
    create();
    start();
    EXPECT_TRUE((host.serial().configured().back() == LineSettings{19200, 2, 7, 2, 1}));
    EXPECT_EQ(readInt("SP_Gap"), 30);
    EXPECT_EQ(readText("SP_TxPrefix"), "05");
    EXPECT_EQ(readInt("SP_TokenQueueSize"), 2);
    play("41 02 44 03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"44"});
}

TEST_F(MemoryWrite, DoneWithoutChangesLeavesThePortAloneButClearsTheQueue) {
    start();
    play("41");
    ASSERT_TRUE(writeInt("SP_Baud", 9600));    // the value already in use
    ASSERT_TRUE(writeBool("SP_Done", false));  // the value written does not matter
    EXPECT_EQ(host.serial().configured().size(), 1u);
    EXPECT_EQ(readInt("tokens_available"), 0);
}

TEST_F(MemoryWrite, DoneOnAClosedPortTakesEffectAtTheNextOpen) {
    protocol->SetInstanceName("Line2");
    start("autoConnect=false");
    ASSERT_TRUE(writeInt("SP_Baud", 57600));
    ASSERT_TRUE(writeBool("SP_Done", true));
    EXPECT_TRUE(host.serial().configured().empty());
    EXPECT_EQ(host.storage().get("Line2", "baud"), "57600");
    EXPECT_FALSE(host.storage().has("XTOK", "baud"));
    ASSERT_TRUE(writeBool("connect", true));
    ASSERT_EQ(host.serial().configured().size(), 1u);
    EXPECT_TRUE((host.serial().configured()[0] == LineSettings{57600, 1, 8, 1, 0}));
}

class Transmit : public ProtocolFixture {};

TEST_F(Transmit, TokensAreFramedByTheTxPrefixAndSuffix) {
    struct Case {
        std::string keys, token;
        bool sent;
        std::string frame, message;
    };
    const Case cases[] = {
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "4142", true, "02 41 42 03", ""},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "4a4B", true, "02 4A 4B 03", ""},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "41G2", false, "",
         "token to send must be in hex format"},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "414", false, "",
         "token to send must be in hex format"},
        {"tx_prefix=02 tx_suffix=03 hex_tokens=true", "none", true, "02 03", ""},
        {"tx_prefix=02 tx_suffix=03", "AB", true, "02 41 42 03", ""},
        {"tx_prefix=none tx_suffix=0D0A", "4142", true, "34 31 34 32 0D 0A", ""},
        {"", "A B", true, "41 20 42", ""},
    };
    for (const Case& c : cases) {
        destroy();
        create();
        start(c.keys);
        std::size_t before = host.serial().writes().size();
        EXPECT_EQ(writeText("tx_token", c.token), c.sent) << c.keys << " " << c.token;
        std::vector<std::string> writes = host.serial().writes();
        if (c.sent) {
            // One write with the whole frame.
            ASSERT_EQ(writes.size(), before + 1) << c.token;
            EXPECT_EQ(writes.back(), hexBytes(c.frame)) << c.keys << " " << c.token;
        } else {
            EXPECT_EQ(writes.size(), before) << c.token;
            EXPECT_EQ(code(), -1);
            EXPECT_EQ(error(), c.message);
        }
    }
}

TEST_F(Transmit, NeedsAnOpenPortAndIgnoresAFailedWrite) {
    start("autoConnect=false hex_tokens=true");
    // The hex check comes first.
    EXPECT_FALSE(writeText("tx_token", "4"));
    EXPECT_EQ(error(), "token to send must be in hex format");
    EXPECT_FALSE(writeText("tx_token", "41"));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Serial port not active for sending");
    EXPECT_TRUE(host.serial().writes().empty());

    ASSERT_TRUE(writeBool("connect", true));
    host.serial().failWrite = true;
    EXPECT_TRUE(writeText("tx_token", "41"));
    EXPECT_EQ(host.serial().writes().size(), 1u);
}

class Connect : public ProtocolFixture {};

TEST_F(Connect, OpensAndClosesThePort) {
    start("autoConnect=false tx_prefix=02 tx_suffix=03");
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_TRUE(host.serial().isOpen());
    EXPECT_EQ(readBool("connect"), true);
    EXPECT_EQ(command("get_stat"), "Connected");

    ASSERT_TRUE(writeBool("connect", false));
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(readBool("connect"), false);
    EXPECT_EQ(host.serial().opens(), 1);
    EXPECT_EQ(host.serial().closes(), 1);

    host.serial().refuseOpen = true;
    EXPECT_FALSE(writeBool("connect", true));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Can't open serial port");
    EXPECT_EQ(readBool("connect"), false);
}

// Asking for the state that already holds sends the value as a token.
TEST_F(Connect, TheStateThatAlreadyHoldsFallsThroughToTransmit) {
    start("tx_prefix=02 tx_suffix=03");
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_EQ(host.serial().opens(), 1);
    EXPECT_EQ(host.serial().writes(), std::vector<std::string>{hexBytes("02 01 03")});

    ASSERT_TRUE(writeBool("connect", false));
    EXPECT_FALSE(writeBool("connect", false));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Serial port not active for sending");
    EXPECT_EQ(host.serial().writes().size(), 1u);

    // In hex mode the byte 01 is not hex text.
    EXPECT_EQ(command("set_hexToken ON"), "OK");
    ASSERT_TRUE(writeBool("connect", true));
    EXPECT_FALSE(writeBool("connect", true));
    EXPECT_EQ(error(), "token to send must be in hex format");
}

TEST(TokenQueueLimit, DropsOneOldestEntryPerPushSoALoweredLimitDoesNotShrinkIt) {
    TokenQueue queue;
    for (char c : std::string("ABCDE")) {
        queue.push(&c, 1, 10, false);
    }
    queue.push("F", 1, 2, false);
    EXPECT_EQ(queue.count(), 5);
    EXPECT_EQ(*queue.head(), "B");
    queue.push("G", 1, 0, false);
    EXPECT_EQ(queue.count(), 5);
    EXPECT_EQ(*queue.head(), "C");
    queue.removeHead();
    queue.removeHead();
    queue.removeHead();
    queue.removeHead();
    queue.removeHead();
    queue.removeHead();  // empty: nothing happens
    EXPECT_EQ(queue.head(), nullptr);
    queue.push("\x1f\x00", 2, 0, true);
    EXPECT_EQ(*queue.head(), "1F00");
}

class Queue : public ProtocolFixture {};

TEST_F(Queue, AFullQueueDropsItsOldestToken) {
    start("token_queue_size=3");
    play("41 | 42 | 43 | 44");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"B", "C", "D"}));
}

TEST_F(Queue, ALimitOfZeroKeepsOnlyTheNewest) {
    start();
    ASSERT_TRUE(writeInt("SP_TokenQueueSize", 0));
    ASSERT_TRUE(writeBool("SP_Done", true));
    play("41 | 42 | 43");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"C"});
}

TEST_F(Queue, AcknowledgingAnEmptyQueueSucceeds) {
    start();
    EXPECT_TRUE(writeBool("token_ack", true));
    EXPECT_EQ(code(), 1);
    EXPECT_EQ(readInt("tokens_available"), 0);
    play("41");
    EXPECT_TRUE(writeBool("token_ack", false));  // the value written does not matter
    EXPECT_EQ(readInt("tokens_available"), 0);
}

TEST_F(Queue, StopAndStartKeepTheQueue) {
    start();
    play("41");
    ASSERT_TRUE(protocol->Stop());
    ASSERT_TRUE(protocol->Start());
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"A"});
}

}  // namespace
}  // namespace xtok::test
