// The configuration text a runtime hands to Configure. Whatever the parser
// accepts is then used the way a runtime uses it: started, the settings
// reported into a small buffer, the framing and queue size read back and a
// token sent, so that a value that slipped through the checks shows.
#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

std::string readText(Protocol_XTOK& protocol, const char* type) {
    const std::string uri = std::string("0?") + type + "?string-200";
    ITag* tag = protocol.CreateTag(uri.c_str());
    if (!tag) {
        return "?";  // a model that does not exist has no memory types
    }
    ValueBuffer value(tag->GetSize());
    std::string text;
    if (protocol.ReadTag(tag, value.data())) {
        text.assign(reinterpret_cast<const char*>(value.data()),
                    strnlen(reinterpret_cast<const char*>(value.data()), value.size()));
    } else {
        text = "?";  // longer than the tag: told by "... too long to read"
    }
    protocol.DeleteTag(tag);
    return text;
}

int32_t readInt(Protocol_XTOK& protocol, const char* type, int32_t fallback) {
    const std::string uri = std::string("0?") + type + "?unsignedInt";
    ITag* tag = protocol.CreateTag(uri.c_str());
    if (!tag) {
        return fallback;
    }
    int32_t value = 0;
    FUZZ_CHECK(protocol.ReadTag(tag, &value));
    protocol.DeleteTag(tag);
    return value;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    // The settings text goes into buffers of every small size in turn.
    const int32_t replySize = static_cast<int32_t>(size % 42) - 1;

    Session session;
    Protocol_XTOK& protocol = *session.protocol;
    const bool configured = protocol.Configure(text.c_str());
    if (!configured) {
        FUZZ_CHECK(protocol.GetLastErrorCode() == -1);
        FUZZ_CHECK(*protocol.GetLastErrorText() != '\0');
    }
    ReplyBuffer settings(replySize);
    FUZZ_CHECK(protocol.GetSerialSettings(settings.data(), replySize));
    FUZZ_CHECK(settings.guardIntact());
    if (!configured || !protocol.Start()) {
        return 0;
    }

    // What Configure let through is what the checks allow.
    const int32_t queueSize = readInt(protocol, "SP_TokenQueueSize", 1);
    FUZZ_CHECK(queueSize >= 1 && queueSize <= 10000);
    for (const char* type : {"SP_RxPrefix", "SP_RxSuffix", "SP_TxPrefix", "SP_TxSuffix"}) {
        const std::string framing = readText(protocol, type);
        FUZZ_CHECK(framing == "?" || isHexText(framing));
    }

    if (ITag* tx = protocol.CreateTag("0?tx_token?string-4")) {
        ValueBuffer token(4, "4142");
        protocol.WriteTag(tx, token.data());
        protocol.DeleteTag(tx);
    }

    // A second Configure starts from scratch.
    FUZZ_CHECK(protocol.Configure(kBaseConfig.c_str()));
    return 0;
}
