#include "protocol/staged_store.h"

#include <mutex>
#include <vector>

#include "protocol/retained_store.h"

namespace xtok {

std::string StagedStore::stagedKey(const std::string& name, int32_t node) {
    return node == -1 ? name : name + std::to_string(node);
}

void StagedStore::stage(StagedValue value) {
    std::string key = stagedKey(value.name, value.node);
    std::lock_guard<SpinLock> guard(lock_);
    entries_[key] = std::move(value);
}

namespace {

StagedValue staged(int32_t kind, const std::string& name, int32_t node) {
    StagedValue v;
    v.kind = kind;
    v.name = name;
    v.node = node;
    return v;
}

}  // namespace

void StagedStore::stageBool(const std::string& name, int32_t node, bool value) {
    StagedValue v = staged(0, name, node);
    v.boolValue = value;
    stage(std::move(v));
}

void StagedStore::stageInt(const std::string& name, int32_t node, int32_t value) {
    StagedValue v = staged(1, name, node);
    v.intValue = value;
    stage(std::move(v));
}

void StagedStore::stageText(const std::string& name, int32_t node, const std::string& value) {
    StagedValue v = staged(2, name, node);
    v.textValue = value;
    stage(std::move(v));
}

template <class T>
bool StagedStore::find(const std::string& name, int32_t node, T StagedValue::*field, T& out) const {
    std::lock_guard<SpinLock> guard(lock_);
    auto it = entries_.find(stagedKey(name, node));
    if (it == entries_.end()) {
        return false;
    }
    out = it->second.*field;
    return true;
}

bool StagedStore::findBool(const std::string& name, int32_t node, bool& out) const {
    return find(name, node, &StagedValue::boolValue, out);
}

bool StagedStore::findInt(const std::string& name, int32_t node, int32_t& out) const {
    return find(name, node, &StagedValue::intValue, out);
}

bool StagedStore::findText(const std::string& name, int32_t node, std::string& out) const {
    return find(name, node, &StagedValue::textValue, out);
}

void StagedStore::commitTo(RetainedStore& store, int32_t node, bool persist) const {
    std::vector<StagedValue> values;
    {
        // Copied out so that the storage writes run without holding the lock.
        std::lock_guard<SpinLock> guard(lock_);
        for (const auto& [key, value] : entries_) {
            if (value.node == node) {
                values.push_back(value);
            }
        }
    }
    for (const StagedValue& v : values) {
        if (v.kind == 0) {
            store.setBool(v.name, node, v.boolValue, persist);
        } else if (v.kind == 1) {
            store.setInt(v.name, node, v.intValue, persist);
        } else {
            store.setText(v.name, node, v.textValue, persist);
        }
    }
}

}  // namespace xtok
