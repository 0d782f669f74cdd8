#include "tools/line_monitor.h"

#include "tools/monitor_lines.h"

namespace xtok::tools {

LineMonitor::LineMonitor(FramingSource framing, QueueMirror& queue, bool json)
    : framing_(std::move(framing)),
      queue_(queue),
      json_(json),
      framer_([this] { return framing_().rx; }) {}

void LineMonitor::push(std::string line) {
    if (!finished_ && showing_) {
        lines_.push(std::move(line));
    }
}

void LineMonitor::restart() {
    std::lock_guard<std::mutex> lock(framerMutex_);
    framer_.restart();
}

void LineMonitor::received(const uint8_t* bytes, std::size_t count,
                           host::WallClock::time_point at) {
    {
        std::lock_guard<std::mutex> lock(framerMutex_);
        arrival_ = at;  // the time of every byte of this read
    }
    push(receivedLine(std::string(reinterpret_cast<const char*>(bytes), count), at, json_));
}

void LineMonitor::delivered(uint8_t byte) {
    FramedToken token;
    std::lock_guard<std::mutex> lock(framerMutex_);
    if (framer_.byte(byte, token)) {
        framed(token);
    }
}

void LineMonitor::timedOut(int32_t timeoutMs) {
    FramedToken token;
    std::lock_guard<std::mutex> lock(framerMutex_);
    if (framer_.silence(timeoutMs, token)) {
        framed(token);
    }
}

// With the framer's lock held: the token's line, then the drop it causes.
void LineMonitor::framed(const FramedToken& token) {
    push(tokenEventLine(token, arrival_, json_));
    const int32_t limit = framing_().queueLimit;
    long dropped = 0;
    if (queue_.framed(token.bytes, arrival_, limit, dropped)) {
        push(queueDropLine(dropped, limit, arrival_, json_));
    }
    const long limitTokens = tokenLimit_;
    if (limitTokens > 0 && ++tokens_ >= limitTokens) {
        finished_ = true;
    }
}

void LineMonitor::sent(const uint8_t* data, std::size_t written, std::size_t asked,
                       host::WallClock::time_point at) {
    push(sentLine(std::string(reinterpret_cast<const char*>(data), written), asked, at, json_));
}

void LineMonitor::link(const host::LinkEvent& event) {
    if (event.change == host::LinkChange::Opened || event.change == host::LinkChange::Closed) {
        restart();  // the plug-in's pass ends with its port
    }
    push(linkLine(event, json_));
}

}  // namespace xtok::tools
