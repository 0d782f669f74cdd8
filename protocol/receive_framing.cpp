// Cutting the received byte stream into tokens by prefix, suffix and gap.
#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>

#include "framework/clock.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "xtokline/text.h"

namespace xtok {

namespace {

// A frame (prefix and suffix included) past this many bytes is dropped.
constexpr std::size_t kMaxFrame = 1000;
// A gap of 0 or less stands for this many milliseconds of silence.
constexpr int32_t kDefaultGap = 500;
// The longest single read: a longer gap is waited out in slices of this, so
// that a close or a stop never waits on one long read.
constexpr int32_t kSliceMs = 500;
constexpr int32_t kIdleSleepMs = 10;

// Whether the `length` bytes at `frame` end with `tail`. The caller has
// compared the last byte already.
bool endsWith(const char* frame, std::size_t length, const std::string& tail) {
    return length >= tail.size() &&
           (tail.size() == 1 ||
            std::memcmp(frame + length - tail.size(), tail.data(), tail.size() - 1) == 0);
}

}  // namespace

void Protocol_XTOK::pushToken(const char* bytes, std::size_t length) {
    HostLock lock(queueLock_);
    tokens_.push(bytes, length, active_[kTokenQueueSize].load(std::memory_order_relaxed),
                 active_[kHexTokens].load(std::memory_order_relaxed) != 0);
}

Protocol_XTOK::ReadResult Protocol_XTOK::readByte(uint8_t* byte, int32_t timeoutMs) {
    HostLock hold(portLock_);
    // Checked under the lock: a close by "connect" waits for this read.
    if (!connected_.load(std::memory_order_acquire) ||
        closes_.load(std::memory_order_relaxed) != passCloses_) {
        return ReadResult::Disconnected;
    }
    return port_.ReadByte(byte, timeoutMs) ? ReadResult::Byte : ReadResult::Timeout;
}

void Protocol_XTOK::receiveToken() {
    passCloses_ = closes_.load(std::memory_order_relaxed);
    if (!connected_.load(std::memory_order_acquire)) {
        if (IMultiTask2* tasks = services_.multiTask) {
            tasks->Sleep(kIdleSleepMs);
        }
        return;
    }
    // New framing takes effect with the next token: the texts are converted
    // at each pass, into storage the pass keeps.
    {
        HostLock lock(queueLock_);
        rxPrefix_.clear();
        appendHexBytes(activeText_[kRxPrefix], rxPrefix_);
        rxSuffix_.clear();
        appendHexBytes(activeText_[kRxSuffix], rxSuffix_);
    }
    const int32_t gap = active_[kGap].load(std::memory_order_relaxed);
    const int32_t timeout = gap <= 0 ? kDefaultGap : gap;
    const int64_t began = NowStamp();
    // A pass that read nothing and ended long before its gap met a line that
    // fails at once (hung up): a pause keeps the task from spinning on it.
    if (!receiveFramed(rxPrefix_, rxSuffix_, timeout) && NowStamp() - began < timeout / 2) {
        if (IMultiTask2* tasks = services_.multiTask) {
            tasks->Sleep(kIdleSleepMs);
        }
    }
}

Protocol_XTOK::ReadResult Protocol_XTOK::readWithin(uint8_t* byte, int32_t timeoutMs) {
    if (timeoutMs <= kSliceMs) {
        return readByte(byte, timeoutMs);  // every byte of a token: kept short
    }
    for (int32_t left = timeoutMs;;) {
        const int32_t slice = std::min(left, kSliceMs);
        const ReadResult read = readByte(byte, slice);
        left -= slice;
        if (read != ReadResult::Timeout || left <= 0) {
            return read;
        }
        if (task_.IsStopRequested()) {
            return ReadResult::Disconnected;
        }
    }
}

bool Protocol_XTOK::receiveFramed(const std::string& prefix, const std::string& suffix,
                                  int32_t timeout) {
    // The frame is collected in frame_'s storage, sized once for the longest
    // frame a pass can hold (the size test below runs after each byte), and
    // each byte is read straight into its place there: no copy and no
    // allocation per byte.
    const std::size_t capacity = std::max(prefix.size(), kMaxFrame) + 1;
    if (frame_.size() < capacity) {
        frame_.resize(capacity);
    }
    char* const frame = &frame_[0];
    uint8_t* const at = reinterpret_cast<uint8_t*>(frame);

    // A token can only end on the last byte of its suffix (or, without one,
    // of the next prefix); the whole tail is compared only after that byte.
    const std::string& end = suffix.empty() ? prefix : suffix;
    const bool framed = !end.empty();
    const char last = framed ? end.back() : 0;
    const std::size_t ends = prefix.size() + suffix.size();

    // Bytes in the frame. The count of bytes matched since the hunt
    // began, which the end tests compare, is the same number in every
    // framing: the hunt collects exactly what it matches, and later every
    // byte is both collected and counted; only prefix-only framing cuts
    // the frame back to the prefix, and there the count already stands at
    // the prefix length or more, where the test is true whatever the
    // frame's length.
    std::size_t length = 0;
    bool received = false;  // any byte in this pass

    // Hunt for the prefix. A prefix byte is compared as a signed value
    // with the received byte as an unsigned one, so a byte of 0x80 or
    // above only ever matches as the first prefix byte (through the
    // restart below), and a restart looks at the first prefix byte
    // alone, never at a shorter partial match. Both are how devices in
    // the field expect it.
    while (length < prefix.size()) {
        if (readWithin(at + length, timeout) != ReadResult::Byte) {
            return received;  // a partial prefix is dropped
        }
        received = true;
        const uint8_t byte = at[length];
        if (static_cast<int>(static_cast<int8_t>(prefix[length])) == static_cast<int>(byte)) {
            ++length;
            continue;
        }
        length = 0;
        if (static_cast<uint8_t>(prefix[0]) == byte) {
            at[0] = byte;
            length = 1;
        }
    }

    for (;;) {
        ReadResult read = readWithin(at + length, timeout);
        if (read != ReadResult::Byte) {
            // The gap ends a token only where no suffix is expected.
            if (read == ReadResult::Timeout && suffix.empty() && length > prefix.size()) {
                pushToken(frame + prefix.size(), length - prefix.size());
            }
            return received || length > 0;
        }
        if (frame[length++] == last && framed && length >= ends) {
            if (!suffix.empty()) {
                if (endsWith(frame, length, suffix)) {
                    pushToken(frame + prefix.size(), length - prefix.size() - suffix.size());
                    return true;
                }
            } else if (endsWith(frame, length, prefix)) {
                // The next token's prefix: deliver what lies between.
                // With a self-overlapping prefix the length wraps, and the
                // token is everything after the first prefix.
                std::size_t tokenLength = length - 2 * prefix.size();
                if (tokenLength > length - prefix.size()) {
                    tokenLength = length - prefix.size();
                }
                pushToken(frame + prefix.size(), tokenLength);
                std::memcpy(frame, prefix.data(), prefix.size());
                length = prefix.size();
            }
        }
        if (length > kMaxFrame) {
            return true;
        }
    }
}

}  // namespace xtok
