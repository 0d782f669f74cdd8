// Console lines, one per line of input ("@N" first sets the reply buffer's
// size, "@null" passes none; ">hex|hex" plays bytes on the line): no reply
// runs past its buffer, and a line no console knows answers false and leaves
// the buffer untouched.
#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

// Every command a console knows, each between blanks.
const std::string kCommands =
    " help connect get_stat put get tokens_available get_token_length token_ack set_hexToken "
    "set_rxGap set_rxPrefix set_rxSuffix set_txPrefix set_txSuffix info xml lasterror read write "
    "getmaxtm deletetags ";

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Session session;
    FUZZ_CHECK(session.start("rx_prefix=02 rx_suffix=03"));
    session.host.serial().feed(hexBytes("02 41 42 03 02 03 02 43 44 45 03"));
    session.receiveAll();
    for (std::string line : lines(data, size)) {
        if (!line.empty() && line[0] == '>') {
            session.host.serial().feed(hexBytes(line.substr(1)));
            session.receiveAll();
            continue;
        }
        int32_t replySize = 32;
        bool noReply = false;
        if (!line.empty() && line[0] == '@') {
            const auto [count, rest] = firstWord(line.substr(1));
            noReply = count == "null";
            replySize = static_cast<int32_t>(std::strtol(count.c_str(), nullptr, 10) % 4097);
            line = rest;
        }
        ReplyBuffer reply(replySize);
        const bool result =
            session.protocol->DoCommand(line.c_str(), noReply ? nullptr : reply.data(), replySize);
        FUZZ_CHECK(reply.guardIntact());
        std::vector<std::string> words;
        splitTrimmed(line, ' ', words);
        const bool known = kCommands.find(' ' + words[0] + ' ') != std::string::npos;
        FUZZ_CHECK(known || (!result && reply.untouched()));
    }
    FUZZ_CHECK(session.readInt("tokens_available") >= 0);
    return 0;
}
