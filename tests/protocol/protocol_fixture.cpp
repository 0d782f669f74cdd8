#include "tests/protocol/protocol_fixture.h"

#include <cstring>

#include "protocol/protocol_xtok.h"
#include "xtokline/text.h"

namespace xtok::test {

bool eventually(const std::function<bool()>& condition) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

namespace {

/// The address of a "TYPE" or "TYPE?DATATYPE": node 0, and the natural
/// data type when none is named (texts 64 bytes long).
std::string addressOf(IProtocol7& protocol, const std::string& what) {
    if (what.find('?') != std::string::npos) {
        return "0?" + what;
    }
    static const std::map<int32_t, std::string> natural = {
        {kBoolean, "boolean"}, {kUnsignedByte, "unsignedByte"}, {kUnsignedInt, "unsignedInt"}};
    int32_t type = kByte;
    for (const MemoryType& memory :
         static_cast<Protocol_XTOK&>(protocol).models().front().memoryTypes) {
        type = memory.name == what ? memory.naturalType : type;
    }
    auto it = natural.find(type);
    return "0?" + what + "?" + (it == natural.end() ? "string-64" : it->second);
}

}  // namespace

void ProtocolFixture::SetUp() {
    session_ = std::make_unique<ModuleSession>(host);
    create();
}

void ProtocolFixture::TearDown() {
    destroy();
    session_.reset();
}

void ProtocolFixture::create() {
    protocol = rootObject().factory().CreateProtocol("XTOK");
    ASSERT_NE(protocol, nullptr);
    if (!instance.empty()) {
        protocol->SetInstanceName(instance.c_str());
    }
}

void ProtocolFixture::destroy() {
    tags_.clear();
    if (protocol) {
        protocol->Stop();
        rootObject().factory().DestroyProtocol(protocol);
        protocol = nullptr;
    }
}

ITag* ProtocolFixture::tag(const std::string& uri) {
    auto it = tags_.find(uri);
    ITag* made = it != tags_.end() ? it->second : tags_[uri] = protocol->CreateTag(uri.c_str());
    EXPECT_NE(made, nullptr) << uri << ": " << error();
    return made;
}

std::string ProtocolFixture::read(const std::string& what) {
    const std::string address = addressOf(*protocol, what);
    ITag* t = tag(address);
    if (!t) {
        return "!" + error();
    }
    // Bytes the read leaves alone show as EE.
    std::string value(static_cast<std::size_t>(t->GetSize()) + 16, '\xEE');
    if (!protocol->ReadTag(t, value.data())) {
        return "!" + error();
    }
    value.resize(static_cast<std::size_t>(t->GetSize()));
    const std::string type = address.substr(address.rfind('?') + 1);
    if (type.rfind("string", 0) == 0) {
        return value.c_str();
    }
    if (type == "unsignedInt") {
        int32_t number = 0;
        std::memcpy(&number, value.data(), sizeof number);
        return std::to_string(number);
    }
    if (type == "unsignedByte" || type == "boolean") {
        return std::to_string(static_cast<uint8_t>(value[0]));
    }
    return bytesToHexText(value.data(), value.size());
}

std::string ProtocolFixture::write(const std::string& what, const std::string& value) {
    const std::string address = addressOf(*protocol, what);
    ITag* t = tag(address);
    if (!t) {
        return "!" + error();
    }
    const std::string type = address.substr(address.rfind('?') + 1);
    std::string bytes(static_cast<std::size_t>(t->GetSize()) + 4, '\0');
    const int32_t number = static_cast<int32_t>(std::strtoll(value.c_str(), nullptr, 10));
    if (type.rfind("string", 0) == 0) {
        bytes.replace(0, std::min(value.size(), bytes.size()), value, 0, bytes.size());
    } else if (type == "unsignedInt" || type == "unsignedByte" || type == "boolean") {
        std::memcpy(bytes.data(), &number, sizeof number);
    } else {
        bytes.replace(0, value.size() / 2, hexBytes(value));
    }
    return protocol->WriteTag(t, bytes.data()) ? "" : "!" + error();
}

std::string ProtocolFixture::command(const std::string& line) {
    std::vector<char> reply(8192, '\0');
    const bool ok = protocol->DoCommand(line.c_str(), reply.data(), 8192);
    return (ok ? "" : "!") + std::string(reply.data());
}

void ProtocolFixture::play(const std::string& script) {
    std::size_t at = 0;
    for (std::size_t bar; (bar = script.find('|', at)) != std::string::npos; at = bar + 1) {
        host.serial().feed(hexBytes(script.substr(at, bar - at)));
        host.serial().silence();
    }
    host.serial().feed(hexBytes(script.substr(at)));
    host.serial().silence();
    ASSERT_TRUE(host.serial().waitDrained()) << "the receive task did not read the script";
}

void ProtocolFixture::settle() {
    ASSERT_TRUE(host.serial().waitDrained());
    ASSERT_TRUE(host.serial().waitDrained());
}

std::vector<std::string> ProtocolFixture::takeTokens() {
    std::vector<std::string> out;
    for (int32_t n = std::atoi(read("tokens_available").c_str()); n > 0; --n) {
        out.push_back(read("rx_token?string-4096"));
        EXPECT_EQ(write("token_ack", "1"), "");
    }
    return out;
}

std::string ProtocolFixture::step(const std::string& verb, const std::string& rest) {
    auto check = [this](bool ok) { return ok ? "" : "!" + error(); };
    auto shown = [](const std::string& text) { return text.empty() ? "''" : text; };
    // Items of a record since the step last showed it.
    auto since = [](std::size_t& seen, const std::vector<std::string>& items) {
        std::string out;
        for (std::size_t i = seen; i < items.size(); ++i) {
            out += (out.empty() ? "" : ",") + items[i];
        }
        seen = items.size();
        return out.empty() ? "-" : out;
    };
    FakeSerialFactory& line = host.serial();
    const std::map<std::string, std::atomic<bool>*> faults = {
        {"open", &line.refuseOpen},           {"configure", &line.failConfigure},
        {"write", &line.failWrite},           {"store", &host.storage().failWrites},
        {"load", &host.storage().failReads},  {"task", &host.tasks().refuseTasks},
        {"stop", &host.tasks().stopTimesOut}, {"basic", nullptr}};
    const std::map<std::string, std::function<std::string()>> steps = {
        {"start", [&] { return check(start(rest)); }},
        {"conf", [&] { return check(configure(rest)); }},
        {"cfg", [&] { return check(protocol->Configure(rest.c_str())); }},
        {"go", [&] { return check(protocol->Start()); }},
        {"stop", [&] { return check(protocol->Stop()); }},
        {"new", [&] { return destroy(), create(), ""; }},
        {"inst", [&] { return instance = rest, protocol->SetInstanceName(rest.c_str()), ""; }},
        {"w",
         [&] { return write(rest.substr(0, rest.find(' ')), rest.substr(rest.find(' ') + 1)); }},
        {"play", [&] { return play(rest), ""; }},
        {"settle", [&] { return settle(), ""; }},
        {"fault", [&] { return setFault(faults.at(rest), true), ""; }},
        {"heal", [&] { return setFault(faults.at(rest), false), ""; }},
        {"feed", [&] { return line.feed(hexBytes(rest)), ""; }},
        {"error", [&] { return line.readError(), ""; }},
        {"hangup", [&] { return line.hangUp(), ""; }},
        {"drain", [&] { return check(line.waitDrained()); }},
        {"store",
         [&] {
             return host.storage().put(section(), rest.substr(0, rest.find(' ')),
                                       rest.substr(rest.find(' ') + 1)),
                    "";
         }},
        {"r", [&] { return shown(read(rest)); }},
        {"cmd", [&] { return shown(command(rest)); }},
        {"tokens",
         [&] {
             std::string out;
             for (const std::string& token : takeTokens()) {
                 out += (out.empty() ? "" : ",") + shown(token);
             }
             return out.empty() ? "none" : out;
         }},
        {"line",
         [&] {
             char text[64] = {};
             protocol->GetSerialSettings(text, sizeof text - 1);
             return std::string(text);
         }},
        {"sent",
         [&] {
             std::vector<std::string> frames;
             for (const std::string& frame : line.writes()) {
                 frames.push_back(shown(bytesToHexText(frame.data(), frame.size())));
             }
             return since(sentSeen_, frames);
         }},
        {"cfgd",
         [&] {
             std::vector<std::string> applied;
             for (const LineSettings& s : line.configured()) {
                 applied.push_back(std::to_string(s.baud) + "/" + std::to_string(s.parity) + "/" +
                                   std::to_string(s.bits) + "/" + std::to_string(s.stop) + "/" +
                                   std::to_string(s.mode));
             }
             return since(configuredSeen_, applied);
         }},
        {"tasks",
         [&] {
             std::vector<std::string> calls;
             for (const std::string& call : host.tasks().calls()) {
                 if (call.find("Task") != std::string::npos) {
                     calls.push_back(call);
                 }
             }
             return since(tasksSeen_, calls);
         }},
        {"stored",
         [&] {
             return host.storage().has(section(), rest) ? host.storage().get(section(), rest) : "-";
         }},
        {"err", [&] { return std::to_string(code()) + " " + error(); }},
        {"gap", [&] { return std::to_string(line.record().lastTimeout); }},
        {"opens",
         [&] {
             const LineRecord record = line.record();
             return std::to_string(record.opens) + "/" + std::to_string(record.closes) + " " +
                    (record.names.empty() ? "-" : record.names.back());
         }},
    };
    auto found = steps.find(verb);
    return found == steps.end() ? "?" + verb : found->second();
}

void ProtocolFixture::setFault(std::atomic<bool>* fault, bool on) {
    if (fault) {
        *fault = on;
    } else {
        host.storage().extended = !on;  // "basic"
    }
}

std::string ProtocolFixture::run(const std::string& script) {
    std::string shown;
    std::size_t at = 0;
    for (std::size_t end = 0; end != std::string::npos; at = end + 1) {
        end = script.find(';', at);
        const std::string step = script.substr(at, end == std::string::npos ? end : end - at);
        const std::size_t first = step.find_first_not_of(' ');
        if (first == std::string::npos) {
            continue;
        }
        const std::string words = step.substr(first);
        const std::size_t blank = words.find(' ');
        const std::string out = this->step(
            words.substr(0, blank), blank == std::string::npos ? "" : words.substr(blank + 1));
        if (!out.empty()) {
            shown += (shown.empty() ? "" : " | ") + out;
        }
    }
    return shown;
}

TEST_P(Scenarios, ShowWhatTheyShould) {
    EXPECT_EQ(run(GetParam().script), GetParam().shows) << GetParam().script;
}

}  // namespace xtok::test
