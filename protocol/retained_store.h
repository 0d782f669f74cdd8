// Settings that an operator changes at run time and that outlive a restart:
// a cache in front of the host's permanent storage.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "protocol/spin_lock.h"

namespace xtok {

struct RetainedValue {
    int32_t kind = 0;  ///< 0 boolean, 1 integer, 2 text
    bool boolValue = false;
    int32_t intValue = 0;
    std::string textValue;
};

/// Values live under `section` (the instance name) and a full key: the name
/// for node -1, else "node<n>_<name>". The first get of a key reads permanent
/// storage (or takes the default) and caches the result for good. Safe to
/// use from several threads.
class RetainedStore {
public:
    void setSection(const std::string& section);

    void getBool(const std::string& name, int32_t node, bool def, bool& out);
    void getInt(const std::string& name, int32_t node, int32_t def, int32_t& out);
    void getText(const std::string& name, int32_t node, const std::string& def, std::string& out);

    /// Caches the value and, with `persist`, writes it to permanent storage
    /// (a failed write is not reported: the cached value stands).
    void setBool(const std::string& name, int32_t node, bool value, bool persist);
    void setInt(const std::string& name, int32_t node, int32_t value, bool persist);
    void setText(const std::string& name, int32_t node, const std::string& value, bool persist);

    static std::string fullKey(const std::string& name, int32_t node);

private:
    /// The cached entry for the key, read from storage on first use.
    RetainedValue entry(const std::string& name, int32_t node, int32_t kind,
                        const RetainedValue& def);
    static RetainedValue load(const std::string& section, const std::string& key, int32_t kind,
                              const RetainedValue& def);
    void store(const std::string& name, int32_t node, const RetainedValue& value, bool persist);

    SpinLock lock_;
    std::string section_;
    std::map<std::string, RetainedValue> entries_;
};

}  // namespace xtok
