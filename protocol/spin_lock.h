// A minimal lock for the few values that the receive task, the runtime's
// threads and the console share without a host lock: the framing texts and
// the settings stores. Held only for a copy or a map lookup, so spinning is
// cheaper than a host lock and needs no operating-system call.
#pragma once

#include <atomic>
#include <cstdint>
#include <mutex>
#include <string>

#include "module/service_table.h"

namespace xtok {

class SpinLock {
public:
    void lock() {
        for (int spins = 0; flag_.test_and_set(std::memory_order_acquire); ++spins) {
            // A holder preempted by a waiter of higher priority (the receive
            // task) never runs again on a single core while the waiter only
            // spins: past a short spin, the waiter sleeps through the host,
            // which lets threads of any priority run.
            if (spins >= kSpinsBeforeSleep) {
                if (IMultiTask2* tasks = services().multiTask) {
                    tasks->Sleep(1);
                }
            }
        }
    }
    void unlock() { flag_.clear(std::memory_order_release); }

private:
    static constexpr int kSpinsBeforeSleep = 1000;
    std::atomic_flag flag_ = ATOMIC_FLAG_INIT;
};

/// A text that one thread may replace while others read it.
class SharedText {
public:
    std::string get() const {
        std::lock_guard<SpinLock> guard(lock_);
        return text_;
    }
    void set(std::string text) {
        std::lock_guard<SpinLock> guard(lock_);
        text_.swap(text);
        version_.fetch_add(1, std::memory_order_release);
    }
    /// Changes with every set. A reader that keeps something derived from the
    /// text reads this before get(), and derives again when it differs from
    /// the version it derived from: a set between the two only costs one
    /// more derivation.
    uint32_t version() const { return version_.load(std::memory_order_acquire); }

private:
    mutable SpinLock lock_;
    std::string text_;
    std::atomic<uint32_t> version_{0};
};

}  // namespace xtok
