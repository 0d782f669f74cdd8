#include "protocol/staged_store.h"

namespace xtok {

std::string StagedStore::stagedKey(const std::string& name, int32_t node) {
    return node == -1 ? name : name + std::to_string(node);
}

void StagedStore::stage(const std::string& name, int32_t node, const StoredValue& value) {
    entries_[stagedKey(name, node)] = Entry{name, node, value};
}

const StoredValue* StagedStore::find(const std::string& name, int32_t node) const {
    auto it = entries_.find(stagedKey(name, node));
    return it == entries_.end() ? nullptr : &it->second.value;
}

void StagedStore::commitTo(RetainedStore& store, int32_t node, bool persist) const {
    for (const auto& [key, entry] : entries_) {
        if (entry.node == node) {
            store.set(entry.name, node, entry.value, persist);
        }
    }
}

}  // namespace xtok
