// Bounds-checked reads of a binary file's structures, for the export readers.
#pragma once

#include <cstddef>
#include <cstring>
#include <string>

namespace xtok::test {

template <class T>
bool readAt(const std::string& file, std::size_t offset, T& out) {
    if (offset > file.size() || file.size() - offset < sizeof(T)) {
        return false;
    }
    std::memcpy(&out, file.data() + offset, sizeof(T));
    return true;
}

/// The zero-terminated text at `offset`, or "" past the end.
inline std::string textAt(const std::string& file, std::size_t offset) {
    return offset < file.size() ? std::string(file.c_str() + offset) : std::string();
}

}  // namespace xtok::test
