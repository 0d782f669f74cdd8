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
#include "protocol/settings.h"
#include "tools/active_framing.h"
#include "tools/queue_mirror.h"
#include "tools/tag_values.h"

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
    /// Host notices after a successful start; during it they become part of
    /// the start error instead.
    host::Notice notice = host::printNotice;
    /// Reopen the port's device after a hang-up or failure.
    bool reconnect = false;
    /// Called once the plug-in is loaded, before it is configured and
    /// started: where a line monitor begins in time to see the port open.
    std::function<void(PluginSession&)> beforeStart;
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

/// The address that reads a setting's SP_ memory type.
std::string settingAddress(const Setting& setting);

class NoticeRelay;

class PluginSession {
public:
    /// Null with one line in `error` when any step fails: the state file, the
    /// plug-in, the configuration, or the port.
    static std::unique_ptr<PluginSession> start(const SessionOptions& options, std::string& error);
    ~PluginSession();
    PluginSession(const PluginSession&) = delete;
    PluginSession& operator=(const PluginSession&) = delete;

    IProtocol7& protocol() { return *protocol_; }

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
    /// Reads the framing in force, when nothing is staged: at the start and
    /// after SP_Done.
    void readFraming();
    /// What a successful write or console line does to the queue and the
    /// framing.
    void wrote(const std::string& address);
    void commanded(const std::string& line);

    struct TagDeleter {
        void operator()(ITag* tag) const;
    };

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
};

}  // namespace xtok::tools
