#include "module/interface_factory.h"

#include <cstring>

namespace xtok {

void* InterfaceFactory::GetInterface(const char* name) {
    if (!name) {
        return nullptr;
    }
    if (std::strcmp(name, "IProtocolFactory") == 0 || std::strcmp(name, "ProtocolFactory") == 0) {
        return &factory_;
    }
    if (std::strcmp(name, "IProtModule") == 0 || std::strcmp(name, "ProtModule") == 0) {
        return &module_;
    }
    return nullptr;
}

}  // namespace xtok
