#include "tools/queue_mirror.h"

namespace xtok::tools {

namespace {

// Enough for any queue a panel reads in time; beyond it the oldest copies go
// and those tokens are shown as the plug-in hands them out.
constexpr std::size_t kKept = 1000;

}  // namespace

void QueueMirror::removeOldest() {
    if (count_ > 0) {
        --count_;
    }
    if (newest_.size() > static_cast<std::size_t>(count_)) {
        newest_.pop_front();
    }
}

// As the plug-in pushes: a queue at or over its limit loses exactly one token.
bool QueueMirror::framed(const std::string& bytes, host::WallClock::time_point arrived,
                         int32_t limit, long& dropped) {
    std::lock_guard<std::mutex> lock(mutex_);
    const bool full = count_ > 0 && count_ >= limit;
    if (full) {
        removeOldest();
        dropped = ++dropped_;
    }
    ++count_;
    newest_.push_back({bytes, arrived});
    if (newest_.size() > kKept) {
        newest_.pop_front();
    }
    return full;
}

void QueueMirror::acknowledged() {
    std::lock_guard<std::mutex> lock(mutex_);
    removeOldest();
}

void QueueMirror::cleared() {
    restart(0);
}

void QueueMirror::restart(long count) {
    std::lock_guard<std::mutex> lock(mutex_);
    count_ = count;
    newest_.clear();
}

bool QueueMirror::oldest(std::string& bytes, host::WallClock::time_point& arrived) const {
    std::lock_guard<std::mutex> lock(mutex_);
    if (count_ == 0 || newest_.size() != static_cast<std::size_t>(count_)) {
        return false;
    }
    bytes = newest_.front().bytes;
    arrived = newest_.front().arrived;
    return true;
}

}  // namespace xtok::tools
