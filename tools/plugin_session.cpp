#include "tools/plugin_session.h"

#include "host/permanent_storage.h"

#include <algorithm>
#include <cctype>
#include <mutex>

#include "tools/interrupt.h"
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
std::string memoryTypeOf(const std::string& address) {
    const std::size_t first = address.find('?');
    if (first == std::string::npos) {
        return "";
    }
    return address.substr(first + 1, address.find('?', first + 1) - first - 1);
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

// Texts are sized for any prefix an operator would configure.
std::string settingAddress(const Setting& setting) {
    const char* type = "string-256";
    switch (setting.kind) {
        case SettingKind::Number:
            type = "unsignedInt";
            break;
        case SettingKind::Byte:
            type = "unsignedByte";
            break;
        case SettingKind::Flag:
            type = "boolean";
            break;
        case SettingKind::Hex:
            break;
    }
    return std::string("0?") + setting.memoryType + "?" + type;
}

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
    if (options.beforeStart) {
        options.beforeStart(*session);
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
    session->started_ = true;
    session->readFraming();
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
        return false;
    }
    wrote(address);
    if (!kept.empty()) {
        error = address + " written, but its " + kept;
    }
    return kept.empty();
}

std::string PluginSession::command(const std::string& line, bool& ok) {
    std::vector<char> buffer(kReplySize, '\0');
    bool known = false;
    const std::string kept = retaining(
        [&] { known = protocol_->DoCommand(line.c_str(), buffer.data(), kReplySize - 1); });
    std::string reply(buffer.data());
    if (!kept.empty()) {
        ok = false;
        return reply.empty() ? kept : reply + " (but " + kept + ")";
    }
    std::string word = line.substr(0, line.find(' '));
    if (!known && reply.empty()) {
        ok = false;
        return "unknown command '" + word + "' (help lists them)";
    }
    ok = known && !replyTellsFailure(word, reply);
    if (ok) {
        commanded(line);
    }
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
    token.length = wordValue(length.bytes);
    // A zero byte cut the text: the monitor's copy of the same token, if it
    // saw one, holds the rest.
    std::string whole;
    if (token.length > token.text.size() && queue_.oldest(whole) && whole.size() == token.length &&
        whole.compare(0, token.text.size() + 1, token.text + '\0') == 0) {
        token.text = whole;
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

void PluginSession::readFraming() {
    ActiveFraming framing;
    TagValue value;
    std::string ignored;
    auto text = [&](SettingId id, std::string& out) {
        if (read(settingAddress(kSettings[id]), value, ignored)) {
            out = stringValue(value.bytes);
        }
    };
    auto number = [&](SettingId id, int32_t& out) {
        if (read(settingAddress(kSettings[id]), value, ignored)) {
            out = static_cast<int32_t>(wordValue(value.bytes));
        }
    };
    text(kRxPrefix, framing.rx.prefix);
    text(kRxSuffix, framing.rx.suffix);
    number(kGap, framing.rx.gap);
    number(kTokenQueueSize, framing.queueLimit);
    framing_.set(framing);
}

void PluginSession::wrote(const std::string& address) {
    const std::string type = memoryTypeOf(address);
    if (type == "token_ack") {
        queue_.acknowledged();
    } else if (type == "SP_Done") {
        queue_.cleared();
        readFraming();
    }
}

// As the plug-in's console splits its words: at each blank.
void PluginSession::commanded(const std::string& line) {
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    if (words[0] == "token_ack") {
        words.size() == 2 && words[1] == "all" ? queue_.cleared() : queue_.acknowledged();
    } else if (words[0] == "write" && words.size() > 1) {
        wrote(words[1]);
    } else {
        framing_.noteCommand(line);
    }
}

}  // namespace xtok::tools
