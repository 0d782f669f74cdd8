// Received tokens waiting to be read and acknowledged. Not thread-safe: the
// protocol holds queueLock around every use.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace xtok {

/// First in, first out. The entries live in a ring of strings that keep
/// their storage when a token is acknowledged, so that once the ring has
/// grown to the queue's working size a push copies the token into memory it
/// already has: no allocation per token on the receive path.
class TokenQueue {
public:
    /// Drops the oldest entry when `limit` entries or more are queued (one
    /// entry per push, never more: a lowered limit shrinks the queue only as
    /// tokens are acknowledged), then appends the token, as hex text when
    /// `hex` is on.
    void push(const char* bytes, std::size_t length, int32_t limit, bool hex);
    /// The oldest token in its stored form, or null when the queue is empty.
    const std::string* head() const { return count_ == 0 ? nullptr : &ring_[head_]; }
    int32_t count() const { return static_cast<int32_t>(count_); }
    void removeHead();
    /// Empties the queue and gives its memory back.
    void clear();

private:
    void dropHead();
    void grow();

    // A power of two long (or empty); the queued entries are the count_ from
    // head_ on, wrapping; the others are spare storage.
    std::vector<std::string> ring_;
    std::size_t head_ = 0;
    std::size_t count_ = 0;
};

}  // namespace xtok
