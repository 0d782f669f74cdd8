// The receive task: a host task that runs the protocol's receive passes
// for as long as the protocol is started.
#pragma once

#include <atomic>
#include <cstdint>

#include "xtokline/host.h"

namespace xtok {

class Protocol_XTOK;

/// A body for a host task, with the host's task handle.
class TaskBase : public IRunnable {
public:
    explicit TaskBase(IMultiTask2* multiTask) : multiTask_(multiTask) {}
    /// Creates and starts the host task once; true when a task exists.
    bool StartTask(int32_t priority, int32_t flags);
    /// Asks the host to end the task, waiting up to `timeoutMs`; the handle
    /// is forgotten only when the task really ended. True without a task.
    bool StopTask(int32_t timeoutMs);
    /// True when the host asks the task to end, or when there is no task.
    bool IsStopRequested() { return !handle_ || handle_->IsStopRequested(); }
    void Yield(int32_t ms) {
        if (multiTask_) {
            multiTask_->Sleep(ms);
        }
    }
    bool HasTask() const { return handle_ != nullptr; }
    /// Ends the body for good, whatever the host's StopTask answered: it
    /// leaves its loop at the next pass, and this returns once it has, or
    /// after about `waitMs` should the host keep it inside one of its own
    /// calls for longer. The object may go away only after this.
    void Retire(int32_t waitMs);

protected:
    ~TaskBase() = default;
    /// For the body's loop: false once the host asks the task to end or the
    /// task has been retired.
    bool ShouldRun() { return !retired_.load(std::memory_order_acquire) && !IsStopRequested(); }
    /// The body's last touch of this object, as it returns.
    void Finished() { running_.store(false, std::memory_order_release); }

private:
    ITask* handle_ = nullptr;
    IMultiTask2* multiTask_;
    std::atomic<bool> running_{false};  ///< the host has the body running
    std::atomic<bool> retired_{false};
};

class ReceiveTask final : public TaskBase {
public:
    ReceiveTask(IMultiTask2* multiTask, Protocol_XTOK& protocol)
        : TaskBase(multiTask), protocol_(protocol) {}
    /// The task is a member of its protocol; the host never frees it.
    void* Destroy(unsigned) override { return this; }
    /// Receive passes until the host asks the task to stop.
    bool Run() override;

private:
    Protocol_XTOK& protocol_;
};

}  // namespace xtok
