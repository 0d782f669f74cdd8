#include "tests/support/plugin_library.h"

#include <dlfcn.h>
#include <elf.h>

#include <cstring>
#include <fstream>
#include <iterator>

#include "tests/support/slot_call.h"

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
    if (!handle_) {
        return nullptr;
    }
    using Entry = void* (*)();
    auto entry = reinterpret_cast<Entry>(dlsym(handle_, "GetInterfaceFactory"));
    return entry ? entry() : nullptr;
}

void* PluginLibrary::rootInterface(const char* name) const {
    void* object = root();
    return object ? callSlot<void*>(object, 0, name) : nullptr;
}

std::string readWholeFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

namespace {

template <class T>
bool readAt(const std::string& file, std::size_t offset, T& out) {
    if (offset > file.size() || file.size() - offset < sizeof(T)) {
        return false;
    }
    std::memcpy(&out, file.data() + offset, sizeof(T));
    return true;
}

}  // namespace

std::vector<std::string> definedDynamicSymbols(const std::string& path) {
    std::vector<std::string> names;
    std::string file = readWholeFile(path);
    Elf64_Ehdr header;
    if (!readAt(file, 0, header) || std::memcmp(header.e_ident, ELFMAG, SELFMAG) != 0) {
        return names;
    }
    for (int i = 0; i < header.e_shnum; ++i) {
        Elf64_Shdr section;
        if (!readAt(file, header.e_shoff + i * sizeof(Elf64_Shdr), section) ||
            section.sh_type != SHT_DYNSYM) {
            continue;
        }
        Elf64_Shdr strings;
        if (!readAt(file, header.e_shoff + section.sh_link * sizeof(Elf64_Shdr), strings)) {
            continue;
        }
        for (std::size_t s = 0; s < section.sh_size / sizeof(Elf64_Sym); ++s) {
            Elf64_Sym symbol;
            if (readAt(file, section.sh_offset + s * sizeof(Elf64_Sym), symbol) &&
                symbol.st_shndx != SHN_UNDEF && symbol.st_name != 0 &&
                strings.sh_offset + symbol.st_name < file.size()) {
                names.emplace_back(file.c_str() + strings.sh_offset + symbol.st_name);
            }
        }
    }
    return names;
}

}  // namespace xtok::test
