#include "tools/config_text.h"

#include <cctype>
#include <cstring>

namespace xtok::tools {

namespace {

bool isBlank(char c) {
    return std::isspace(static_cast<unsigned char>(c)) != 0;
}

/// The length of a "Node<digits>::" at the start of `word`, else 0.
std::size_t nodePrefixLength(const std::string& word) {
    if (word.rfind("Node", 0) != 0) {
        return 0;
    }
    std::size_t at = 4;
    while (at < word.size() && std::isdigit(static_cast<unsigned char>(word[at]))) {
        ++at;
    }
    return word.compare(at, 2, "::") == 0 ? at + 2 : 0;
}

ConfigEntry entryOf(const std::string& word) {
    ConfigEntry entry{word, "", "", ""};
    std::size_t prefix = nodePrefixLength(word);
    std::size_t equals = word.find('=', prefix);
    if (equals == std::string::npos || equals == prefix) {
        return entry;
    }
    entry.node = prefix ? word.substr(0, prefix - 2) : "";
    entry.key = word.substr(prefix, equals - prefix);
    entry.value = word.substr(equals + 1);
    return entry;
}

}  // namespace

ConfigText::ConfigText(const std::string& text) {
    const std::size_t marker = text.find(kMarker);
    if (marker == std::string::npos) {
        before_ = text;
        return;
    }
    versioned_ = true;
    const std::size_t start = marker + std::strlen(kMarker);
    const std::size_t next = text.find("CfgVer=", start);
    before_ = text.substr(0, start);
    after_ = next == std::string::npos ? "" : text.substr(next);
    const std::string section = text.substr(start, next - start);
    for (std::size_t at = 0; at < section.size();) {
        std::size_t end = at;
        while (end < section.size() && !isBlank(section[end])) {
            ++end;
        }
        if (end > at) {
            entries_.push_back(entryOf(section.substr(at, end - at)));
        }
        at = end + 1;
    }
}

bool ConfigText::isMarkerKey(const std::string& key) {
    return std::strncmp(kMarker, (key + "=").c_str(), key.size() + 1) == 0;
}

const std::string* ConfigText::find(const std::string& key) const {
    for (const ConfigEntry& entry : entries_) {
        if (entry.node.empty() && entry.key == key) {
            return &entry.value;
        }
    }
    return nullptr;
}

void ConfigText::set(const std::string& key, const std::string& value) {
    const ConfigEntry entry = entryOf(key + "=" + value);
    bool placed = false;
    for (auto it = entries_.begin(); it != entries_.end();) {
        if (!it->node.empty() || it->key != key) {
            ++it;
        } else if (!placed) {
            *it++ = entry;
            placed = true;
        } else {
            it = entries_.erase(it);
        }
    }
    if (!placed) {
        entries_.push_back(entry);
    }
}

std::string ConfigText::text() const {
    std::string text = before_;
    for (const ConfigEntry& entry : entries_) {
        text += " " + entry.word;
    }
    return after_.empty() ? text : text + " " + after_;
}

}  // namespace xtok::tools
