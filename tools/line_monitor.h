// The line monitor: a tap on the host's serial ports that turns what it hears
// into lines for the console's thread to print: bytes in both directions,
// tokens as the plug-in frames them, link changes and drops of a full queue.
#pragma once

#include <atomic>
#include <mutex>

#include "host/line_tap.h"
#include "tools/active_framing.h"
#include "tools/event_lines.h"
#include "tools/queue_mirror.h"
#include "tools/token_framer.h"

namespace xtok::tools {

class LineMonitor final : public host::LineTap {
public:
    /// With `json`, its lines are JSON objects.
    LineMonitor(FramingSource framing, QueueMirror& queue, bool json);

    void received(const uint8_t* bytes, std::size_t count, host::WallClock::time_point at) override;
    void delivered(uint8_t byte) override;
    void timedOut(int32_t timeoutMs) override;
    void sent(const uint8_t* data, std::size_t written, std::size_t asked,
              host::WallClock::time_point at) override;
    void link(const host::LinkEvent& event) override;

    /// Follows the framing afresh, as from the start of a pass: switched on
    /// while a token is under way, the monitor may show only its end.
    void restart();
    /// Whether it makes lines; it follows the line and the queue either way.
    void show(bool on) { showing_ = on; }
    /// Makes no more lines after `count` tokens; 0 for no end.
    void stopAfter(long count) { tokenLimit_ = count; }
    /// True once the token limit is reached.
    bool finished() const { return finished_; }
    EventLines& lines() { return lines_; }

private:
    void push(std::string line);
    void framed(const FramedToken& token);

    FramingSource framing_;
    QueueMirror& queue_;
    const bool json_;
    EventLines lines_;
    // The receive task's, and a close from the runtime's thread.
    std::mutex framerMutex_;
    TokenFramer framer_;
    host::WallClock::time_point arrival_{};
    long tokens_ = 0;
    std::atomic<long> tokenLimit_{0};
    std::atomic<bool> finished_{false};
    std::atomic<bool> showing_{false};
};

}  // namespace xtok::tools
