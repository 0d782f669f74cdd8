#include "tools/active_framing.h"

#include <vector>

#include "xtokline/text.h"

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

// The words as the plug-in's console splits them: at each blank.
void FramingState::noteCommand(const std::string& line) {
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    if (words.size() < 2) {
        return;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    int32_t gap = 0;
    if (words[0] == "set_rxPrefix") {
        framing_.rx.prefix = words[1];
    } else if (words[0] == "set_rxSuffix") {
        framing_.rx.suffix = words[1];
    } else if (words[0] == "set_rxGap" && parseClamped(words[1], 10, gap)) {
        framing_.rx.gap = gap;
    }
}

}  // namespace xtok::tools
