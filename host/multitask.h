// "IMultiTask2": tasks on std::thread, recursive locks, sleep.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <thread>

#include "host/host_service.h"
#include "host/notice.h"

namespace xtok::host {

/// One task handle. The runtime's model: the plug-in creates it, starts it,
/// and asks it to stop; the host frees it once a stop has seen it end.
class Task final : public ITask {
public:
    explicit Task(IRunnable* body) : body_(body) {}
    Task(const Task&) = delete;
    Task& operator=(const Task&) = delete;

    // Freed by the host after a successful StopTask only.
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    bool IsStopRequested() override;
    int32_t Reserved3() override { return 0; }
    bool Start() override;

    void requestStop();
    /// Waits up to `timeoutMs` for the body to have returned (or never to
    /// have been started); then the thread is joined.
    bool waitEnded(int32_t timeoutMs);
    /// Lets a body that does not end run on without this handle's thread
    /// object; the handle itself must then stay alive (the body may still
    /// ask it IsStopRequested).
    void detach();

private:
    void run();

    IRunnable* body_;
    std::thread thread_;
    std::mutex mutex_;
    std::condition_variable ended_;
    bool started_ = false;
    bool running_ = false;
    // Asked once per pass of a receive loop: no lock for it.
    std::atomic<bool> stopRequested_{false};
};

class MultiTask final : public HostService<IMultiTask2> {
public:
    /// At destruction, tasks still registered are asked to stop and given
    /// `shutdownGraceMs` to end; see ~MultiTask.
    explicit MultiTask(Notice notice = printNotice, int32_t shutdownGraceMs = 1000);
    ~MultiTask();

    int32_t Reserved4() override { return 0; }
    bool StopTask(ITask* task, int32_t timeoutMs) override;
    IMutex* CreateMutex(int32_t flags) override;
    void DestroyMutex(IMutex* mutex) override;
    void Sleep(int32_t ms) override;
    int32_t Reserved9() override { return 0; }
    int32_t Reserved10() override { return 0; }
    int32_t Reserved11() override { return 0; }
    ITask* CreateTask(IRunnable* body, int32_t priority, int32_t flags) override;

    /// Tasks created and not yet stopped successfully (started or not).
    int liveTasks() const;

private:
    std::unique_ptr<Task> take(ITask* task);
    /// Ends a StopTask: a handle still running goes back to the registry.
    void settle(std::unique_ptr<Task> task);

    Notice notice_;
    int32_t shutdownGraceMs_;
    mutable std::mutex mutex_;
    std::map<ITask*, std::unique_ptr<Task>> tasks_;
    // Handles taken out of tasks_ by a StopTask that is waiting on them.
    int stopping_ = 0;
};

}  // namespace xtok::host
