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
        handle_->Start();
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

bool ReceiveTask::Run() {
    while (!IsStopRequested()) {
        protocol_.receiveToken();
        Yield(0);
    }
    return true;
}

}  // namespace xtok
