// The library's root object, handed the token protocol's maker: the one
// place where the module learns which protocol it carries.
#include <cstring>
#include <new>

#include "module/interface_factory.h"
#include "protocol/protocol_xtok.h"

namespace xtok {

namespace {

IProtocol7* makeProtocol(const char* name, const ServiceTable& services) {
    if (std::strcmp(name, "XTOK") != 0) {
        return nullptr;
    }
    try {
        return new Protocol_XTOK(services);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

// Built by the library's static initialisers, destroyed at unload; its
// module's destructor then releases the services still held.
InterfaceFactory root(makeProtocol);

}  // namespace

InterfaceFactory& rootObject() {
    return root;
}

}  // namespace xtok
