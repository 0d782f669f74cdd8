// Writes of the memory types: transmit, acknowledge, connect, and the
// line settings staged until SP_Done applies them.
#include <algorithm>
#include <cstring>

#include "framework/data_types.h"
#include "framework/scratch_buffer.h"
#include "protocol/hex_text.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "protocol/xtok_tag.h"

namespace xtok {

namespace {

// Scratch bytes kept in the call's own frame: a string-64 tag with its
// slack, and every number.
constexpr std::size_t kScratchInline = 128;

int32_t takeInt(const uint8_t* value) {
    int32_t v = 0;
    std::memcpy(&v, value, sizeof v);
    return v;
}

// The text of a value: up to its first zero byte, and never past the
// bytes the tag holds, which need not contain a zero.
std::string takeText(const uint8_t* value, int32_t available) {
    const char* text = reinterpret_cast<const char*>(value);
    const void* zero = std::memchr(text, 0, static_cast<std::size_t>(std::max(available, 0)));
    return zero ? std::string(text) : std::string(text, static_cast<std::size_t>(available));
}

bool isBaudRate(int32_t baud) {
    static const int32_t rates[] = {150,  300,   600,   1200,  2400,  4800,
                                    9600, 19200, 38400, 57600, 115200};
    return std::find(std::begin(rates), std::end(rates), baud) != std::end(rates);
}

}  // namespace

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
    if (tag.isSettingsTag() && tag.memoryType->name != "SP_Done") {
        return stageSetting(tag, value, available);
    }
    HostLock lock(queueLock_);
    const std::string& name = tag.memoryType->name;
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

bool Protocol_XTOK::stageSetting(XtokTag& tag, const uint8_t* value, int32_t available) {
    const std::string& name = tag.memoryType->name;
    struct ByteType {
        const char *type, *key;
        int32_t low, high;
    };
    static const ByteType bytes[] = {{"SP_Par", "parity", 0, 4},
                                     {"SP_Bits", "bits", 7, 8},
                                     {"SP_Stop", "stop", 1, 2},
                                     {"SP_Mode", "mode", 0, 2}};
    for (const ByteType& b : bytes) {
        if (name == b.type) {
            int32_t v = value[0];
            if (v < b.low || v > b.high) {
                return false;  // refused without a message
            }
            stagedSettings_.stageInt(b.key, -1, v);
            return true;
        }
    }
    struct TextType {
        const char *type, *key, *message;
    };
    static const TextType texts[] = {
        {"SP_RxPrefix", "rx_prefix", "Rx prefix value is not hex format"},
        {"SP_RxSuffix", "rx_suffix", "Rx suffix value is not hex format"},
        {"SP_TxPrefix", "tx_prefix", "Tx prefix value is not hex format"},
        {"SP_TxSuffix", "tx_suffix", "Tx suffix value is not hex format"}};
    for (const TextType& t : texts) {
        if (name == t.type) {
            std::string text = takeText(value, available);
            if (!isHexText(text)) {
                SetLastError(-1, t.message);
                return false;
            }
            stagedSettings_.stageText(t.key, -1, text);
            return true;
        }
    }
    if (name == "SP_Baud") {
        int32_t baud = takeInt(value);
        if (!isBaudRate(baud)) {
            SetLastError(-1, "illegal baudrate intValue");
            return false;
        }
        stagedSettings_.stageInt("baud", -1, baud);
    } else if (name == "SP_Gap") {
        stagedSettings_.stageInt("gap", -1, takeInt(value));
    } else if (name == "SP_TokenQueueSize") {
        stagedSettings_.stageInt("token_queue_size", -1, takeInt(value));
    } else if (name == "SP_HexTokens") {
        stagedSettings_.stageBool("hex_tokens", -1, value[0] != 0);
    }
    return true;
}

void Protocol_XTOK::applyStagedSettings() {
    stagedSettings_.commitTo(settings_, -1, true);
    auto pick = [this](const char* key, int32_t active) { return settingInt(key, active); };
    bool changed = false;
    auto apply = [&changed](std::atomic<int32_t>& active, int32_t value) {
        if (value != active) {
            active = value;
            changed = true;
        }
    };
    apply(baud_, pick("baud", baud_));
    apply(parity_, pick("parity", parity_));
    // The bits fall back to the active stop bits, not the active data bits;
    // kept as retained configurations expect it.
    apply(bits_, pick("bits", stop_));
    apply(stop_, pick("stop", stop_));
    apply(mode_, pick("mode", mode_));
    if (changed) {
        port_.Reconfigure(lineSettings());
    }
    auto pickText = [this](const char* key, SharedText& active) {
        active.set(settingText(key, active.get()));
    };
    pickText("rx_prefix", rxPrefix_);
    pickText("rx_suffix", rxSuffix_);
    pickText("tx_prefix", txPrefix_);
    pickText("tx_suffix", txSuffix_);
    gap_ = pick("gap", gap_);
    hexTokens_ = settingBool("hex_tokens", hexTokens_);
    tokenQueueSize_ = pick("token_queue_size", tokenQueueSize_);
    tokens_.clear();
}

bool Protocol_XTOK::writeConnect(const uint8_t* value, int32_t available) {
    const bool on = value[0] != 0;
    if (connected_ && !on) {
        HostLock lock(portLock_);
        port_.Close();
        connected_ = false;
        return true;
    }
    if (!connected_ && on) {
        HostLock lock(portLock_);
        if (!openPort()) {
            SetLastError(-1, "Can't open serial port");
            return false;
        }
        connected_ = true;
        return true;
    }
    // Asking for the state that already holds sends the value as a token:
    // 1 while connected goes out as the byte 01.
    return transmit(takeText(value, available));
}

bool Protocol_XTOK::transmit(const std::string& text) {
    const bool hex = hexTokens_;
    if (hex && !isHexText(text)) {
        SetLastError(-1, "token to send must be in hex format");
        return false;
    }
    if (!connected_) {
        SetLastError(-1, "Serial port not active for sending");
        return false;
    }
    std::string frame = hexTextToBytes(txPrefix_.get());
    frame += hex ? hexTextToBytes(text) : text;
    frame += hexTextToBytes(txSuffix_.get());
    port_.Write(frame);  // a failed write is not reported
    return true;
}

}  // namespace xtok
