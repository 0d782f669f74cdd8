// xtok-host as a user runs it: the built binary in a child process, with a
// deadline, against a simulated device on a pseudo-terminal.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <termios.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <map>
#include <regex>
#include <thread>

#include "host/permanent_storage.h"
#include "tests/host/temp_dir.h"
#include "tests/tools/subprocess.h"
#include "tools/pty_pair.h"
#include "tools/simulated_device.h"

namespace xtok::tools::test {
namespace {

using namespace std::chrono_literals;
using namespace std::string_literals;

const std::string kHost = XTOK_HOST_PATH;
const std::string kPlugin = XTOK_PLUGIN_PATH;

std::string configFor(const std::string& port) {
    return "CfgVer=1 model=1 port=" + port +
           " baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232"
           " rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03 gap=50";
}

TEST(Cli, DemoShowsTokensWithinSecondsAndStopsAtTheCount) {
    // No --plugin: the demo finds the plug-in of its own build tree.
    Subprocess demo({kHost, "demo", "--count", "1"});
    EXPECT_TRUE(demo.waitForOutput("received  \"", 5s));
    Finished done = demo.finish(15s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_EQ(countOf(done.out, "received  \""), 1) << done.out;
    EXPECT_EQ(countOf(done.out, "answered  \"OK "), 1) << done.out;
    EXPECT_NE(done.out.find("1 code received, 1 answered"), std::string::npos) << done.out;
    EXPECT_EQ(done.err, "");
}

TEST(Cli, CtrlCEndsTheDemoCleanly) {
    Subprocess demo({kHost, "demo", "--interval", "50", "--monitor", "--plugin", kPlugin});
    // Without a count it goes on: a second code comes before Ctrl-C.
    ASSERT_TRUE(demo.waitForOutput("received  \"", 5s, 2));
    demo.interrupt();
    Finished done = demo.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_NE(done.out.find(" received, "), std::string::npos) << done.out;
    EXPECT_NE(done.out.find("  tx     \"\\x02OK "), std::string::npos) << done.out;
}

class Session : public ::testing::Test {
protected:
    void SetUp() override {
        std::string error;
        line_ = PtyPair::open(error);
        ASSERT_NE(line_, nullptr) << error;
        device_ = std::make_unique<SimulatedDevice>(line_->master(), DeviceOptions{});
    }
    /// xtok-host run on `port`, else on the simulated device's line.
    std::vector<std::string> run(std::vector<std::string> extra, const std::string& port = "") {
        std::vector<std::string> arguments = {
            kHost,      "run",   "--config", configFor(port.empty() ? line_->slavePath() : port),
            "--plugin", kPlugin, "--state",  dir_.file("retained.sqlite3")};
        arguments.insert(arguments.end(), extra.begin(), extra.end());
        return arguments;
    }

    host::test::TempDir dir_;
    std::unique_ptr<PtyPair> line_;
    std::unique_ptr<SimulatedDevice> device_;
};

// A run over the simulated device as a user scripts it: its options, the
// script (" || " between runs on the same state file; "<" first: standard
// input), and what standard output and standard error hold, in order.
struct Script {
    const char* name;
    std::vector<std::string> options;
    std::string script;
    std::vector<std::string> out, err;
    int status;
};

void PrintTo(const Script& row, std::ostream* out) {
    *out << row.name;
}

// Bytes 04 to FF, as a typed string escapes them and as watch lists them.
std::string highBytes(bool typed) {
    std::string text;
    char hex[8];
    for (int byte = 4; byte < 256; ++byte) {
        std::snprintf(hex, sizeof hex, typed ? "\\x%02X" : " %02X", byte);
        text += hex;
    }
    return text;
}

const Script kScripts[] = {
    {"ReadsWritesAndWatches",
     {},
     "tag write 0?tx_token?string-16 HELLO; watch --count 1 --timeout 10; "
     "tag read 0?tokens_available?unsignedInt; tag write 0?SP_Baud?unsignedInt 19200; "
     "tag read 0?SP_Baud?unsignedInt; get_stat; settings; help",
     {"ok\n", "  \"ACK HELLO\"  41 43 4B 20 48 45 4C 4C 4F  (9 bytes)\n0\nok\n19200\nConnected\n",
      "setting            key               active      from           staged      retained\n",
      "Commands of xtok-host", "connect cmd - set connect ON or OFF\n"},
     {},
     0},
    // Every byte value from 04 up crosses the line both ways unchanged: the
    // terminal driver's conversions are off.
    {"EveryByteCrossesTheLine",
     {},
     "tag write 0?tx_token?string-300 " + highBytes(true) + "; watch --count 1 --timeout 10",
     {"41 43 4B 20" + highBytes(false) + "  (256 bytes)\n"},
     {},
     0},
    {"RetainedSettingsSurviveARestart",
     {},
     "tag write 0?SP_Baud?unsignedInt 19200; tag write 0?SP_RxSuffix?string-8 0D0A; "
     "tag write 0?SP_Done?boolean 1 || tag read 0?SP_Baud?unsignedInt; "
     "tag read 0?SP_RxSuffix?string-8",
     {"ok\nok\nok\n19200\n\"0D0A\"\n"},
     {},
     0},
    // The console answers most failures in its reply text, with a "known
    // command" result: those count as failures all the same.
    {"AScriptOnStandardInputGoesOnAfterAFailure",
     {},
     "<get_stat\n# a comment\ntag read 0?nope?int\n\nread 0?SP_Baud?unsignedInt\n"
     "write 0?SP_Baud?unsignedInt 80\nset_hexToken maybe\nconnect OFF\nget_stat\nquit\nget_stat\n",
     {"Connected\n80250000\nOK\nDisconnected\n"},
     {"error: bad tag address '0?nope?int': Can't access memory type\n",
      "error: write: incorrect length of data to write\nerror: set_hexToken: wrong value\n"},
     1},
    {"JsonGivesOneObjectPerResult",
     {"--json"},
     "tag write 0?tx_token?string-16 \"A\\x01\"; watch --count 1 --timeout 10; settings; "
     "tag read 0?nope?int; help datatypes; help memorytypes",
     {"{\"command\":\"tag write", "\"token\":\"ACK A\\u0001\",\"length\":6",
      "\"ok\":true,\"tokens\":1}\n", "\"SP_Baud\":{\"key\":\"baudrate\",\"active\":9600",
      "\"ok\":false,\"error\":\"bad tag address", "\"datatypes\":[\"boolean\",\"byte\"",
      "\"string-N\",\"binary-N\",\"time\"", "{\"name\":\"SP_Done\",\"type\":\"boolean\""},
     {},
     1},
    // The console's setters and the SP_ writes pass through xtok-host, which
    // follows them; what it says is active is what the plug-in then receives
    // by. SP_Done returns a console change to the starting value; a pass still
    // hunting the console's prefix would drop the answer: a close ends it.
    {"SettingsTellWhereEachActiveValueCameFrom",
     {"--json"},
     "tag write 0?SP_Gap?unsignedInt 70; tag write 0?SP_Done?boolean 1 || set_rxPrefix 05; "
     "set_rxGap 2a; tag write 0?SP_HexTokens?boolean 0; "
     "tag write 0?SP_TokenQueueSize?unsignedInt 50; settings; tag write 0?SP_Done?boolean 1; "
     "settings; connect OFF; connect ON; tag write 0?tx_token?string-8 HI; "
     "watch --count 1 --timeout 10",
     {"\"SP_Baud\":{\"key\":\"baudrate\",\"active\":9600,\"source\":\"configuration\"",
      "\"SP_RxPrefix\":{\"key\":\"rx_prefix\",\"active\":\"05\",\"source\":\"console\"",
      "\"SP_Gap\":{\"key\":\"gap\",\"active\":2,\"source\":\"console\","
      "\"staged\":null,\"retained\":70}",
      "\"hex_tokens\",\"active\":false,\"source\":\"default\",\"staged\":false",
      "\"SP_TokenQueueSize\":{\"key\":\"token_queue_size\",\"active\":100,"
      "\"source\":\"default\",\"staged\":50,\"retained\":null}",
      "\"SP_RxPrefix\":{\"key\":\"rx_prefix\",\"active\":\"02\",\"source\":\"configuration\"",
      "\"SP_Gap\":{\"key\":\"gap\",\"active\":70,\"source\":\"retained file\"",
      "\"SP_TokenQueueSize\":{\"key\":\"token_queue_size\",\"active\":50,"
      "\"source\":\"SP_ write\",\"staged\":50,\"retained\":50}",
      "\"token\":\"ACK HI\""},
     {},
     0},
    // Each option of the short form sets what its key in the configuration
    // text would, over the text's own.
    {"EachOptionSetsItsKey",
     {"--json",       "--baud",      "19200",
      "--stop",       "2",           "--mode",
      "RS-422",       "--prefix",    "1B",
      "--suffix",     "0d0a",        "--tx-prefix",
      "05",           "--tx-suffix", "06",
      "--gap",        "40",          "--hex-tokens",
      "--queue-size", "7",           "--no-auto-connect"},
     "settings; get_stat",
     {",19200,none,8,2,RS-422\"", "\"rx_prefix\",\"active\":\"1B\",\"source\":\"configuration\"",
      "\"rx_suffix\",\"active\":\"0d0a\"", "\"gap\",\"active\":40",
      "\"tx_prefix\",\"active\":\"05\"", "\"tx_suffix\",\"active\":\"06\"",
      "\"hex_tokens\",\"active\":true", "\"token_queue_size\",\"active\":7", "Disconnected"},
     {},
     0},
};

class Scripts : public Session, public ::testing::WithParamInterface<Script> {};

TEST_P(Scripts, ShowWhatTheyShould) {
    const Script& script = GetParam();
    Finished done;
    std::string out, err, runs = script.script;
    for (std::size_t at = 0, end = 0; end != std::string::npos; at = end + 4) {
        end = runs.find(" || ", at);
        const std::string steps = runs.substr(at, end - at);
        std::vector<std::string> options = script.options;
        if (steps[0] != '<') {
            options.insert(options.end(), {"--exec", steps});
        }
        done = runTool(run(options), steps[0] == '<' ? steps.substr(1) : "");
        out += done.out;
        err += done.err;
    }
    EXPECT_EQ(done.status, script.status) << err;
    for (const auto& [text, parts] : {std::pair{out, script.out}, {err, script.err}}) {
        std::size_t at = 0;
        for (const std::string& part : parts) {
            at = text.find(part, at);
            ASSERT_NE(at, std::string::npos) << part << "\nnot in order in\n" << text;
        }
    }
    EXPECT_TRUE(script.err.size() || err.empty()) << err;
}

INSTANTIATE_TEST_SUITE_P(Run, Scripts, ::testing::ValuesIn(kScripts),
                         [](const auto& info) { return std::string(info.param.name); });

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

// While another program holds the state file, what must be retained fails
// and says why; what retains nothing goes on as usual.
TEST_F(Session, ALockedStateFileFailsOnlyWhatItMustKeep) {
    std::string error;
    auto holder = host::PermanentStorage::open(dir_.file("retained.sqlite3"), error);
    ASSERT_TRUE(holder && holder->begin(error) && holder->WriteInt("XTOK", "gap", 1)) << error;
    Finished done = runTool(run({"--exec",
                                 "get_stat; tag write 0?SP_Gap?unsignedInt 5; "
                                 "tag write 0?SP_Done?boolean 1; tag read 0?SP_Gap?unsignedInt; "
                                 "reset-retained"}));
    EXPECT_EQ(done.status, 1);
    EXPECT_EQ(done.out, "Connected\nok\n5\n");
    EXPECT_EQ(done.err,
              "error: 0?SP_Done?boolean written, but its settings are not retained: database "
              "is locked\nerror: cannot clear the settings retained in " +
                  dir_.file("retained.sqlite3") + " for instance XTOK: database is locked\n");
}

// Line settings retained in the state file that the port refuses do not
// lock the operator out: the run starts disconnected and says which they are
// and how to clear them; reset-retained and --reset-retained clear them.
TEST_F(Session, RefusedRetainedSettingsStartDisconnectedUntilCleared) {
    const std::string state = dir_.file("retained.sqlite3");
    auto retain = [&] {
        std::string error;
        auto storage = host::PermanentStorage::open(state, error);
        ASSERT_NE(storage, nullptr) << error;
        storage->WriteInt("XTOK", "baud", 14400);  // no terminal has it
        storage->WriteInt("XTOK", "token_queue_size", 0);
    };
    const std::string cleared = "cleared the settings retained in " + state +
                                " for instance XTOK: baud=14400 token_queue_size=0";
    // A port name longer than any fixed buffer for the settings text.
    const std::string longPort = dir_.file(std::string(200, 'd')) + "/" + std::string(100, 'p');
    ASSERT_EQ(mkdir(dir_.file(std::string(200, 'd')).c_str(), 0700), 0);
    ASSERT_EQ(symlink(line_->slavePath().c_str(), longPort.c_str()), 0);
    retain();
    Finished done = runTool(
        run({"--exec", "get_stat; reset-retained; get_stat; tag read 0?SP_Baud?unsignedInt"},
            longPort));
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_EQ(done.out, "Disconnected\n" + cleared + "; the plug-in started anew on " + longPort +
                            ",9600,none,8,1,RS-232\nConnected\n9600\n");
    const std::string reported[] = {
        "baud 14400 (configured 9600)", "kept in " + state + " for instance XTOK",
        "started disconnected. reset-retained", "the retained token_queue_size 0"};
    for (const std::string& said : reported) {
        EXPECT_NE(done.err.find(said), std::string::npos) << said << " in " << done.err;
    }
    retain();
    done = runTool(run({"--reset-retained", "--exec", "get_stat"}));
    EXPECT_EQ(done.out, "Connected\n");
    EXPECT_EQ(done.err, "xtok-host: " + cleared + "\n");
}

/// A pseudo-terminal as a person's terminal: cooked, as a shell leaves it.
class Terminal {
public:
    Terminal() {
        master_ = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
        if (master_ >= 0 && grantpt(master_) == 0 && unlockpt(master_) == 0) {
            slave_ = ptsname(master_);
            held_ = open(slave_.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
        }
    }
    ~Terminal() {
        close(held_);
        close(master_);
    }
    const std::string& slave() const { return slave_; }
    std::string settings() const {
        termios t{};
        if (tcgetattr(held_, &t) != 0) {
            return "none";
        }
        char text[128];  // field by field, so that a failure shows which differ
        std::snprintf(text, sizeof text, "iflag %o oflag %o cflag %o lflag %o speed %u/%u cc",
                      t.c_iflag, t.c_oflag, t.c_cflag, t.c_lflag, cfgetispeed(&t), cfgetospeed(&t));
        std::string shown = text;
        for (cc_t c : t.c_cc) {
            shown += " " + std::to_string(c);
        }
        return shown;
    }
    bool type(const std::string& text) {
        return write(master_, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    }

private:
    int master_ = -1;
    int held_ = -1;
    std::string slave_;
};

struct TerminalCase {
    const char* what;
    bool portOnTerminal;      // the configured port is /dev/tty, the run's own terminal
    const char* script;       // --exec, or null for a session typed at the prompt
    const char* runningWhen;  // the output that shows it runs
    bool sigterm;             // ended by SIGTERM, else by its script or a typed quit
    int status;
};

const TerminalCase kTerminalCases[] = {
    {"a script on the terminal's port", true, "get_stat", nullptr, false, 0},
    {"a failing script on the terminal's port", true, "tag read 0?x?int", nullptr, false, 1},
    {"SIGTERM in a watch on the terminal's port", true, "get_stat; watch", "Connected", true, 0},
    {"quit typed at the prompt", false, nullptr, "xtok> ", false, 0},
    {"SIGTERM at the prompt", false, nullptr, "xtok> ", true, 0},
};

// However a run ends, the terminal it was started on is left as it was:
// readline's settings and those of a port on the terminal itself are undone.
TEST_F(Session, TheTerminalIsLeftAsItWasHoweverTheRunEnds) {
    for (const TerminalCase& c : kTerminalCases) {
        Terminal terminal;
        const std::string before = terminal.settings();
        std::vector<std::string> arguments = run({}, c.portOnTerminal ? "com1" : "");
        if (c.portOnTerminal) {
            arguments.insert(arguments.end(), {"--map", "com1=/dev/tty"});
        }
        if (c.script) {
            arguments.insert(arguments.end(), {"--exec", c.script});
        }
        Subprocess session(arguments, "", false, terminal.slave());
        if (c.runningWhen) {
            ASSERT_TRUE(session.waitForOutput(c.runningWhen, 10s)) << c.what;
        }
        if (c.sigterm) {
            kill(session.pid(), SIGTERM);
        } else if (!c.script) {
            ASSERT_TRUE(terminal.type("quit\n"));
        }
        Finished done = session.finish(10s);
        EXPECT_EQ(done.status, c.status) << c.what << ": " << done.err;
        EXPECT_EQ(terminal.settings(), before) << c.what;
    }
}

// At the prompt the monitor's lines come as they happen, not when a line is
// typed; SP_Done empties xtok-host's copy of the queue with the plug-in's. A
// reset-retained after the device went away starts the plug-in anew,
// disconnected, and the session goes on.
TEST_F(Session, ThePromptShowsMonitorLinesUntypedAndOutlivesALostDevice) {
    const std::string link = dir_.file("ttyLINK");
    ASSERT_EQ(symlink(line_->slavePath().c_str(), link.c_str()), 0);
    Terminal terminal;
    Subprocess session(run({}, link), "", false, terminal.slave());
    ASSERT_TRUE(session.waitForOutput("xtok> ", 10s));
    ASSERT_TRUE(terminal.type("monitor on\n"));
    ASSERT_TRUE(session.waitForOutput("monitor on", 5s));
    device_->sendRaw("\2Z\3");
    EXPECT_TRUE(session.waitForOutput("token  suffix  \"Z\"", 5s));
    // SP_Done empties the queue: the next token is watched whole, not as "Z".
    ASSERT_TRUE(terminal.type("tag write 0?SP_Done?boolean 1\n"));
    ASSERT_TRUE(session.waitForOutput("ok\n", 5s));
    device_->sendRaw(std::string("\2B\0C\3", 5));
    ASSERT_TRUE(terminal.type("watch --count 1 --timeout 5\n"));
    // Shown whole twice: by the monitor and by watch.
    EXPECT_TRUE(session.waitForOutput("\"B\\x00C\"  42 00 43  (3 bytes)\n", 5s, 2));
    ASSERT_EQ(unlink(link.c_str()), 0);
    ASSERT_TRUE(terminal.type("reset-retained\nget_stat\n"));
    EXPECT_TRUE(session.waitForOutput("Disconnected", 5s));
    ASSERT_TRUE(terminal.type("quit\n"));
    Finished done = session.finish(10s);
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_NE(done.out.find("; the plug-in started anew, disconnected ("), std::string::npos)
        << done.out;
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
    // Every event but the raw bytes, without its time.
    const std::string device = line_->slavePath();
    EXPECT_EQ(
        std::regex_replace(done.out, std::regex(",\"time\":\"[^\"]*\"|.*\"rx\".*\n"), ""),
        "{\"event\":\"link\",\"link\":\"opened\",\"device\":\"" + device +
            "\"}\n{\"event\":\"link\",\"link\":\"settings applied\",\"device\":\"" + device +
            "\",\"settings\":\"9600,none,8,1,RS-232\"}\n{\"event\":\"token\",\"end\":\"suffix\","
            "\"hex\":\"00\",\"text\":\"\\u0000\",\"length\":1}\n{\"event\":\"token\",\"end\":"
            "\"suffix\",\"hex\":\"5A\",\"text\":\"Z\",\"length\":1}\n{\"event\":\"queue\","
            "\"limit\":1,\"droppedSoFar\":1}\n");
    std::ifstream log(dir_.file("line.log"));
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(log), {}), done.out);
}

// A device that goes away and comes back at the same path: the monitor says
// so, reception goes on, and info tells the line's state.
TEST_F(Session, ALostDeviceIsReopenedWhenItComesBack) {
    const std::string link = dir_.file("ttyLINK");
    ASSERT_EQ(symlink(line_->slavePath().c_str(), link.c_str()), 0);
    Subprocess session(
        run({"--reconnect", "--json", "--exec", "monitor on; watch --count 1 --timeout 20; info"},
            link));
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
    for (const char* line :
         {"  port              list of string    default com1    mandatory  16 choices: com1, "
          "com2, com3, com4 ... com16",
          "  rx_prefix         string            -               optional",
          "  connect            boolean      read/write  Connect"}) {
        EXPECT_NE(std::find(lines.begin(), lines.end(), line), lines.end()) << line;
    }

    Finished xml = runTool({kHost, "describe", "--xml", kPlugin});
    EXPECT_EQ(xml.status, 0) << xml.err;
    EXPECT_EQ(xml.out.rfind("<?xml", 0), 0u);
    EXPECT_EQ(countOf(xml.out, "<memtype "), 19);
}

TEST(Cli, PortsListsAsJson) {
    Finished ports = runTool({kHost, "ports", "--json"});
    EXPECT_EQ(ports.status, 0);
    EXPECT_EQ(ports.out.rfind("{\"ok\":true,\"ports\":[", 0), 0u) << ports.out;
}

TEST(Cli, EveryCommandTellsItsVersionAndThePluginsOwn) {
    for (const char* command : {"demo", "run", "describe", "ports", "completion"}) {
        Finished done = runTool({kHost, command, "--version"});
        EXPECT_EQ(done.status, 0) << command;
        EXPECT_EQ(done.out, "xtok-host " XTOK_VERSION "\nplug-in XTOK (Xtokline) version 106: " +
                                kPlugin + "\n");
    }
}

TEST(Cli, EveryConfigurationFaultIsToldAtOnceBeforeThePluginStarts) {
    Finished done = runTool({kHost, "run", "--plugin", kPlugin, "--config",
                             "CfgVer=1 model=1 port=/dev/null baudrat=9600 parity=EVEN", "--bits",
                             "9", "--suffix", "0d0", "--queue-size", "0"});
    EXPECT_EQ(done.status, 2);
    EXPECT_EQ(linesOf(done.err),
              (std::vector<std::string>{
                  "xtok-host: unknown key 'baudrat'; did you mean 'baudrate'?",
                  "xtok-host: parity 'EVEN' is not one of none, even, odd",
                  "xtok-host: rx_suffix '0d0' is not hex: pairs of 0-9 and A-F, or none",
                  "xtok-host: token_queue_size '0' is out of range 1 to 10000",
                  "xtok-host: missing mandatory key 'baudrate'",
                  "xtok-host: missing mandatory key 'stopbits'",
                  "xtok-host: missing mandatory key 'mode'",
                  "xtok-host: the host cannot set this line: 9 data bits are not valid"}));
}

// Past twenty faults the rest are counted, not told one by one.
// Unknown keys and the five mandatory keys they leave missing.
TEST(Cli, ManyFaultsEndInACount) {
    for (const auto& [keys, count] :
         {std::pair{16, "and 1 fault more"}, {25, "and 10 faults more"}}) {
        std::string config = "CfgVer=1 model=1 port=/dev/null";
        for (int i = 0; i < keys; ++i) {
            config += " key" + std::to_string(i) + "=1";
        }
        Finished done = runTool({kHost, "run", "--plugin", kPlugin, "--config", config});
        EXPECT_EQ(linesOf(done.err).size(), 21u) << done.err;
        EXPECT_EQ(linesOf(done.err).back(), "xtok-host: " + std::string(count)) << done.err;
    }
}

// Every bad input: one line on standard error (under --json one object on
// standard output), its reason, the right status (0 for a value that only
// earns a warning).
// In the arguments, {line} is a free pseudo-terminal, {busy} one that another
// program holds, {locked} a file the user may not open, {dir} a scratch
// directory (with big.cfg, a file past 1 MiB; mib.cfg, one of 1 MiB; zero.cfg, one with a zero
// byte; fifo, a FIFO), {text} a file that is no plug-in. The state file
// retains parity even.
struct BadInput {
    const char* what;
    const char* arguments;  ///< separated by '|'; {np} is kNoPort
    const char* reason;
    int status;
    bool asNobody = false;
    bool json = false;  ///< told as one JSON object on standard output instead
};

const std::string kNoPort =
    "CfgVer=1 model=1 baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232";

const BadInput kBadInputs[] = {
    {"missing device", "run|--config|{np} port={dir}/ttyNONE", "No such file", 1},
    {"unknown port name", "run|--config|{np} port=com17", "unknown port name", 2},
    {"busy port", "run|--config|{np} port={busy}", "in use by another program", 1},
    {"port that is no serial device", "run|--config|{np} port={text}", "not a serial device", 1},
    {"no permission", "run|--config|{np} port={locked}", "Permission denied", 1, true},
    {"no port in the configuration", "run|--config|{np}", "missing mandatory key 'port'", 2},
    {"no device", "run", "name the device", 2},
    {"bad parity", "run|{line}|--parity|EVEN", "parity 'EVEN' is not one of none, even, odd", 2},
    {"misspelled key", "run|--config|{np} port={line} baudrat=9600",
     "unknown key 'baudrat'; did you mean 'baudrate'?", 2},
    {"part of a key", "run|--config|{np} port={line} suffix=03", "'rx_suffix'?", 2},
    {"too far from any key", "run|--config|{np} port={line} tokxn_qxexe_sxze=1",
     "unknown key 'tokxn_qxexe_sxze'\n", 2},
    {"misspelled option", "run|{line}|--baudrat|9600",
     "unknown option '--baudrat'; did you mean '--baudrate'?", 2},
    {"blank in a value", "run|{line}|--prefix|02 gap=9", "cannot be written", 2},
    {"no configuration at all", "run|--config|hello", "unknown format", 2},
    {"word without a value", "run|--config|{np} port={line} foo", "'foo' is no key=value", 2},
    {"key that only starts like a node", "run|--config|{np} port={line} Nodes=1",
     "unknown key 'Nodes'", 2},
    // Refused whatever is retained: the run does not start disconnected.
    {"configured baud rate the port lacks", "run|{line}|--parity|none|--baud|14400",
     "cannot start: {line}: baud rate 14400 is not supported", 1},
    {"bad tag address", "run|--config|{np} port={line}|--exec|tag read 0?x?int",
     "bad tag address '0?x?int'", 1},
    {"bad typed value", "run|--config|{np} port={line}|--exec|tag write 0?SP_Baud?unsignedInt fast",
     "'fast' is not a number", 1},
    {"text as plug-in", "run|--plugin|{text}|{line}", "no description block", 1},
    {"text described", "describe|{text}", "no description block", 1},
    {"missing plug-in", "describe|{dir}/none.so", "No such file", 1},
    {"unknown command", "bogus", "unknown command 'bogus'", 2},
    {"unknown option", "demo|--colour", "--colour", 2},
    {"count of zero", "demo|--count|0", "whole number above 0", 2},
    {"interval below 20 ms", "demo|--count|19|--interval|19", "--interval", 2},
    {"watch count of zero", "run|--config|{np} port={line}|--exec|watch --count 0", "--count", 1},
    {"bad port map", "run|{line}|--map|com99=/dev/x", "comN=DEVICE", 2},
    {"configuration file missing", "run|--config|@{dir}/none.cfg", "cannot read", 2},
    {"queue size below the editor's range",
     "run|--config|{np} port={line}|--exec|tag write 0?SP_TokenQueueSize?unsignedInt 0",
     "warning: SP_TokenQueueSize 0 lies outside the project editor's range 1 to 10000", 0},
    {"queue size above the editor's range",
     "run|--config|{np} port={line}|--exec|tag write 0?SP_TokenQueueSize?unsignedInt 10001; "
     "tag write 0?SP_Gap?unsignedInt 5",
     "SP_TokenQueueSize 10001 lies outside", 0},  // told once, not at every write
    {"configuration file too large", "run|--config|@{dir}/big.cfg", "at most 1 MiB", 2},
    {"configuration file of 1 MiB, no more", "run|--config|@{dir}/mib.cfg", "unknown format", 2},
    {"configuration file with a zero byte", "run|--config|@{dir}/zero.cfg", "zero byte", 2},
    {"configuration FIFO", "run|--config|@{dir}/fifo", "is a FIFO", 2},
    {"configuration directory", "run|--config|@{dir}", "is a directory", 2},
    {"configuration device", "run|--config|@/dev/zero", "is a device", 2},
    {"state file that is no database", "run|{line}|--state|{text}", "not a database", 1},
    {"state file inside a file", "run|{line}|--state|{text}/retained", "cannot create directory",
     1},
    {"log file cannot be opened", "monitor|--config|{np} port={line}|--log|{dir}/none/line.log",
     "cannot open the log", 2},
    {"monitor count of zero", "monitor|--count|0|--config|{np}", "above 0", 2},
    {"unknown command under --json", "bogus|--json", "{\"ok\":false,\"error\":\"unknown", 2, false,
     true},
    {"unknown option under --json", "ports|--json|--all", "not expected: --all", 2, false, true},
    {"two faults under --json", "run|--json|--baudrat=1", "\"errors\":[\"unknown option", 2, false,
     true},
    {"no device under --json", "run|--json|/dev/null/tty|--parity|none", "cannot open", 1, false,
     true},
    {"monitor switched to nonsense", "run|--config|{np} port={line}|--exec|monitor maybe",
     "use monitor on", 1},
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
        std::ofstream(dir_.file("big.cfg")) << std::string((1 << 20) + 1, ' ');
        std::ofstream(dir_.file("mib.cfg")) << std::string(1 << 20, ' ');
        std::ofstream(dir_.file("zero.cfg")) << kNoPort + std::string(1, '\0') + " port=com1";
        ASSERT_EQ(mkfifo(dir_.file("fifo").c_str(), 0600), 0);
        auto storage = host::PermanentStorage::open(dir_.file("retained.sqlite3"), error);
        ASSERT_TRUE(storage && storage->WriteInt("XTOK", "parity", 1)) << error;
        // The child may run as nobody: it must reach the directory and its
        // state file, but not the locked device.
        chmod(dir_.file("").c_str(), 0777);
        chmod(dir_.file("locked").c_str(), 0);
    }
    void TearDown() override { close(holder_); }

    /// `text` with the placeholders filled in.
    std::string substituted(std::string text) const {
        const std::map<std::string, std::string> values = {{"{np}", kNoPort},
                                                           {"{line}", line_->slavePath()},
                                                           {"{busy}", busy_->slavePath()},
                                                           {"{locked}", dir_.file("locked")},
                                                           {"{text}", dir_.file("notes.txt")},
                                                           {"{dir}", dir_.file("")}};
        for (const auto& [name, value] : values) {
            for (std::size_t at; (at = text.find(name)) != std::string::npos;) {
                text.replace(at, name.size(), value);
            }
        }
        return text;
    }

    std::vector<std::string> arguments(const BadInput& input) {
        std::vector<std::string> result = {kHost};
        const std::string all = input.arguments;
        for (std::size_t at = 0, bar = 0; bar != std::string::npos; at = bar + 1) {
            bar = all.find('|', at);
            result.push_back(substituted(all.substr(at, bar - at)));
        }
        if (result[1] == "run" || result[1] == "monitor") {
            // A state file of its own for a child run as nobody: root's is not
            // for it to write.
            if (std::find(result.begin(), result.end(), "--state") == result.end()) {
                result.insert(
                    result.end(),
                    {"--state", dir_.file(input.asNobody ? "nobody.sqlite3" : "retained.sqlite3")});
            }
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
        const std::string& told = input.json ? done.out : done.err;
        EXPECT_EQ(linesOf(told).size(), 1u) << input.what << ": " << done.err << done.out;
        EXPECT_NE(told.find(substituted(input.reason)), std::string::npos) << input.what << told;
        EXPECT_TRUE(!input.json || done.err.empty()) << input.what << ": " << done.err;
    }
}

}  // namespace
}  // namespace xtok::tools::test
