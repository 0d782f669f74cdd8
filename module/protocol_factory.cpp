#include "module/protocol_factory.h"

#include <cstring>
#include <new>

#include "module/service_table.h"
#include "protocol/protocol_xtok.h"

namespace xtok {

void* ProtocolFactory::Destroy(unsigned) {
    // The factory is a static part of the root object: nothing to free.
    return this;
}

void* ProtocolFactory::GetInterface(const char* name) {
    if (name &&
        (std::strcmp(name, "ProtocolFactory") == 0 || std::strcmp(name, "IProtocolFactory") == 0)) {
        return this;
    }
    return nullptr;
}

IProtocol7* ProtocolFactory::CreateProtocol(const char* name) {
    if (!name || std::strcmp(name, "XTOK") != 0) {
        return nullptr;
    }
    // A protocol takes its locks and port from the services Init acquired;
    // without them it could not run, so none is made.
    if (!services().held) {
        return nullptr;
    }
    try {
        return new Protocol_XTOK();
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

void ProtocolFactory::DestroyProtocol(IProtocol7* protocol) {
    if (protocol) {
        protocol->Destroy(1);
    }
}

}  // namespace xtok
