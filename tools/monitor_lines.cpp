#include "tools/monitor_lines.h"

#include "tools/json_line.h"
#include "tools/token_view.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

std::string head(WallTime at, const char* kind) {
    std::string text = clockText(at) + "  " + kind;
    return text + std::string(text.size() < 21 ? 21 - text.size() : 1, ' ');
}

JsonLine event(const char* kind, WallTime at) {
    JsonLine json;
    json.text("event", kind).text("time", isoTime(at));
    return json;
}

JsonLine& withBytes(JsonLine& json, const std::string& bytes) {
    return json.text("hex", bytesToHexText(bytes.data(), bytes.size()))
        .text("text", bytes)
        .number("length", static_cast<int64_t>(bytes.size()));
}

std::string byteCount(std::size_t count) {
    return std::to_string(count) + (count == 1 ? " byte" : " bytes");
}

}  // namespace

std::string receivedLine(const std::string& bytes, WallTime at, bool json) {
    if (json) {
        JsonLine line = event("rx", at);
        return withBytes(line, bytes).str();
    }
    return head(at, "rx") + bytesView(bytes);
}

std::string sentLine(const std::string& bytes, std::size_t asked, WallTime at, bool json) {
    const bool whole = bytes.size() == asked;
    if (json) {
        JsonLine line = event("tx", at);
        withBytes(line, bytes);
        return (whole ? line : line.number("asked", static_cast<int64_t>(asked))).str();
    }
    return head(at, "tx") + bytesView(bytes) +
           (whole ? ""
                  : "  (" + std::to_string(bytes.size()) + " of " + byteCount(asked) +
                        ": the line took no more)");
}

std::string tokenEventLine(const FramedToken& token, WallTime at, bool json) {
    if (json) {
        JsonLine line = event("token", at);
        line.text("end", tokenEndName(token.end));
        return withBytes(line, token.bytes).str();
    }
    return head(at, "token") + tokenEndName(token.end) + "  " + bytesView(token.bytes) + "  (" +
           byteCount(token.bytes.size()) + ")";
}

std::string linkLine(const host::LinkEvent& e, bool json) {
    if (json) {
        JsonLine line = event("link", e.at);
        line.text("link", host::linkChangeName(e.change)).text("device", e.device);
        if (!e.settings.empty()) {
            line.text("settings", e.settings);
        }
        return (e.reason.empty() ? line : line.text("reason", e.reason)).str();
    }
    return head(e.at, "link") + host::linkChangeName(e.change) + " " + e.device +
           (e.settings.empty() ? "" : " " + e.settings) +
           (e.reason.empty() ? "" : " (" + e.reason + ")");
}

std::string queueDropLine(long droppedSoFar, int32_t limit, WallTime at, bool json) {
    if (json) {
        return event("queue", at).number("limit", limit).number("droppedSoFar", droppedSoFar).str();
    }
    return head(at, "queue") + "full at " + std::to_string(limit) +
           " tokens: the oldest was dropped (" + std::to_string(droppedSoFar) + " dropped so far)";
}

std::string linesDroppedLine(std::size_t count, bool json) {
    const WallTime now = std::chrono::system_clock::now();
    if (json) {
        return event("monitor", now).number("linesDropped", static_cast<int64_t>(count)).str();
    }
    return head(now, "monitor") + std::to_string(count) + " lines dropped: the console fell behind";
}

std::string lineStateText(const host::LinkEvent& latest) {
    const bool open = latest.change == host::LinkChange::Opened;
    return "line: " + latest.device + " " + host::linkChangeName(latest.change) +
           (open ? " since " : " at ") + clockText(latest.at) +
           (latest.reason.empty() ? "" : " (" + latest.reason + ")");
}

}  // namespace xtok::tools
