// xtok-host as a user runs it: the built binary in a child process, with a
// deadline, against a simulated device on a pseudo-terminal.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <map>
#include <thread>

#include "host/permanent_storage.h"
#include "tests/host/temp_dir.h"
#include "tests/tools/subprocess.h"
#include "tools/pty_pair.h"
#include "tools/simulated_device.h"

namespace xtok::tools::test {
namespace {

using namespace std::chrono_literals;

const std::string kHost = XTOK_HOST_PATH;
const std::string kPlugin = XTOK_PLUGIN_PATH;

std::string configFor(const std::string& port) {
    return "CfgVer=1 model=1 port=" + port +
           " baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232"
           " rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03 gap=50";
}

int countOf(const std::string& text, const std::string& part) {
    int count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

TEST(Cli, DemoShowsTokensWithinSecondsAndStopsAtTheCount) {
    // No --plugin: the demo finds the plug-in of its own build tree.
    Subprocess demo({kHost, "demo", "--count", "3"});
    EXPECT_TRUE(demo.waitForOutput("received  \"", 5s));
    Finished done = demo.finish(15s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_EQ(countOf(done.out, "received  \""), 3) << done.out;
    EXPECT_EQ(countOf(done.out, "answered  \"OK "), 3) << done.out;
    EXPECT_NE(done.out.find("3 codes received, 3 answered"), std::string::npos) << done.out;
    EXPECT_EQ(done.err, "");
}

TEST(Cli, CtrlCEndsTheDemoCleanly) {
    Subprocess demo({kHost, "demo", "--interval", "50", "--plugin", kPlugin});
    // Without a count it goes on: a second code comes before Ctrl-C.
    ASSERT_TRUE(demo.waitForOutput("received  \"", 5s, 2));
    demo.interrupt();
    Finished done = demo.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_NE(done.out.find(" received, "), std::string::npos) << done.out;
}

class Session : public ::testing::Test {
protected:
    void SetUp() override {
        std::string error;
        line_ = PtyPair::open(error);
        ASSERT_NE(line_, nullptr) << error;
        device_ = std::make_unique<SimulatedDevice>(line_->master(), DeviceOptions{});
    }
    std::vector<std::string> run(std::vector<std::string> extra) {
        std::vector<std::string> arguments = {
            kHost,      "run",   "--config", configFor(line_->slavePath()),
            "--plugin", kPlugin, "--state",  dir_.file("retained.sqlite3")};
        arguments.insert(arguments.end(), extra.begin(), extra.end());
        return arguments;
    }

    host::test::TempDir dir_;
    std::unique_ptr<PtyPair> line_;
    std::unique_ptr<SimulatedDevice> device_;
};

TEST_F(Session, ScriptedRunReadsWritesAndWatches) {
    Finished done = runTool(run({"--exec",
                                 "tag write 0?tx_token?string-16 HELLO;"
                                 " watch --count 1 --timeout 10;"
                                 " tag read 0?tokens_available?unsignedInt;"
                                 " tag write 0?SP_Baud?unsignedInt 19200;"
                                 " tag read 0?SP_Baud?unsignedInt; get_stat"}));
    EXPECT_EQ(done.status, 0) << done.err;
    std::vector<std::string> lines = linesOf(done.out);
    ASSERT_EQ(lines.size(), 6u) << done.out;
    EXPECT_EQ(lines[0], "ok");
    EXPECT_NE(lines[1].find("\"ACK HELLO\"  41 43 4B 20 48 45 4C 4C 4F  (9 bytes)"),
              std::string::npos)
        << lines[1];
    EXPECT_EQ(lines[2], "0");
    EXPECT_EQ(lines[3], "ok");
    EXPECT_EQ(lines[4], "19200");
    EXPECT_EQ(lines[5], "Connected");
    EXPECT_EQ(device_->tokens(), std::vector<std::string>{"HELLO"});
}

// However long the gap, a close and the end of the run come within about
// half a second: the wait for silence is read in slices.
TEST_F(Session, ALongGapDelaysNoClose) {
    const auto began = std::chrono::steady_clock::now();
    Finished done = runTool(run({"--exec",
                                 "tag write 0?SP_Gap?unsignedInt 30000; "
                                 "tag write 0?SP_Done?boolean 1; connect OFF; get_stat"}));
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_EQ(linesOf(done.out).back(), "Disconnected");
    EXPECT_LT(std::chrono::steady_clock::now() - began, 5s);
}

// SP_Done retains its settings in one transaction: a run killed at any
// moment leaves the whole old set or the whole new set in the state file.
TEST_F(Session, AKillDuringSpDoneLeavesTheOldSetOrTheNew) {
    for (int round = 1; round <= 16; ++round) {
        std::string script;
        for (int i = 10; i < 60; ++i) {  // every SP_Done changes every value
            const std::string n = std::to_string(i);
            script += "tag write 0?SP_Gap?unsignedInt " + n +
                      "; tag write 0?SP_TokenQueueSize?unsignedInt " + n +
                      "; tag write 0?SP_TxPrefix?string-8 " + n +
                      "; tag write 0?SP_Done?boolean 1; ";
        }
        Subprocess session(run({"--exec", script}));
        // Killed once it runs, a little later each round.
        session.waitForOutput("ok\n", 10s);
        std::this_thread::sleep_for(std::chrono::microseconds(1300 * round));
        kill(session.pid(), SIGKILL);
        session.finish(10s);
        std::string error;
        auto storage = host::PermanentStorage::open(dir_.file("retained.sqlite3"), error);
        ASSERT_NE(storage, nullptr) << error;
        const int32_t gap = storage->ReadInt("XTOK", "gap");
        EXPECT_EQ(storage->ReadInt("XTOK", "token_queue_size"), gap) << round;
        EXPECT_EQ(storage->ReadText("XTOK", "tx_prefix"), gap ? std::to_string(gap) : "") << round;
    }
}

// SP_Done keeps the settings in the state file: the next run starts with them.
TEST_F(Session, RetainedSettingsSurviveARestart) {
    Finished done = runTool(run({"--exec",
                                 "tag write 0?SP_Baud?unsignedInt 19200; tag write "
                                 "0?SP_RxSuffix?string-8 0D0A; tag write 0?SP_Done?boolean 1"}));
    EXPECT_EQ(done.status, 0) << done.err;
    done =
        runTool(run({"--exec", "tag read 0?SP_Baud?unsignedInt; tag read 0?SP_RxSuffix?string-8"}));
    EXPECT_EQ(done.out, "19200\n\"0D0A\"\n") << done.err;
}

TEST_F(Session, CtrlCEndsAWatchAndTheScriptGoesOn) {
    device_.reset();
    DeviceOptions reader;
    reader.codes = {"4006381333931"};
    reader.interval = 50ms;
    reader.firstCode = 0ms;
    device_ = std::make_unique<SimulatedDevice>(line_->master(), reader);
    Subprocess session(run({"--exec", "watch; get_stat"}));
    ASSERT_TRUE(session.waitForOutput("\"4006381333931\"", 5s));
    session.interrupt();
    Finished done = session.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_EQ(linesOf(done.out).back(), "Connected") << done.out;
}

TEST_F(Session, JsonGivesOneObjectPerResult) {
    Finished done = runTool(run({"--json", "--exec",
                                 "tag write 0?tx_token?string-16 \"A\\x01\"; watch --count 1 "
                                 "--timeout 10; settings; tag read 0?nope?int"}));
    EXPECT_EQ(done.status, 1);
    std::vector<std::string> lines = linesOf(done.out);
    ASSERT_EQ(lines.size(), 5u) << done.out;
    for (const std::string& line : lines) {
        EXPECT_TRUE(line.front() == '{' && line.back() == '}') << line;
    }
    EXPECT_NE(lines[1].find("\"token\":\"ACK A\\u0001\",\"length\":6"), std::string::npos)
        << lines[1];
    EXPECT_NE(lines[2].find("\"ok\":true,\"tokens\":1"), std::string::npos) << lines[2];
    EXPECT_NE(lines[3].find("\"SP_Baud\":9600"), std::string::npos) << lines[3];
    EXPECT_NE(lines[4].find("\"ok\":false,\"error\":\"bad tag address"), std::string::npos)
        << lines[4];
    EXPECT_EQ(done.err, "");
}

TEST_F(Session, AScriptOnStandardInputGoesOnAfterAFailureAndSaysSoAtTheEnd) {
    // The plug-in's console answers most failures in its reply text, with a
    // "known command" result: those count as failures all the same.
    Finished done = runTool(run({}),
                            "get_stat\n# a comment\ntag read 0?nope?int\n\n"
                            "read 0?SP_Baud?unsignedInt\nwrite 0?SP_Baud?unsignedInt 80\n"
                            "set_hexToken maybe\nconnect OFF\nget_stat\nquit\nget_stat\n");
    EXPECT_EQ(done.status, 1);
    EXPECT_EQ(done.out, "Connected\n80250000\nOK\nDisconnected\n");
    EXPECT_EQ(
        linesOf(done.err),
        (std::vector<std::string>{"error: bad tag address '0?nope?int': Can't access memory type",
                                  "error: write: incorrect length of data to write",
                                  "error: set_hexToken: wrong value"}));
}

// The monitor beside the console: tokens with zero bytes and the rule that
// ended each, the framing changed by a console setter on the way (a new pass
// takes it: the port is closed and opened around it), and watch showing such
// a token whole.
TEST_F(Session, MonitorShowsEachTokenWithWhatEndedIt) {
    Subprocess session(run({"--json", "--exec",
                            "monitor on; watch --count 1 --timeout 10; connect OFF; "
                            "set_rxSuffix none; connect ON; watch --count 2 --timeout 10"}));
    ASSERT_TRUE(session.waitForOutput("\"monitor\":true", 5s));
    device_->sendRaw(std::string("\2A\0B\3", 5));
    ASSERT_TRUE(session.waitForOutput("\"reply\":\"OK\"", 5s, 3));
    device_->sendRaw(std::string("\2C\0\2D", 5));
    Finished done = session.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    for (const char* shown :
         {"{\"event\":\"rx\",\"time\":\"", "\"end\":\"suffix\",\"hex\":\"410042\"",
          "\"end\":\"next prefix\",\"hex\":\"4300\"", "\"end\":\"gap\",\"hex\":\"44\"",
          "\"token\":\"A\\u0000B\",\"length\":3,\"hex\":\"410042\"}",
          "\"token\":\"C\\u0000\",\"length\":2,\"hex\":\"4300\"}"}) {
        EXPECT_NE(done.out.find(shown), std::string::npos) << shown << "\n" << done.out;
    }
}

TEST_F(Session, MonitorEndsAtItsCountAndLogsWhatItShows) {
    std::vector<std::string> arguments =
        run({"--json", "--count", "2", "--log", dir_.file("line.log")});
    arguments[1] = "monitor";
    arguments[3] += " token_queue_size=1";
    Subprocess monitor(arguments);
    ASSERT_TRUE(monitor.waitForOutput("settings applied", 5s));
    device_->sendRaw(std::string("\x02\0\x03\x02Z\x03", 6));  // nobody takes the first
    Finished done = monitor.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    std::vector<std::string> events;
    for (const std::string& line : linesOf(done.out)) {
        if (line.find("\"rx\"") == std::string::npos) {
            events.push_back(line.substr(0, line.find(",\"time\"")) +
                             line.substr(line.find('"', line.find(",\"time\"") + 9) + 1));
        }
    }
    const std::string device = line_->slavePath();
    EXPECT_EQ(
        events,
        (std::vector<std::string>{
            "{\"event\":\"link\",\"link\":\"opened\",\"device\":\"" + device + "\"}",
            "{\"event\":\"link\",\"link\":\"settings applied\",\"device\":\"" + device +
                "\",\"settings\":\"9600,none,8,1,RS-232\"}",
            "{\"event\":\"token\",\"end\":\"suffix\",\"hex\":\"00\",\"text\":\"\\u0000\","
            "\"length\":1}",
            "{\"event\":\"token\",\"end\":\"suffix\",\"hex\":\"5A\",\"text\":\"Z\",\"length\":1}",
            "{\"event\":\"queue\",\"limit\":1,\"droppedSoFar\":1}"}))
        << done.out;
    std::ifstream log(dir_.file("line.log"));
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(log), {}), done.out);
}

// A device that goes away and comes back at the same path: the monitor says
// so, reception goes on, and info tells the line's state.
TEST_F(Session, ALostDeviceIsReopenedWhenItComesBack) {
    const std::string link = dir_.file("ttyLINK");
    ASSERT_EQ(symlink(line_->slavePath().c_str(), link.c_str()), 0);
    std::vector<std::string> arguments =
        run({"--reconnect", "--json", "--exec", "monitor on; watch --count 1 --timeout 20; info"});
    arguments[3] = configFor(link);
    Subprocess session(arguments);
    ASSERT_TRUE(session.waitForOutput("\"monitor\":true", 5s));
    device_.reset();
    line_->closeMaster();
    ASSERT_TRUE(session.waitForOutput("\"link\":\"lost\"", 5s));
    std::string error;
    std::unique_ptr<PtyPair> back = PtyPair::open(error);
    ASSERT_NE(back, nullptr) << error;
    ASSERT_EQ(unlink(link.c_str()), 0);
    ASSERT_EQ(symlink(back->slavePath().c_str(), link.c_str()), 0);
    ASSERT_TRUE(session.waitForOutput("\"link\":\"reconnected\"", 5s));
    ASSERT_EQ(write(back->master(), "\x02R\x03", 3), 3);
    Finished done = session.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_NE(done.out.find("\"reason\":\"hang-up\""), std::string::npos) << done.out;
    EXPECT_NE(done.out.find("\"token\":\"R\""), std::string::npos) << done.out;
    EXPECT_NE(done.out.find("line: " + link + " reconnected at "), std::string::npos) << done.out;
}

TEST(Cli, DescribeShowsTheNineteenMemoryTypesAndTheWholeXml) {
    Finished summary = runTool({kHost, "describe", kPlugin});
    EXPECT_EQ(summary.status, 0) << summary.err;
    std::vector<std::string> lines = linesOf(summary.out);
    auto heading = std::find(lines.begin(), lines.end(), "Memory types (19):");
    ASSERT_NE(heading, lines.end()) << summary.out;
    EXPECT_EQ(lines.end() - heading - 1, 19);
    EXPECT_EQ(lines[0], "Name       XTOK");

    Finished xml = runTool({kHost, "describe", "--xml", kPlugin});
    EXPECT_EQ(xml.status, 0) << xml.err;
    EXPECT_EQ(xml.out.rfind("<?xml", 0), 0u);
    EXPECT_EQ(countOf(xml.out, "<memtype "), 19);
}

TEST(Cli, PortsListsWhatThereIsAndSaysWhatItCannot) {
    Finished done = runTool({kHost, "ports"});
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_NE(done.out.find("Pseudo-terminals (/dev/pts/N) are not listed"), std::string::npos);
}

// Every bad input: one line on standard error, its reason, the right status.
// In the arguments, {line} is a free pseudo-terminal, {busy} one that another
// program holds, {locked} a file the user may not open, {dir} a scratch
// directory, {text} a file that is no plug-in.
struct BadInput {
    const char* what;
    std::vector<std::string> arguments;
    const char* reason;
    int status;
    bool asNobody = false;
};

const std::string kNoPort =
    "CfgVer=1 model=1 baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232";

const BadInput kBadInputs[] = {
    {"missing device", {"run", "--config", kNoPort + " port={dir}/ttyNONE"}, "No such file", 1},
    {"unknown port name", {"run", "--config", kNoPort + " port=com17"}, "unknown port name", 1},
    {"busy port", {"run", "--config", kNoPort + " port={busy}"}, "in use by another program", 1},
    {"no permission",
     {"run", "--config", kNoPort + " port={locked}"},
     "Permission denied",
     1,
     true},
    {"no port in the configuration", {"run", "--config", kNoPort}, "'port' is not found", 1},
    {"bad parity",
     {"run", "--config",
      "CfgVer=1 model=1 port={line} baudrate=9600 parity=EVEN bits=8 stopbits=1 mode=RS-232"},
     "'parity' has invalid value",
     1},
    {"no configuration at all", {"run", "--config", "hello"}, "unknown format", 1},
    {"bad tag address",
     {"run", "--config", kNoPort + " port={line}", "--exec", "tag read 0?x?int"},
     "bad tag address '0?x?int'",
     1},
    {"bad typed value",
     {"run", "--config", kNoPort + " port={line}", "--exec",
      "tag write 0?SP_Baud?unsignedInt fast"},
     "'fast' is not a number",
     1},
    {"text as plug-in",
     {"run", "--plugin", "{text}", "--config", kNoPort + " port={line}"},
     "is not a shared object",
     1},
    {"text described", {"describe", "{text}"}, "no description block", 1},
    {"missing plug-in", {"describe", "{dir}/none.so"}, "No such file", 1},
    {"unknown command", {"bogus"}, "unknown command 'bogus'", 2},
    {"unknown option", {"demo", "--colour"}, "--colour", 2},
    {"no configuration option", {"run"}, "--config is required", 2},
    {"count of zero", {"demo", "--count", "0"}, "whole number above 0", 2},
    {"watch count of zero",
     {"run", "--config", kNoPort + " port={line}", "--exec", "watch --count 0"},
     "--count",
     1},
    {"bad port map", {"run", "--config", kNoPort, "--map", "com99=/dev/x"}, "comN=DEVICE", 2},
    {"configuration file missing", {"run", "--config", "@{dir}/none.cfg"}, "cannot read", 2},
    {"log file cannot be opened",
     {"monitor", "--config", kNoPort + " port={line}", "--log", "{dir}/none/line.log"},
     "cannot open the log",
     2},
    {"monitor count of zero", {"monitor", "--count", "0", "--config", kNoPort}, "above 0", 2},
    {"monitor switched to nonsense",
     {"run", "--config", kNoPort + " port={line}", "--exec", "monitor maybe"},
     "use monitor on",
     1},
};

class BadInputs : public ::testing::Test {
protected:
    void SetUp() override {
        std::string error;
        line_ = PtyPair::open(error);
        busy_ = PtyPair::open(error);
        ASSERT_TRUE(line_ && busy_) << error;
        holder_ = open(busy_->slavePath().c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
        ASSERT_EQ(flock(holder_, LOCK_EX | LOCK_NB), 0);
        std::ofstream(dir_.file("notes.txt")) << "not a plug-in\n";
        std::ofstream(dir_.file("locked")) << "";
        // The child may run as nobody: it must reach the directory and its
        // state file, but not the locked device.
        chmod(dir_.file("").c_str(), 0777);
        chmod(dir_.file("locked").c_str(), 0);
    }
    void TearDown() override { close(holder_); }

    std::vector<std::string> arguments(const BadInput& input) {
        std::map<std::string, std::string> values = {{"{line}", line_->slavePath()},
                                                     {"{busy}", busy_->slavePath()},
                                                     {"{locked}", dir_.file("locked")},
                                                     {"{text}", dir_.file("notes.txt")},
                                                     {"{dir}", dir_.file("")}};
        std::vector<std::string> result = {kHost};
        for (std::string argument : input.arguments) {
            for (const auto& [name, value] : values) {
                for (std::size_t at; (at = argument.find(name)) != std::string::npos;) {
                    argument.replace(at, name.size(), value);
                }
            }
            result.push_back(argument);
        }
        if (input.arguments[0] == "run" || input.arguments[0] == "monitor") {
            // A state file of its own for a child run as nobody: root's is not
            // for it to write.
            result.insert(
                result.end(),
                {"--state", dir_.file(input.asNobody ? "nobody.sqlite3" : "retained.sqlite3")});
            if (std::find(result.begin(), result.end(), "--plugin") == result.end()) {
                result.insert(result.end(), {"--plugin", kPlugin});
            }
        }
        return result;
    }

    host::test::TempDir dir_;
    std::unique_ptr<PtyPair> line_;
    std::unique_ptr<PtyPair> busy_;
    int holder_ = -1;
};

TEST_F(BadInputs, GiveOneLineOnStandardErrorAndAFailingStatus) {
    for (const BadInput& input : kBadInputs) {
        Finished done = runTool(arguments(input), "", input.asNobody);
        EXPECT_FALSE(done.timedOut) << input.what;
        EXPECT_EQ(done.status, input.status) << input.what << ": " << done.err;
        std::vector<std::string> lines = linesOf(done.err);
        EXPECT_EQ(lines.size(), 1u) << input.what << ": " << done.err;
        EXPECT_NE(done.err.find(input.reason), std::string::npos) << input.what << ": " << done.err;
    }
}

}  // namespace
}  // namespace xtok::tools::test
