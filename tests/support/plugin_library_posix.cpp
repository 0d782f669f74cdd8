// Loading with dlopen; exports read from the ELF dynamic symbol table of a
// 32-bit or 64-bit shared object.
#include <dlfcn.h>
#include <elf.h>

#include "tests/support/file_view.h"
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

namespace {

template <class Header, class Section, class Symbol>
std::vector<std::string> dynamicSymbols(const std::string& file) {
    std::vector<std::string> names;
    Header header;
    if (!readAt(file, 0, header)) {
        return names;
    }
    for (std::size_t i = 0; i < header.e_shnum; ++i) {
        Section section, strings;
        if (!readAt(file, header.e_shoff + i * sizeof(Section), section) ||
            section.sh_type != SHT_DYNSYM ||
            !readAt(file, header.e_shoff + section.sh_link * sizeof(Section), strings)) {
            continue;
        }
        for (std::size_t s = 0; s < section.sh_size / sizeof(Symbol); ++s) {
            Symbol symbol;
            if (readAt(file, section.sh_offset + s * sizeof(Symbol), symbol) &&
                symbol.st_shndx != SHN_UNDEF && symbol.st_name != 0) {
                names.push_back(textAt(file, strings.sh_offset + symbol.st_name));
            }
        }
    }
    return names;
}

}  // namespace

std::vector<std::string> exportedSymbols(const std::string& path) {
    const std::string file = readWholeFile(path);
    if (file.compare(0, SELFMAG, ELFMAG) != 0 || file.size() <= EI_CLASS) {
        return {};
    }
    return file[EI_CLASS] == ELFCLASS32 ? dynamicSymbols<Elf32_Ehdr, Elf32_Shdr, Elf32_Sym>(file)
                                        : dynamicSymbols<Elf64_Ehdr, Elf64_Shdr, Elf64_Sym>(file);
}

}  // namespace xtok::test
