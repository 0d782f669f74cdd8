#include "tools/active_framing.h"

namespace xtok::tools {

ActiveFraming FramingState::get() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return framing_;
}

void FramingState::set(const ActiveFraming& framing) {
    std::lock_guard<std::mutex> lock(mutex_);
    framing_ = framing;
}

}  // namespace xtok::tools
