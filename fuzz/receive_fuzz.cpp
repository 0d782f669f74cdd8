// The byte stream a device sends, cut into tokens under the framing settings
// of the first line. The receive pass runs on this thread (the host refuses
// to make the task) over the scripted line, with tag reads and
// acknowledgements in between. In every mode the queue keeps its bound and
// no token exceeds the longest frame; without framing the tokens must be
// exactly the runs of bytes between silences.
//
// Input: first line the configuration keys ("rx_prefix=02 rx_suffix=03 gap=5
// token_queue_size=4 hex_tokens=true"), or "unframed" for the exact check.
// Then per line: hex bytes with '|' for a silence; "run 41 1005" for one
// byte repeated; "read 8" reads rx_token through a string-8 tag; "ack";
// "console <line>" (framing texts set there are not checked).
#include <string>
#include <vector>

#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

constexpr std::size_t kMaxFrame = 1000;

// A byte, or a silence when `silence`.
struct Event {
    bool silence;
    char byte;
};

std::vector<Event> script(const std::string& line) {
    std::vector<Event> events;
    const auto [word, rest] = firstWord(line);
    if (word == "run") {
        const auto [byte, count] = firstWord(rest);
        const std::string b = hexBytes(byte);
        events.assign(static_cast<std::size_t>(number(count, 0, 3000, 0)),
                      Event{false, b.empty() ? 'A' : b[0]});
        return events;
    }
    std::size_t at = 0;
    for (std::size_t bar = line.find('|');; at = bar + 1, bar = line.find('|', at)) {
        for (char c : hexBytes(line.substr(at, bar == std::string::npos ? bar : bar - at))) {
            events.push_back({false, c});
        }
        if (bar == std::string::npos) {
            return events;
        }
        events.push_back({true, 0});
    }
}

void play(Session& session, const std::vector<Event>& events) {
    for (const Event& e : events) {
        if (e.silence) {
            session.host.serial().silence();
        } else {
            session.host.serial().feed(std::string(1, e.byte));
        }
    }
}

// Receive passes until the receive side has read the whole script: a pass
// reads at least one event. A closed port ("console connect OFF") is not
// read; the script waits for the next open.
void receiveAll(Session& session) {
    session.host.serial().silence();
    if (!session.host.serial().isOpen()) {
        return;
    }
    for (int pass = 0; pass < 100000 && session.host.serial().pending() > 0; ++pass) {
        session.protocol->receiveToken();
    }
    FUZZ_CHECK(session.host.serial().pending() == 0);
}

ITag* makeTag(Protocol_XTOK& protocol, const std::string& uri) {
    ITag* tag = protocol.CreateTag(uri.c_str());
    FUZZ_CHECK(tag != nullptr);
    return tag;
}

int32_t readInt(Protocol_XTOK& protocol, const char* uri) {
    ITag* tag = makeTag(protocol, uri);
    int32_t value = 0;
    FUZZ_CHECK(protocol.ReadTag(tag, &value));
    protocol.DeleteTag(tag);
    return value;
}

void acknowledge(Protocol_XTOK& protocol) {
    ITag* ack = makeTag(protocol, "0?token_ack?boolean");
    uint8_t one = 1;
    FUZZ_CHECK(protocol.WriteTag(ack, &one));
    protocol.DeleteTag(ack);
}

// Every queued token, oldest first, taken off the queue.
std::vector<std::string> takeTokens(Protocol_XTOK& protocol) {
    ITag* token = makeTag(protocol, "0?rx_token?string-2001");
    std::vector<std::string> tokens;
    for (int32_t n = readInt(protocol, "0?tokens_available?unsignedInt"); n > 0; --n) {
        ValueBuffer value(token->GetSize());
        FUZZ_CHECK(protocol.ReadTag(token, value.data()));
        tokens.emplace_back(reinterpret_cast<const char*>(value.data()));
        acknowledge(protocol);
    }
    protocol.DeleteTag(token);
    FUZZ_CHECK(readInt(protocol, "0?tokens_available?unsignedInt") == 0);
    return tokens;
}

// Without prefix or suffix a silence ends a run; a run past the longest
// frame is dropped and collection starts afresh.
std::vector<std::string> unframedTokens(const std::vector<Event>& events) {
    std::vector<std::string> tokens;
    std::string run;
    for (const Event& e : events) {
        if (e.silence) {
            if (!run.empty()) {
                tokens.push_back(bytesToHexText(run.data(), run.size()));
            }
            run.clear();
            continue;
        }
        run.push_back(e.byte);
        if (run.size() > kMaxFrame) {
            run.clear();
        }
    }
    if (!run.empty()) {
        tokens.push_back(bytesToHexText(run.data(), run.size()));
    }
    return tokens;
}

void unframed(const std::vector<std::string>& input) {
    Session session;
    FUZZ_CHECK(session.start("hex_tokens=true token_queue_size=10000"));
    std::vector<Event> all;
    for (std::size_t i = 1; i < input.size(); ++i) {
        for (const Event& e : script(input[i])) {
            all.push_back(e);
        }
    }
    play(session, all);
    receiveAll(session);
    FUZZ_CHECK(takeTokens(*session.protocol) == unframedTokens(all));
}

void framed(const std::vector<std::string>& input) {
    Session session;
    Protocol_XTOK& protocol = *session.protocol;
    if (!session.start(input[0])) {
        return;
    }
    const int32_t limit = readInt(protocol, "0?SP_TokenQueueSize?unsignedInt");
    for (std::size_t i = 1; i < input.size(); ++i) {
        const auto [word, rest] = firstWord(input[i]);
        if (word == "read") {
            ITag* token =
                makeTag(protocol, "0?rx_token?string-" + std::to_string(number(rest, 0, 3000, 8)));
            ValueBuffer value(token->GetSize());
            protocol.ReadTag(token, value.data());
            protocol.DeleteTag(token);
        } else if (word == "ack") {
            acknowledge(protocol);
        } else if (word == "console") {
            char reply[64];
            protocol.DoCommand(rest.c_str(), reply, sizeof reply);
        } else {
            play(session, script(input[i]));
            receiveAll(session);
        }
        const int32_t queued = readInt(protocol, "0?tokens_available?unsignedInt");
        FUZZ_CHECK(queued >= 0 && queued <= limit);
        const int32_t head = readInt(protocol, "0?rx_token_len?unsignedInt");
        FUZZ_CHECK(queued == 0 || (head >= 0 && head <= 2 * int32_t{kMaxFrame}));
    }
    receiveAll(session);
    for (const std::string& token : takeTokens(protocol)) {
        FUZZ_CHECK(token.size() <= 2 * kMaxFrame);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    if (input[0] == "unframed") {
        unframed(input);
    } else {
        framed(input);
    }
    return 0;
}
