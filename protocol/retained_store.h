// Settings that an operator changes at run time and that outlive a restart:
// a cache in front of the host's permanent storage. Not thread-safe: the
// protocol holds queueLock around every use.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <variant>

#include "xtokline/host.h"

namespace xtok {

/// A setting's value as the stores keep it: a flag, a number or a text.
using StoredValue = std::variant<bool, int32_t, std::string>;

/// Values live under `section` (the instance name) and a full key: the name
/// for node -1, else "node<n>_<name>". The first get of a key reads permanent
/// storage (or takes the default) and caches the result for good.
class RetainedStore {
public:
    /// The storage to read and write (null: none) and the section to use.
    void attach(IPermanentStorage* storage, const std::string& section);

    /// The cached value, else the stored one of the default's kind, else
    /// the default; cached either way.
    StoredValue get(const std::string& name, int32_t node, const StoredValue& def);
    /// Caches the value and, with `persist`, writes it to permanent storage
    /// (a failed write is not reported: the cached value stands).
    void set(const std::string& name, int32_t node, const StoredValue& value, bool persist);

    static std::string fullKey(const std::string& name, int32_t node);

private:
    StoredValue load(const std::string& key, const StoredValue& def) const;

    IPermanentStorage* storage_ = nullptr;
    std::string section_;
    std::map<std::string, StoredValue> entries_;
};

}  // namespace xtok
