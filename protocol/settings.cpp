// The setting rows' users inside the protocol: the active values, SP_Done,
// the SP_ reads and writes and the console's setters.
#include "protocol/settings.h"

#include <algorithm>
#include <cstring>
#include <iterator>

#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "protocol/xtok_tag.h"
#include "xtokline/text.h"

namespace xtok {

const Setting* findSettingByMemoryType(const std::string& memoryType) {
    for (const Setting& setting : kSettings) {
        if (memoryType == setting.memoryType) {
            return &setting;
        }
    }
    return nullptr;
}

bool acceptsNumber(const Setting& setting, int32_t value) {
    static const int32_t rates[] = {150,  300,   600,   1200,  2400,  4800,
                                    9600, 19200, 38400, 57600, 115200};
    if (setting.baudRates) {
        return std::find(std::begin(rates), std::end(rates), value) != std::end(rates);
    }
    return value >= setting.low && value <= setting.high;
}

namespace {

int32_t numberOf(const StoredValue& value) {
    if (const int32_t* number = std::get_if<int32_t>(&value)) {
        return *number;
    }
    const bool* flag = std::get_if<bool>(&value);
    return flag && *flag ? 1 : 0;
}

}  // namespace

StoredValue Protocol_XTOK::activeValue(SettingId id) const {
    switch (kSettings[id].kind) {
        case SettingKind::Hex:
            return activeText_[id];
        case SettingKind::Flag:
            return active_[id].load() != 0;
        default:
            return active_[id].load();
    }
}

void Protocol_XTOK::makeActive(SettingId id, const StoredValue& value) {
    if (const std::string* text = std::get_if<std::string>(&value)) {
        activeText_[id] = *text;
    } else {
        active_[id] = numberOf(value);
    }
}

StoredValue Protocol_XTOK::settingValue(const Setting& setting, SettingId fallback) {
    const StoredValue* staged = stagedSettings_.find(setting.key, -1);
    return staged ? *staged : settings_.get(setting.key, -1, activeValue(fallback));
}

// With queueLock held. The line settings go to the open port in one
// reconfigure, and only when one of them changed.
void Protocol_XTOK::applyStagedSettings() {
    stagedSettings_.commitTo(settings_, -1, true);
    bool lineChanged = false;
    for (const Setting& setting : kSettings) {
        const StoredValue value = settingValue(setting, setting.applyFallback);
        if (setting.activation == Activation::PortReconfigure) {
            lineChanged |= numberOf(value) != active_[setting.id].load();
        }
        makeActive(setting.id, value);
    }
    if (lineChanged) {
        port_.Reconfigure(lineSettings());
    }
    tokens_.clear();
}

bool Protocol_XTOK::stageSetting(const Setting& setting, const uint8_t* value, int32_t available) {
    StoredValue staged;
    switch (setting.kind) {
        case SettingKind::Hex: {
            std::string text = takeText(value, available);
            if (!isHexText(text)) {
                SetLastError(-1, setting.refusal);
                return false;
            }
            staged = std::move(text);
            break;
        }
        case SettingKind::Flag:
            staged = value[0] != 0;
            break;
        default: {
            int32_t number = value[0];
            if (setting.kind == SettingKind::Number) {
                std::memcpy(&number, value, sizeof number);
            }
            if (!acceptsNumber(setting, number)) {
                if (setting.refusal) {
                    SetLastError(-1, setting.refusal);
                }
                return false;
            }
            staged = number;
        }
    }
    stagedSettings_.stage(setting.key, -1, staged);
    return true;
}

bool Protocol_XTOK::readSettingsType(XtokTag& tag, uint8_t* buffer) {
    const Setting* setting = findSettingByMemoryType(tag.memoryType->name);
    if (!setting) {
        buffer[0] = 0;  // SP_Done
        return true;
    }
    const StoredValue value = settingValue(*setting, setting->id);
    if (const std::string* text = std::get_if<std::string>(&value)) {
        if (static_cast<int64_t>(text->size()) >= tag.GetSize()) {
            SetLastError(-1, setting->tooLongToRead);
            return false;
        }
        std::memcpy(buffer, text->c_str(), text->size() + 1);
    } else if (setting->kind == SettingKind::Number) {
        const int32_t number = numberOf(value);
        std::memcpy(buffer, &number, sizeof number);
    } else {
        buffer[0] = static_cast<uint8_t>(numberOf(value));
    }
    return true;
}

bool Protocol_XTOK::consoleSet(const Setting& setting, const std::string& value, char* reply,
                               int32_t size) {
    const char* answer = "OK";
    int32_t number = 0;
    HostLock lock(queueLock_);
    if (setting.kind == SettingKind::Hex) {
        // Stored as typed: a text that is not hex converts leniently when used.
        activeText_[setting.id] = value;
    } else if (setting.kind == SettingKind::Flag && (value == "ON" || value == "OFF")) {
        active_[setting.id] = value == "ON";
    } else if (setting.kind == SettingKind::Number && parseClamped(value, 10, number)) {
        active_[setting.id] = number;
    } else {
        answer = "ERROR: wrong value";
    }
    // "ERROR: wrong value" still answers true here, unlike "connect".
    CopyReply(answer, reply, size);
    return true;
}

}  // namespace xtok
