#include "tools/active_framing.h"

namespace xtok::tools {

ActiveFraming FramingState::get() const {
    std::unique_lock<std::mutex> lock(mutex_);
    known_.wait_for(lock, std::chrono::seconds(2), [this] { return set_; });
    return framing_;
}

void FramingState::set(const ActiveFraming& framing) {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        framing_ = framing;
        set_ = true;
    }
    known_.notify_all();
}

}  // namespace xtok::tools
