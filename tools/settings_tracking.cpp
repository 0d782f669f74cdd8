// How the session's writes and console lines move the settings model. The
// plug-in tells no one what they changed, so the session follows each one
// that the plug-in carried out.
#include <algorithm>
#include <cstring>

#include "tools/plugin_session.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

// The one SP_ memory type without a row: it applies the others.
const char* const kApply = "SP_Done";

// Texts sized well past any prefix an operator would stage.
std::string settingAddress(const Setting& setting) {
    switch (setting.kind) {
        case SettingKind::Number:
            return std::string("0?") + setting.memoryType + "?unsignedInt";
        case SettingKind::Byte:
            return std::string("0?") + setting.memoryType + "?unsignedByte";
        case SettingKind::Flag:
            return std::string("0?") + setting.memoryType + "?boolean";
        default:
            return std::string("0?") + setting.memoryType + "?string-4096";
    }
}

StoredValue storedOf(const Setting& setting, const TagValue& value) {
    const std::vector<uint8_t>& bytes = value.bytes;
    if (setting.kind == SettingKind::Hex) {
        return stringValue(bytes);
    }
    if (setting.kind == SettingKind::Flag) {
        return !bytes.empty() && bytes[0] != 0;
    }
    int32_t number = 0;
    if (!bytes.empty()) {
        std::memcpy(&number, bytes.data(), std::min(bytes.size(), sizeof number));
    }
    return number;
}

}  // namespace

void PluginSession::trackWrite(const std::string& address, bool kept) {
    std::vector<std::string> fields;
    splitTrimmed(address, '?', fields);
    const std::string type = fields.size() > 1 ? fields[1] : "";
    if (type == kApply) {
        settings_.applied(kept);
        return;
    }
    // A setting's SP_ read shows its staged value: what the plug-in made of
    // the written bytes, whatever their type.
    const Setting* setting = findSettingByMemoryType(type);
    TagValue value;
    std::string error;
    if (setting && read(settingAddress(*setting), value, error)) {
        settings_.staged(setting->id, storedOf(*setting, value));
    }
}

void PluginSession::trackCommand(const std::string& line, bool kept) {
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    if (words[0] == "write" && words.size() == 3) {
        trackWrite(words[1], kept);
    } else {
        settings_.consoleLine(line);
    }
}

}  // namespace xtok::tools
