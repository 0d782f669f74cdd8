#include "tools/plugin_session.h"

#include "host/permanent_storage.h"

#include <cctype>
#include <mutex>

#include "tools/interrupt.h"

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

/// Holds the host's notices while the session starts, so that the reason a
/// port would not open becomes part of the one error line; passes them on
/// once the session runs.
class NoticeRelay {
public:
    explicit NoticeRelay(host::Notice out) : out_(std::move(out)) {}

    void say(const std::string& text) {
        std::unique_lock<std::mutex> lock(mutex_);
        if (holding_) {
            held_.push_back(text);
            return;
        }
        lock.unlock();
        if (out_) {
            out_(text);
        }
    }
    std::string held() const {
        std::lock_guard<std::mutex> lock(mutex_);
        std::string joined;
        for (const std::string& line : held_) {
            joined += (joined.empty() ? "" : "; ") + line;
        }
        return joined;
    }
    void passOn() {
        std::vector<std::string> held;
        {
            std::lock_guard<std::mutex> lock(mutex_);
            holding_ = false;
            held.swap(held_);
        }
        for (const std::string& line : held) {
            say(line);
        }
    }

private:
    host::Notice out_;
    mutable std::mutex mutex_;
    bool holding_ = true;
    std::vector<std::string> held_;
};

void PluginSession::TagDeleter::operator()(ITag* tag) const {
    tag->Destroy(1);
}

std::unique_ptr<PluginSession> PluginSession::start(const SessionOptions& options,
                                                    std::string& error) {
    std::unique_ptr<PluginSession> session(new PluginSession);
    if (!session->load(options, error)) {
        return nullptr;
    }
    IProtocol7& protocol = *session->protocol_;
    if (!options.instanceName.empty()) {
        protocol.SetInstanceName(options.instanceName.c_str());
    }
    if (!protocol.Configure(options.config.c_str())) {
        error = "bad configuration: " + session->lastError();
        return nullptr;
    }
    bool started = false;
    {
        InterruptsBlocked forTheMainThread;  // the receive task starts here
        started = protocol.Start();
    }
    if (!started) {
        // The host's notice says why the port would not open; the
        // plug-in only knows that it did not.
        std::string why = session->relay_->held();
        error = "cannot start: " + (why.empty() ? session->lastError() : why);
        return nullptr;
    }
    session->relay_->passOn();
    session->settings_.configured(options.config);
    if (host::PermanentStorage* storage = session->host_->permanentStorage()) {
        session->settings_.retainedAtStart(*storage, protocol.GetInstanceName());
    }
    return session;
}

bool PluginSession::load(const SessionOptions& options, std::string& error) {
    relay_ = std::make_shared<NoticeRelay>(options.notice);
    host::HostOptions hostOptions;
    hostOptions.ports = options.ports;
    hostOptions.permanentStorage = options.permanentStorage;
    hostOptions.storagePath = options.statePath;
    hostOptions.notice = [relay = relay_](const std::string& text) { relay->say(text); };
    host_ = host::ServiceProvider::create(hostOptions, error);
    if (!host_) {
        return false;
    }
    plugin_ = host::LoadedPlugin::load(options.pluginPath, *host_, error);
    if (!plugin_) {
        return false;
    }
    protocol_ = plugin_->createProtocol("XTOK", error);
    return protocol_ != nullptr;
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
    } else {
        trackWrite(address, kept.empty());
    }
    if (written && !kept.empty()) {
        error = address + " written, but its " + kept;
    }
    return written && kept.empty();
}

std::string PluginSession::command(const std::string& line, bool& ok) {
    std::vector<char> buffer(kReplySize, '\0');
    bool known = false;
    const std::string kept = retaining(
        [&] { known = protocol_->DoCommand(line.c_str(), buffer.data(), kReplySize - 1); });
    std::string reply(buffer.data());
    std::string word = line.substr(0, line.find(' '));
    if (known && !replyTellsFailure(word, reply)) {
        trackCommand(line, kept.empty());
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
    if (count.bytes.size() < 4 ||
        (count.bytes[0] | count.bytes[1] | count.bytes[2] | count.bytes[3]) == 0) {
        return Intake::None;
    }
    TagValue length;
    TagValue text;
    if (!read(kTokenLength, length, error) || !read(kToken, text, error)) {
        return Intake::Failed;
    }
    token.arrived = std::chrono::system_clock::now();
    token.text = stringValue(text.bytes);
    token.length =
        static_cast<uint32_t>(length.bytes[0] | length.bytes[1] << 8 | length.bytes[2] << 16 |
                              static_cast<uint32_t>(length.bytes[3]) << 24);
    return write(kTokenAck, "1", error) ? Intake::Token : Intake::Failed;
}

}  // namespace xtok::tools
