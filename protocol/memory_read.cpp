// Reads of the memory types: the received tokens, the connection state and
// the line settings.
#include <algorithm>
#include <cstring>

#include "framework/data_types.h"
#include "framework/scratch_buffer.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "protocol/xtok_tag.h"

namespace xtok {

namespace {

// Scratch bytes kept in the call's own frame: a string-64 tag with its
// slack, and every number.
constexpr std::size_t kScratchInline = 128;

void putInt(uint8_t* buffer, int32_t value) {
    std::memcpy(buffer, &value, sizeof value);
}

// Slack past the span a read covers, so that a value written for a tag
// never runs off the scratch buffer, whatever size the caller passed.
int32_t slackFor(XtokTag& tag) {
    return std::max(tag.GetSize(), 8);
}

}  // namespace

bool Protocol_XTOK::ReadTagRaw(ITag* itag, void* buffer, int32_t size) {
    if (!started_) {
        SetLastError(-3, "Protocol not started");
        return false;
    }
    if (!itag || !buffer) {
        SetLastError(-1, "illegal memtype to read");
        return false;
    }
    auto& tag = *static_cast<XtokTag*>(itag);
    const MemoryType& type = *tag.memoryType;
    const int32_t elementSize = ElementSize(type.naturalType);
    const bool bits = IsBitType(type.naturalType);
    size = std::max(size, 0);
    int32_t index = tag.start();
    int32_t offset = 0;
    int64_t count;
    int64_t total;
    if (bits) {
        count = int64_t{size} * 8;
        total = size;
        index -= index % 8;
    } else {
        offset = tag.GetByteAddress() - index * elementSize;
        count = (int64_t{offset} + size + elementSize - 1) / elementSize;
        total = count * elementSize;
    }
    // In the object for the common small tags: no allocation per read.
    ScratchBuffer<kScratchInline> scratch(static_cast<int32_t>(total + slackFor(tag)));
    if (!scratch.ok()) {
        SetLastError(-1, kNoMemoryText);
        return false;
    }
    const int64_t block = type.blockReadCount > 0 ? type.blockReadCount : 1;
    std::size_t position = 0;
    while (count >= 1) {
        int64_t n = std::min(count, block);
        if (!readMemoryType(tag, index, scratch.data() + position)) {
            return false;
        }
        position += bits ? static_cast<std::size_t>((index % 8 + n) / 8)
                         : static_cast<std::size_t>(n * elementSize);
        index += static_cast<int32_t>(n);
        count -= n;
    }
    if (size > 0) {
        std::memcpy(buffer, scratch.data() + offset, static_cast<std::size_t>(size));
    }
    return true;
}

bool Protocol_XTOK::readMemoryType(XtokTag& tag, int32_t, uint8_t* buffer) {
    HostLock lock(queueLock_);
    return tag.isSettingsTag() ? readSettingsType(tag, buffer) : readTokenType(tag, buffer);
}

bool Protocol_XTOK::readTokenType(XtokTag& tag, uint8_t* buffer) {
    const std::string& name = tag.memoryType->name;
    const std::string* head = tokens_.head();
    if (name == "rx_token") {
        if (!head) {
            buffer[0] = 0;
            return true;
        }
        if (static_cast<int64_t>(head->size()) >= tag.GetSize()) {
            SetLastError(-1, "token too long");
            return false;
        }
        // As a text: in raw mode a token with a zero byte reads as the part
        // before it (hex mode exists for such tokens).
        std::memcpy(buffer, head->c_str(), std::strlen(head->c_str()) + 1);
    } else if (name == "rx_token_len") {
        if (head) {
            putInt(buffer, static_cast<int32_t>(head->size()));
        } else {
            buffer[0] = 0;  // only the first byte: runtimes rely on this
        }
    } else if (name == "tokens_available") {
        putInt(buffer, tokens_.count());
    } else if (name == "token_ack" || name == "tx_token") {
        buffer[0] = 0;
    } else if (name == "connect") {
        buffer[0] = connected_ ? 1 : 0;
    } else {
        SetLastError(-1, "illegal memtype to read");
        return false;
    }
    return true;
}

}  // namespace xtok
