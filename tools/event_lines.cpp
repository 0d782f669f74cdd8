#include "tools/event_lines.h"

#include <fcntl.h>
#include <unistd.h>

namespace xtok::tools {

namespace {

// A few seconds of a saturated line's monitor lines.
constexpr std::size_t kMaxWaitingBytes = 8 << 20;

}  // namespace

EventLines::EventLines() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC | O_NONBLOCK) == 0) {
        wakeRead_ = ends[0];
        wakeWrite_ = ends[1];
    }
}

EventLines::~EventLines() {
    for (int fd : {wakeRead_, wakeWrite_}) {
        if (fd >= 0) {
            ::close(fd);
        }
    }
}

void EventLines::push(std::string line) {
    std::lock_guard<std::mutex> lock(mutex_);
    if (bytes_ + line.size() > kMaxWaitingBytes) {
        ++dropped_;
        return;
    }
    bytes_ += line.size();
    lines_.push_back(std::move(line));
    if (lines_.size() == 1 && wakeWrite_ >= 0) {
        // One byte per batch; a full pipe already wakes the reader.
        [[maybe_unused]] ssize_t ignored = ::write(wakeWrite_, "", 1);
    }
}

std::vector<std::string> EventLines::take(std::size_t& dropped) {
    std::vector<std::string> taken;
    std::lock_guard<std::mutex> lock(mutex_);
    // Emptied with the lines, so that the next push wakes the reader again.
    char drain[64];
    while (wakeRead_ >= 0 && ::read(wakeRead_, drain, sizeof drain) > 0) {
    }
    taken.swap(lines_);
    dropped = dropped_;
    dropped_ = 0;
    bytes_ = 0;
    return taken;
}

}  // namespace xtok::tools
