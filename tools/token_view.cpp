#include "tools/token_view.h"

#include <time.h>

#include <cstdio>

#include "tools/byte_text.h"

namespace xtok::tools {

namespace {

std::string format(std::chrono::system_clock::time_point when, bool utc, const char* pattern) {
    using namespace std::chrono;
    time_t seconds = system_clock::to_time_t(when);
    long millis =
        static_cast<long>(duration_cast<milliseconds>(when.time_since_epoch()).count() % 1000);
    tm parts{};
    if (utc) {
        gmtime_r(&seconds, &parts);
    } else {
        localtime_r(&seconds, &parts);
    }
    char text[64];
    std::size_t length = strftime(text, sizeof text, pattern, &parts);
    std::snprintf(text + length, sizeof text - length, ".%03ld%s", millis < 0 ? 0 : millis,
                  utc ? "Z" : "");
    return text;
}

}  // namespace

std::string clockText(std::chrono::system_clock::time_point when) {
    return format(when, false, "%H:%M:%S");
}

std::string isoTime(std::chrono::system_clock::time_point when) {
    return format(when, true, "%Y-%m-%dT%H:%M:%S");
}

std::string bytesView(const std::string& bytes) {
    std::string view = "\"" + escapeBytes(bytes) + "\"";
    return bytes.empty() ? view : view + "  " + hexBytes(bytes);
}

std::string tokenLine(const Token& token) {
    std::string line = bytesView(token.text) + "  (" + std::to_string(token.length) +
                       (token.length == 1 ? " byte" : " bytes");
    if (token.length > token.text.size()) {
        // The plug-in hands a raw token out as text, up to its first zero
        // byte; only a monitor that saw it framed knows the rest.
        line += ", shown up to its first zero byte; with the monitor on it shows whole";
    }
    return line + ")";
}

}  // namespace xtok::tools
