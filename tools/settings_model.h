// The settings as xtok-host has seen them change: configured, retained at
// start, set from the console, staged by SP_ writes and applied by SP_Done.
// For each row of the settings table it answers the active value and where
// it came from, the staged value and the retained one. The plug-in reports
// its active framing nowhere, so the model follows each event as the
// plug-in handles it.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "protocol/retained_store.h"
#include "protocol/settings.h"
#include "tools/active_framing.h"

namespace xtok::tools {

enum class Source : uint8_t {
    Default,        ///< the plug-in's default: the configuration does not name it
    Configuration,  ///< the configuration text (options included)
    Retained,       ///< the state file, at start
    Console,        ///< a console setter (set_rxPrefix, ...)
    SpWrite,        ///< an SP_ write, applied by SP_Done
};

const char* sourceName(Source source);

struct SettingState {
    StoredValue active;
    Source source = Source::Default;
    std::optional<StoredValue> staged;    ///< written to its SP_ type, waiting for SP_Done
    std::optional<StoredValue> retained;  ///< in the state file
};

/// The row whose configuration key is `key`, or null.
const Setting* findSettingByConfigKey(const std::string& key);

/// A number, or a parity or mode code, as Configure reads it from `text`.
/// False when the text spells none.
bool configuredNumber(const Setting& setting, const std::string& text, int32_t& number);
/// The other way round: a parity or mode code by its name, where it has
/// one, any other number as it is.
std::string spelledNumber(const Setting& setting, int32_t number);

class SettingsModel {
public:
    /// Every setting at its default.
    SettingsModel();

    /// The values of a configuration text, or their defaults.
    void configured(const std::string& configText);
    /// What `storage` retains under `section`, over the configured values,
    /// as Start loads it.
    void retainedAtStart(IPermanentStorage& storage, const std::string& section);
    /// A console line that the plug-in carried out; its setters change an
    /// active value at once.
    void consoleLine(const std::string& line);
    /// An SP_ write accepted: staged until SP_Done, and staged it stays.
    void staged(SettingId id, const StoredValue& value);
    /// SP_Done: the staged values retained (in the state file when `kept`),
    /// and every setting made what the plug-in retains for it: a console
    /// change is undone by it.
    void applied(bool kept);

    const SettingState& operator[](SettingId id) const { return states_[id]; }
    /// How the receive side cuts tokens now: what a line monitor needs to
    /// cut them as the plug-in does.
    ActiveFraming framing() const;

private:
    struct Held {
        StoredValue value;
        Source source;
    };
    void activate(SettingId id, const StoredValue& value, Source source);

    SettingState states_[kSettingCount];
    /// What the plug-in's retained store holds for each setting: the value at
    /// start until an SP_Done retains another. SP_Done returns every setting
    /// to it.
    Held held_[kSettingCount];
};

}  // namespace xtok::tools
