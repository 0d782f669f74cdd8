// Cutting the received byte stream into tokens by prefix, suffix and gap.
#include <algorithm>
#include <cstdint>
#include <cstring>
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

// Whether the `length` bytes at `frame` end with `tail`. The caller has
// compared the last byte already.
bool endsWith(const char* frame, std::size_t length, const std::string& tail) {
    return length >= tail.size() &&
           (tail.size() == 1 ||
            std::memcmp(frame + length - tail.size(), tail.data(), tail.size() - 1) == 0);
}

// The bytes of a framing text as of this pass, converted only when the text
// has changed since the last conversion: the same bytes as converting on
// every pass, without the work.
template <class Cache>
inline const std::string& framingBytes(const SharedText& text, Cache& cache) {
    const uint32_t version = text.version();
    if (version != cache.version) {
        cache.bytes = hexTextToBytes(text.get());
        cache.version = version;
    }
    return cache.bytes;
}

}  // namespace

void Protocol_XTOK::pushToken(const char* bytes, std::size_t length) {
    HostLock lock(queueLock_);
    tokens_.push(bytes, length, tokenQueueSize_.load(std::memory_order_relaxed),
                 hexTokens_.load(std::memory_order_relaxed));
}

namespace {

// How a pass holds portLock around each byte read. A host gives the protocol
// its locks unless it could not make them, and then there is none to take;
// the pass is compiled for either case, so that the per-byte path never asks
// which.
struct PortLock {
    IMutex& mutex;
    void lock() const { mutex.Lock(); }
    void unlock() const { mutex.Unlock(); }
};
struct NoPortLock {
    void lock() const {}
    void unlock() const {}
};

template <class Lock>
class ByteHold {
public:
    explicit ByteHold(const Lock& lock) : lock_(lock) { lock_.lock(); }
    ~ByteHold() { lock_.unlock(); }
    ByteHold(const ByteHold&) = delete;
    ByteHold& operator=(const ByteHold&) = delete;

private:
    const Lock& lock_;
};

}  // namespace

template <class Lock>
inline Protocol_XTOK::ReadResult Protocol_XTOK::readByteLocked(const Lock& portLock,
                                                                uint8_t* byte,
                                                                int32_t timeoutMs) {
    ByteHold<Lock> hold(portLock);
    // Checked under the lock: a close by "connect" waits for this read.
    if (!connected_.load(std::memory_order_acquire)) {
        return ReadResult::Disconnected;
    }
    return port_.ReadByte(byte, timeoutMs) ? ReadResult::Byte : ReadResult::Timeout;
}

void Protocol_XTOK::receiveToken() {
    if (!connected_.load(std::memory_order_acquire)) {
        if (IMultiTask2* tasks = services().multiTask) {
            tasks->Sleep(kIdleSleepMs);
        }
        return;
    }
    // New framing takes effect with the next token.
    const std::string& prefix = framingBytes(rxPrefix_, rxPrefixBytes_);
    const std::string& suffix = framingBytes(rxSuffix_, rxSuffixBytes_);
    const int32_t gap = gap_.load(std::memory_order_relaxed);
    const int32_t timeout = gap == 0 ? kDefaultGap : gap;

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

    auto pass = [&](const auto& portLock) {
        // Bytes in the frame. The count of bytes matched since the hunt
        // began, which the end tests compare, is the same number in every
        // framing: the hunt collects exactly what it matches, and later every
        // byte is both collected and counted; only prefix-only framing cuts
        // the frame back to the prefix, and there the count already stands at
        // the prefix length or more, where the test is true whatever the
        // frame's length.
        std::size_t length = 0;

        // Hunt for the prefix. A prefix byte is compared as a signed value
        // with the received byte as an unsigned one, so a byte of 0x80 or
        // above only ever matches as the first prefix byte (through the
        // restart below), and a restart looks at the first prefix byte
        // alone, never at a shorter partial match. Both are how devices in
        // the field expect it.
        while (length < prefix.size()) {
            if (readByteLocked(portLock, at + length, timeout) != ReadResult::Byte) {
                return;  // a partial prefix is dropped
            }
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
            ReadResult read = readByteLocked(portLock, at + length, timeout);
            if (read != ReadResult::Byte) {
                // The gap ends a token only where no suffix is expected.
                if (read == ReadResult::Timeout && suffix.empty() && length > prefix.size()) {
                    pushToken(frame + prefix.size(), length - prefix.size());
                }
                return;
            }
            if (frame[length++] == last && framed && length >= ends) {
                if (!suffix.empty()) {
                    if (endsWith(frame, length, suffix)) {
                        pushToken(frame + prefix.size(), length - prefix.size() - suffix.size());
                        return;
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
                return;
            }
        }
    };
    if (portLock_) {
        pass(PortLock{*portLock_});
    } else {
        pass(NoPortLock{});
    }
}

}  // namespace xtok
