// Loading with LoadLibrary; exports read from the DLL's export directory.
#include <windows.h>

#include "tests/support/file_view.h"
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

namespace {

// The file offset of a relative virtual address, through the section table.
std::size_t fileOffset(const std::string& file, std::size_t sections, int count, DWORD rva) {
    for (int i = 0; i < count; ++i) {
        IMAGE_SECTION_HEADER section;
        if (readAt(file, sections + i * sizeof section, section) && rva >= section.VirtualAddress &&
            rva < section.VirtualAddress + section.SizeOfRawData) {
            return rva - section.VirtualAddress + section.PointerToRawData;
        }
    }
    return file.size();
}

}  // namespace

// The reader's own width: a test program reads DLLs built for its target.
std::vector<std::string> exportedSymbols(const std::string& path) {
    const std::string file = readWholeFile(path);
    IMAGE_DOS_HEADER dos;
    IMAGE_NT_HEADERS nt;
    if (!readAt(file, 0, dos) || !readAt(file, dos.e_lfanew, nt) ||
        nt.Signature != IMAGE_NT_SIGNATURE) {
        return {};
    }
    const std::size_t sections = dos.e_lfanew + offsetof(IMAGE_NT_HEADERS, OptionalHeader) +
                                 nt.FileHeader.SizeOfOptionalHeader;
    const int count = nt.FileHeader.NumberOfSections;
    auto at = [&](DWORD rva) { return fileOffset(file, sections, count, rva); };
    IMAGE_EXPORT_DIRECTORY exports;
    std::vector<std::string> names;
    const DWORD rva = nt.OptionalHeader.DataDirectory[IMAGE_DIRECTORY_ENTRY_EXPORT].VirtualAddress;
    if (rva == 0 || !readAt(file, at(rva), exports)) {
        return names;
    }
    for (DWORD i = 0; i < exports.NumberOfNames; ++i) {
        DWORD name;
        if (readAt(file, at(exports.AddressOfNames) + i * sizeof name, name)) {
            names.push_back(textAt(file, at(name)));
        }
    }
    return names;
}

}  // namespace xtok::test
