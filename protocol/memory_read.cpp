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
    return tag.isSettingsTag() ? readSettingsType(tag, buffer) : readTokenType(tag, buffer);
}

int32_t Protocol_XTOK::settingInt(const char* key, int32_t active) {
    int32_t value = active;
    if (!stagedSettings_.findInt(key, -1, value)) {
        settings_.getInt(key, -1, active, value);
    }
    return value;
}

bool Protocol_XTOK::settingBool(const char* key, bool active) {
    bool value = active;
    if (!stagedSettings_.findBool(key, -1, value)) {
        settings_.getBool(key, -1, active, value);
    }
    return value;
}

std::string Protocol_XTOK::settingText(const char* key, const std::string& active) {
    std::string value;
    if (!stagedSettings_.findText(key, -1, value)) {
        settings_.getText(key, -1, active, value);
    }
    return value;
}

bool Protocol_XTOK::readSettingsType(XtokTag& tag, uint8_t* buffer) {
    const std::string& name = tag.memoryType->name;
    struct TextType {
        const char *type, *key, *tooLong;
        SharedText* active;
    };
    const TextType texts[] = {
        {"SP_RxPrefix", "rx_prefix", "rx prefix too long to read", &rxPrefix_},
        {"SP_RxSuffix", "rx_suffix", "rx suffix too long to read", &rxSuffix_},
        {"SP_TxPrefix", "tx_prefix", "tx prefix too long to read", &txPrefix_},
        {"SP_TxSuffix", "tx_suffix", "tx suffix too long to read", &txSuffix_}};
    for (const TextType& t : texts) {
        if (name == t.type) {
            std::string text = settingText(t.key, t.active->get());
            if (static_cast<int64_t>(text.size()) >= tag.GetSize()) {
                SetLastError(-1, t.tooLong);
                return false;
            }
            std::memcpy(buffer, text.c_str(), text.size() + 1);
            return true;
        }
    }
    if (name == "SP_Baud") {
        putInt(buffer, settingInt("baud", baud_));
    } else if (name == "SP_Par") {
        buffer[0] = static_cast<uint8_t>(settingInt("parity", parity_));
    } else if (name == "SP_Bits") {
        buffer[0] = static_cast<uint8_t>(settingInt("bits", bits_));
    } else if (name == "SP_Stop") {
        buffer[0] = static_cast<uint8_t>(settingInt("stop", stop_));
    } else if (name == "SP_Mode") {
        buffer[0] = static_cast<uint8_t>(settingInt("mode", mode_));
    } else if (name == "SP_Gap") {
        putInt(buffer, settingInt("gap", gap_));
    } else if (name == "SP_TokenQueueSize") {
        putInt(buffer, settingInt("token_queue_size", tokenQueueSize_));
    } else if (name == "SP_HexTokens") {
        buffer[0] = settingBool("hex_tokens", hexTokens_) ? 1 : 0;
    } else if (name == "SP_Done") {
        buffer[0] = 0;
    }
    return true;
}

bool Protocol_XTOK::readTokenType(XtokTag& tag, uint8_t* buffer) {
    HostLock lock(queueLock_);
    const std::string& name = tag.memoryType->name;
    if (name == "rx_token") {
        return tokens_.withHead([&](const std::string* head) {
            if (!head) {
                buffer[0] = 0;
                return true;
            }
            if (static_cast<int64_t>(head->size()) >= tag.GetSize()) {
                SetLastError(-1, "token too long");
                return false;
            }
            // As a text: in raw mode a token with a zero byte reads as the
            // part before it (hex mode exists for such tokens).
            std::size_t length = std::strlen(head->c_str());
            std::memcpy(buffer, head->c_str(), length + 1);
            return true;
        });
    }
    if (name == "rx_token_len") {
        tokens_.withHead([&](const std::string* head) {
            if (head) {
                putInt(buffer, static_cast<int32_t>(head->size()));
            } else {
                buffer[0] = 0;  // only the first byte: runtimes rely on this
            }
        });
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
