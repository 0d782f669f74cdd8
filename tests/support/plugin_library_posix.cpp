// Loading with dlopen.
#include <dlfcn.h>

#include "tests/support/plugin_library.h"

namespace xtok::test {

PluginLibrary::PluginLibrary(const char* path) {
    handle_ = dlopen(path, RTLD_NOW | RTLD_LOCAL);
    if (!handle_) {
        const char* why = dlerror();
        error_ = why ? why : "dlopen failed";
    }
}

PluginLibrary::~PluginLibrary() {
    if (handle_) {
        dlclose(handle_);
    }
}

void* PluginLibrary::root() const {
    using Entry = void* (*)();
    auto entry = handle_ ? reinterpret_cast<Entry>(dlsym(handle_, "GetInterfaceFactory")) : nullptr;
    return entry ? entry() : nullptr;
}

}  // namespace xtok::test
