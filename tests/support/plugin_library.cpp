#include "tests/support/plugin_library.h"

#include <fstream>
#include <iterator>

#include "tests/support/slot_call.h"

namespace xtok::test {

void* PluginLibrary::rootInterface(const char* name) const {
    void* object = root();
    return object ? callSlot<void*>(object, 0, name) : nullptr;
}

std::string readWholeFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

}  // namespace xtok::test
