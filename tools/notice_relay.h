// The host's notices while a plug-in session starts: held, so that the
// reason a port would not open becomes part of the one error line (or of
// the report of settings it refused); passed on once the session runs.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "host/notice.h"

namespace xtok::tools {

class NoticeRelay {
public:
    explicit NoticeRelay(host::Notice out) : out_(std::move(out)) {}

    /// Holds `text`, or passes it on once passOn() was called.
    void say(const std::string& text);
    /// The notices held so far, joined with "; ", and no longer held.
    std::string takeHeld();
    /// Passes on what is held, and from now on every notice at once.
    void passOn();

private:
    host::Notice out_;
    std::mutex mutex_;
    bool holding_ = true;
    std::vector<std::string> held_;
};

}  // namespace xtok::tools
