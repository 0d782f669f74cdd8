// The host's lock: recursive, and free of system calls unless threads contend.
#pragma once

#include <atomic>
#include <thread>

#include "xtokline/host.h"

namespace xtok::host {

/// The plug-in's receive task takes a lock around every byte it reads, so the
/// uncontended path is a compare-and-swap on `state_`; the kernel (futex) is
/// asked only when a thread has to wait.
class RecursiveMutex final : public IMutex {
public:
    RecursiveMutex() = default;
    RecursiveMutex(const RecursiveMutex&) = delete;
    RecursiveMutex& operator=(const RecursiveMutex&) = delete;

    // Freed by IMultiTask2::DestroyMutex only.
    void* Destroy(unsigned) override { return this; }
    void Lock() override;
    bool TryLock() override;
    void Unlock() override;

private:
    bool reenter();
    void own();
    void waitForState();

    // 0 free, 1 held, 2 held and a thread may be waiting in the kernel.
    std::atomic<int> state_{0};
    // Only the holder stores its own id here, so a thread that reads its own
    // id is the holder, whatever ordering the read sees.
    std::atomic<std::thread::id> owner_{};
    // Touched by the holder only.
    int depth_ = 0;
};

}  // namespace xtok::host
