#include "host/recursive_mutex.h"

#include <linux/futex.h>
#include <linux/membarrier.h>
#include <pthread.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <new>

namespace xtok::host {

/// One thread's bias. `held` is 1 while that thread holds the lock through
/// it; `held` and `depth` are written by that thread only.
struct RecursiveMutex::Bias {
    explicit Bias(uintptr_t thread, Bias* next) : thread(thread), next(next) {}
    const uintptr_t thread;
    Bias* const next;
    std::atomic<int> held{0};
    int depth = 0;
};

namespace {

static_assert(sizeof(std::atomic<int>) == sizeof(int) && std::atomic<int>::is_always_lock_free,
              "the futex word must be a plain int");

// A thread's run of lock takings after which the lock is biased to it, the
// first time; each withdrawal doubles it. A lock biased this often and
// withdrawn each time is contended: no more biases for it.
constexpr uint32_t kBiasAfter = 64;
constexpr uint32_t kMaxBiases = 16;

// Rounds of a contended lock's spin; each is a pause instruction and a look.
constexpr int kSpinsBeforeSleep = 100;

inline void cpuRelax() {
#if defined(__x86_64__) || defined(__i386__)
    __builtin_ia32_pause();
#elif defined(__aarch64__)
    asm volatile("yield");
#endif
}

void futexWait(std::atomic<int>& word, int expected) {
    syscall(SYS_futex, reinterpret_cast<int*>(&word), FUTEX_WAIT_PRIVATE, expected, nullptr,
            nullptr, 0);
}

void futexWakeOne(std::atomic<int>& word) {
    syscall(SYS_futex, reinterpret_cast<int*>(&word), FUTEX_WAKE_PRIVATE, 1, nullptr, nullptr, 0);
}

// Distinct and non-zero for every live thread. The thread pointer is one
// register read; pthread_self (what std::this_thread::get_id asks) is a call
// into the C library that returns the same value on glibc.
inline uintptr_t threadIdentity() {
#if defined(__GNUC__) && (defined(__x86_64__) || defined(__aarch64__))
    return reinterpret_cast<uintptr_t>(__builtin_thread_pointer());
#else
    return static_cast<uintptr_t>(pthread_self());
#endif
}

bool registerHeavyBarrier() {
    long commands = syscall(SYS_membarrier, MEMBARRIER_CMD_QUERY, 0, 0);
    return commands > 0 && (commands & MEMBARRIER_CMD_PRIVATE_EXPEDITED) &&
           syscall(SYS_membarrier, MEMBARRIER_CMD_REGISTER_PRIVATE_EXPEDITED, 0, 0) == 0;
}

bool heavyBarrierAvailable() {
    static const bool available = registerHeavyBarrier();
    return available;
}

// A full memory barrier on every thread of the process that is running, and
// a context switch (as good as one) on every other: after it, every store a
// thread made before it is visible, and every load a thread makes after it
// sees what was stored before the call.
void heavyBarrier() {
    syscall(SYS_membarrier, MEMBARRIER_CMD_PRIVATE_EXPEDITED, 0, 0);
}

// Keeps the compiler from moving memory accesses across it; the processor's
// part of the order is the heavy barrier's business.
inline void compilerBarrier() {
    std::atomic_signal_fence(std::memory_order_seq_cst);
}

}  // namespace

RecursiveMutex::~RecursiveMutex() {
    for (Bias* bias = made_; bias;) {
        Bias* next = bias->next;
        delete bias;
        bias = next;
    }
}

// The biased thread's way in: announce, then look whether the bias still
// stands. A withdrawing thread clears bias_ before its heavy barrier and reads
// `held` after it, so either this thread sees the withdrawal and backs out,
// or the withdrawing thread sees `held` and waits.
inline bool RecursiveMutex::enterBiased(Bias* bias) {
    bias->held.store(1, std::memory_order_relaxed);
    compilerBarrier();
    if (bias_.load(std::memory_order_relaxed) == bias) {
        bias->depth = 1;
        heldThrough_.store(bias, std::memory_order_release);
        return true;
    }
    leaveBiased(bias);
    return false;
}

inline void RecursiveMutex::leaveBiased(Bias* bias) {
    bias->held.store(0, std::memory_order_release);
    compilerBarrier();
    if (bias_.load(std::memory_order_relaxed) != bias) {
        wakeWithdrawer(bias);  // a withdrawing thread may wait for this
    }
}

void RecursiveMutex::wakeWithdrawer(Bias* bias) {
    futexWakeOne(bias->held);
}

// The biased thread's way in is all that happens here in the common case;
// the rest is out of line so that this stays a leaf without a frame.
void RecursiveMutex::Lock() {
    const uintptr_t self = threadIdentity();
    Bias* bias = bias_.load(std::memory_order_acquire);
    if (bias && bias->thread == self) {
        if (bias->depth > 0) {
            ++bias->depth;
            return;
        }
        if (enterBiased(bias)) {
            return;
        }
    }
    lockSlowly(self);
}

void RecursiveMutex::lockSlowly(uintptr_t self) {
    // Held through a bias that is being withdrawn right now: still ours.
    Bias* held = heldThrough_.load(std::memory_order_acquire);
    if (held && held->thread == self) {
        ++held->depth;
        return;
    }
    if (owner_.load(std::memory_order_relaxed) == self) {
        ++depth_;
        return;
    }
    lockFutex(self);
    Bias* bias = bias_.load(std::memory_order_relaxed);
    if (bias && bias->thread != self) {
        withdraw(bias, true);
    } else if (!bias) {
        considerBias(self);
    }
}

bool RecursiveMutex::TryLock() {
    const uintptr_t self = threadIdentity();
    Bias* bias = bias_.load(std::memory_order_acquire);
    if (bias && bias->thread == self) {
        if (bias->depth > 0) {
            ++bias->depth;
            return true;
        }
        if (enterBiased(bias)) {
            return true;
        }
    }
    Bias* held = heldThrough_.load(std::memory_order_acquire);
    if (held && held->thread == self) {
        ++held->depth;
        return true;
    }
    if (owner_.load(std::memory_order_relaxed) == self) {
        ++depth_;
        return true;
    }
    int expected = 0;
    if (!state_.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
        return false;
    }
    owner_.store(self, std::memory_order_relaxed);
    depth_ = 1;
    bias = bias_.load(std::memory_order_relaxed);
    if (bias && bias->thread != self && !withdraw(bias, false)) {
        unlockFutex();
        return false;
    }
    return true;
}

void RecursiveMutex::Unlock() {
    const uintptr_t self = threadIdentity();
    Bias* held = heldThrough_.load(std::memory_order_acquire);
    if (held && held->thread == self) {
        if (--held->depth == 0) {
            heldThrough_.store(nullptr, std::memory_order_relaxed);
            leaveBiased(held);
        }
        return;
    }
    unlockSlowly(self);
}

void RecursiveMutex::unlockSlowly(uintptr_t self) {
    // An unlock by a thread that does not hold the lock would release someone
    // else's; ignore it rather than corrupt the state.
    if (owner_.load(std::memory_order_relaxed) != self) {
        return;
    }
    if (--depth_ > 0) {
        return;
    }
    unlockFutex();
}

void RecursiveMutex::lockFutex(uintptr_t self) {
    int expected = 0;
    if (!state_.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
        waitForState();
    }
    owner_.store(self, std::memory_order_relaxed);
    depth_ = 1;
}

// Holders keep a host lock for one byte read or one queue operation, well
// under a microsecond: a short spin mostly finds the lock free again and
// saves the waiter a sleep and the holder a wake. After that, the classic
// three-state futex lock: whoever takes the lock from there leaves state 2
// behind, so its Unlock wakes the next waiter.
void RecursiveMutex::waitForState() {
    for (int spin = 0; spin < kSpinsBeforeSleep; ++spin) {
        cpuRelax();
        int expected = 0;
        if (state_.load(std::memory_order_relaxed) == 0 &&
            state_.compare_exchange_weak(expected, 1, std::memory_order_acquire)) {
            return;
        }
    }
    while (state_.exchange(2, std::memory_order_acquire) != 0) {
        futexWait(state_, 2);
    }
}

void RecursiveMutex::unlockFutex() {
    owner_.store(0, std::memory_order_relaxed);
    depth_ = 0;
    if (state_.exchange(0, std::memory_order_release) == 2) {
        futexWakeOne(state_);
    }
}

void RecursiveMutex::considerBias(uintptr_t self) {
    if (runThread_ == self) {
        ++run_;
    } else {
        runThread_ = self;
        run_ = 1;
    }
    const uint32_t needed = kBiasAfter << std::min<uint32_t>(withdrawals_, 16);
    if (run_ < needed || biases_ >= kMaxBiases || !heavyBarrierAvailable()) {
        return;
    }
    Bias* bias = new (std::nothrow) Bias(self, made_);
    if (!bias) {
        return;
    }
    made_ = bias;
    ++biases_;
    run_ = 0;
    bias_.store(bias, std::memory_order_release);
}

bool RecursiveMutex::withdraw(Bias* bias, bool wait) {
    bias_.store(nullptr, std::memory_order_relaxed);
    heavyBarrier();
    if (!wait && bias->held.load(std::memory_order_acquire) != 0) {
        bias_.store(bias, std::memory_order_release);
        return false;
    }
    while (bias->held.load(std::memory_order_acquire) != 0) {
        futexWait(bias->held, 1);
    }
    ++withdrawals_;
    runThread_ = 0;
    run_ = 0;
    return true;
}

}  // namespace xtok::host
