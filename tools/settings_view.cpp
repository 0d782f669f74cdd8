#include "tools/settings_view.h"

#include <optional>

#include "tools/json_line.h"
#include "xtokline/constants.h"

namespace xtok::tools {

namespace {

std::string shown(const Setting& setting, const std::optional<StoredValue>& value) {
    if (!value) {
        return "-";
    }
    if (const std::string* text = std::get_if<std::string>(&*value)) {
        return text->empty() ? "(none)" : *text;
    }
    if (const bool* flag = std::get_if<bool>(&*value)) {
        return *flag ? "true" : "false";
    }
    return spelledNumber(setting, std::get<int32_t>(*value));
}

std::string json(const std::optional<StoredValue>& value) {
    if (!value) {
        return "null";
    }
    if (const std::string* text = std::get_if<std::string>(&*value)) {
        return jsonString(*text);
    }
    if (const bool* flag = std::get_if<bool>(&*value)) {
        return *flag ? "true" : "false";
    }
    return std::to_string(std::get<int32_t>(*value));
}

std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(text.size() < width ? width - text.size() : 1, ' ');
}

}  // namespace

std::string settingsText(const SettingsModel& model, const std::string& activeLine) {
    std::string text = "active line  " + activeLine + "\n" + padded("setting", 19) +
                       padded("key", 18) + padded("active", 12) + padded("from", 15) +
                       padded("staged", 12) + "retained\n";
    for (const Setting& setting : kSettings) {
        const SettingState& state = model[setting.id];
        text += padded(setting.memoryType, 19) + padded(setting.configKey, 18) +
                padded(shown(setting, state.active), 12) + padded(sourceName(state.source), 15) +
                padded(shown(setting, state.staged), 12) + shown(setting, state.retained) + "\n";
    }
    return text +
           "SP_Done applies and retains the staged values, which stay staged, and returns the\n"
           "others to their retained or starting value, console changes included.\n";
}

std::string settingsJson(const SettingsModel& model) {
    JsonLine all;
    for (const Setting& setting : kSettings) {
        const SettingState& state = model[setting.id];
        all.raw(setting.memoryType, JsonLine()
                                        .text("key", setting.configKey)
                                        .raw("active", json(state.active))
                                        .text("source", sourceName(state.source))
                                        .raw("staged", json(state.staged))
                                        .raw("retained", json(state.retained))
                                        .str());
    }
    return all.str();
}

}  // namespace xtok::tools
