// Settings written through the SP_ memory types, waiting for SP_Done.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "protocol/spin_lock.h"

namespace xtok {

class RetainedStore;

struct StagedValue {
    int32_t kind = 0;  ///< 0 boolean, 1 integer, 2 text
    std::string name;
    bool boolValue = false;
    int32_t intValue = 0;
    std::string textValue;
    int32_t node = -1;
};

/// Keyed by the name alone for node -1, else the name followed by the node
/// number ("gap2"). This differs from the retained store's keys on purpose:
/// each store uses only its own. Safe to use from several threads.
class StagedStore {
public:
    void stageBool(const std::string& name, int32_t node, bool value);
    void stageInt(const std::string& name, int32_t node, int32_t value);
    void stageText(const std::string& name, int32_t node, const std::string& value);

    /// True with `out` set when staged; otherwise `out` is left alone.
    bool findBool(const std::string& name, int32_t node, bool& out) const;
    bool findInt(const std::string& name, int32_t node, int32_t& out) const;
    bool findText(const std::string& name, int32_t node, std::string& out) const;

    /// Sets every staged value of `node` into `store`, in key order. The
    /// staged values stay, so later reads of the SP_ types still see them.
    void commitTo(RetainedStore& store, int32_t node, bool persist) const;

    static std::string stagedKey(const std::string& name, int32_t node);

private:
    void stage(StagedValue value);
    /// Copies one field of the staged entry; false when nothing is staged.
    template <class T>
    bool find(const std::string& name, int32_t node, T StagedValue::*field, T& out) const;

    mutable SpinLock lock_;
    std::map<std::string, StagedValue> entries_;
};

}  // namespace xtok
