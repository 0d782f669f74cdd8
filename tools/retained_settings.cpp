#include "tools/retained_settings.h"

#include <cstdlib>
#include <vector>

#include "protocol/settings.h"
#include "tools/settings_model.h"

namespace xtok::tools {

namespace {

/// The value of one of the rows kBaud to kMode.
int32_t lineValue(const LineSettings& line, int id) {
    const int32_t values[] = {line.baud, line.parity, line.bits, line.stop, line.mode};
    return values[id];
}

}  // namespace

std::string RetainedSettings::where() const {
    return "in " + storage_.path() + " for instance " + instance_;
}

std::string RetainedSettings::lineDifferences(const LineSettings& configured) {
    std::string differences;
    for (int id = kBaud; id <= kMode; ++id) {
        const Setting& setting = kSettings[id];
        if (!storage_.IsStored(instance_.c_str(), setting.key)) {
            continue;
        }
        const int32_t retained = storage_.ReadInt(instance_.c_str(), setting.key);
        const int32_t value = lineValue(configured, id);
        if (retained != value) {
            differences += std::string(differences.empty() ? "" : ", ") + setting.key + " " +
                           spelledNumber(setting, retained) + " (configured " +
                           spelledNumber(setting, value) + ")";
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

// The port's name may hold commas: the five fields are counted from the end.
bool parseSerialSettings(const std::string& text, std::string& port, LineSettings& line) {
    std::size_t end = text.size();
    std::string fields[5];
    for (int i = 4; i >= 0; --i) {
        const std::size_t comma = end == 0 ? std::string::npos : text.rfind(',', end - 1);
        if (comma == std::string::npos) {
            return false;
        }
        fields[i] = text.substr(comma + 1, end - comma - 1);
        end = comma;
    }
    port = text.substr(0, end);
    line.baud = std::atoi(fields[0].c_str());
    line.bits = std::atoi(fields[2].c_str());
    line.stop = std::atoi(fields[3].c_str());
    return configuredNumber(kSettings[kParity], fields[1], line.parity) &&
           configuredNumber(kSettings[kMode], fields[4], line.mode);
}

}  // namespace xtok::tools
