// The binary contract between an operator-panel runtime and a protocol plug-in.
//
// The runtime and the plug-in are built by different compilers, years apart.
// What they share is not this header but the *slot number* of every operation:
// an object's first word points at a table of functions, and the runtime calls
// "slot N" of it. These headers spell the same tables as C++ interfaces so that
// plug-in, host and tests agree on them. Rules that keep the numbering fixed:
//
//  - interfaces hold pure virtual functions only: no data, no overloads, no
//    default arguments, no virtual destructor (that would take two slots);
//  - where the other side may destroy an object, slot 0 is Destroy(flags);
//  - reserved slots are real functions returning 0, so later slots keep their
//    numbers;
//  - text is zero-terminated 8-bit; caller buffers come as (char*, int32_t);
//    counts, codes and milliseconds are int32_t; time stamps are int64_t
//    milliseconds since 1970-01-01 UTC; callers read only the low byte of a
//    bool result;
//  - nothing throws across the contract.
//
// Each slot is commented with its number. tests/contract checks those numbers
// against the compiler's own table layout.
//
// Calling convention of a slot, per target (XTOK_SLOT_CALL below):
//  - Windows 32-bit x86: the Microsoft member-function convention (thiscall):
//    the object in ECX, the other arguments on the stack right to left, the
//    callee pops them; results in EAX (EDX:EAX for 64 bits).
//  - Windows x86-64: the Microsoft x64 convention, the object as the first
//    argument in RCX.
//  - Linux x86-64 and 32-bit ARM: the platform's C++ ABI (System V AMD64,
//    AAPCS soft-float), the object as the first argument.
// Every slot is declared with XTOK_SLOT_CALL so that the convention does not
// depend on a compiler's default; the slot-number test checks each one.
#pragma once

#include <cstdint>
#include <new>

#if defined(_MSC_VER) && defined(_M_IX86)
#define XTOK_SLOT_CALL __thiscall
#elif defined(_WIN32) && defined(__i386__)
#define XTOK_SLOT_CALL __attribute__((thiscall))
#else
#define XTOK_SLOT_CALL
#endif

namespace xtok {

/// Runs an object's destructor and, when bit 0 of `flags` is set, frees its
/// memory; returns the object's address. This is what slot 0 (`Destroy`)
/// does for every heap object handed across the contract. `T` must be the
/// object's dynamic type, or have a virtual destructor of its own.
template <class T>
void* destroyObject(T* self, unsigned flags) {
    void* address = self;
    if (flags & 1u) {
        delete self;
    } else {
        self->~T();
    }
    return address;
}

}  // namespace xtok
