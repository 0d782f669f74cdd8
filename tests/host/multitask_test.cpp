// Tasks and locks on real threads. Nothing here waits for time to pass except
// the StopTasks whose time-outs are the point of the tests.
#include <gtest/gtest.h>

#include <future>
#include <thread>

#include "host/multitask.h"
#include "tests/host/notice_log.h"

namespace xtok::host {
namespace {

/// A task body that waits until the test lets it go, then runs until it is
/// asked to stop.
class Body : public IRunnable {
public:
    void* Destroy(unsigned) override { return this; }
    bool Run() override {
        started_.set_value();
        released_.wait();
        while (!task->IsStopRequested()) {
            std::this_thread::yield();
        }
        finished_.set_value();  // the body's last touch of itself
        return true;
    }

    ITask* task = nullptr;
    void waitStarted() { started_.get_future().wait(); }
    void release() { release_.set_value(); }
    void waitFinished() { finished_.get_future().wait(); }

private:
    std::promise<void> started_, release_, finished_;
    std::shared_future<void> released_{release_.get_future().share()};
};

ITask* startTask(MultiTask& tasks, Body& body) {
    body.task = tasks.CreateTask(&body, 3, 0);
    if (body.task && body.task->Start()) {
        body.waitStarted();
    }
    return body.task;
}

// A stop times out while the body runs on, and succeeds once it ends.
TEST(Tasks, StopTimesOutWhileTheBodyRunsAndSucceedsOnceItEnds) {
    MultiTask tasks;
    Body body;
    ITask* task = startTask(tasks, body);
    ASSERT_NE(task, nullptr);
    EXPECT_FALSE(task->Start());  // once only
    EXPECT_FALSE(tasks.StopTask(task, 20));
    body.release();
    EXPECT_TRUE(tasks.StopTask(task, 10000));
    EXPECT_EQ(tasks.liveTasks(), 0);
    // The handle is gone; a second stop must not touch it again.
    EXPECT_FALSE(tasks.StopTask(task, 0));
}

TEST(Tasks, ShutdownLeavesAStuckTaskRunningWithAValidHandle) {
    test::NoticeLog notices;
    Body body;
    {
        MultiTask tasks(notices.sink(), 10);
        ASSERT_NE(startTask(tasks, body), nullptr);
    }
    EXPECT_EQ(notices.count("did not stop"), 1);
    // The body outlives the service and can still ask its handle.
    body.release();
    body.waitFinished();
}

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
