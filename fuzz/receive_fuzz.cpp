// Bytes on the line. "unframed" first: no framing and hex tokens, and every
// token must be exactly a run between silences of at most 1000 bytes. Else
// the first line is the configuration's framing and the others are scripts
// ("hex|hex", '|' a silence; "run HH N" N bytes HH), "read N", "ack" or
// "console ...": the queue stays within its limit and tokens within 1000 bytes.
#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

constexpr std::size_t kMaxFrame = 1000;

/// Plays a script line; notes in `runs` what a gap-only framing makes of it:
/// runs between silences, a run past 1000 bytes dropped at its 1001st byte.
void play(Session& session, const std::string& line, std::vector<std::string>& runs) {
    const auto [word, rest] = firstWord(line);
    std::string pieces = line;
    if (word == "run") {
        const auto [byte, count] = firstWord(rest);
        pieces.assign(std::strtoul(count.c_str(), nullptr, 10) % 3001, hexBytes(byte + "41")[0]);
    }
    std::size_t at = 0;
    for (std::size_t bar = word == "run" ? std::string::npos : line.find('|');;
         at = bar + 1, bar = line.find('|', at)) {
        const std::string piece = word == "run" ? pieces : hexBytes(line.substr(at, bar - at));
        session.host.serial().feed(piece);
        for (char c : piece) {
            runs.back() += c;
            runs.back() = runs.back().size() > kMaxFrame ? "" : runs.back();
        }
        if (bar == std::string::npos) {
            return;
        }
        session.host.serial().silence();
        runs.push_back("");
    }
}

std::vector<std::string> takeTokens(Session& session) {
    std::vector<std::string> tokens;
    for (int32_t n = session.readInt("tokens_available"); n > 0; --n) {
        tokens.push_back(session.read("0?rx_token?string-2001").c_str());
        FUZZ_CHECK(session.write("0?token_ack?boolean", "\x01"));
    }
    FUZZ_CHECK(session.readInt("tokens_available") == 0);
    return tokens;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    const bool unframed = input[0] == "unframed";
    Session session;
    if (!session.start(unframed ? "hex_tokens=true token_queue_size=10000" : input[0])) {
        return 0;
    }
    const int32_t limit = session.readInt("SP_TokenQueueSize");
    std::vector<std::string> runs(1), expected;
    for (std::size_t i = 1; i < input.size(); ++i) {
        const auto [word, rest] = firstWord(input[i]);
        if (!unframed && word == "read") {
            session.read("0?rx_token?string-" + std::to_string(std::atoi(rest.c_str()) % 3000 + 1));
        } else if (!unframed && word == "ack") {
            session.write("0?token_ack?boolean", "\x01");
        } else if (!unframed && word == "console") {
            char reply[64];
            session.protocol->DoCommand(rest.c_str(), reply, sizeof reply);
        } else {
            play(session, input[i], runs);
            session.receiveAll();
            runs.push_back("");
        }
        const int32_t queued = session.readInt("tokens_available");
        FUZZ_CHECK(unframed || (queued >= 0 && queued <= limit));
    }
    for (const std::string& run : runs) {
        if (!run.empty()) {
            expected.push_back(bytesToHexText(run.data(), run.size()));
        }
    }
    const std::vector<std::string> tokens = takeTokens(session);
    FUZZ_CHECK(!unframed || tokens == expected);
    for (const std::string& token : tokens) {
        FUZZ_CHECK(token.size() <= 2 * kMaxFrame);
    }
    return 0;
}
