#include "tools/demo.h"

#include <chrono>
#include <ostream>

#include "tools/interrupt.h"
#include "tools/monitor_console.h"
#include "tools/plugin_session.h"
#include "tools/pty_pair.h"
#include "tools/simulated_device.h"
#include "tools/token_view.h"

namespace xtok::tools {

namespace {

using Clock = std::chrono::steady_clock;

// What a reader at a goods-in desk might scan: EAN-13 codes and labels.
const std::vector<std::string> kCodes = {"4006381333931", "9780201379624", "5012345678900",
                                         "LOT 2024-117",  "0614141000036", "SN-00042-B"};

const char* const kAckPrefix = "ACK ";
constexpr std::chrono::milliseconds kPoll{10};
// After the last code, how long the demo waits for the reader to confirm
// the last answer before it stops anyway.
constexpr std::chrono::milliseconds kLastAckPatience{2000};

std::string configFor(const std::string& port) {
    return "CfgVer=1 model=1 port=" + port +
           " baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232"
           " rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03";
}

class Demo {
public:
    Demo(PluginSession& session, const DemoOptions& options, std::ostream& out, std::ostream& err,
         MonitorConsole* monitor)
        : session_(session), options_(options), out_(out), err_(err), monitor_(monitor) {}

    int run() {
        Clock::time_point lastAckDeadline{};
        while (!interruptRequested()) {
            bool finished = options_.count > 0 && codes_ >= options_.count;
            if (finished && (acks_ >= answers_ || Clock::now() >= lastAckDeadline)) {
                break;
            }
            if (monitor_) {
                monitor_->print();
            }
            Token token;
            std::string error;
            Intake intake = session_.takeToken(token, error);
            if (intake == Intake::Failed || (intake == Intake::Token && !take(token, error))) {
                err_ << "xtok-host: " << error << std::endl;
                return 1;
            }
            if (intake == Intake::None) {
                pauseUnlessInterrupted(kPoll);
            }
            if (!finished && options_.count > 0 && codes_ >= options_.count) {
                lastAckDeadline = Clock::now() + kLastAckPatience;
            }
        }
        if (monitor_) {
            monitor_->print();
        }
        out_ << codes_ << (codes_ == 1 ? " code" : " codes") << " received, " << answers_
             << " answered, " << acks_ << " confirmed by the reader" << std::endl;
        return 0;
    }

private:
    bool take(const Token& token, std::string& error) {
        std::string stamp = clockText(token.arrived) + "  ";
        if (token.text.rfind(kAckPrefix, 0) == 0) {
            ++acks_;
            out_ << stamp << "confirmed \"" << token.text.substr(4) << "\"" << std::endl;
            return true;
        }
        ++codes_;
        out_ << stamp << "received  " << tokenLine(token) << std::endl;
        std::string answer = "OK " + token.text;
        if (!session_.write("0?tx_token?string-256", answer, error)) {
            return false;
        }
        ++answers_;
        out_ << clockText(std::chrono::system_clock::now()) << "  answered  \"" << answer << "\""
             << std::endl;
        return true;
    }

    PluginSession& session_;
    const DemoOptions& options_;
    std::ostream& out_;
    std::ostream& err_;
    MonitorConsole* monitor_;
    long codes_ = 0;
    long answers_ = 0;
    long acks_ = 0;
};

}  // namespace

int runDemo(const DemoOptions& options, std::ostream& out, std::ostream& err) {
    std::string error;
    std::unique_ptr<PtyPair> line = PtyPair::open(error);
    if (!line) {
        err << "xtok-host: " << error << std::endl;
        return 1;
    }
    SessionOptions sessionOptions;
    sessionOptions.pluginPath = options.pluginPath;
    sessionOptions.config = configFor(line->slavePath());
    // Settings an operator retained for real lines must not reach the demo,
    // nor the demo's reach them.
    sessionOptions.permanentStorage = false;
    std::unique_ptr<MonitorConsole> monitor;
    if (options.monitor) {
        sessionOptions.beforeStart = [&](PluginSession& loaded) {
            monitor = std::make_unique<MonitorConsole>(loaded, false, out, err);
            monitor->on();
        };
    }
    std::unique_ptr<PluginSession> session = PluginSession::start(sessionOptions, error);
    if (!session) {
        err << "xtok-host: " << error << std::endl;
        return 1;
    }
    DeviceOptions reader;
    reader.codes = kCodes;
    reader.interval = std::chrono::milliseconds(options.intervalMs);
    SimulatedDevice device(line->master(), reader);

    out << "xtok-host demo: a simulated reader on a pseudo-terminal; the plug-in reads "
        << line->slavePath() << "\n"
        << "  9600 8N1, frames 02 ... 03; each code is answered \"OK <code>\", "
           "the reader confirms with \"ACK ...\"\n"
        << "  "
        << (options.count > 0
                ? "stops after " + std::to_string(options.count) + " codes or at Ctrl-C"
                : "Ctrl-C stops")
        << std::endl;
    return Demo(*session, options, out, err, monitor.get()).run();
}

}  // namespace xtok::tools
