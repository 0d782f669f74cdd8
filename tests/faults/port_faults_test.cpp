// A port the host will not open, or opens but will not set up: every way of
// opening tells "Can't open serial port", leaves no port open behind it,
// keeps the queued tokens, and works once the host does.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/faults/fault_fixture.h"

namespace xtok::test::faults {
namespace {

enum class PortFault { OpenRefused, ConfigureRefused };

std::string faultName(const ::testing::TestParamInfo<PortFault>& info) {
    return info.param == PortFault::OpenRefused ? "OpenRefused" : "ConfigureRefused";
}

class PortFaults : public FaultFixture, public ::testing::WithParamInterface<PortFault> {
protected:
    void setFault(bool on) {
        if (GetParam() == PortFault::OpenRefused) {
            host.serial().refuseOpen = on;
        } else {
            host.serial().failConfigure = on;
        }
    }
    /// Every port the host handed out has been given back.
    bool nothingLeftOpen() { return !host.serial().isOpen(); }
};

TEST_P(PortFaults, StartFailsWithoutATaskAndSucceedsOnceThePortOpens) {
    setFault(true);
    EXPECT_FALSE(start());
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Can't open serial port");
    EXPECT_TRUE(nothingLeftOpen());
    EXPECT_EQ(host.tasks().tasksCreated(), 0);
    // Not started: tags refuse with their own message.
    EXPECT_FALSE(readInt("tokens_available").has_value());
    EXPECT_EQ(error(), "Protocol not started");

    setFault(false);
    ASSERT_TRUE(protocol->Start()) << error();
    EXPECT_TRUE(host.serial().isOpen());
    EXPECT_EQ(host.tasks().tasksCreated(), 1);
}

TEST_P(PortFaults, ConnectTagFailsAndTheQueueStays) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    ASSERT_TRUE(writeBool("connect", false));
    setFault(true);

    EXPECT_FALSE(writeBool("connect", true));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(error(), "Can't open serial port");
    EXPECT_TRUE(nothingLeftOpen());
    EXPECT_EQ(command("get_stat"), "Disconnected");
    EXPECT_FALSE(writeText("tx_token", "x"));
    EXPECT_EQ(error(), "Serial port not active for sending");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD"}));

    setFault(false);
    EXPECT_TRUE(writeBool("connect", true)) << error();
    play(
        "\x02"
        "EF\x03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"EF"});
}

TEST_P(PortFaults, ConsoleConnectAnswersTheFailureAndTheQueueStays) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    EXPECT_EQ(command("connect OFF"), "OK");
    setFault(true);

    bool result = false;
    EXPECT_EQ(command("connect ON", &result), "Can't open serial port");
    EXPECT_TRUE(result);
    EXPECT_TRUE(nothingLeftOpen());
    EXPECT_EQ(command("get_stat"), "Disconnected");
    EXPECT_EQ(command("put 41", &result), "ERROR: serial port is not active for sending");
    EXPECT_FALSE(result);
    EXPECT_EQ(command("tokens_available"), "2");
    EXPECT_EQ(command("get"), "AB");

    setFault(false);
    EXPECT_EQ(command("connect ON"), "OK");
    EXPECT_EQ(command("get_stat"), "Connected");
}

INSTANTIATE_TEST_SUITE_P(Faults, PortFaults,
                         ::testing::Values(PortFault::OpenRefused, PortFault::ConfigureRefused),
                         faultName);

// New line settings the host refuses on the open port: SP_Done still
// applies and retains them, and the port stays open for the next token.
TEST_F(FaultFixture, RefusedReconfigureKeepsThePortAndTheSettings) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    host.serial().failConfigure = true;
    ASSERT_TRUE(writeInt("SP_Baud", 19200));
    EXPECT_TRUE(writeBool("SP_Done", true)) << error();
    ASSERT_EQ(host.serial().configured().size(), 2u);
    EXPECT_EQ(host.serial().configured().back().baud, 19200);
    EXPECT_EQ(readInt("SP_Baud"), 19200);
    EXPECT_EQ(host.storage().get("XTOK", "baud"), "19200");
    EXPECT_TRUE(host.serial().isOpen());
    play(
        "\x02"
        "AB\x03");
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"AB"});
}

}  // namespace
}  // namespace xtok::test::faults
