// Reaching an object the way a foreign runtime does: by slot number in the
// table its first word points at, not through our headers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace xtok::test {

/// Calls entry `slot` of `object`'s table as R(object, args...).
template <class R, class... Args>
R callSlot(void* object, int slot, Args... args) {
    using Fn = R (*)(void*, Args...);
    void** table = *static_cast<void***>(object);
    return reinterpret_cast<Fn>(table[slot])(object, args...);
}

/// The slot number the compiler gave a virtual member function (Itanium C++
/// ABI: a pointer to a virtual member holds 1 + the byte offset in the table).
template <class M>
int slotOf(M member) {
    static_assert(sizeof(M) == 2 * sizeof(std::uintptr_t), "Itanium member pointer expected");
    std::uintptr_t words[2];
    std::memcpy(words, &member, sizeof words);
    return static_cast<int>((words[0] - 1) / sizeof(void*));
}

}  // namespace xtok::test
