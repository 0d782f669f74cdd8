// Reaching an object the way a foreign runtime does: by slot number in the
// table its first word points at, not through our headers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "xtokline/common.h"

namespace xtok::test {

/// Calls entry `slot` of `object`'s table as R(object, args...).
template <class R, class... Args>
R callSlot(void* object, int slot, Args... args) {
    using Fn = R(XTOK_SLOT_CALL*)(void*, Args...);
    void** table = *static_cast<void***>(object);
    return reinterpret_cast<Fn>(table[slot])(object, args...);
}

/// Whether a member function has the contract's calling convention.
template <class M>
struct HasSlotCall : std::false_type {};
template <class R, class C, class... Args>
struct HasSlotCall<R (XTOK_SLOT_CALL C::*)(Args...)> : std::true_type {};

/// The first word of a pointer to a virtual member function: the member's
/// offset in the table plus a constant (1 in the generic C++ ABI, 0 on ARM,
/// which marks virtuals in the second word instead).
template <class M>
std::uintptr_t firstWordOf(M member) {
    static_assert(sizeof(M) == 2 * sizeof(std::uintptr_t), "two-word member pointer expected");
    std::uintptr_t words[2];
    std::memcpy(words, &member, sizeof words);
    return words[0];
}

struct SlotProbe {
    virtual void XTOK_SLOT_CALL first() {}
};

/// The slot number the compiler gave a virtual member function, measured
/// against a member known to sit in slot 0. It must have the contract's
/// calling convention too.
template <class M>
int slotOf(M member) {
    static_assert(HasSlotCall<M>::value, "slot without the contract's calling convention");
    const std::uintptr_t slot0 = firstWordOf(&SlotProbe::first);
    return static_cast<int>((firstWordOf(member) - slot0) / sizeof(void*));
}

}  // namespace xtok::test
