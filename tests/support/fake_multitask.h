// Tasks on real threads and recursive locks that record every lock and
// unlock with the calling thread, so tests can check which locks an
// operation takes and in which order.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/fake_service.h"

namespace xtok::test {

class FakeMultiTask;

class FakeTask final : public ITask {
public:
    FakeTask(IRunnable* body, int32_t priority, int32_t flags)
        : body_(body), priority_(priority), flags_(flags) {}
    ~FakeTask();
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    bool IsStopRequested() override { return stop_.load(); }
    int32_t Reserved3() override { return 0; }
    bool Start() override;

    void requestStop() { stop_ = true; }
    /// Waits up to `ms` for Run to return.
    bool waitEnded(int32_t ms);
    void join();
    int32_t priority() const { return priority_; }
    int32_t flags() const { return flags_; }

private:
    IRunnable* body_;
    int32_t priority_, flags_;
    std::atomic<bool> stop_{false};
    std::thread thread_;
    std::mutex mutex_;
    std::condition_variable endedChanged_;
    bool ended_ = false;
};

struct LockEvent {
    int mutex;  ///< 1-based number in creation order
    bool lock;  ///< lock (or a successful TryLock) / unlock
    std::thread::id thread;
};

class FakeMutex final : public IMutex {
public:
    FakeMutex(FakeMultiTask& owner, int number) : owner_(owner), number_(number) {}
    void* Destroy(unsigned) override { return this; }
    void Lock() override;
    bool TryLock() override;
    void Unlock() override;
    int number() const { return number_; }

private:
    FakeMultiTask& owner_;
    int number_;
    std::recursive_mutex mutex_;
};

class FakeMultiTask final : public FakeService<IMultiTask2> {
public:
    FakeMultiTask() : FakeService("IMultiTask2", 200) {}
    ~FakeMultiTask();

    int32_t Reserved4() override { return 0; }
    bool StopTask(ITask* task, int32_t timeoutMs) override;
    IMutex* CreateMutex(int32_t flags) override;
    void DestroyMutex(IMutex* mutex) override;
    void Sleep(int32_t ms) override;
    int32_t Reserved9() override { return 0; }
    int32_t Reserved10() override { return 0; }
    int32_t Reserved11() override { return 0; }
    ITask* CreateTask(IRunnable* body, int32_t priority, int32_t flags) override;

    // Faults to inject.
    std::atomic<bool> refuseTasks{false};
    std::atomic<bool> stopTimesOut{false};

    /// Lock events in order (kept up to a bound, so a long run cannot eat memory).
    std::vector<LockEvent> lockEvents() const;
    void clearLockEvents();
    void record(const LockEvent& event);

    int mutexesCreated() const;
    int mutexesAlive() const;
    int tasksCreated() const;
    /// The most recently created task, or null.
    FakeTask* lastTask() const;
    std::vector<int32_t> sleeps() const;
    std::vector<std::string> calls() const;  ///< "StopTask 1000", "CreateTask 3 0", ...

private:
    void log(const std::string& line);

    mutable std::mutex mutex_;
    std::vector<std::unique_ptr<FakeMutex>> mutexes_;
    std::vector<int> destroyed_;
    std::vector<std::unique_ptr<FakeTask>> tasks_;
    std::vector<LockEvent> events_;
    std::vector<int32_t> sleeps_;
    std::vector<std::string> calls_;
};

}  // namespace xtok::test
