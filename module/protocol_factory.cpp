#include "module/protocol_factory.h"

#include <cstring>

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
    // A protocol takes its locks and port from the services Init acquired;
    // without them it could not run, so none is made.
    return services_.held && name ? make_(name, services_) : nullptr;
}

void ProtocolFactory::DestroyProtocol(IProtocol7* protocol) {
    if (protocol) {
        protocol->Destroy(1);
    }
}

}  // namespace xtok
