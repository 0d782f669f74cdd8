// Received tokens waiting to be read and acknowledged. The caller holds
// queueLock around every use (the console's commands excepted).
#pragma once

#include <cstddef>
#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "protocol/spin_lock.h"

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
    /// Runs `use` with the head in its stored form (null when the queue is
    /// empty) while no other thread can change the queue. The console's
    /// commands take no queueLock, yet the receive task pushes meanwhile:
    /// every change and every look at the head is guarded inside the queue.
    template <class Use>
    auto withHead(Use use) const {
        std::lock_guard<SpinLock> guard(guard_);
        return use(count_ == 0 ? nullptr : &ring_[head_]);
    }
    /// The head without the guard: only where no other thread can change
    /// the queue.
    const std::string* head() const { return count_ == 0 ? nullptr : &ring_[head_]; }
    int32_t count() const {
        std::lock_guard<SpinLock> guard(guard_);
        return static_cast<int32_t>(count_);
    }
    void removeHead();
    /// Empties the queue and gives its memory back.
    void clear();

private:
    void dropHead();
    void grow();

    mutable SpinLock guard_;

    // A power of two long (or empty); the queued entries are the count_ from
    // head_ on, wrapping; the others are spare storage.
    std::vector<std::string> ring_;
    std::size_t head_ = 0;
    std::size_t count_ = 0;
};

}  // namespace xtok
