#include "protocol/receive_task.h"

#include "protocol/protocol_xtok.h"

namespace xtok {

bool TaskBase::StartTask(int32_t priority, int32_t flags) {
    if (handle_) {
        return true;
    }
    if (!multiTask_) {
        return false;
    }
    handle_ = multiTask_->CreateTask(this, priority, flags);
    if (handle_) {
        // Set before Start: the host may run the body, and let it finish,
        // before Start returns.
        running_.store(true, std::memory_order_release);
        if (!handle_->Start()) {
            running_.store(false, std::memory_order_release);
        }
    }
    return handle_ != nullptr;
}

bool TaskBase::StopTask(int32_t timeoutMs) {
    if (!handle_) {
        return true;
    }
    if (!multiTask_->StopTask(handle_, timeoutMs)) {
        return false;
    }
    handle_ = nullptr;
    return true;
}

void TaskBase::Retire(int32_t waitMs) {
    constexpr int32_t kPollMs = 10;
    retired_.store(true, std::memory_order_release);
    for (int32_t waited = 0;
         running_.load(std::memory_order_acquire) && multiTask_ && waited < waitMs;
         waited += kPollMs) {
        multiTask_->Sleep(kPollMs);
    }
}

bool ReceiveTask::Run() {
    while (ShouldRun()) {
        protocol_.receiveToken();
        Yield(0);
    }
    Finished();
    return true;
}

}  // namespace xtok
