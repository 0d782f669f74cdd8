#include "host/recursive_mutex.h"

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace xtok::host {

namespace {

static_assert(sizeof(std::atomic<int>) == sizeof(int) && std::atomic<int>::is_always_lock_free,
              "the futex word must be a plain int");

int* futexWord(std::atomic<int>& state) {
    return reinterpret_cast<int*>(&state);
}

void futexWait(std::atomic<int>& state, int expected) {
    syscall(SYS_futex, futexWord(state), FUTEX_WAIT_PRIVATE, expected, nullptr, nullptr, 0);
}

void futexWakeOne(std::atomic<int>& state) {
    syscall(SYS_futex, futexWord(state), FUTEX_WAKE_PRIVATE, 1, nullptr, nullptr, 0);
}

}  // namespace

bool RecursiveMutex::reenter() {
    if (owner_.load(std::memory_order_relaxed) != std::this_thread::get_id()) {
        return false;
    }
    ++depth_;
    return true;
}

void RecursiveMutex::own() {
    owner_.store(std::this_thread::get_id(), std::memory_order_relaxed);
    depth_ = 1;
}

void RecursiveMutex::Lock() {
    if (reenter()) {
        return;
    }
    int expected = 0;
    if (!state_.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
        waitForState();
    }
    own();
}

// Classic three-state futex lock: whoever takes the lock from here leaves
// state 2 behind, so its Unlock wakes the next waiter.
void RecursiveMutex::waitForState() {
    while (state_.exchange(2, std::memory_order_acquire) != 0) {
        futexWait(state_, 2);
    }
}

bool RecursiveMutex::TryLock() {
    if (reenter()) {
        return true;
    }
    int expected = 0;
    if (!state_.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
        return false;
    }
    own();
    return true;
}

void RecursiveMutex::Unlock() {
    // An unlock by a thread that does not hold the lock would release someone
    // else's; ignore it rather than corrupt the state.
    if (owner_.load(std::memory_order_relaxed) != std::this_thread::get_id()) {
        return;
    }
    if (--depth_ > 0) {
        return;
    }
    owner_.store(std::thread::id(), std::memory_order_relaxed);
    if (state_.exchange(0, std::memory_order_release) == 2) {
        futexWakeOne(state_);
    }
}

}  // namespace xtok::host
