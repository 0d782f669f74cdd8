// A token protocol made by the plug-in's factory over the test host, driven
// by scripts of panel steps whose results read as one line of text.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

#include "module/interface_factory.h"
#include "tests/support/fake_host.h"
#include "tests/support/module_session.h"

namespace xtok::test {

/// The mandatory keys; tests append what they need.
inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

/// Polls `condition` until it holds or five seconds passed; true when it held.
bool eventually(const std::function<bool()>& condition);

class ProtocolFixture : public ::testing::Test {
public:
    void SetUp() override;
    void TearDown() override;
    void create();
    /// Stops and destroys the protocol, as a runtime does.
    void destroy();
    bool configure(const std::string& extra = "") {
        return protocol->Configure((kBaseConfig + " " + extra).c_str());
    }
    /// Configures with the base keys and `extra`, then starts.
    bool start(const std::string& extra = "") { return configure(extra) && protocol->Start(); }
    std::string error() const { return protocol->GetLastErrorText(); }
    int32_t code() const { return protocol->GetLastErrorCode(); }

    /// A tag made once per address, kept for the test.
    ITag* tag(const std::string& uri);
    /// A memory type read through a tag: "TYPE" takes the type's natural data
    /// type, "TYPE?DATATYPE" any other. Texts read as text, unsignedInt as a
    /// signed number, bytes and booleans as numbers, anything else as hex;
    /// "!" and the last error when the read fails.
    std::string read(const std::string& what);
    /// A typed write, values as `read` shows them;
    /// "" when it succeeds, else "!" and the last error.
    std::string write(const std::string& what, const std::string& value);
    /// The console's reply up to its first zero, "!" before it when it
    /// answered false.
    std::string command(const std::string& line);

    /// Plays hex byte pairs on the line, '|' standing for a silence (one read
    /// that times out), and a silence at the end; returns once the receive
    /// task has read all of it.
    void play(const std::string& script);
    /// Waits until the receive task is in a pass begun after this call: a
    /// pass takes the framing and the gap when it begins.
    void settle();
    /// Every queued token, oldest first, each read through rx_token and then
    /// acknowledged; the queue is empty afterwards.
    std::vector<std::string> takeTokens();

    /// Runs `script`, steps separated by ';', and returns what the steps that
    /// show something showed, separated by " | ". Steps that act show
    /// nothing when they succeed and "!" with the last error when they fail:
    ///   start KEYS      configure the base keys and KEYS, then start
    ///   conf KEYS       configure only;  cfg TEXT: a whole configuration
    ///   go, stop        Start, Stop;  new: a fresh protocol, same instance
    ///   inst NAME       the instance name
    ///   w WHAT VALUE    write a tag (see write)
    ///   play SCRIPT     bytes on the line (see play);  settle
    ///   fault F, heal F a fault of the host on or off: open, configure,
    ///                   write (the port), store, load (the storage), basic
    ///                   (storage without its extension), task, stop
    ///   feed HEX, silence, error, hangup: the line's next reads; drain
    ///   store KEY TEXT  a retained value in the instance's section
    /// Steps that show:
    ///   r WHAT          a tag's value (see read)
    ///   cmd LINE        the console's reply (see command)
    ///   tokens          every queued token, taken as the panel takes them
    ///   line            the serial settings text
    ///   sent            frames written since the last "sent", as hex
    ///   cfgd            settings applied since the last "cfgd"
    ///   stored KEY      a retained value ("-" when none)
    ///   err             the last error's code and text
    ///   gap             the time-out of the latest read
    ///   opens           ports opened, closed
    ///   tasks           task calls since the last "tasks"
    std::string run(const std::string& script);

    FakeHost host;
    IProtocol7* protocol = nullptr;
    /// Set by "inst"; the protocol's own name when empty.
    std::string instance;

private:
    std::string step(const std::string& verb, const std::string& rest);
    void setFault(std::atomic<bool>* fault, bool on);
    std::string section() const { return instance.empty() ? "XTOK" : instance; }

    std::unique_ptr<ModuleSession> session_;
    std::map<std::string, ITag*> tags_;
    std::size_t sentSeen_ = 0, configuredSeen_ = 0, tasksSeen_ = 0;
};

/// One scripted scenario: its name, the script and what it shows.
struct Scenario {
    const char* name;
    const char* script;
    const char* shows;
};

// ctest lists a row by its name rather than its bytes.
inline void PrintTo(const Scenario& row, std::ostream* out) {
    *out << row.name;
}

class Scenarios : public ProtocolFixture, public ::testing::WithParamInterface<Scenario> {};

inline std::string scenarioName(const ::testing::TestParamInfo<Scenario>& info) {
    return info.param.name;
}

}  // namespace xtok::test
