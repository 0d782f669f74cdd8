#include "tools/plugin_session.h"

#include "host/permanent_storage.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <mutex>

#include "protocol/settings.h"
#include "tools/interrupt.h"
#include "tools/notice_relay.h"
#include "tools/retained_settings.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

// Tags of the token queue, sized for the longest token the protocol keeps
// (1000 bytes, twice that as hex text) with its zero byte.
const char* const kTokensAvailable = "0?tokens_available?unsignedInt";
const char* const kTokenLength = "0?rx_token_len?unsignedInt";
const char* const kToken = "0?rx_token?string-4096";
const char* const kTokenAck = "0?token_ack?boolean";

// Large enough for the console's longest reply, the help texts together.
constexpr int32_t kReplySize = 65536;

bool startsWith(const std::string& text, const char* start) {
    return text.rfind(start, 0) == 0;
}

bool isHexLine(const std::string& reply) {
    for (std::size_t i = 0; i < reply.size(); ++i) {
        bool last = i + 1 == reply.size();
        if (!(last ? reply[i] == '\n' : std::isxdigit(static_cast<unsigned char>(reply[i])))) {
            return false;
        }
    }
    return !reply.empty();
}

/// The memory type of a tag address "node?type?datatype".
/// The consoles report most failures in the reply text alone, with the
/// command still "known"; a script must see them as failures all the same.
bool replyTellsFailure(const std::string& word, const std::string& reply) {
    if (startsWith(reply, "ERROR") || startsWith(reply, "error") || startsWith(reply, "Can't")) {
        return true;
    }
    if (word == "write") {
        return reply != "written ok\n";
    }
    return word == "read" && !isHexLine(reply);
}

}  // namespace

void PluginSession::TagDeleter::operator()(ITag* tag) const {
    tag->Destroy(1);
}

std::unique_ptr<PluginSession> PluginSession::start(const SessionOptions& options,
                                                    std::string& error) {
    std::unique_ptr<PluginSession> session(new PluginSession);
    session->config_ = options.config;
    session->instanceName_ = options.instanceName;
    std::string cleared;
    if (!session->load(options, error) ||
        (options.resetRetained && !session->clearRetained(cleared, error))) {
        return nullptr;
    }
    if (!cleared.empty()) {
        session->say(false, cleared);
    }
    if (options.beforeStart) {
        options.beforeStart(*session);
    }
    if (!session->configureAndStart(error)) {
        return nullptr;
    }
    session->relay_->passOn();
    session->started_ = true;
    return session;
}

bool PluginSession::load(const SessionOptions& options, std::string& error) {
    relay_ = std::make_shared<NoticeRelay>(options.notice);
    host::HostOptions hostOptions;
    hostOptions.ports = options.ports;
    hostOptions.permanentStorage = options.permanentStorage;
    hostOptions.storagePath = options.statePath;
    hostOptions.notice = [relay = relay_](const std::string& text) { relay->say(text); };
    hostOptions.reconnect = options.reconnect;
    host_ = host::ServiceProvider::create(hostOptions, error);
    if (!host_) {
        return false;
    }
    plugin_ = host::LoadedPlugin::load(options.pluginPath, *host_, error);
    return plugin_ && (protocol_ = newProtocol(error)) != nullptr;
}

IProtocol7* PluginSession::newProtocol(std::string& error) {
    IProtocol7* protocol = plugin_->createProtocol("XTOK", error);
    if (protocol && !instanceName_.empty()) {
        protocol->SetInstanceName(instanceName_.c_str());
    }
    return protocol;
}

bool PluginSession::configureAndStart(std::string& error) {
    IProtocol7& protocol = *protocol_;
    if (!protocol.Configure(config_.c_str())) {
        error = "bad configuration: " + lastError();
        return false;
    }
    const std::string configured = serialSettings();
    const int refusals = host_->serialFactory().refusals();
    // What Start makes active, known before the receive task asks for it.
    settings_ = SettingsModel();
    settings_.configured(config_);
    if (host::PermanentStorage* storage = host_->permanentStorage()) {
        settings_.retainedAtStart(*storage, protocol.GetInstanceName());
    }
    framing_.set(settings_.framing());
    bool started = false;
    {
        InterruptsBlocked forTheMainThread;  // the receive task starts here
        started = protocol.Start();
    }
    // The host's notice says why the port would not open; the plug-in only
    // knows that it did not.
    const std::string held = relay_->takeHeld();
    const std::string why = held.empty() ? lastError() : held;
    if (!started && !startDisconnected(configured, refusals, why)) {
        error = "cannot start: " + why;
        return false;
    }
    if (host::PermanentStorage* storage = host_->permanentStorage()) {
        const std::string warning =
            RetainedSettings(*storage, protocol.GetInstanceName()).queueSizeWarning();
        if (!warning.empty()) {
            say(true, warning);
        }
    }
    return true;
}

// Settings retained by SP_Done that the port refuses would otherwise keep the
// operator from ever starting again, and from the SP_ tags that could change
// them.
bool PluginSession::startDisconnected(const std::string& configured, int refusalsBefore,
                                      const std::string& why) {
    host::PermanentStorage* storage = host_->permanentStorage();
    std::string port;
    LineSettings line;
    if (!storage || host_->serialFactory().refusals() == refusalsBefore ||
        !parseSerialSettings(configured, port, line)) {
        return false;
    }
    RetainedSettings retained(*storage, protocol_->GetInstanceName());
    const std::string refused = retained.lineDifferences(line);
    if (refused.empty() || !portTakes(port, line) || !startWithoutPort()) {
        return false;
    }
    say(true, "the port refused line settings that SP_Done retained: " + refused + " [" + why +
                  "]. They are kept " + retained.where() +
                  "; started disconnected. reset-retained, or run --reset-retained, clears "
                  "them; or set others with SP_ tags and SP_Done, then connect ON");
    return true;
}

// Whether the configured settings are the port's to refuse as well: then the
// retained ones are not to blame.
bool PluginSession::portTakes(const std::string& port, const LineSettings& line) {
    host::SerialFactory& ports = host_->serialFactory();
    ISerialPort* opened = ports.Open(port.c_str());
    const bool taken =
        opened && opened->Configure(line.baud, line.parity, line.bits, line.stop, line.mode);
    if (opened) {
        ports.Close(opened);
    }
    relay_->takeHeld();  // said by the start error, if it comes to that
    return taken;
}

// autoConnect=false as the section's first entry wins over any later one.
bool PluginSession::startWithoutPort() {
    const std::string marker = "CfgVer=1";
    const std::size_t section = config_.find(marker);
    if (section == std::string::npos) {
        return false;
    }
    std::string disconnected = config_;
    disconnected.insert(section + marker.size(), " autoConnect=false ");
    InterruptsBlocked forTheMainThread;
    return protocol_->Configure(disconnected.c_str()) && protocol_->Start();
}

bool PluginSession::clearRetained(std::string& report, std::string& error) {
    host::PermanentStorage* storage = host_->permanentStorage();
    if (!storage) {
        error = "no settings are retained in this session";
        return false;
    }
    return RetainedSettings(*storage, protocol_->GetInstanceName()).clear(report, error);
}

bool PluginSession::resetRetained(std::string& report, std::string& error) {
    if (!clearRetained(report, error)) {
        return false;
    }
    // The protocol keeps what it read at its first Start for its whole life:
    // only a new one reads the cleared file. Should none be made, the old
    // one runs on.
    IProtocol7* fresh = newProtocol(error);
    if (!fresh) {
        error = report + "; but " + error;
        return false;
    }
    tags_.clear();
    plugin_->destroyProtocol(protocol_);
    protocol_ = fresh;
    std::string why;
    if (!configureAndStart(why)) {
        // The session goes on: connect ON tries the port again.
        if (!startWithoutPort()) {
            error = report + "; but " + why;
            return false;
        }
        report += "; the plug-in started anew, disconnected (" + why + ")";
        return true;
    }
    report += "; the plug-in started anew on " + serialSettings();
    return true;
}

// The port's name comes from the configuration and may be long; the rest of
// the text is a few numbers and names.
std::string PluginSession::serialSettings() {
    std::vector<char> text(config_.size() + 64, '\0');
    protocol_->GetSerialSettings(text.data(), static_cast<int32_t>(text.size() - 1));
    return text.data();
}

void PluginSession::say(bool warning, const std::string& text) {
    messages_.push_back({warning, text});
}

std::vector<SessionMessage> PluginSession::takeMessages() {
    std::vector<SessionMessage> messages;
    messages.swap(messages_);
    return messages;
}

PluginSession::~PluginSession() {
    tags_.clear();
    plugin_.reset();  // stops and destroys the protocol first
    host_.reset();
}

std::string PluginSession::lastError() {
    const char* text = protocol_->GetLastErrorText();
    return text && *text ? text : "the plug-in gives no reason";
}

PluginSession::ErrorRecord PluginSession::errorRecord() {
    const char* text = protocol_->GetLastErrorText();
    return {protocol_->GetLastErrorCode(), text ? text : ""};
}

// Some refusals (a data bits value of 9, say) leave the error record as it
// was: an unchanged record may be an older failure's, and is said to be.
std::string PluginSession::reasonSince(const ErrorRecord& before) {
    ErrorRecord after = errorRecord();
    if (after.code != before.code || after.text != before.text) {
        return lastError();
    }
    return after.text.empty()
               ? "refused without a reason"
               : "refused; the plug-in's last error, perhaps an older one: " + after.text;
}

ITag* PluginSession::tag(const std::string& address, std::string& error) {
    auto found = tags_.find(address);
    if (found != tags_.end()) {
        return found->second.get();
    }
    // NewTag, not CreateTag: the tag is ours alone, so the console's
    // "deletetags" cannot pull it from under us.
    ITag* made = protocol_->NewTag(address.c_str());
    if (!made) {
        // The plug-in repeats the address; once is enough.
        std::string why = lastError();
        std::string repeated = "Tag URI error: " + address + " - ";
        if (why.rfind(repeated, 0) == 0) {
            why.erase(0, repeated.size());
        }
        error = "bad tag address '" + address + "': " + why;
        return nullptr;
    }
    tags_[address].reset(made);
    return made;
}

bool PluginSession::readBytes(ITag& tag, std::vector<uint8_t>& bytes, std::string& error) {
    int32_t size = tag.GetSize();
    bytes.assign(static_cast<std::size_t>(size > 0 ? size : 0), 0);
    // A tag of size 0 still gets a valid address to write nothing to.
    uint8_t none = 0;
    ErrorRecord before = errorRecord();
    if (!protocol_->ReadTag(&tag, bytes.empty() ? &none : bytes.data())) {
        error = std::string("cannot read ") + tag.GetUri() + ": " + reasonSince(before);
        return false;
    }
    return true;
}

bool PluginSession::read(const std::string& address, TagValue& value, std::string& error) {
    ITag* found = tag(address, error);
    if (!found) {
        return false;
    }
    value.shape = TagShape::of(*found);
    return readBytes(*found, value.bytes, error);
}

template <class Call>
std::string PluginSession::retaining(Call call) {
    host::PermanentStorage* storage = host_->permanentStorage();
    std::string why;
    if (storage && !storage->begin(why)) {
        call();
        return "settings cannot be retained: " + why;
    }
    call();
    return !storage || storage->commit(why) ? "" : "settings are not retained: " + why;
}

bool PluginSession::write(const std::string& address, const std::string& text, std::string& error) {
    ITag* found = tag(address, error);
    std::vector<uint8_t> bytes;
    if (!found || !parseValue(TagShape::of(*found), text, bytes, error)) {
        return false;
    }
    uint8_t none = 0;
    ErrorRecord before = errorRecord();
    bool written = false;
    const std::string kept = retaining(
        [&] { written = protocol_->WriteTag(found, bytes.empty() ? &none : bytes.data()); });
    if (!written) {
        error = "cannot write " + address + ": " + reasonSince(before);
        return false;
    }
    wrote(address, kept.empty());
    if (!kept.empty()) {
        error = address + " written, but its " + kept;
    } else {
        warnAboutQueueSize(address);
    }
    return kept.empty();
}

// The plug-in takes any queue size; the project editor would not have. The
// value is read back as the plug-in holds it, whatever type wrote it.
void PluginSession::warnAboutQueueSize(const std::string& address) {
    const Setting& row = kSettings[kTokenQueueSize];
    std::vector<std::string> fields;
    splitTrimmed(address, '?', fields);
    TagValue value;
    std::string error;
    if (fields.size() < 2 || fields[1] != row.memoryType ||
        !read(std::string("0?") + row.memoryType + "?unsignedInt", value, error) ||
        value.bytes.size() < sizeof(int32_t)) {
        return;
    }
    int32_t size = 0;
    std::memcpy(&size, value.bytes.data(), sizeof size);
    const std::string warning = queueSizeWarning(size, row.memoryType);
    if (!warning.empty()) {
        say(true, warning);
    }
}

std::string PluginSession::command(const std::string& line, bool& ok) {
    std::vector<char> buffer(kReplySize, '\0');
    bool known = false;
    const std::string kept = retaining(
        [&] { known = protocol_->DoCommand(line.c_str(), buffer.data(), kReplySize - 1); });
    std::string reply(buffer.data());
    std::string word = line.substr(0, line.find(' '));
    if (known && !replyTellsFailure(word, reply)) {
        commanded(line, kept.empty());
    }
    if (!kept.empty()) {
        ok = false;
        return reply.empty() ? kept : reply + " (but " + kept + ")";
    }
    if (!known && reply.empty()) {
        ok = false;
        return "unknown command '" + word + "' (help lists them)";
    }
    ok = known && !replyTellsFailure(word, reply);
    return reply;
}

Intake PluginSession::takeToken(Token& token, std::string& error) {
    TagValue count;
    if (!read(kTokensAvailable, count, error)) {
        return Intake::Failed;
    }
    if (wordValue(count.bytes) == 0) {
        return Intake::None;
    }
    TagValue length;
    TagValue text;
    if (!read(kTokenLength, length, error) || !read(kToken, text, error)) {
        return Intake::Failed;
    }
    token.arrived = std::chrono::system_clock::now();
    token.text = stringValue(text.bytes);
    token.length = wordValue(length.bytes);
    // The monitor's copy of the same token, when it followed the line, tells
    // when its last byte arrived, and holds the rest of a raw token that a
    // zero byte cut (rx_token reads up to the first zero byte).
    std::string whole;
    host::WallClock::time_point arrived;
    if (queue_.oldest(whole, arrived)) {
        const bool raw = whole.size() == token.length && whole.c_str() == token.text;
        const bool hex = bytesToHexText(whole.data(), whole.size()) == token.text;
        token.text = raw ? whole : token.text;
        token.arrived = raw || hex ? arrived : token.arrived;
    }
    return write(kTokenAck, "1", error) ? Intake::Token : Intake::Failed;
}

FramingSource PluginSession::framingSource() {
    return [this] { return framing_.get(); };
}

void PluginSession::follow(std::shared_ptr<host::LineTap> tap) {
    TagValue count;
    std::string ignored;
    // Before the start nothing is queued, and no tag is made yet.
    queue_.restart(started_ && read(kTokensAvailable, count, ignored) ? wordValue(count.bytes) : 0);
    if (std::find(taps_.begin(), taps_.end(), tap) == taps_.end()) {
        taps_.push_back(tap);
    }
    host_->serialFactory().attach(tap.get());
}

void PluginSession::unfollow() {
    host_->serialFactory().attach(nullptr);
}

std::vector<host::LinkEvent> PluginSession::lineStates() {
    return host_->serialFactory().lineStates();
}

}  // namespace xtok::tools
