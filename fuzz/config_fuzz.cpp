// Configuration texts: Configure refuses with a message or accepts, and what
// it accepted starts a protocol whose framing and queue size are sane.
#include "fuzz/fuzz_session.h"
#include "xtokline/text.h"

using namespace xtok::fuzz;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Session session;
    xtok::Protocol_XTOK& protocol = *session.protocol;
    const bool configured =
        protocol.Configure(std::string(reinterpret_cast<const char*>(data), size).c_str());
    FUZZ_CHECK(configured || (protocol.GetLastErrorCode() == -1 && *protocol.GetLastErrorText()));
    ReplyBuffer settings(static_cast<int32_t>(size % 42) - 1);
    FUZZ_CHECK(protocol.GetSerialSettings(settings.data(), settings.size()));
    FUZZ_CHECK(settings.guardIntact());
    if (configured && protocol.Start()) {
        const int32_t queueSize = session.readInt("SP_TokenQueueSize");
        FUZZ_CHECK(queueSize == -1 || (queueSize >= 1 && queueSize <= 10000));  // -1: no model 1
        for (const char* type : {"SP_RxPrefix", "SP_RxSuffix", "SP_TxPrefix", "SP_TxSuffix"}) {
            const std::string text = session.read(std::string("0?") + type + "?string-200");
            FUZZ_CHECK(text == "?" || xtok::isHexText(text.c_str()));
        }
        session.write("0?tx_token?string-4", "4142");
    }
    FUZZ_CHECK(protocol.Configure(kBaseConfig.c_str()));  // a later Configure starts afresh
    return 0;
}
