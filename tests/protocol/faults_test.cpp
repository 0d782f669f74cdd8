// Faults of the host and the line, one row each: what is injected, what the
// panel then does, and what it sees. Queued tokens survive every fault.
#include <gtest/gtest.h>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

class Faults : public ProtocolFixture {
public:
    /// Starts with STX/ETX framing and two tokens queued, "AB" and "CD".
    void startWithTwoTokens(const std::string& keys = "") {
        ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03 " + keys));
        host.serial().feed(
            "\x02"
            "AB\x03\x02"
            "CD\x03");
        ASSERT_TRUE(host.serial().waitDrained());
    }
    /// `ok` and the last error, if it failed.
    std::string said(bool ok) { return ok ? "ok" : "failed: " + error(); }
    /// The state a panel sees: connection, port, and the tokens it takes.
    std::string state() {
        std::string tokens;
        for (const std::string& t : takeTokens()) {
            tokens += " " + t;
        }
        return command("get_stat") + (host.serial().isOpen() ? " open," : " closed,") + tokens;
    }
    /// Plays one more token and says what the queue then holds.
    std::string receives() {
        play("02 45 46 03");
        return state();
    }
};

struct FaultCase {
    const char* name;
    std::function<std::string(Faults&)> run;
    const char* outcome;
};

// Each row's steps append to `o` in order (the operands of one expression
// would run in any order).
const FaultCase kFaults[] = {
    {"PortRefusedAtStart",
     [](Faults& f) {
         f.host.serial().refuseOpen = true;
         std::string o = f.said(f.start());
         return o += " | " + f.said(f.writeText("tx_token", "x"));
     },
     "failed: Can't open serial port | failed: Protocol not started"},
    {"SettingsRefusedAtStartNoTaskUntilAStartSucceeds",
     [](Faults& f) {
         f.host.serial().failConfigure = true;
         std::string o = f.said(f.start());
         o += " " + std::to_string(f.host.tasks().lastTask() != nullptr);
         f.host.serial().failConfigure = false;
         return o += " | " + f.said(f.protocol->Start());
     },
     "failed: Can't open serial port 0 | ok"},
    {"PortRefusedByTheConnectTag",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.writeBool("connect", false);
         f.host.serial().refuseOpen = true;
         std::string o = f.said(f.writeBool("connect", true));
         o += " | " + f.said(f.writeText("tx_token", "x"));
         return o += " | " + f.state();
     },
     "failed: Can't open serial port | failed: Serial port not active for sending | "
     "Disconnected closed, AB CD"},
    {"SettingsRefusedByTheConsoleConnect",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.command("connect OFF");
         f.host.serial().failConfigure = true;
         std::string o = f.command("connect ON");
         o += " | " + f.command("put 41");
         return o += " | " + f.state();
     },
     "Can't open serial port | ERROR: serial port is not active for sending | "
     "Disconnected closed, AB CD"},
    {"ReconfigureRefusedBySpDone",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.serial().failConfigure = true;
         f.writeInt("SP_Baud", 19200);
         std::string o = f.said(f.writeBool("SP_Done", true));
         o += " " + f.host.storage().get("XTOK", "baud");
         return o += " | " + f.receives();
     },
     "ok 19200 | Connected open, EF"},
    {"ReadErrorInATokenEndsItLikeASilence",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.serial().feed(
             "\x02"
             "GH");
         f.host.serial().readError();
         return f.receives();
     },
     "Connected open, AB CD EF"},
    {"HangUpKeepsTheQueueAndReconnectResumes",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.serial().feed(
             "\x02"
             "GH");
         f.host.serial().hangUp();
         f.host.serial().waitDrained();
         std::string o = f.state();
         f.writeBool("connect", false);
         f.writeBool("connect", true);
         return o += " | " + f.receives();
     },
     "Connected open, AB CD | Connected open, EF"},
    {"HangUpThenStopAndStartResume",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.serial().hangUp();
         f.host.serial().waitDrained();
         std::string o = f.said(f.protocol->Stop() && f.protocol->Start());
         return o += " | " + f.receives();
     },
     "ok | Connected open, AB CD EF"},
    {"FailedWritesAreNotReported",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.serial().failWrite = true;
         std::string o = f.said(f.writeText("tx_token", "hi"));
         o += " " + f.command("put again");
         o += " " + std::to_string(f.host.serial().writes().size());
         return o += " | " + f.receives();
     },
     "ok OK 2 | Connected open, AB CD EF"},
    {"StorageWritesFailButTheSettingsHoldWhileTheProtocolLives",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.storage().failWrites = true;
         f.writeInt("SP_Gap", 25);
         f.writeText("SP_TxPrefix", "0D");
         std::string o = f.said(f.writeBool("SP_Done", true));
         f.writeText("tx_token", "x");
         f.protocol->Stop();
         f.protocol->Start();
         o += " " + f.host.serial().writes().back();
         o += std::to_string(f.readInt("SP_Gap").value_or(-1));
         o += " " + std::to_string(f.host.storage().has("XTOK", "gap"));
         return o += " | " + f.receives();
     },
     "ok \rx\x03"
     "25 0 | Connected open, EF"},
    {"StorageReadsFailAndRetainedTextsFallBackToEmpty",
     [](Faults& f) {
         f.host.storage().put("XTOK", "tx_prefix", "0D");
         f.host.storage().failReads = true;
         f.startWithTwoTokens();
         f.writeText("tx_token", "x");
         std::string o = f.readText("SP_TxPrefix").value_or("?");
         o += "|" + f.host.serial().written();
         return o += " | " + f.state();
     },
     "|x\x03 | Connected open, AB CD"},
    {"BasicStorageReadsFailToo",
     [](Faults& f) {
         f.host.storage().extended = false;
         f.host.storage().put("XTOK", "tx_prefix", "0D");
         f.host.storage().failReads = true;
         f.startWithTwoTokens();
         std::string o = f.readText("SP_TxPrefix").value_or("?");
         return o += "| " + f.state();
     },
     "| Connected open, AB CD"},
    {"TaskRefusedStartsWithoutReceiving",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.protocol->Stop();
         f.host.tasks().refuseTasks = true;
         std::string o = f.said(f.protocol->Start());
         const long reads = f.host.serial().record().reads;
         f.host.serial().feed(
             "\x02"
             "EF\x03");
         o += " | " + f.state();
         o += " " + std::to_string(f.host.serial().record().reads - reads);
         f.protocol->Stop();
         f.host.tasks().refuseTasks = false;
         f.protocol->Start();
         f.host.serial().waitDrained();
         return o += " | " + f.state();
     },
     "ok | Connected open, AB CD 0 | Connected open, EF"},
    {"StopTimesOutButClosesThePortAndTheQueueStays",
     [](Faults& f) {
         f.startWithTwoTokens();
         f.host.tasks().stopTimesOut = true;
         std::string o = f.said(f.protocol->Stop());
         o += " " + f.command("get_stat");
         FakeTask* task = f.host.tasks().lastTask();
         f.host.tasks().stopTimesOut = false;
         f.destroy();  // the protocol ends the task the host could not
         return o += " " + std::to_string(task->waitEnded(5000));
     },
     "ok Disconnected 1"},
};

class FaultTable : public Faults, public ::testing::WithParamInterface<FaultCase> {};

TEST_P(FaultTable, LeavesThePanelWhatItExpects) {
    EXPECT_EQ(GetParam().run(*this), GetParam().outcome);
}

INSTANTIATE_TEST_SUITE_P(Rows, FaultTable, ::testing::ValuesIn(kFaults),
                         [](const auto& info) { return std::string(info.param.name); });

// A required service refused: Init fails with the name and gives back what it
// took; without the optional ones (storage among them) the protocol does its
// whole job.
TEST(ServiceFaults, RequiredRefusedFailsInitOptionalMissingIsFine) {
    ProtModule& module = rootObject().module();
    for (auto [service, text] : {std::pair{"IMultiTask2", "IMultiTask2 not created"},
                                 {"ISerialFactory", "ISerialFactory not created"},
                                 {"ISocketFactory", "ISocketFactory not created"},
                                 {"ICDSBuffer", "piCDSBuffer not created"}}) {
        FakeHost host;
        host.refuse(service);
        EXPECT_EQ(module.Init(&host), 0);
        EXPECT_STREQ(module.GetErrorText(), text);
        EXPECT_EQ(host.outstanding(), 0);
        EXPECT_EQ(rootObject().factory().CreateProtocol("XTOK"), nullptr);
    }
    EXPECT_EQ(module.Init(nullptr), 0);
    EXPECT_STREQ(module.GetErrorText(), "IMultiTask2 not created");
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
