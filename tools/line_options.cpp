#include "tools/line_options.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cctype>
#include <utility>

#include "tools/closest_word.h"
#include "tools/config_check.h"
#include "tools/config_file.h"
#include "tools/config_text.h"
#include "tools/settings_model.h"

namespace xtok::tools {

namespace {

// Leads a command line may leave out: a bare "prefix" is the receive side's,
// a bare "queue size" the token queue's.
const char* const kDroppedLeads[] = {"rx-", "token-"};

/// A key as an option word: "token_queue_size" gives "token-queue-size",
/// "autoConnect" gives "auto-connect".
std::string optionWord(const std::string& key) {
    std::string word;
    for (char c : key) {
        const bool upper = std::isupper(static_cast<unsigned char>(c)) != 0;
        word += upper && !word.empty() ? "-" : "";
        word += c == '_' ? '-' : static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    return word;
}

/// The key's own word, the settings table's name of it, and the short form.
std::vector<std::string> optionWords(const ParameterInfo& p) {
    std::vector<std::string> words = {optionWord(p.key)};
    const Setting* setting = findSettingByConfigKey(p.key);
    if (setting && optionWord(setting->key) != words[0]) {
        words.push_back(optionWord(setting->key));
    }
    for (const char* lead : kDroppedLeads) {
        if (words[0].rfind(lead, 0) == 0) {
            words.push_back(words[0].substr(std::strlen(lead)));
        }
    }
    return words;
}

std::string optionNames(const std::vector<std::string>& words, const char* lead) {
    std::string names;
    for (const std::string& word : words) {
        names += (names.empty() ? "--" : ",--") + std::string(lead) + word;
    }
    return names;
}

std::string helpOf(const ParameterInfo& p, const PluginDescription& description) {
    const std::vector<std::string>& choices =
        p.type == "prop_modelRef" ? description.models : p.choices;
    std::string help = p.display;
    for (std::size_t i = 0; i < choices.size(); ++i) {
        help += (i == 0 ? ": " : ", ") + choices[i];
    }
    help += p.min.empty() || p.max.empty() ? "" : ", " + p.min + " to " + p.max;
    return help + (p.defaultValue.empty() ? "" : " (default " + p.defaultValue + ")");
}

void addKeyOption(CLI::App& command, const ParameterInfo& p, const PluginDescription& description,
                  std::map<std::string, std::string>& keys) {
    const std::string key = p.key;
    const std::string help = helpOf(p, description);
    if (p.type != "prop_bool") {
        command.add_option_function<std::string>(
            optionNames(optionWords(p), ""), [&keys, key](const std::string& v) { keys[key] = v; },
            help);
        return;
    }
    // A flag says the other value than the default.
    const bool onByDefault = p.defaultValue == "true";
    command.add_flag_callback(
        optionNames(optionWords(p), onByDefault ? "no-" : ""),
        [&keys, key, onByDefault] { keys[key] = onByDefault ? "false" : "true"; }, help);
}

bool readConfigText(const std::string& option, std::string& text, std::string& error) {
    if (option.empty() || option[0] != '@') {
        text = option;
        return true;
    }
    return readConfigFile(option.substr(1), text, error);
}

/// The editor's defaults of the mandatory keys, but for the port, which
/// only the user can name.
ConfigText editorDefaults(const PluginDescription& description) {
    ConfigText config;
    for (const ParameterInfo& p : description.parameters) {
        if (p.mandatory && !p.defaultValue.empty() && p.key != kPortKey &&
            !ConfigText::isMarkerKey(p.key)) {
            config.set(p.key, p.defaultValue);
        }
    }
    return config;
}

// A blank would end the value in the text, and a version marker the section.
bool fitsTheText(const std::string& key, const std::string& value,
                 std::vector<std::string>& faults) {
    const bool blank = std::any_of(value.begin(), value.end(), [](char c) {
        return std::isspace(static_cast<unsigned char>(c));
    });
    if (blank || value.find("CfgVer=") != std::string::npos) {
        faults.push_back(key + " '" + value + "' cannot be written into a configuration text");
        return false;
    }
    return true;
}

std::vector<std::string> unknownArguments(const CLI::App& command) {
    std::vector<std::string> names;
    for (const CLI::Option* option : command.get_options()) {
        for (const std::string& name : option->get_lnames()) {
            names.push_back("--" + name);
        }
    }
    std::vector<std::string> faults;
    bool valueOfUnknown = false;
    for (const std::string& extra : command.remaining()) {
        if (extra.rfind("-", 0) == 0) {
            faults.push_back(unknownWord("option", extra.substr(0, extra.find('=')), names));
            valueOfUnknown = extra.find('=') == std::string::npos;
        } else if (!std::exchange(valueOfUnknown, false)) {
            faults.push_back("unexpected argument '" + extra + "'");
        }
    }
    return faults;
}

}  // namespace

void addLineOptions(CLI::App& command, LineOptions& options, const PluginDescription& description) {
    command.allow_extras();
    command.add_option("device", options.device,
                       "The device: a path such as /dev/ttyUSB0, or a port name com1 ... com16 "
                       "(see --map)");
    command.add_option("--config", options.config,
                       "Configuration text, or @FILE holding it; the options below override its "
                       "keys");
    for (const ParameterInfo& p : description.parameters) {
        if (p.key != kPortKey && !ConfigText::isMarkerKey(p.key)) {
            addKeyOption(command, p, description, options.keys);
        }
    }
    command.add_option("--map", options.maps,
                       "Device of a port name, e.g. com1=/dev/ttyUSB0 (repeatable)");
    command.add_option("--state", options.statePath,
                       "SQLite file for retained settings (default: "
                       "$XDG_STATE_HOME/xtokline/retained.sqlite3)");
    command.add_option("--plugin", options.pluginPath,
                       "The plug-in file (default: beside xtok-host)");
    command.add_option("--instance", options.instanceName,
                       "Instance name, under which settings are retained (default: XTOK)");
}

std::vector<std::string> lineFaults(const CLI::App& command, const LineOptions& options,
                                    const PluginDescription& description, SessionOptions& session) {
    std::vector<std::string> faults = unknownArguments(command);
    session.pluginPath = options.pluginPath;
    session.statePath = options.statePath;
    session.instanceName = options.instanceName;
    std::string why;
    for (const std::string& map : options.maps) {
        if (!session.ports.assign(map, why)) {
            faults.push_back(why);
        }
    }
    std::string text;
    if (!readConfigText(options.config, text, why)) {
        faults.push_back(why);
        return faults;
    }
    ConfigText config = options.config.empty() ? editorDefaults(description) : ConfigText(text);
    for (const auto& [key, value] : options.keys) {
        if (fitsTheText(key, value, faults)) {
            config.set(key, value);
        }
    }
    if (!options.device.empty() && fitsTheText("device", options.device, faults)) {
        config.set(kPortKey, options.device);
    }
    for (const std::string& fault : checkConfiguration(config, description, session.ports)) {
        faults.push_back(fault);
    }
    session.config = config.text();
    return faults;
}

}  // namespace xtok::tools
