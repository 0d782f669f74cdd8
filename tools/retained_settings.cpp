#include "tools/retained_settings.h"

#include <cstdlib>
#include <vector>

#include "protocol/settings.h"
#include "xtokline/constants.h"
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

/// Parity and mode by name, numbers as they are.
std::string shown(const Setting& setting, int32_t value) {
    if (setting.spelledAs == SpelledAs::ParityName && value >= 0 && value < kParityCount) {
        return kParityNames[value];
    }
    if (setting.spelledAs == SpelledAs::ModeName && value >= 0 && value < kModeCount) {
        return kModeNames[value];
    }
    return std::to_string(value);
}

int32_t codeOf(const char* const* names, int count, const std::string& name) {
    for (int code = 0; code < count; ++code) {
        if (name == names[code]) {
            return code;
        }
    }
    return -1;
}

/// The five line settings of "port,baud,parity,bits,stop,mode", whose order
/// is that of the rows kBaud to kMode; the port name, which may hold commas,
/// is skipped by counting from the end.
bool lineValues(const std::string& text, int32_t (&values)[kMode + 1]) {
    std::vector<std::string> fields;
    splitTrimmed(text, ',', fields);
    if (fields.size() < 6) {
        return false;
    }
    const std::size_t first = fields.size() - 5;
    for (int id = kBaud; id <= kMode; ++id) {
        const std::string& field = fields[first + static_cast<std::size_t>(id)];
        const SpelledAs spelledAs = kSettings[id].spelledAs;
        values[id] = spelledAs == SpelledAs::ParityName ? codeOf(kParityNames, kParityCount, field)
                     : spelledAs == SpelledAs::ModeName ? codeOf(kModeNames, kModeCount, field)
                                                        : std::atoi(field.c_str());
    }
    return true;
}

}  // namespace

std::string RetainedSettings::where() const {
    return "in " + storage_.path() + " for instance " + instance_;
}

std::string RetainedSettings::lineDifferences(const std::string& configured) {
    int32_t values[kMode + 1] = {};
    if (!lineValues(configured, values)) {
        return "";
    }
    std::string differences;
    for (int id = kBaud; id <= kMode; ++id) {
        const Setting& setting = kSettings[id];
        if (!storage_.IsStored(instance_.c_str(), setting.key)) {
            continue;
        }
        const int32_t retained = storage_.ReadInt(instance_.c_str(), setting.key);
        if (retained != values[id]) {
            differences += std::string(differences.empty() ? "" : ", ") + setting.key + " " +
                           shown(setting, retained) + " (configured " + shown(setting, values[id]) +
                           ")";
        }
    }
    return differences;
}

std::string RetainedSettings::queueSizeWarning() {
    const char* key = kSettings[kTokenQueueSize].key;
    if (!storage_.IsStored(instance_.c_str(), key)) {
        return "";
    }
    return tools::queueSizeWarning(storage_.ReadInt(instance_.c_str(), key),
                                   std::string("the retained ") + key, where());
}

bool RetainedSettings::clear(std::string& report, std::string& error) {
    std::vector<host::StoredEntry> values;
    if (!storage_.list(instance_, values, error) || !storage_.clear(instance_, error)) {
        error = "cannot clear the settings retained " + where() + ": " + error;
        return false;
    }
    if (values.empty()) {
        report = "nothing to clear: no settings are retained " + where();
        return true;
    }
    report = "cleared the settings retained " + where() + ":";
    for (const host::StoredEntry& value : values) {
        report += " " + value.key + "=" + value.shown;
    }
    return true;
}

std::string queueSizeWarning(int32_t size, const std::string& what, const std::string& where) {
    const Setting& row = kSettings[kTokenQueueSize];
    if (size >= row.editorLow && size <= row.editorHigh) {
        return "";
    }
    return what + " " + std::to_string(size) + (where.empty() ? "" : " (" + where + ")") +
           " lies outside the project editor's range " + std::to_string(row.editorLow) + " to " +
           std::to_string(row.editorHigh) + "; the plug-in takes it all the same, and its queue " +
           (size < row.editorLow ? "keeps only the newest token"
                                 : "may hold that many tokens in memory");
}

}  // namespace xtok::tools
