// Cutting the received byte stream into tokens by prefix, suffix and gap.
#include <cstdint>
#include <string>

#include "module/service_table.h"
#include "protocol/hex_text.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"

namespace xtok {

namespace {

// A frame (prefix and suffix included) past this many bytes is dropped.
constexpr std::size_t kMaxFrame = 1000;
// A gap of 0 stands for this many milliseconds of silence.
constexpr int32_t kDefaultGap = 500;
constexpr int32_t kIdleSleepMs = 10;

bool endsWith(const std::string& frame, const std::string& tail) {
    return frame.size() >= tail.size() &&
           frame.compare(frame.size() - tail.size(), tail.size(), tail) == 0;
}

}  // namespace

void Protocol_XTOK::pushToken(const char* bytes, std::size_t length) {
    HostLock lock(queueLock_);
    tokens_.push(bytes, length, tokenQueueSize_.load(std::memory_order_relaxed),
                 hexTokens_.load(std::memory_order_relaxed));
}

Protocol_XTOK::ReadResult Protocol_XTOK::readByteLocked(uint8_t& byte, int32_t timeoutMs) {
    HostLock lock(portLock_);
    // Checked under the lock: a close by "connect" waits for this read.
    if (!connected_.load(std::memory_order_acquire)) {
        return ReadResult::Disconnected;
    }
    return port_.ReadByte(&byte, timeoutMs) ? ReadResult::Byte : ReadResult::Timeout;
}

void Protocol_XTOK::receiveToken() {
    if (!connected_.load(std::memory_order_acquire)) {
        if (IMultiTask2* tasks = services().multiTask) {
            tasks->Sleep(kIdleSleepMs);
        }
        return;
    }
    // Converted on every pass, so new framing takes effect with the next token.
    const std::string prefix = hexTextToBytes(rxPrefix_.get());
    const std::string suffix = hexTextToBytes(rxSuffix_.get());
    const int32_t gap = gap_.load(std::memory_order_relaxed);
    const int32_t timeout = gap == 0 ? kDefaultGap : gap;
    std::string& frame = frame_;
    frame.clear();
    std::size_t matched = 0;
    uint8_t byte = 0;

    // Hunt for the prefix. A prefix byte is compared as a signed value with
    // the received byte as an unsigned one, so a byte of 0x80 or above only
    // ever matches as the first prefix byte (through the restart below), and
    // a restart looks at the first prefix byte alone, never at a shorter
    // partial match. Both are how devices in the field expect it.
    while (matched < prefix.size()) {
        if (readByteLocked(byte, timeout) != ReadResult::Byte) {
            return;  // a partial prefix is dropped
        }
        if (static_cast<int>(static_cast<int8_t>(prefix[matched])) == static_cast<int>(byte)) {
            frame.push_back(static_cast<char>(byte));
            ++matched;
            continue;
        }
        frame.clear();
        matched = 0;
        if (static_cast<uint8_t>(prefix[0]) == byte) {
            frame.push_back(static_cast<char>(byte));
            matched = 1;
        }
    }

    for (;;) {
        ReadResult read = readByteLocked(byte, timeout);
        if (read == ReadResult::Disconnected) {
            return;
        }
        if (read == ReadResult::Timeout) {
            // The gap ends a token only where no suffix is expected.
            if (suffix.empty() && frame.size() > prefix.size()) {
                pushToken(frame.data() + prefix.size(), frame.size() - prefix.size());
            }
            return;
        }
        frame.push_back(static_cast<char>(byte));
        ++matched;
        if (matched >= prefix.size() + suffix.size()) {
            if (!suffix.empty()) {
                if (endsWith(frame, suffix)) {
                    pushToken(frame.data() + prefix.size(),
                              frame.size() - prefix.size() - suffix.size());
                    return;
                }
            } else if (!prefix.empty() && endsWith(frame, prefix)) {
                // The next token's prefix: deliver what lies between. With a
                // self-overlapping prefix the length wraps, and the token is
                // everything after the first prefix.
                std::size_t length = frame.size() - 2 * prefix.size();
                if (length > frame.size() - prefix.size()) {
                    length = frame.size() - prefix.size();
                }
                pushToken(frame.data() + prefix.size(), length);
                frame = prefix;
            }
        }
        if (frame.size() > kMaxFrame) {
            return;
        }
    }
}

}  // namespace xtok
