// Loads the installed plug-in through the installed contract headers and
// asks its factory for its name: exit status 0 when that works.
#include <dlfcn.h>

#include <cstdio>
#include <cstring>

#include "xtokline/plugin.h"
#include "xtokline/protocol.h"

static_assert(xtok::kProtocolSlotCount == 84, "the contract's protocol table");

int main() {
    void* library = dlopen(XTOKLINE_PLUGIN, RTLD_NOW | RTLD_LOCAL);
    auto entry =
        reinterpret_cast<void* (*)()>(library ? dlsym(library, "GetInterfaceFactory") : nullptr);
    auto* root = entry ? static_cast<xtok::IInterfaceFactory*>(entry()) : nullptr;
    auto* factory =
        root ? static_cast<xtok::IProtocolFactory*>(root->GetInterface("IProtocolFactory"))
             : nullptr;
    if (!factory || !factory->GetName()) {
        std::fprintf(stderr, "no protocol factory in %s (%s)\n", XTOKLINE_PLUGIN,
                     library ? "loaded" : dlerror());
        return 1;
    }
    std::printf("%s\n", factory->GetName());
    return 0;
}
