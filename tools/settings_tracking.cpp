// How the session's writes and console lines move the settings model and
// the queue as the host sees them. The plug-in tells no one what they
// changed, so the session follows each one that the plug-in carried out.
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

void PluginSession::wrote(const std::string& address, bool kept) {
    std::vector<std::string> fields;
    splitTrimmed(address, '?', fields);
    const std::string type = fields.size() > 1 ? fields[1] : "";
    const Setting* setting = findSettingByMemoryType(type);
    TagValue value;
    std::string error;
    if (type == "token_ack") {
        queue_.acknowledged();
    } else if (type == kApply) {
        settings_.applied(kept);
        queue_.cleared();
    } else if (setting && read(settingAddress(*setting), value, error)) {
        // A setting's SP_ read shows its staged value: what the plug-in made
        // of the written bytes, whatever their type.
        settings_.staged(setting->id, storedOf(*setting, value));
    }
    framing_.set(settings_.framing());
}

// As the plug-in's console splits its words: at each blank.
void PluginSession::commanded(const std::string& line, bool kept) {
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    if (words[0] == "write" && words.size() == 3) {
        wrote(words[1], kept);
    } else if (words[0] == "token_ack") {
        words.size() == 2 && words[1] == "all" ? queue_.cleared() : queue_.acknowledged();
    } else {
        settings_.consoleLine(line);
        framing_.set(settings_.framing());
    }
}

}  // namespace xtok::tools
