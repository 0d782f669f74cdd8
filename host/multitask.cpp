#include "host/multitask.h"

#include <time.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <system_error>
#include <vector>

namespace xtok::host {

bool Task::IsStopRequested() {
    return stopRequested_.load(std::memory_order_acquire);
}

bool Task::Start() {
    std::lock_guard<std::mutex> lock(mutex_);
    if (started_) {
        return false;
    }
    try {
        thread_ = std::thread(&Task::run, this);
    } catch (const std::system_error&) {
        return false;
    }
    started_ = true;
    running_ = true;
    return true;
}

void Task::run() {
    try {
        body_->Run();
    } catch (...) {
        // Nothing may throw across the contract; if a body does, the task
        // still counts as ended instead of taking the process down.
    }
    std::lock_guard<std::mutex> lock(mutex_);
    running_ = false;
    ended_.notify_all();
}

void Task::requestStop() {
    stopRequested_.store(true, std::memory_order_release);
}

bool Task::waitEnded(int32_t timeoutMs) {
    std::unique_lock<std::mutex> lock(mutex_);
    if (!ended_.wait_for(lock, std::chrono::milliseconds(timeoutMs > 0 ? timeoutMs : 0),
                         [this] { return !running_; })) {
        return false;
    }
    lock.unlock();
    if (thread_.joinable()) {
        thread_.join();
    }
    return true;
}

void Task::detach() {
    if (thread_.joinable()) {
        thread_.detach();
    }
}

namespace {

// Handles of tasks that would not stop: never freed, since their bodies may
// still ask them, but kept reachable so that leak checkers see the intent.
void keepForever(std::unique_ptr<Task> task) {
    static std::mutex mutex;
    static auto* kept = new std::vector<Task*>();
    std::lock_guard<std::mutex> lock(mutex);
    kept->push_back(task.release());
}

}  // namespace

MultiTask::MultiTask(Notice notice, int32_t shutdownGraceMs)
    : HostService("IMultiTask2"), notice_(std::move(notice)), shutdownGraceMs_(shutdownGraceMs) {}

// A plug-in should have stopped its tasks; one that did not gets a grace
// period. A body that still does not return cannot be killed safely, so its
// thread is detached and its handle kept for good: the body may go on
// asking IsStopRequested until the process ends. Whoever unloads the plug-in
// must keep its code mapped while liveTasks() is not 0.
MultiTask::~MultiTask() {
    std::map<ITask*, std::unique_ptr<Task>> left;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        left.swap(tasks_);
    }
    for (auto& entry : left) {
        entry.second->requestStop();
    }
    // One grace period for all of them, not one each.
    auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(shutdownGraceMs_);
    for (auto& entry : left) {
        auto remaining = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        if (!entry.second->waitEnded(static_cast<int32_t>(remaining.count()))) {
            notice_("a plug-in task did not stop; leaving it running");
            entry.second->detach();
            keepForever(std::move(entry.second));
        }
    }
}

ITask* MultiTask::CreateTask(IRunnable* body, int32_t, int32_t) {
    // Priority and flags are the runtime's scheduling hints; ordinary Linux
    // threads cannot be raised without privileges, so all tasks run alike.
    if (!body) {
        return nullptr;
    }
    auto task = std::make_unique<Task>(body);
    ITask* handle = task.get();
    std::lock_guard<std::mutex> lock(mutex_);
    tasks_.emplace(handle, std::move(task));
    return handle;
}

std::unique_ptr<Task> MultiTask::take(ITask* task) {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = tasks_.find(task);
    if (it == tasks_.end()) {
        return nullptr;
    }
    std::unique_ptr<Task> owned = std::move(it->second);
    tasks_.erase(it);
    ++stopping_;
    return owned;
}

void MultiTask::settle(std::unique_ptr<Task> task) {
    std::lock_guard<std::mutex> lock(mutex_);
    --stopping_;
    if (task) {
        ITask* handle = task.get();
        tasks_.emplace(handle, std::move(task));
    }
}

// The handle leaves the registry while it is waited for, so that a second
// StopTask on it meanwhile answers false instead of freeing it under us.
bool MultiTask::StopTask(ITask* task, int32_t timeoutMs) {
    std::unique_ptr<Task> owned = take(task);
    if (!owned) {
        return false;
    }
    owned->requestStop();
    bool ended = owned->waitEnded(timeoutMs);
    if (ended) {
        owned.reset();
    }
    settle(std::move(owned));
    return ended;
}

int MultiTask::liveTasks() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(tasks_.size()) + stopping_;
}

namespace {

/// The host's lock: the standard library's recursive mutex. A lock that no
/// other thread wants costs one uncontended atomic operation each way.
class Mutex final : public IMutex {
public:
    // Freed by DestroyMutex only.
    void* Destroy(unsigned) override { return this; }
    void Lock() override { mutex_.lock(); }
    bool TryLock() override { return mutex_.try_lock(); }
    void Unlock() override { mutex_.unlock(); }

private:
    std::recursive_mutex mutex_;
};

}  // namespace

IMutex* MultiTask::CreateMutex(int32_t) {
    return new (std::nothrow) Mutex();
}

void MultiTask::DestroyMutex(IMutex* mutex) {
    delete static_cast<Mutex*>(mutex);
}

void MultiTask::Sleep(int32_t ms) {
    // Sleep(0) does nothing here. On the panel it hands the rest of a time
    // slice to threads of the same priority, which a strict-priority
    // scheduler would not run otherwise; here every task is an ordinary
    // thread that the scheduler shares out anyway, and the plug-in's receive
    // task says Sleep(0) after every token.
    if (ms > 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(ms));
    }
}

}  // namespace xtok::host
