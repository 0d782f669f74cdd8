// Received tokens waiting to be read and acknowledged. The caller holds
// queueLock around every use (the console's commands excepted).
#pragma once

#include <cstdint>
#include <deque>
#include <string>

namespace xtok {

class TokenQueue {
public:
    /// Drops the oldest entry when `limit` entries or more are queued (one
    /// entry per push, never more: a lowered limit shrinks the queue only as
    /// tokens are acknowledged), then appends the token, as hex text when
    /// `hex` is on.
    void push(const char* bytes, std::size_t length, int32_t limit, bool hex);
    /// The head in its stored form; null when the queue is empty.
    const std::string* head() const { return tokens_.empty() ? nullptr : &tokens_.front(); }
    int32_t count() const { return static_cast<int32_t>(tokens_.size()); }
    void removeHead() {
        if (!tokens_.empty()) {
            tokens_.pop_front();
        }
    }
    void clear() { tokens_.clear(); }

private:
    std::deque<std::string> tokens_;
};

}  // namespace xtok
