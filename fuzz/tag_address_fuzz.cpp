// Tag addresses, one per line: a tag is made or refused with its reason, and
// every tag slot, conversion and array access on a made one stays in bounds.
#include "framework/data_types.h"
#include "fuzz/fuzz_session.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

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
        uint8_t item[16];
        for (int32_t index : {-1, 0, count - 1, count}) {
            protocol.ReadArrayItem(tag, index, item);
        }
    }
    ITag* copy = tag->Clone();
    FUZZ_CHECK(copy && uri == copy->GetUri());
    protocol.CanJoinTags(copy, tag, 0);
    protocol.TagFollows(tag, copy);
    copy->Destroy(1);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Session session;
    FUZZ_CHECK(session.start("Node2::model=1 Node5::model=7 rx_prefix=02 rx_suffix=03"));
    ITag* previous = nullptr;
    for (const std::string& uri : lines(data, size)) {
        ITag* tag = session.protocol->CreateTag(uri.c_str());
        const std::string error = session.protocol->GetLastErrorText();
        FUZZ_CHECK(tag || error.rfind("Tag URI error: " + uri + " - ", 0) == 0);
        if (tag) {
            useTag(*session.protocol, tag, uri);
            if (previous) {
                session.protocol->CanJoinTags(previous, tag, 0);
                session.protocol->TagLess(previous, tag);
            }
            previous = tag;  // kept in the protocol's list
        }
    }
    return 0;
}
