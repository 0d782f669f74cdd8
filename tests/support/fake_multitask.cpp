#include "tests/support/fake_multitask.h"

#include <algorithm>
#include <chrono>

namespace xtok::test {

namespace {
// Enough for any lock-order check; a stress run simply stops recording.
constexpr std::size_t kMaxEvents = 200000;
constexpr std::size_t kMaxSleeps = 10000;
}  // namespace

FakeTask::~FakeTask() {
    requestStop();
    join();
}

bool FakeTask::Start() {
    if (thread_.joinable()) {
        return false;
    }
    thread_ = std::thread([this] {
        body_->Run();
        std::lock_guard<std::mutex> lock(mutex_);
        ended_ = true;
        endedChanged_.notify_all();
    });
    return true;
}

bool FakeTask::waitEnded(int32_t ms) {
    std::unique_lock<std::mutex> lock(mutex_);
    return endedChanged_.wait_for(lock, std::chrono::milliseconds(std::max(ms, 0)),
                                  [this] { return ended_; });
}

void FakeTask::join() {
    if (thread_.joinable()) {
        thread_.join();
    }
}

void FakeMutex::Lock() {
    mutex_.lock();
    owner_.record({number_, true, std::this_thread::get_id()});
}

bool FakeMutex::TryLock() {
    if (!mutex_.try_lock()) {
        return false;
    }
    owner_.record({number_, true, std::this_thread::get_id()});
    return true;
}

void FakeMutex::Unlock() {
    owner_.record({number_, false, std::this_thread::get_id()});
    mutex_.unlock();
}

FakeMultiTask::~FakeMultiTask() {
    for (auto& task : tasks_) {
        task->requestStop();
    }
    for (auto& task : tasks_) {
        task->join();
    }
}

void FakeMultiTask::log(const std::string& line) {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.push_back(line);
}

bool FakeMultiTask::StopTask(ITask* task, int32_t timeoutMs) {
    log("StopTask " + std::to_string(timeoutMs));
    auto* fake = static_cast<FakeTask*>(task);
    if (stopTimesOut) {
        return false;  // the task goes on; the destructor ends it
    }
    fake->requestStop();
    return fake->waitEnded(timeoutMs);
}

IMutex* FakeMultiTask::CreateMutex(int32_t flags) {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.push_back("CreateMutex " + std::to_string(flags));
    mutexes_.push_back(std::make_unique<FakeMutex>(*this, static_cast<int>(mutexes_.size()) + 1));
    return mutexes_.back().get();
}

void FakeMultiTask::DestroyMutex(IMutex* mutex) {
    std::lock_guard<std::mutex> lock(mutex_);
    int number = mutex ? static_cast<FakeMutex*>(mutex)->number() : 0;
    calls_.push_back("DestroyMutex " + std::to_string(number));
    destroyed_.push_back(number);
}

void FakeMultiTask::Sleep(int32_t ms) {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        if (sleeps_.size() < kMaxSleeps) {
            sleeps_.push_back(ms);
        }
    }
    // Idle sleeps are not waited through; a short pause keeps an idle
    // receive task from spinning a core while a test runs.
    if (ms > 0) {
        std::this_thread::sleep_for(std::chrono::microseconds(200));
    } else {
        std::this_thread::yield();
    }
}

ITask* FakeMultiTask::CreateTask(IRunnable* body, int32_t priority, int32_t flags) {
    log("CreateTask " + std::to_string(priority) + " " + std::to_string(flags));
    if (refuseTasks) {
        return nullptr;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    tasks_.push_back(std::make_unique<FakeTask>(body, priority, flags));
    return tasks_.back().get();
}

void FakeMultiTask::record(const LockEvent& event) {
    std::lock_guard<std::mutex> lock(mutex_);
    if (events_.size() < kMaxEvents) {
        events_.push_back(event);
    }
}

std::vector<LockEvent> FakeMultiTask::lockEvents() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return events_;
}

void FakeMultiTask::clearLockEvents() {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.clear();
}

int FakeMultiTask::mutexesCreated() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(mutexes_.size());
}

int FakeMultiTask::mutexesAlive() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(mutexes_.size() - destroyed_.size());
}

int FakeMultiTask::tasksCreated() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(tasks_.size());
}

FakeTask* FakeMultiTask::lastTask() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return tasks_.empty() ? nullptr : tasks_.back().get();
}

std::vector<int32_t> FakeMultiTask::sleeps() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return sleeps_;
}

std::vector<std::string> FakeMultiTask::calls() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return calls_;
}

}  // namespace xtok::test
