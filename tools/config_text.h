// A configuration text cut as the plug-in's reader cuts it: the words of the
// section after the first "CfgVer=1", up to the next version's marker; what
// lies around that section is kept as it is. Options of the command line
// change keys of it without losing the rest.
#pragma once

#include <string>
#include <vector>

namespace xtok::tools {

struct ConfigEntry {
    std::string word;  // as written
    std::string node;  // "Node2" of "Node2::model=1"; "" for a key of the whole line
    std::string key;   // "" when the word is no key=value entry
    std::string value;
};

class ConfigText {
public:
    /// Opens the only section the plug-in reads.
    static constexpr const char* kMarker = "CfgVer=1";

    explicit ConfigText(const std::string& text = kMarker);

    /// Whether `key` is the one the marker spells: the section never holds it.
    static bool isMarkerKey(const std::string& key);

    /// Whether the text holds the marker at all.
    bool versioned() const { return versioned_; }
    const std::vector<ConfigEntry>& entries() const { return entries_; }
    /// The value the plug-in reads for a key of the whole line: its first
    /// entry's; null when there is none.
    const std::string* find(const std::string& key) const;
    /// Gives `key` the one entry `key=value`, where its first entry stood or
    /// at the end.
    void set(const std::string& key, const std::string& value);
    std::string text() const;

private:
    std::string before_;  // up to the marker, and the marker
    std::string after_;   // from the next version's marker on
    bool versioned_ = false;
    std::vector<ConfigEntry> entries_;
};

}  // namespace xtok::tools
