// The plug-in's token queue as xtok-host sees it from outside: the tokens its
// line monitor saw framed and the acknowledgements the host itself made. It
// lets the monitor say when a full queue drops its oldest token, and lets a
// token with a zero byte be shown whole, which the plug-in's rx_token cannot.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <string>

#include "host/line_tap.h"

namespace xtok::tools {

class QueueMirror {
public:
    /// A token framed at `arrived` while `limit` is in force. True when the
    /// plug-in drops its oldest token for it; `dropped` is then the count so far.
    bool framed(const std::string& bytes, host::WallClock::time_point arrived, int32_t limit,
                long& dropped);
    /// The host removed the oldest token (token_ack).
    void acknowledged();
    /// The queue was emptied (SP_Done, "token_ack all").
    void cleared();
    /// `count` tokens wait whose bytes the monitor did not see.
    void restart(long count);
    /// The oldest token's received bytes and the time its last byte arrived,
    /// when the monitor saw it framed.
    bool oldest(std::string& bytes, host::WallClock::time_point& arrived) const;

private:
    void removeOldest();

    mutable std::mutex mutex_;
    long count_ = 0;
    long dropped_ = 0;
    struct Seen {
        std::string bytes;
        host::WallClock::time_point arrived;
    };
    // Copies of the newest tokens, at most kKept of them.
    std::deque<Seen> newest_;
};

}  // namespace xtok::tools
