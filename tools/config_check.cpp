#include "tools/config_check.h"

#include <set>

#include "host/serial_line.h"
#include "tools/closest_word.h"
#include "tools/settings_model.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

using Errors = std::vector<std::string>;

// Told one by one; beyond that only counted.
constexpr std::size_t kMostFaults = 20;

std::string quoted(const std::string& key, const std::string& value) {
    return key + " '" + value + "'";
}

bool wholeNumber(const std::string& text, int32_t& number) {
    std::size_t used = 0;
    return parseClamped(text, 0, number, &used) && used == text.size();
}

std::string listed(const std::vector<std::string>& choices) {
    std::string text;
    for (const std::string& choice : choices) {
        text += (text.empty() ? "" : ", ") + choice;
    }
    return text;
}

bool amongChoices(const ParameterInfo& p, const std::vector<std::string>& choices,
                  const std::string& value) {
    int32_t number = 0;
    const bool numeric = p.listType == "prop_integer" && wholeNumber(value, number);
    for (const std::string& choice : choices) {
        int32_t offered = 0;
        if (value == choice || (numeric && wholeNumber(choice, offered) && offered == number)) {
            return true;
        }
    }
    return false;
}

/// Values the editor does not offer that the plug-in still takes: any baud
/// rate, bits or stop bits the host's line check lets pass, and the names of
/// the parity and mode codes the line knows ("mark").
bool takenBeyondTheList(const ParameterInfo& p, const Setting* setting, const std::string& value) {
    int32_t number = 0;
    return p.listType == "prop_integer" ? wholeNumber(value, number)
                                        : setting && setting->spelledAs != SpelledAs::Number &&
                                              configuredNumber(*setting, value, number);
}

/// The bounds of a number: the editor's, else the settings table's.
bool withinBounds(const ParameterInfo& p, int32_t number, std::string& bounds) {
    int32_t low = INT32_MIN;
    int32_t high = INT32_MAX;
    const Setting* setting = findSettingByConfigKey(p.key);
    if (setting && setting->editorLow != setting->editorHigh) {
        low = setting->editorLow;
        high = setting->editorHigh;
    }
    if (!p.min.empty() && !p.max.empty()) {
        wholeNumber(p.min, low);
        wholeNumber(p.max, high);
    }
    bounds = std::to_string(low) + " to " + std::to_string(high);
    return number >= low && number <= high;
}

std::string valueFault(const ParameterInfo& p, const std::string& value,
                       const PluginDescription& description, const host::ComMap& ports) {
    std::string why;
    if (p.key == kPortKey) {  // a path as well as one of the editor's names
        std::string device;
        return ports.resolve(value, device, why) ? "" : why;
    }
    const std::vector<std::string>& choices =
        p.type == "prop_modelRef" ? description.models : p.choices;
    int32_t number = 0;
    const Setting* setting = findSettingByConfigKey(p.key);
    if (!choices.empty() && !amongChoices(p, choices, value) &&
        !takenBeyondTheList(p, setting, value)) {
        return quoted(p.key, value) + " is not one of " + listed(choices);
    }
    if (p.type == "prop_integer" && !wholeNumber(value, number)) {
        return quoted(p.key, value) + " is not a whole number";
    }
    if (p.type == "prop_integer" && !withinBounds(p, number, why)) {
        return quoted(p.key, value) + " is out of range " + why;
    }
    if (p.type == "prop_bool" && value != "true" && value != "false") {
        return quoted(p.key, value) + " must be true or false";
    }
    if (setting && setting->kind == SettingKind::Hex && !isHexText(value)) {
        return quoted(p.key, value) + " is not hex: pairs of 0-9 and A-F, or none";
    }
    return "";
}

struct Checker {
    const PluginDescription& description;
    const host::ComMap& ports;
    std::vector<std::string> keys;
    std::set<std::string> seen;
    std::set<std::string> faulty;
    Errors errors;
    std::size_t untold = 0;

    void fault(const std::string& key, const std::string& text) {
        faulty.insert(key);
        if (errors.size() < kMostFaults) {
            errors.push_back(text);
        } else {
            ++untold;
        }
    }

    void entry(const ConfigEntry& e) {
        const ParameterInfo* p = e.key.empty() ? nullptr : description.parameter(e.key);
        if (e.key.empty()) {
            fault("", "'" + e.word + "' is no key=value entry");
        } else if (!p) {
            // Past the limit the words are only counted: a suggestion costs.
            fault(e.key, errors.size() < kMostFaults ? unknownWord("key", e.key, keys) : "");
        } else if (!e.node.empty() && !p->perNode) {
            fault(e.key, "'" + e.word + "': " + e.key + " belongs to the whole line, not a node");
        } else if (!seen.insert(e.node + "::" + e.key).second) {
            fault(e.key, "'" + e.word + "': " + e.key + " is given twice; only the first counts");
        } else {
            const std::string why = valueFault(*p, e.value, description, ports);
            if (!why.empty()) {
                fault(e.key, why);
            }
        }
    }

    void missing(const ConfigText& config) {
        for (const ParameterInfo& p : description.parameters) {
            if (p.mandatory && !config.find(p.key) && !ConfigText::isMarkerKey(p.key)) {
                fault(p.key,
                      "missing mandatory key '" + p.key + "'" +
                          (p.key == kPortKey ? ": name the device, e.g. xtok-host run /dev/ttyUSB0"
                                             : ""));
            }
        }
    }

    // The line as Configure decodes it, checked as the host checks a line
    // before it applies it; a key that failed its own checks, or is missing,
    // counts with the editor's default, so that the others are still told.
    void line(const ConfigText& config) {
        int32_t values[kSettingCount] = {};
        for (const Setting& setting : kSettings) {
            const std::string* text = config.find(setting.configKey);
            const ParameterInfo* p = description.parameter(setting.configKey);
            const std::string value = text && !faulty.count(setting.configKey) ? *text
                                      : p                                      ? p->defaultValue
                                                                               : "";
            if (setting.activation == Activation::PortReconfigure &&
                !configuredNumber(setting, value, values[setting.id])) {
                return;
            }
        }
        const std::string why = host::checkSettings(
            {values[kBaud], values[kParity], values[kBits], values[kStop], values[kMode]});
        if (!why.empty()) {
            fault("", "the host cannot set this line: " + why);
        }
    }
};

}  // namespace

std::vector<std::string> checkConfiguration(const ConfigText& config,
                                            const PluginDescription& description,
                                            const host::ComMap& ports) {
    if (!config.versioned()) {
        return {std::string("unknown format: the configuration text has no ") +
                ConfigText::kMarker};
    }
    Checker checker{description, ports, {}, {}, {}, {}, 0};
    for (const ParameterInfo& p : description.parameters) {
        checker.keys.push_back(p.key);
    }
    for (const ConfigEntry& entry : config.entries()) {
        checker.entry(entry);
    }
    checker.missing(config);
    checker.line(config);
    if (checker.untold > 0) {
        checker.errors.push_back("and " + std::to_string(checker.untold) +
                                 (checker.untold == 1 ? " fault" : " faults") + " more");
    }
    return checker.errors;
}

}  // namespace xtok::tools
