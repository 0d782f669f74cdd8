// Writes of the memory types: transmit, acknowledge, connect, and the
// line settings staged until SP_Done applies them.
#include <algorithm>
#include <cstring>

#include "framework/data_types.h"
#include "framework/scratch_buffer.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "protocol/xtok_tag.h"
#include "xtokline/text.h"

namespace xtok {

namespace {

// Scratch bytes kept in the call's own frame: a string-64 tag with its
// slack, and every number.
constexpr std::size_t kScratchInline = 128;

}  // namespace

std::string takeText(const uint8_t* value, int32_t available) {
    const char* text = reinterpret_cast<const char*>(value);
    const void* zero = std::memchr(text, 0, static_cast<std::size_t>(std::max(available, 0)));
    return zero ? std::string(text) : std::string(text, static_cast<std::size_t>(available));
}

bool Protocol_XTOK::WriteTag(ITag* itag, const void* value) {
    if (!started_) {
        SetLastError(-3, "Protocol not started");
        return false;
    }
    if (!itag || !value) {
        SetLastError(-1, "illegal memtype to write");
        return false;
    }
    auto& tag = *static_cast<XtokTag*>(itag);
    const MemoryType& type = *tag.memoryType;
    if (type.readOnly) {
        SetLastError(-1, "writing to read_only type");
        return false;
    }
    const int32_t elementSize = ElementSize(type.naturalType);
    const bool bits = IsBitType(type.naturalType);
    const int32_t rawSize = tag.GetRawSize();
    int32_t index = tag.start();
    int32_t offset = 0;
    int64_t count;
    int64_t total;
    if (bits) {
        count = tag.GetSize();
        total = (tag.GetBitOffset() + count + 7) / 8;
    } else {
        offset = tag.GetByteAddress() - index * elementSize;
        count = (int64_t{offset} + rawSize + elementSize - 1) / elementSize;
        total = count * elementSize;
    }
    if (index + count > type.max) {
        SetLastError(-1, "writing after the end of memory type");
        return false;
    }
    // Room for the converted value and for what a read of a settings or
    // token type may put there.
    // In the object for the common small tags: no allocation per write.
    ScratchBuffer<kScratchInline> scratch(
        static_cast<int32_t>(std::max<int64_t>(total, offset + rawSize) + 8));
    if (!scratch.ok()) {
        SetLastError(-1, kNoMemoryText);
        return false;
    }
    if (!bits && !(offset == 0 && total == rawSize) &&
        !partialRead(tag, index, static_cast<int32_t>(count), offset, rawSize, elementSize,
                     scratch.data())) {
        return false;
    }
    if (!tag.ConvertData(value, scratch.data() + offset, 1)) {
        SetLastError(-9, "write conversion error");
        return false;
    }
    const int64_t block = type.blockWriteCount > 0 ? type.blockWriteCount : 1;
    std::size_t position = 0;
    while (count >= 1) {
        int64_t n = std::min(count, block);
        int32_t available = static_cast<int32_t>(total - static_cast<int64_t>(position));
        if (!writeMemoryType(tag, index, scratch.data() + position, available)) {
            return false;
        }
        position += bits ? static_cast<std::size_t>((index % 8 + n) / 8)
                         : static_cast<std::size_t>(n * elementSize);
        index += static_cast<int32_t>(n);
        count -= n;
    }
    return true;
}

bool Protocol_XTOK::partialRead(XtokTag& tag, int32_t index, int32_t count, int32_t offset,
                                int32_t rawSize, int32_t elementSize, uint8_t* scratch) {
    if (tag.memoryType->blockReadCount > count && count < 11) {
        return readMemoryType(tag, index, scratch);
    }
    if (offset != 0 && !readMemoryType(tag, index, scratch)) {
        return false;
    }
    if (count > 1 && (offset + rawSize) % elementSize != 0) {
        return readMemoryType(tag, index + count - 1,
                              scratch + static_cast<std::size_t>(count - 1) * elementSize);
    }
    return true;
}

bool Protocol_XTOK::writeMemoryType(XtokTag& tag, int32_t, const uint8_t* value,
                                    int32_t available) {
    HostLock lock(queueLock_);
    const std::string& name = tag.memoryType->name;
    if (const Setting* setting = findSettingByMemoryType(name)) {
        return stageSetting(*setting, value, available);
    }
    if (name == "SP_Done") {
        applyStagedSettings();
        return true;
    }
    if (name == "token_ack") {
        tokens_.removeHead();
        return true;
    }
    if (name == "connect") {
        return writeConnect(value, available);
    }
    if (name == "tx_token") {
        return transmit(takeText(value, available));
    }
    SetLastError(-1, "illegal memtype to write");
    return false;
}

bool Protocol_XTOK::writeConnect(const uint8_t* value, int32_t available) {
    const bool on = value[0] != 0;
    if (on == connected_) {
        // Asking for the state that already holds sends the value as a
        // token: 1 while connected goes out as the byte 01.
        return transmit(takeText(value, available));
    }
    if (!setConnected(on)) {
        SetLastError(-1, "Can't open serial port");
        return false;
    }
    return true;
}

bool Protocol_XTOK::transmit(const std::string& text) {
    switch (send(text)) {
        case Sent::NotHex:
            SetLastError(-1, "token to send must be in hex format");
            return false;
        case Sent::NotConnected:
            SetLastError(-1, "Serial port not active for sending");
            return false;
        default:
            return true;
    }
}

Protocol_XTOK::Sent Protocol_XTOK::send(const std::string& text) {
    const bool hex = active_[kHexTokens] != 0;
    if (hex && !isHexText(text)) {
        return Sent::NotHex;
    }
    if (!connected_) {
        return Sent::NotConnected;
    }
    std::string frame;
    appendHexBytes(activeText_[kTxPrefix], frame);
    if (hex) {
        appendHexBytes(text, frame);
    } else {
        frame += text;
    }
    appendHexBytes(activeText_[kTxSuffix], frame);
    port_.Write(frame);
    return Sent::Ok;
}

}  // namespace xtok
