#include "protocol/retained_store.h"

#include <mutex>

#include "module/service_table.h"

namespace xtok {

namespace {

enum Kind : int32_t { kBool = 0, kInt = 1, kText = 2 };

// A retained text longer than this is not read back.
constexpr int32_t kTextBufferSize = 256;

std::string readStoredText(IPermanentStorage* storage, const std::string& section,
                           const std::string& key) {
    auto* extended = static_cast<IPermanentStorage2*>(storage->GetInterface("IPermanentStorage2"));
    if (!extended) {
        const char* text = storage->ReadText(section.c_str(), key.c_str());
        return text ? text : "";
    }
    char buffer[kTextBufferSize] = {};
    if (!extended->ReadTextTo(section.c_str(), key.c_str(), buffer, kTextBufferSize)) {
        return "";
    }
    buffer[kTextBufferSize - 1] = '\0';
    return buffer;
}

}  // namespace

std::string RetainedStore::fullKey(const std::string& name, int32_t node) {
    return node == -1 ? name : "node" + std::to_string(node) + "_" + name;
}

void RetainedStore::setSection(const std::string& section) {
    std::lock_guard<SpinLock> guard(lock_);
    section_ = section;
}

RetainedValue RetainedStore::load(const std::string& section, const std::string& key, int32_t kind,
                                  const RetainedValue& def) {
    IPermanentStorage* storage = services().permanentStorage;
    if (!storage || !storage->IsStored(section.c_str(), key.c_str())) {
        return def;
    }
    RetainedValue value = def;
    if (kind == kBool) {
        value.boolValue = storage->ReadBool(section.c_str(), key.c_str());
    } else if (kind == kInt) {
        value.intValue = storage->ReadInt(section.c_str(), key.c_str());
    } else {
        value.textValue = readStoredText(storage, section, key);
    }
    return value;
}

RetainedValue RetainedStore::entry(const std::string& name, int32_t node, int32_t kind,
                                   const RetainedValue& def) {
    std::string key = fullKey(name, node);
    std::string section;
    {
        std::lock_guard<SpinLock> guard(lock_);
        auto it = entries_.find(key);
        if (it != entries_.end()) {
            // The kind recorded in the entry is not compared: a key has one use.
            return it->second;
        }
        section = section_;
    }
    // Storage is read without the lock held; should another thread cache
    // the key meanwhile, its entry stays.
    RetainedValue loaded = load(section, key, kind, def);
    std::lock_guard<SpinLock> guard(lock_);
    return entries_.emplace(key, std::move(loaded)).first->second;
}

void RetainedStore::getBool(const std::string& name, int32_t node, bool def, bool& out) {
    RetainedValue d;
    d.kind = kBool;
    d.boolValue = def;
    out = entry(name, node, kBool, d).boolValue;
}

void RetainedStore::getInt(const std::string& name, int32_t node, int32_t def, int32_t& out) {
    RetainedValue d;
    d.kind = kInt;
    d.intValue = def;
    out = entry(name, node, kInt, d).intValue;
}

void RetainedStore::getText(const std::string& name, int32_t node, const std::string& def,
                            std::string& out) {
    RetainedValue d;
    d.kind = kText;
    d.textValue = def;
    out = entry(name, node, kText, d).textValue;
}

void RetainedStore::store(const std::string& name, int32_t node, const RetainedValue& value,
                          bool persist) {
    std::string key = fullKey(name, node);
    std::string section;
    {
        std::lock_guard<SpinLock> guard(lock_);
        entries_[key] = value;
        section = section_;
    }
    IPermanentStorage* storage = services().permanentStorage;
    if (!persist || !storage) {
        return;
    }
    const char* s = section.c_str();
    if (value.kind == kBool) {
        storage->WriteBool(s, key.c_str(), value.boolValue);
    } else if (value.kind == kInt) {
        storage->WriteInt(s, key.c_str(), value.intValue);
    } else {
        storage->WriteText(s, key.c_str(), value.textValue.c_str());
    }
}

void RetainedStore::setBool(const std::string& name, int32_t node, bool value, bool persist) {
    RetainedValue v;
    v.kind = kBool;
    v.boolValue = value;
    store(name, node, v, persist);
}

void RetainedStore::setInt(const std::string& name, int32_t node, int32_t value, bool persist) {
    RetainedValue v;
    v.kind = kInt;
    v.intValue = value;
    store(name, node, v, persist);
}

void RetainedStore::setText(const std::string& name, int32_t node, const std::string& value,
                            bool persist) {
    RetainedValue v;
    v.kind = kText;
    v.textValue = value;
    store(name, node, v, persist);
}

}  // namespace xtok
