// Tag write values, as a runtime passes them to WriteTag: every memory type,
// with its own and with foreign data types, lengths and conversions. Each
// value buffer is exactly the tag's size on the heap and holds no terminator
// beyond what the value itself has, so a write that looks for the end of a
// text past the value is caught.
//
// Input: "<address> <hex value>" per line; the value is repeated or cut to
// the tag's size ('A's when empty). A first line "config <keys>" adds keys
// to the configuration (default: tx prefix 02, tx suffix 03).
#include <string>

#include "fuzz/fuzz_session.h"
#include "protocol/xtok_tag.h"

using namespace xtok;
using namespace xtok::fuzz;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::vector<std::string> input = lines(data, size);
    Session session;
    Protocol_XTOK& protocol = *session.protocol;
    // Sent frames are checked against the value while the framing is known.
    bool framingKnown = true;
    std::string config = "tx_prefix=02 tx_suffix=03";
    if (firstWord(input[0]).first == "config") {
        config = firstWord(input[0]).second;
        framingKnown = false;
    }
    if (!session.start(config)) {
        return 0;
    }

    for (const std::string& line : input) {
        const auto [uri, hex] = firstWord(line);
        ITag* tag = protocol.CreateTag(uri.c_str());
        if (!tag) {
            continue;
        }
        ValueBuffer value(tag->GetSize(), hexBytes(hex));
        const std::size_t writesBefore = session.host.serial().writes().size();
        const bool written = protocol.WriteTag(tag, value.data());

        // A plain text token goes out as it stands, up to its first zero
        // byte or the end of the value, framed by the tx prefix and suffix.
        const std::string& type = static_cast<XtokTag*>(tag)->memoryType->name;
        framingKnown = framingKnown && !(written && type == "SP_Done");
        if (written && framingKnown && type == "tx_token" && uri.find('(') == std::string::npos &&
            value.size() > 0) {
            const auto writes = session.host.serial().writes();
            FUZZ_CHECK(writes.size() == writesBefore + 1);
            const char* text = reinterpret_cast<const char*>(value.data());
            const std::string sent(text, strnlen(text, value.size()));
            FUZZ_CHECK(writes.back() == "\x02" + sent + "\x03");
        }

        ValueBuffer read(tag->GetSize());
        protocol.ReadTag(tag, read.data());
        if (tag->GetElementCode() != 0) {
            const int32_t width =
                ElementSize(EffectiveElementCode(tag->GetTypeCode(), tag->GetElementCode()));
            ValueBuffer item(width, hexBytes(hex));
            protocol.WriteArrayItem(tag, static_cast<int32_t>(hex.size() % 13) - 1, item.data());
        }
        protocol.DeleteTag(tag);
    }
    return 0;
}
