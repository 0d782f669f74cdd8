// Settings written through the SP_ memory types, waiting for SP_Done. Not
// thread-safe: the protocol holds queueLock around every use.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "protocol/retained_store.h"

namespace xtok {

/// Keyed by the name alone for node -1, else the name followed by the node
/// number ("gap2"). This differs from the retained store's keys on purpose:
/// each store uses only its own.
class StagedStore {
public:
    void stage(const std::string& name, int32_t node, const StoredValue& value);
    /// The staged value, or null.
    const StoredValue* find(const std::string& name, int32_t node) const;

    /// Sets every staged value of `node` into `store`, in key order. The
    /// staged values stay, so later reads of the SP_ types still see them.
    void commitTo(RetainedStore& store, int32_t node, bool persist) const;

    static std::string stagedKey(const std::string& name, int32_t node);

private:
    struct Entry {
        std::string name;
        int32_t node;
        StoredValue value;
    };
    std::map<std::string, Entry> entries_;
};

}  // namespace xtok
