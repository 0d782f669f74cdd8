// The plug-in as a panel runs it: host services, the loaded library, one
// configured and started protocol, and the tags a panel would use.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "host/plugin_loader.h"
#include "host/service_provider.h"
#include "tools/queue_mirror.h"
#include "tools/settings_model.h"
#include "tools/tag_values.h"
#include "xtokline/constants.h"

namespace xtok::tools {

class PluginSession;

struct SessionOptions {
    std::string pluginPath;
    std::string config;
    host::ComMap ports;
    /// Without it the protocol starts from its configuration alone.
    bool permanentStorage = true;
    std::string statePath;     // "" for the host's default file
    std::string instanceName;  // "" for the protocol's own name
    /// Forget the instance's retained settings before the start.
    bool resetRetained = false;
    /// Host notices after a successful start; during it they become part of
    /// the start error instead.
    host::Notice notice = host::printNotice;
    /// Reopen the port's device after a hang-up or failure.
    bool reconnect = false;
    /// Called once the plug-in is loaded, before it is configured and
    /// started: where a line monitor begins in time to see the port open.
    std::function<void(PluginSession&)> beforeStart;
};

/// What the session has to tell beside the results of commands: what a reset
/// cleared, settings a port refused, values outside the project editor's
/// range. Warnings are not failures.
struct SessionMessage {
    bool warning;
    std::string text;
};

/// A tag's value as read.
struct TagValue {
    TagShape shape;
    std::vector<uint8_t> bytes;
};

/// A received token as the panel sees it.
struct Token {
    // The stored form: rx_token gives it up to its first zero byte, the line
    // monitor's copy whole.
    std::string text;
    uint32_t length;  // rx_token_len: the stored form's whole length
    std::chrono::system_clock::time_point arrived;
};

enum class Intake { None, Token, Failed };

class NoticeRelay;

class PluginSession {
public:
    /// Null with one line in `error` when any step fails: the state file, the
    /// plug-in, the configuration, or the port. When the port refuses line
    /// settings retained in the state file, the session starts all the same,
    /// disconnected, and a message says which and how to clear them.
    static std::unique_ptr<PluginSession> start(const SessionOptions& options, std::string& error);
    ~PluginSession();
    PluginSession(const PluginSession&) = delete;
    PluginSession& operator=(const PluginSession&) = delete;

    IProtocol7& protocol() { return *protocol_; }
    /// The protocol's line as GetSerialSettings tells it, whole.
    std::string serialSettings();

    /// A tag by its address, made once and kept. Null with `error` set.
    ITag* tag(const std::string& address, std::string& error);
    bool read(const std::string& address, TagValue& value, std::string& error);
    /// Writes `text`, typed as the address's data type says (tag_values.h).
    bool write(const std::string& address, const std::string& text, std::string& error);

    /// A line for the plug-in's own console. `ok` is false when the console
    /// did not know the command or answered an error.
    std::string command(const std::string& line, bool& ok);

    /// Takes the oldest received token off the queue, if there is one.
    Intake takeToken(Token& token, std::string& error);

    /// The settings as this session has changed them (settings_tracking.cpp).
    const SettingsModel& settings() const { return settings_; }

    /// Forgets the instance's retained settings and starts the plug-in's
    /// protocol anew, so that the configured ones are active. `report` says
    /// what was cleared and how the protocol started. False with `error`
    /// when the settings could not be cleared or the protocol not started.
    bool resetRetained(std::string& report, std::string& error);

    /// The messages since the last call.
    std::vector<SessionMessage> takeMessages();

    /// The receive framing and queue limit in force, for a line monitor.
    FramingSource framingSource();
    /// The queue as the host sees it; acknowledgements made here count.
    QueueMirror& queue() { return queue_; }
    /// `tap` hears the line from now on; it is kept for the session's life.
    void follow(std::shared_ptr<host::LineTap> tap);
    void unfollow();
    /// The latest opening, closing, loss or reconnection of each device.
    std::vector<host::LinkEvent> lineStates();

private:
    PluginSession() = default;
    bool load(const SessionOptions& options, std::string& error);
    /// A new protocol, named; null with `error`.
    IProtocol7* newProtocol(std::string& error);
    bool configureAndStart(std::string& error);
    /// Starts again without opening the port, when the port refused settings
    /// retained in the state file: false when it did not, or `why` had
    /// another cause.
    bool startDisconnected(const std::string& configured, int refusalsBefore,
                           const std::string& why);
    /// Configures again with autoConnect=false and starts.
    bool startWithoutPort();
    bool portTakes(const std::string& port, const LineSettings& line);
    bool clearRetained(std::string& report, std::string& error);
    void say(bool warning, const std::string& text);
    void warnAboutQueueSize(const std::string& address);
    bool readBytes(ITag& tag, std::vector<uint8_t>& bytes, std::string& error);
    std::string lastError();
    struct ErrorRecord {
        int32_t code;
        std::string text;
    };
    ErrorRecord errorRecord();
    /// Why the call that followed `before` failed.
    std::string reasonSince(const ErrorRecord& before);
    /// Runs `call` into the plug-in as one storage transaction: the settings
    /// it retains are kept all together or not at all. "" when they are kept
    /// (or nothing is stored), else why they are not.
    template <class Call>
    std::string retaining(Call call);
    /// Follows a successful write of `address` in the settings model and
    /// the queue (settings_tracking.cpp); `kept` tells whether what it
    /// retains is in the state file.
    void wrote(const std::string& address, bool kept);
    /// The same for a console line the plug-in carried out.
    void commanded(const std::string& line, bool kept);

    struct TagDeleter {
        void operator()(ITag* tag) const;
    };

    std::string config_;
    std::string instanceName_;
    std::vector<SessionMessage> messages_;

    // Declared in the order of building; destroyed the other way round.
    FramingState framing_;
    QueueMirror queue_;
    std::vector<std::shared_ptr<host::LineTap>> taps_;
    std::shared_ptr<NoticeRelay> relay_;
    std::unique_ptr<host::ServiceProvider> host_;
    std::unique_ptr<host::LoadedPlugin> plugin_;
    IProtocol7* protocol_ = nullptr;
    bool started_ = false;
    std::map<std::string, std::unique_ptr<ITag, TagDeleter>> tags_;
    SettingsModel settings_;
};

}  // namespace xtok::tools
