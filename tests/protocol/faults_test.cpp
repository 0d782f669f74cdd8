// Faults of the host and the line, one row each: what is injected, what the
// panel then does, and what it sees. Queued tokens survive every fault.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

// Most rows start with STX/ETX framing and the tokens "AB" and "CD" queued.
const Scenario kFaults[] = {
    {"PortRefusedAtStart", "fault open; start; w tx_token x",
     "!Can't open serial port | !Protocol not started"},
    {"SettingsRefusedAtStartNoTaskUntilAStartSucceeds",
     "fault configure; start; tasks; heal configure; go; tasks",
     "!Can't open serial port | - | CreateTask 3 0"},
    {"PortRefusedByTheConnectTag",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "w connect 0; fault open; w connect 1; w tx_token x; cmd get_stat; opens; tokens",
     "!Can't open serial port | !Serial port not active for sending | Disconnected | 1/1 com1 | "
     "AB,CD"},
    {"SettingsRefusedByTheConsoleConnect",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "cmd connect OFF; fault configure; cmd connect ON; cmd put 41; cmd get_stat; tokens",
     "OK | Can't open serial port | !ERROR: serial port is not active for sending | Disconnected | "
     "AB,CD"},
    {"ReconfigureRefusedBySpDone",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "fault configure; w SP_Baud 19200; w SP_Done 1; stored baud; play 02 45 46 03; "
     "cmd get_stat; tokens",
     "19200 | Connected | EF"},
    {"ReadErrorInATokenEndsItLikeASilence",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "feed 02 47 48; error; play 02 45 46 03; tokens",
     "AB,CD,EF"},
    {"HangUpKeepsTheQueueAndReconnectResumes",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "feed 02 47 48; hangup; drain; cmd get_stat; tokens; w connect 0; w connect 1; "
     "play 02 45 46 03; tokens; opens",
     "Connected | AB,CD | EF | 2/1 com1"},
    {"HangUpThenStopAndStartResume",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "hangup; drain; stop; go; play 02 45 46 03; tokens",
     "AB,CD,EF"},
    {"FailedWritesAreNotReported",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "fault write; w tx_token hi; cmd put again; sent; play 02 45 46 03; tokens",
     "OK | 02686903,02616761696E03 | AB,CD,EF"},
    {"StorageWritesFailButTheSettingsHoldWhileTheProtocolLives",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "fault store; w SP_Gap 25; w SP_TxPrefix 0D; w SP_Done 1; w tx_token x; stop; go; sent; "
     "r SP_Gap; stored gap; play 02 45 46 03; tokens",
     "0D7803 | 25 | - | EF"},
    {"StorageReadsFailAndRetainedTextsFallBackToEmpty",
     "store tx_prefix 0D; fault load; start rx_prefix=02 rx_suffix=03 tx_suffix=03; "
     "play 02 41 42 03; w tx_token x; r SP_TxPrefix; sent; tokens",
     "'' | 7803 | AB"},
    {"BasicStorageReadsFailToo",
     "fault basic; store tx_prefix 0D; fault load; start rx_prefix=02 rx_suffix=03; "
     "play 02 41 42 03; r SP_TxPrefix; tokens",
     "'' | AB"},
    {"TaskRefusedStartsWithoutReceiving",
     "start rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03; play 02 41 42 03 02 43 44 03; "
     "stop; fault task; go; feed 02 45 46 03; cmd get_stat; tokens; stop; heal task; go; drain; "
     "tokens",
     "Connected | AB,CD | EF"},
};

INSTANTIATE_TEST_SUITE_P(Faults, Scenarios, ::testing::ValuesIn(kFaults), scenarioName);

class Faults : public ProtocolFixture {};

TEST_F(Faults, StopTimesOutButClosesThePortAndTheTaskEndsWithTheProtocol) {
    EXPECT_EQ(run("start; play 41; fault stop; stop; cmd get_stat; heal stop; opens"),
              "Disconnected | 1/1 com1");
    FakeTask* task = host.tasks().lastTask();
    destroy();  // the protocol ends the task the host could not
    EXPECT_TRUE(task->waitEnded(5000));
}

// Without the optional services (storage among them) settings still apply
// and hold while the protocol lives.
TEST(ServiceFaults, WithoutTheOptionalServicesTheProtocolDoesItsWholeJob) {
    FakeHost host;
    for (const char* name :
         {"IDiag", "IPermanentStorage", "IDriverInterface", "ISmux", "IFastTimer"}) {
        host.refuse(name);
    }
    ModuleSession session(host);
    IProtocol7* protocol = rootObject().factory().CreateProtocol("XTOK");
    ASSERT_TRUE(protocol->Configure((kBaseConfig + " tx_prefix=02").c_str()) && protocol->Start());
    ITag* gap = protocol->CreateTag("0?SP_Gap?unsignedInt");
    ITag* done = protocol->CreateTag("0?SP_Done?boolean");
    int32_t value = 25;
    EXPECT_TRUE(protocol->WriteTag(gap, &value) && protocol->WriteTag(done, &value));
    EXPECT_TRUE(protocol->Stop() && protocol->Start());
    value = 0;
    EXPECT_TRUE(protocol->ReadTag(gap, &value));
    EXPECT_EQ(value, 25);
    EXPECT_EQ(host.storage().writes(), 0);
    rootObject().factory().DestroyProtocol(protocol);
}

}  // namespace
}  // namespace xtok::test
