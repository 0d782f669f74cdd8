// A host lock held for a scope.
#pragma once

#include "xtokline/host.h"

namespace xtok {

class HostLock {
public:
    explicit HostLock(IMutex* mutex) : mutex_(mutex) {
        if (mutex_) {
            mutex_->Lock();
        }
    }
    ~HostLock() {
        if (mutex_) {
            mutex_->Unlock();
        }
    }
    HostLock(const HostLock&) = delete;
    HostLock& operator=(const HostLock&) = delete;

private:
    IMutex* mutex_;
};

}  // namespace xtok
