// A zero-filled working buffer for one call: inside the object up to N bytes,
// so that the common small data need no allocation, on the heap above.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <new>

namespace xtok {

/// The error text when a heap block cannot be had.
constexpr const char* kNoMemoryText = "not enough memory";

template <std::size_t N>
class ScratchBuffer {
public:
    /// A size of 0 or less gives an empty buffer.
    explicit ScratchBuffer(int32_t size) {
        if (size <= static_cast<int32_t>(N)) {
            data_ = inline_;
            size_ = size > 0 ? static_cast<std::size_t>(size) : 0;
            return;
        }
        heap_.reset(new (std::nothrow) uint8_t[static_cast<std::size_t>(size)]());
        data_ = heap_.get();
        size_ = data_ ? static_cast<std::size_t>(size) : 0;
    }
    ScratchBuffer(const ScratchBuffer&) = delete;
    ScratchBuffer& operator=(const ScratchBuffer&) = delete;

    /// False when the heap block could not be had.
    bool ok() const { return data_ != nullptr; }
    uint8_t* data() { return data_; }
    std::size_t size() const { return size_; }

private:
    uint8_t inline_[N] = {};
    std::unique_ptr<uint8_t[]> heap_;
    uint8_t* data_ = nullptr;
    std::size_t size_ = 0;
};

}  // namespace xtok
