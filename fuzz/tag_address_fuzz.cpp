// Tag addresses with their data type texts, one per line, as a runtime
// passes them to CreateTag. Every tag that is made is then used through each
// operation a runtime has for it, with buffers of exactly the sizes the tag
// states.
#include <string>

#include "fuzz/fuzz_session.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

// Node 2 has a model of its own; node 5 names one that does not exist.
const std::string kConfig = "Node2::model=1 Node5::model=7 rx_prefix=02 rx_suffix=03";

void useTag(Protocol_XTOK& protocol, ITag* tag, const std::string& uri) {
    FUZZ_CHECK(uri == tag->GetUri());
    const int32_t size = tag->GetSize();
    const int32_t rawSize = tag->GetRawSize();
    FUZZ_CHECK(size >= 0 && rawSize >= 0);
    const int32_t bit = tag->GetBitOffset();
    FUZZ_CHECK(bit >= 0 && bit < 8);
    tag->GetByteAddress();
    tag->IsReadOnly();
    tag->IsWriteOnly();
    protocol.GetTagProperty(tag);
    for (int32_t field = -1; field <= 3; ++field) {
        int32_t length = -1;
        const char* text = protocol.GetUriField(tag, field, &length);
        FUZZ_CHECK(!text || (length >= 0 && text + length <= tag->GetUri() + uri.size()));
    }

    // Both directions of the tag's conversions, from bytes of the address.
    ValueBuffer raw(rawSize, uri);
    ValueBuffer value(size);
    tag->Convert(raw.data(), value.data(), 0);
    tag->Convert(value.data(), raw.data(), 1);
    for (const char* name : kConversionNames) {
        ValueBuffer inPlace(size, uri);
        tag->ApplyConversion(inPlace.data(), name, 0);
        tag->ApplyConversion(inPlace.data(), name, 1);
    }

    ValueBuffer read(size);
    protocol.ReadTag(tag, read.data());
    if (tag->GetElementCode() != 0) {
        const int32_t width =
            ElementSize(EffectiveElementCode(tag->GetTypeCode(), tag->GetElementCode()));
        const int32_t count = ElementCount(tag->GetElementCode(), size);
        for (int32_t index : {-1, 0, count - 1, count}) {
            ValueBuffer item(width);
            protocol.ReadArrayItem(tag, index, item.data());
        }
    }

    ITag* copy = tag->Clone();
    FUZZ_CHECK(copy != nullptr);
    FUZZ_CHECK(std::string(copy->GetUri()) == uri);
    protocol.CanJoinTags(tag, copy, 0);
    protocol.CanJoinTags(copy, tag, 0);
    protocol.TagFollows(tag, copy);
    copy->Destroy(1);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Session session;
    Protocol_XTOK& protocol = *session.protocol;
    FUZZ_CHECK(session.start(kConfig));

    ITag* previous = nullptr;
    for (const std::string& uri : lines(data, size)) {
        ITag* tag = protocol.CreateTag(uri.c_str());
        if (!tag) {
            const std::string error = protocol.GetLastErrorText();
            FUZZ_CHECK(error.rfind("Tag URI error: " + uri + " - ", 0) == 0);
            FUZZ_CHECK(protocol.GetLastErrorCode() == -1);
            continue;
        }
        useTag(protocol, tag, uri);
        if (previous) {
            protocol.CanJoinTags(previous, tag, 0);
            protocol.TagLess(previous, tag);
        }
        previous = tag;  // kept in the protocol's list; the destructor frees it
    }
    return 0;
}
