// Loading with LoadLibrary.
#include <windows.h>

#include "tests/support/plugin_library.h"

namespace xtok::test {

PluginLibrary::PluginLibrary(const char* path) {
    handle_ = LoadLibraryA(path);
    if (!handle_) {
        error_ = "LoadLibrary failed with error " + std::to_string(GetLastError());
    }
}

PluginLibrary::~PluginLibrary() {
    if (handle_) {
        FreeLibrary(static_cast<HMODULE>(handle_));
    }
}

void* PluginLibrary::root() const {
    using Entry = void* (*)();
    auto entry = handle_ ? reinterpret_cast<Entry>(reinterpret_cast<void*>(GetProcAddress(
                               static_cast<HMODULE>(handle_), "GetInterfaceFactory")))
                         : nullptr;
    return entry ? entry() : nullptr;
}

}  // namespace xtok::test
