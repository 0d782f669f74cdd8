#include "tools/notice_relay.h"

namespace xtok::tools {

void NoticeRelay::say(const std::string& text) {
    std::unique_lock<std::mutex> lock(mutex_);
    if (holding_) {
        held_.push_back(text);
        return;
    }
    lock.unlock();
    if (out_) {
        out_(text);
    }
}

std::string NoticeRelay::takeHeld() {
    std::vector<std::string> held;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        held.swap(held_);
    }
    std::string joined;
    for (const std::string& line : held) {
        joined += (joined.empty() ? "" : "; ") + line;
    }
    return joined;
}

void NoticeRelay::passOn() {
    std::vector<std::string> held;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        holding_ = false;
        held.swap(held_);
    }
    for (const std::string& line : held) {
        say(line);
    }
}

}  // namespace xtok::tools
