#include "host/multitask.h"

#include <linux/futex.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <system_error>
#include <vector>

#include "host/recursive_mutex.h"

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

IMutex* MultiTask::CreateMutex(int32_t) {
    return new (std::nothrow) RecursiveMutex();
}

void MultiTask::DestroyMutex(IMutex* mutex) {
    delete static_cast<RecursiveMutex*>(mutex);
}

void MultiTask::Sleep(int32_t ms) {
    if (ms <= 0) {
        // Both sequentially consistent, against those of waitForTaskYield: a
        // waiter either sees the new count or is seen here and woken.
        yields_.fetch_add(1);
        if (yieldWaiters_.load() > 0) {
            syscall(SYS_futex, reinterpret_cast<uint32_t*>(&yields_), FUTEX_WAKE_PRIVATE, INT_MAX,
                    nullptr, nullptr, 0);
        }
        // Nothing more. On the panel, Sleep(0) hands the rest of a time
        // slice to threads of the same priority, which a strict-priority
        // scheduler would not run otherwise. Here every task is an ordinary
        // thread that the scheduler preempts and shares out anyway, and the
        // plug-in's receive task says Sleep(0) after every token: giving up
        // the processor each time only cost a system call per token and moved
        // the threads from one processor to the other at line rate.
    } else {
        std::this_thread::sleep_for(std::chrono::milliseconds(ms));
    }
}

uint32_t MultiTask::waitForTaskYield(uint32_t seen, int32_t timeoutMs) {
    static_assert(sizeof(std::atomic<uint32_t>) == sizeof(uint32_t), "a futex word is 32 bits");
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(timeoutMs);
    yieldWaiters_.fetch_add(1);
    uint32_t now;
    while ((now = yields_.load()) == seen) {
        auto left = deadline - std::chrono::steady_clock::now();
        if (left <= std::chrono::nanoseconds::zero()) {
            break;
        }
        auto ns = std::chrono::duration_cast<std::chrono::nanoseconds>(left).count();
        timespec relative{static_cast<time_t>(ns / 1000000000), static_cast<long>(ns % 1000000000)};
        syscall(SYS_futex, reinterpret_cast<uint32_t*>(&yields_), FUTEX_WAIT_PRIVATE, seen,
                &relative, nullptr, 0);
    }
    yieldWaiters_.fetch_sub(1);
    return now;
}

}  // namespace xtok::host
