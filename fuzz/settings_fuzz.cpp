// Operator changes of the line and framing settings: SP_* writes applied by
// SP_Done, over retained values that the host's permanent storage may
// already hold (from an older version, or damaged). After the last SP_Done
// the queue is empty, and a new protocol instance started over the same
// storage reads back every setting as it was.
//
// Input per line: "store <key> <text>" puts a retained value before the
// start; "basic" makes the storage answer without its extended interface;
// "<address> <hex value>" writes a tag as in the tag_write target. An
// SP_Done write ends every input.
#include <map>
#include <string>

#include "fuzz/fuzz_session.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

const char* const kSettings[][2] = {
    {"SP_Baud", "unsignedInt"},    {"SP_Bits", "unsignedByte"},
    {"SP_Stop", "unsignedByte"},   {"SP_Par", "unsignedByte"},
    {"SP_Mode", "unsignedByte"},   {"SP_RxPrefix", "string-300"},
    {"SP_RxSuffix", "string-300"}, {"SP_Gap", "unsignedInt"},
    {"SP_TxPrefix", "string-300"}, {"SP_TxSuffix", "string-300"},
    {"SP_HexTokens", "boolean"},   {"SP_TokenQueueSize", "unsignedInt"}};

const std::string kConfig = "rx_prefix=02 rx_suffix=03 token_queue_size=5";

// Texts up to this length come back from storage whole (the read buffer is
// 256 bytes with the terminator); longer ones are not compared.
constexpr std::size_t kRetainedTextLength = 255;

// Every setting as the SP_ memory types show it; "?" for a text too long to
// compare.
std::map<std::string, std::string> readSettings(Protocol_XTOK& protocol) {
    std::map<std::string, std::string> values;
    for (const auto& [name, dataType] : kSettings) {
        const std::string uri = std::string("0?") + name + "?" + dataType;
        ITag* tag = protocol.CreateTag(uri.c_str());
        FUZZ_CHECK(tag != nullptr);
        ValueBuffer value(tag->GetSize());
        std::string text = "?";
        if (protocol.ReadTag(tag, value.data())) {
            const char* bytes = reinterpret_cast<const char*>(value.data());
            text = tag->GetElementCode() != 0 ? std::string(bytes, strnlen(bytes, value.size()))
                                              : std::string(bytes, value.size());
        }
        values[name] = text.size() > kRetainedTextLength ? "?" : text;
        protocol.DeleteTag(tag);
    }
    return values;
}

bool write(Protocol_XTOK& protocol, const std::string& uri, const std::string& bytes) {
    ITag* tag = protocol.CreateTag(uri.c_str());
    if (!tag) {
        return false;
    }
    ValueBuffer value(tag->GetSize(), bytes);
    const bool written = protocol.WriteTag(tag, value.data());
    protocol.DeleteTag(tag);
    return written;
}

int32_t queued(Protocol_XTOK& protocol) {
    ITag* count = protocol.CreateTag("0?tokens_available?unsignedInt");
    int32_t value = -1;
    FUZZ_CHECK(protocol.ReadTag(count, &value));
    protocol.DeleteTag(count);
    return value;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    Session session;
    for (const std::string& line : input) {
        const auto [word, rest] = firstWord(line);
        if (word == "store") {
            const auto [key, text] = firstWord(rest);
            session.host.storage().put("XTOK", key, text);
        } else if (word == "basic") {
            session.host.storage().extended = false;
        }
    }
    FUZZ_CHECK(session.start(kConfig));

    // Something queued, so that SP_Done has a queue to clear.
    session.host.serial().feed(
        "\x02"
        "A\x03");
    session.host.serial().silence();
    while (session.host.serial().pending() > 0) {
        session.protocol->receiveToken();
    }

    for (const std::string& line : input) {
        const auto [uri, hex] = firstWord(line);
        write(*session.protocol, uri, hexBytes(hex));
    }
    FUZZ_CHECK(write(*session.protocol, "0?SP_Done?boolean", "\x01"));
    FUZZ_CHECK(queued(*session.protocol) == 0);
    ReplyBuffer line(40);
    FUZZ_CHECK(session.protocol->GetSerialSettings(line.data(), line.size()));
    FUZZ_CHECK(line.guardIntact());

    // A restart over the same storage: the panel after a power cycle.
    const std::map<std::string, std::string> before = readSettings(*session.protocol);
    session.protocol->Stop();
    rootObject().factory().DestroyProtocol(session.protocol);
    session.protocol = static_cast<Protocol_XTOK*>(rootObject().factory().CreateProtocol("XTOK"));
    FUZZ_CHECK(session.protocol != nullptr);
    FUZZ_CHECK(session.start(kConfig));
    const std::map<std::string, std::string> after = readSettings(*session.protocol);
    for (const auto& [name, value] : before) {
        FUZZ_CHECK(value == "?" || after.at(name) == value);
    }
    return 0;
}
