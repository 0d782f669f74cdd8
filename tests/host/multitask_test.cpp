// The host's locks, on real threads.
#include <gtest/gtest.h>

#include <thread>

#include "host/multitask.h"

namespace xtok::host {
namespace {

// Recursive for its holder and closed to other threads until the last unlock
// (exclusion under contention is the standard library's own).
TEST(Locks, AreRecursiveAndExcludeOtherThreads) {
    MultiTask tasks;
    IMutex* mutex = tasks.CreateMutex(0);
    ASSERT_NE(mutex, nullptr);
    auto otherThreadGetsIt = [mutex] {
        bool got = false;
        std::thread([&] { (got = mutex->TryLock()) ? mutex->Unlock() : void(); }).join();
        return got;
    };
    mutex->Lock();
    EXPECT_TRUE(mutex->TryLock());
    EXPECT_FALSE(otherThreadGetsIt());
    mutex->Unlock();
    EXPECT_FALSE(otherThreadGetsIt());
    mutex->Unlock();
    EXPECT_TRUE(otherThreadGetsIt());
    tasks.DestroyMutex(mutex);
}

}  // namespace
}  // namespace xtok::host
