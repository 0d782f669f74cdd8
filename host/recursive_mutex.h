// The host's lock: recursive, and free of system calls unless threads contend.
#pragma once

#include <atomic>
#include <cstdint>

#include "xtokline/host.h"

namespace xtok::host {

/// The plug-in's receive task takes a lock around every byte it reads, so
/// taking and giving back a lock that no other thread wants must cost next to
/// nothing. Two levels:
///
/// - A futex lock (`state_`): a compare-and-swap to lock and an exchange to
///   unlock; the kernel is asked only when a thread has to wait.
/// - A bias: once one thread has taken the lock many times in a row, the lock
///   is biased to it, and that thread locks and unlocks with plain stores and
///   loads, no atomic read-modify-write at all. Another thread that wants the
///   lock takes the futex lock, withdraws the bias, makes the biased thread's
///   stores visible with a process-wide memory barrier (membarrier(2)) and
///   waits until the biased thread is out. A lock whose bias keeps being
///   withdrawn is biased ever more rarely, then no more. Without membarrier
///   no lock is ever biased.
///
/// Each lock has a cache line of its own: the receive task's port lock and the
/// queue lock that the runtime's threads poll are created one after the
/// other, and on one line every poll would steal the line from the receive
/// task.
class alignas(64) RecursiveMutex final : public IMutex {
public:
    RecursiveMutex() = default;
    ~RecursiveMutex();
    RecursiveMutex(const RecursiveMutex&) = delete;
    RecursiveMutex& operator=(const RecursiveMutex&) = delete;

    // Freed by IMultiTask2::DestroyMutex only.
    void* Destroy(unsigned) override { return this; }
    void Lock() override;
    bool TryLock() override;
    void Unlock() override;

private:
    struct Bias;

    bool enterBiased(Bias* bias);
    void leaveBiased(Bias* bias);
    [[gnu::noinline]] void wakeWithdrawer(Bias* bias);
    [[gnu::noinline]] void lockSlowly(uintptr_t self);
    [[gnu::noinline]] void unlockSlowly(uintptr_t self);
    void lockFutex(uintptr_t self);
    void unlockFutex();
    void waitForState();
    /// With the futex lock held: counts the holder's run and biases the lock
    /// to it when the run is long enough.
    void considerBias(uintptr_t self);
    /// With the futex lock held: withdraws `bias` (another thread's). With
    /// `wait`, waits until its thread is out of the lock and returns true;
    /// without, gives the bias back and returns false if the thread is in.
    bool withdraw(Bias* bias, bool wait);

    // The bias in force, or null. Read by every Lock; written only with the
    // futex lock held.
    std::atomic<Bias*> bias_{nullptr};
    // The bias the lock is held through right now, or null; written only by
    // that bias's thread while it holds the lock.
    std::atomic<Bias*> heldThrough_{nullptr};

    // The futex lock: 0 free, 1 held, 2 held and a thread may be waiting in
    // the kernel.
    std::atomic<int> state_{0};
    // Touched by the holder only.
    int depth_ = 0;
    // The holder's thread identity, 0 when free. Only the holder stores its
    // own identity here, so a thread that reads its own is the holder,
    // whatever ordering the read sees.
    std::atomic<uintptr_t> owner_{0};

    // With the futex lock held only: the current run of one thread, how often
    // a bias was withdrawn, and every bias ever made (freed with the lock: a
    // thread that lost its bias may still look at it).
    uintptr_t runThread_ = 0;
    uint32_t run_ = 0;
    uint32_t withdrawals_ = 0;
    uint32_t biases_ = 0;
    Bias* made_ = nullptr;
};

}  // namespace xtok::host
