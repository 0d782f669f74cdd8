#include "tools/settings_model.h"

#include <cstring>
#include <vector>

#include "tools/config_text.h"
#include "xtokline/constants.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

StoredValue defaultOf(const Setting& setting) {
    switch (setting.kind) {
        case SettingKind::Hex:
            return std::string();
        case SettingKind::Flag:
            return setting.defaultValue != 0;
        default:
            return setting.defaultValue;
    }
}

int32_t numberOf(const StoredValue& value) {
    if (const int32_t* number = std::get_if<int32_t>(&value)) {
        return *number;
    }
    const bool* flag = std::get_if<bool>(&value);
    return flag && *flag ? 1 : 0;
}

std::string textOf(const StoredValue& value) {
    const std::string* text = std::get_if<std::string>(&value);
    return text ? *text : "";
}

bool nameCode(const char* const* names, int32_t count, const std::string& text, int32_t& code) {
    for (code = 0; code < count; ++code) {
        if (text == names[code]) {
            return true;
        }
    }
    return false;
}

/// The stored value of a row in the kind the plug-in reads it.
StoredValue storedValue(IPermanentStorage& storage, const std::string& section,
                        const Setting& setting) {
    const char* key = setting.key;
    switch (setting.kind) {
        case SettingKind::Hex:
            return std::string(storage.ReadText(section.c_str(), key));
        case SettingKind::Flag:
            return storage.ReadBool(section.c_str(), key);
        default:
            return storage.ReadInt(section.c_str(), key);
    }
}

}  // namespace

const char* sourceName(Source source) {
    static const char* const kNames[] = {"default", "configuration", "retained file", "console",
                                         "SP_ write"};
    return kNames[static_cast<int>(source)];
}

const Setting* findSettingByConfigKey(const std::string& key) {
    for (const Setting& setting : kSettings) {
        if (key == setting.configKey) {
            return &setting;
        }
    }
    return nullptr;
}

bool configuredNumber(const Setting& setting, const std::string& text, int32_t& number) {
    switch (setting.spelledAs) {
        case SpelledAs::ParityName:
            return nameCode(kParityNames, kParityCount, text, number);
        case SpelledAs::ModeName:
            return nameCode(kModeNames, kModeCount, text, number);
        default:
            return parseClamped(text, 0, number);
    }
}

std::string spelledNumber(const Setting& setting, int32_t number) {
    if (setting.spelledAs == SpelledAs::ParityName && number >= 0 && number < kParityCount) {
        return kParityNames[number];
    }
    if (setting.spelledAs == SpelledAs::ModeName && number >= 0 && number < kModeCount) {
        return kModeNames[number];
    }
    return std::to_string(number);
}

SettingsModel::SettingsModel() {
    for (const Setting& setting : kSettings) {
        activate(setting.id, defaultOf(setting), Source::Default);
    }
}

void SettingsModel::activate(SettingId id, const StoredValue& value, Source source) {
    states_[id].active = value;
    states_[id].source = source;
    held_[id] = {value, source};
}

void SettingsModel::configured(const std::string& configText) {
    const ConfigText config(configText);
    for (const Setting& setting : kSettings) {
        const std::string* text = config.find(setting.configKey);
        int32_t number = 0;
        if (!text) {
            activate(setting.id, defaultOf(setting), Source::Default);
        } else if (setting.kind == SettingKind::Hex) {
            activate(setting.id, *text, Source::Configuration);
        } else if (setting.kind == SettingKind::Flag) {
            activate(setting.id, *text == "true", Source::Configuration);
        } else if (configuredNumber(setting, *text, number)) {
            activate(setting.id, number, Source::Configuration);
        }
    }
}

void SettingsModel::retainedAtStart(IPermanentStorage& storage, const std::string& section) {
    for (const Setting& setting : kSettings) {
        if (storage.IsStored(section.c_str(), setting.key)) {
            const StoredValue value = storedValue(storage, section, setting);
            states_[setting.id].retained = value;
            activate(setting.id, value, Source::Retained);
        }
    }
}

// Words as the plug-in's console splits them: at each single blank.
void SettingsModel::consoleLine(const std::string& line) {
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    for (const Setting& setting : kSettings) {
        if (words.size() < 2 || !setting.consoleSetter || words[0] != setting.consoleSetter) {
            continue;
        }
        SettingState& state = states_[setting.id];
        int32_t number = 0;
        if (setting.kind == SettingKind::Hex) {
            state.active = words[1];
        } else if (setting.kind == SettingKind::Flag) {
            state.active = words[1] == "ON";
        } else if (parseClamped(words[1], 10, number)) {
            state.active = number;
        } else {
            return;
        }
        state.source = Source::Console;
    }
}

void SettingsModel::staged(SettingId id, const StoredValue& value) {
    states_[id].staged = value;
}

void SettingsModel::applied(bool kept) {
    for (SettingState& state : states_) {
        const SettingId id = static_cast<SettingId>(&state - states_);
        if (state.staged) {
            held_[id] = {*state.staged, Source::SpWrite};
            state.retained = kept ? state.staged : state.retained;
        }
        state.active = held_[id].value;
        state.source = held_[id].source;
    }
}

ActiveFraming SettingsModel::framing() const {
    ActiveFraming framing;
    framing.rx.prefix = textOf(states_[kRxPrefix].active);
    framing.rx.suffix = textOf(states_[kRxSuffix].active);
    framing.rx.gap = numberOf(states_[kGap].active);
    framing.queueLimit = numberOf(states_[kTokenQueueSize].active);
    return framing;
}

}  // namespace xtok::tools
