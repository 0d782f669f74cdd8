// Tag writes, "address hexvalue" per line ("config ..." first replaces the
// framing): each write stays within the tag's value, a transmit puts the
// framed text on the line, and reads and array writes of the tag stay in bounds.
#include "fuzz/fuzz_session.h"
#include "protocol/xtok_tag.h"

using namespace xtok;
using namespace xtok::fuzz;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    Session session;
    const bool configured = firstWord(input[0]).first == "config";
    if (!session.start(configured ? firstWord(input[0]).second : "tx_prefix=02 tx_suffix=03")) {
        return 0;
    }
    bool framingKnown = !configured;
    for (const std::string& line : input) {
        const auto [uri, hex] = firstWord(line);
        ITag* tag = session.protocol->CreateTag(uri.c_str());
        if (!tag) {
            continue;
        }
        const std::size_t writes = session.host.serial().writes().size();
        const std::string type = static_cast<XtokTag*>(tag)->memoryType->name;
        const bool written = session.write(uri, hexBytes(hex));
        framingKnown = framingKnown && !(written && type == "SP_Done");
        if (written && framingKnown && type == "tx_token" && uri.find('(') == std::string::npos &&
            tag->GetSize() > 0) {
            const std::string bytes = hexBytes(hex);
            std::string value(static_cast<std::size_t>(tag->GetSize()), 'A');
            for (std::size_t i = 0; i < value.size() && !bytes.empty(); ++i) {
                value[i] = bytes[i % bytes.size()];
            }
            FUZZ_CHECK(session.host.serial().writes().size() == writes + 1);
            FUZZ_CHECK(session.host.serial().writes().back() ==
                       "\x02" + std::string(value.c_str()) + "\x03");
        }
        session.read(uri);
        if (tag->GetElementCode() != 0) {
            uint8_t item[16] = {};
            session.protocol->WriteArrayItem(tag, static_cast<int32_t>(hex.size() % 13) - 1, item);
        }
        session.protocol->DeleteTag(tag);
    }
    return 0;
}
