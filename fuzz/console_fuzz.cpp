// Console lines, as the runtime's diagnostic channel passes them to
// DoCommand: the driver's commands and, behind them, the framework's. Each
// reply goes into a small buffer followed by guard bytes; nothing may be
// written past the size, and an unknown command leaves the buffer alone.
//
// Input: one command per line. "@N command" answers into N bytes (default
// 32, "@null" a null buffer); ">02 41 03 | 41" plays bytes on the line,
// '|' a silence, and lets the receive side queue what they make.
#include <set>
#include <string>

#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

const std::set<std::string> kCommands = {"help",
                                         "connect",
                                         "get_stat",
                                         "put",
                                         "get",
                                         "tokens_available",
                                         "get_token_length",
                                         "token_ack",
                                         "set_hexToken",
                                         "set_rxGap",
                                         "set_rxPrefix",
                                         "set_rxSuffix",
                                         "set_txPrefix",
                                         "set_txSuffix",
                                         "info",
                                         "xml",
                                         "lasterror",
                                         "read",
                                         "write",
                                         "getmaxtm",
                                         "deletetags"};

constexpr int32_t kDefaultReply = 32;

void receive(Session& session, const std::string& script) {
    if (!session.host.serial().isOpen()) {
        return;  // "connect OFF": the receive side idles
    }
    std::size_t at = 0;
    for (std::size_t bar = script.find('|'); bar != std::string::npos;
         at = bar + 1, bar = script.find('|', at)) {
        session.host.serial().feed(hexBytes(script.substr(at, bar - at)));
        session.host.serial().silence();
    }
    session.host.serial().feed(hexBytes(script.substr(at)));
    session.host.serial().silence();
    for (int pass = 0; pass < 10000 && session.host.serial().pending() > 0; ++pass) {
        session.protocol->receiveToken();
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Session session;
    Protocol_XTOK& protocol = *session.protocol;
    FUZZ_CHECK(session.start("rx_prefix=02 rx_suffix=03"));
    receive(session, "02 41 42 03 02 03 02 43 44 45 03");

    for (std::string line : lines(data, size)) {
        if (!line.empty() && line[0] == '>') {
            receive(session, line.substr(1));
            continue;
        }
        int32_t replySize = kDefaultReply;
        bool nullReply = false;
        if (!line.empty() && line[0] == '@') {
            auto [size, rest] = firstWord(line.substr(1));
            nullReply = size == "null";
            replySize = number(size, -4, 4096, kDefaultReply);
            line = rest;
        }

        ReplyBuffer reply(replySize);
        const bool result =
            protocol.DoCommand(line.c_str(), nullReply ? nullptr : reply.data(), replySize);
        FUZZ_CHECK(reply.guardIntact());

        std::vector<std::string> words;
        splitTrimmed(line, ' ', words);
        if (!kCommands.count(words[0])) {
            FUZZ_CHECK(!result);
            ReplyBuffer untouched(replySize);
            FUZZ_CHECK(std::memcmp(reply.data(), untouched.data(),
                                   static_cast<std::size_t>(reply.size())) == 0);
        }
    }

    // The queue still answers through tags.
    ITag* count = protocol.CreateTag("0?tokens_available?unsignedInt");
    FUZZ_CHECK(count != nullptr);
    int32_t tokens = -1;
    FUZZ_CHECK(protocol.ReadTag(count, &tokens));
    FUZZ_CHECK(tokens >= 0);
    protocol.DeleteTag(count);
    return 0;
}
