#include "protocol/retained_store.h"

namespace xtok {

namespace {

// A retained text is read into a buffer that doubles until the text fits,
// up to this size; a longer one (no setting has one) reads as empty.
constexpr int32_t kFirstTextBuffer = 256;
constexpr int32_t kLastTextBuffer = 1 << 20;

std::string readStoredText(IPermanentStorage* storage, const std::string& section,
                           const std::string& key) {
    auto* extended = static_cast<IPermanentStorage2*>(storage->GetInterface("IPermanentStorage2"));
    if (!extended) {
        const char* text = storage->ReadText(section.c_str(), key.c_str());
        return text ? text : "";
    }
    for (int32_t size = kFirstTextBuffer; size <= kLastTextBuffer; size *= 2) {
        std::string buffer(static_cast<std::size_t>(size), '\0');
        if (extended->ReadTextTo(section.c_str(), key.c_str(), &buffer[0], size)) {
            buffer.back() = '\0';
            return buffer.c_str();
        }
    }
    return "";
}

}  // namespace

std::string RetainedStore::fullKey(const std::string& name, int32_t node) {
    return node == -1 ? name : "node" + std::to_string(node) + "_" + name;
}

void RetainedStore::attach(IPermanentStorage* storage, const std::string& section) {
    storage_ = storage;
    section_ = section;
}

StoredValue RetainedStore::load(const std::string& key, const StoredValue& def) const {
    const char* section = section_.c_str();
    if (!storage_ || !storage_->IsStored(section, key.c_str())) {
        return def;
    }
    if (std::holds_alternative<bool>(def)) {
        return storage_->ReadBool(section, key.c_str());
    }
    if (std::holds_alternative<int32_t>(def)) {
        return storage_->ReadInt(section, key.c_str());
    }
    return readStoredText(storage_, section_, key);
}

StoredValue RetainedStore::get(const std::string& name, int32_t node, const StoredValue& def) {
    const std::string key = fullKey(name, node);
    auto it = entries_.find(key);
    if (it == entries_.end()) {
        it = entries_.emplace(key, load(key, def)).first;
    }
    // The kind cached is not compared: a key has one use.
    return it->second;
}

void RetainedStore::set(const std::string& name, int32_t node, const StoredValue& value,
                        bool persist) {
    const std::string key = fullKey(name, node);
    entries_[key] = value;
    if (!persist || !storage_) {
        return;
    }
    const char* section = section_.c_str();
    if (const bool* flag = std::get_if<bool>(&value)) {
        storage_->WriteBool(section, key.c_str(), *flag);
    } else if (const int32_t* number = std::get_if<int32_t>(&value)) {
        storage_->WriteInt(section, key.c_str(), *number);
    } else {
        storage_->WriteText(section, key.c_str(), std::get<std::string>(value).c_str());
    }
}

}  // namespace xtok
