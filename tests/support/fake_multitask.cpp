#include "tests/support/fake_multitask.h"

#include <algorithm>
#include <chrono>

namespace xtok::test {

FakeTask::~FakeTask() {
    requestStop();
    if (thread_.joinable()) {
        thread_.join();
    }
}

bool FakeTask::Start() {
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

FakeMultiTask::~FakeMultiTask() {
    for (auto& task : tasks_) {
        task->requestStop();
    }
}

void FakeMultiTask::log(const std::string& line) {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.push_back(line);
}

bool FakeMultiTask::StopTask(ITask* task, int32_t timeoutMs) {
    log("StopTask " + std::to_string(timeoutMs));
    if (stopTimesOut) {
        return false;  // the task goes on; the destructor ends it
    }
    auto* fake = static_cast<FakeTask*>(task);
    fake->requestStop();
    return fake->waitEnded(timeoutMs);
}

IMutex* FakeMultiTask::CreateMutex(int32_t flags) {
    log("CreateMutex " + std::to_string(flags));
    std::lock_guard<std::mutex> lock(mutex_);
    mutexes_.push_back(std::make_unique<FakeMutex>());
    return mutexes_.back().get();
}

void FakeMultiTask::DestroyMutex(IMutex* mutex) {
    log("DestroyMutex");
    std::lock_guard<std::mutex> lock(mutex_);
    mutexes_.erase(std::remove_if(mutexes_.begin(), mutexes_.end(),
                                  [mutex](const auto& m) { return m.get() == mutex; }),
                   mutexes_.end());
}

void FakeMultiTask::Sleep(int32_t ms) {
    // Not waited through: a short pause keeps an idle receive task from
    // spinning a core while a test runs.
    idleSleeps_ += ms >= 10;
    std::this_thread::sleep_for(std::chrono::microseconds(ms > 0 ? 200 : 0));
}

ITask* FakeMultiTask::CreateTask(IRunnable* body, int32_t priority, int32_t flags) {
    log("CreateTask " + std::to_string(priority) + " " + std::to_string(flags));
    if (refuseTasks) {
        return nullptr;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    tasks_.push_back(std::make_unique<FakeTask>(body));
    return tasks_.back().get();
}

std::vector<std::string> FakeMultiTask::calls() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return calls_;
}

int FakeMultiTask::mutexesAlive() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(mutexes_.size());
}

FakeTask* FakeMultiTask::lastTask() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return tasks_.empty() ? nullptr : tasks_.back().get();
}

}  // namespace xtok::test
