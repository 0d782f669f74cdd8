// Tag addresses, each line "address [hexvalue]" ("config ..." first replaces
// the framing): a tag is made or refused with its reason; every tag slot,
// conversion, read and array access on a made one stays in bounds; a value
// written stays within the tag, and a transmit puts the framed text on the
// line.
#include "framework/data_types.h"
#include "fuzz/fuzz_session.h"
#include "protocol/xtok_tag.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

constexpr int32_t kMostBytes = 1 << 22;

void useTag(Protocol_XTOK& protocol, ITag* tag, const std::string& uri) {
    FUZZ_CHECK(uri == tag->GetUri() && tag->GetSize() >= 0 && tag->GetRawSize() >= 0);
    FUZZ_CHECK(tag->GetBitOffset() >= 0 && tag->GetBitOffset() < 8);
    for (int32_t field = -1; field <= 3; ++field) {
        int32_t length = -1;
        const char* text = protocol.GetUriField(tag, field, &length);
        FUZZ_CHECK(!text || (length >= 0 && text + length <= tag->GetUri() + uri.size()));
    }
    const std::size_t size = static_cast<std::size_t>(tag->GetSize());
    std::unique_ptr<uint8_t[]> raw(new uint8_t[tag->GetRawSize()]()), value(new uint8_t[size]());
    for (int32_t i = 0; i < tag->GetRawSize(); ++i) {
        raw[i] = static_cast<uint8_t>(uri[static_cast<std::size_t>(i) % uri.size()]);
    }
    tag->Convert(raw.get(), value.get(), 0);
    tag->Convert(value.get(), raw.get(), 1);
    for (const char* name : {"swapnibble", "swap2", "swap4", "swap8", "bcd", "neg", "inv", "no"}) {
        tag->ApplyConversion(value.get(), name, 1);
    }
    protocol.ReadTag(tag, value.get());
    if (tag->GetElementCode() != 0) {
        const int32_t count = ElementCount(tag->GetElementCode(), tag->GetSize());
        uint8_t item[16] = {};
        for (int32_t index : {-1, 0, count - 1, count}) {
            protocol.ReadArrayItem(tag, index, item);
            protocol.WriteArrayItem(tag, index, item);
        }
    }
    ITag* copy = tag->Clone();
    FUZZ_CHECK(copy && uri == copy->GetUri());
    protocol.CanJoinTags(copy, tag, 0);
    protocol.TagFollows(tag, copy);
    copy->Destroy(1);
}

/// A transmit of `hex` through `tag` sent its text, up to the first zero
/// byte of the tag's value, between the STX/ETX framing.
void checkTransmit(Session& session, ITag* tag, const std::string& hex, std::size_t writes) {
    const std::string value = Session::filled(hexBytes(hex), tag->GetSize());
    FUZZ_CHECK(session.host.serial().writes().size() == writes + 1);
    FUZZ_CHECK(session.host.serial().writes().back() ==
               "\x02" + std::string(value.c_str()) + "\x03");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    Session session;
    const bool configured = firstWord(input[0]).first == "config";
    if (!session.start(configured ? firstWord(input[0]).second
                                  : "Node2::model=1 Node5::model=7 rx_prefix=02 rx_suffix=03 "
                                    "tx_prefix=02 tx_suffix=03")) {
        return 0;
    }
    bool framingKnown = !configured;
    ITag* previous = nullptr;
    for (const std::string& line : input) {
        const auto [uri, hex] = firstWord(line);
        ITag* tag = session.protocol->CreateTag(uri.c_str());
        const std::string error = session.protocol->GetLastErrorText();
        FUZZ_CHECK(tag || error.rfind("Tag URI error: " + uri + " - ", 0) == 0);
        // Every use of a tag costs time in step with its size: one of hundreds
        // of MiB would outlast the time-out while finding nothing a small one cannot.
        if (!tag || tag->GetSize() > kMostBytes) {
            continue;
        }
        useTag(*session.protocol, tag, uri);
        const std::size_t writes = session.host.serial().writes().size();
        const std::string type = static_cast<XtokTag*>(tag)->memoryType->name;
        const bool written = !hex.empty() && session.write(uri, hexBytes(hex));
        framingKnown = framingKnown && !(written && type == "SP_Done");
        if (written && framingKnown && type == "tx_token" && uri.find('(') == std::string::npos &&
            tag->GetSize() > 0) {
            checkTransmit(session, tag, hex, writes);
        }
        if (previous) {
            session.protocol->CanJoinTags(previous, tag, 0);
            session.protocol->TagLess(previous, tag);
        }
        previous = tag;  // kept in the protocol's list
    }
    return 0;
}
