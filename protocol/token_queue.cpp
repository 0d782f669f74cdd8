#include "protocol/token_queue.h"

#include <algorithm>

#include "xtokline/text.h"

namespace xtok {

namespace {

// An acknowledged entry keeps storage up to this size for the next token;
// a rare long token gives its memory back instead of holding it in the ring.
constexpr std::size_t kKeptCapacity = 64;
constexpr std::size_t kFirstRing = 16;

}  // namespace

void TokenQueue::push(const char* bytes, std::size_t length, int32_t limit, bool hex) {
    if (static_cast<int64_t>(count_) >= limit) {
        dropHead();
    }
    if (count_ == ring_.size()) {
        grow();
    }
    std::string& entry = ring_[(head_ + count_) & (ring_.size() - 1)];
    if (hex) {
        entry = bytesToHexText(bytes, length);
    } else if (entry.size() == length) {
        // Devices send tokens of one length: overwrite in place.
        std::copy(bytes, bytes + length, entry.begin());
    } else {
        entry.assign(bytes, length);
    }
    ++count_;
}

void TokenQueue::removeHead() {
    dropHead();
}

void TokenQueue::dropHead() {
    if (count_ == 0) {
        return;
    }
    std::string& entry = ring_[head_];
    if (entry.capacity() > kKeptCapacity) {
        std::string().swap(entry);
    }
    head_ = (head_ + 1) & (ring_.size() - 1);
    --count_;
}

void TokenQueue::clear() {
    std::vector<std::string>().swap(ring_);
    head_ = 0;
    count_ = 0;
}

// Doubles the ring, the queued entries moved (not copied) to its start.
void TokenQueue::grow() {
    std::rotate(ring_.begin(), ring_.begin() + static_cast<std::ptrdiff_t>(head_), ring_.end());
    head_ = 0;
    ring_.resize(std::max(kFirstRing, ring_.size() * 2));
}

}  // namespace xtok
