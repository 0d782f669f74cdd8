// Tasks on real threads and recursive locks, with the faults a host can
// have: no task made, a stop that times out.
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

class FakeTask final : public ITask {
public:
    explicit FakeTask(IRunnable* body) : body_(body) {}
    ~FakeTask();
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    bool IsStopRequested() override { return stop_.load(); }
    int32_t Reserved3() override { return 0; }
    bool Start() override;

    void requestStop() { stop_ = true; }
    /// Waits up to `ms` for Run to return.
    bool waitEnded(int32_t ms);

private:
    IRunnable* body_;
    std::atomic<bool> stop_{false};
    std::thread thread_;
    std::mutex mutex_;
    std::condition_variable endedChanged_;
    bool ended_ = false;
};

class FakeMutex final : public IMutex {
public:
    void* Destroy(unsigned) override { return this; }
    void Lock() override { mutex_.lock(); }
    bool TryLock() override { return mutex_.try_lock(); }
    void Unlock() override { mutex_.unlock(); }

private:
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

    std::atomic<bool> refuseTasks{false}, stopTimesOut{false};

    /// "CreateTask 3 0", "StopTask 1000", "CreateMutex 0", "DestroyMutex", in order.
    std::vector<std::string> calls() const;
    int mutexesAlive() const;
    /// The `index`th lock made (0 first), or null.
    FakeMutex* mutex(std::size_t index) const {
        std::lock_guard<std::mutex> lock(mutex_);
        return index < mutexes_.size() ? mutexes_[index].get() : nullptr;
    }
    /// The most recently made task, or null.
    FakeTask* lastTask() const;
    /// Sleeps of 10 ms or more: a receive task idling.
    long idleSleeps() const { return idleSleeps_.load(); }

private:
    void log(const std::string& line);

    mutable std::mutex mutex_;
    std::vector<std::unique_ptr<FakeMutex>> mutexes_;
    std::vector<std::unique_ptr<FakeTask>> tasks_;
    std::vector<std::string> calls_;
    std::atomic<long> idleSleeps_{0};
};

}  // namespace xtok::test
