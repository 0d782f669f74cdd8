// The built plug-in as a foreign runtime sees it: loaded by the system's
// loader (dlopen, LoadLibrary), reached through GetInterfaceFactory and slot
// numbers only. The loading half has one source per system.
#pragma once

#include <string>
#include <vector>

namespace xtok::test {

/// The plug-in file loaded for the lifetime of the object.
class PluginLibrary {
public:
    explicit PluginLibrary(const char* path = XTOK_PLUGIN_PATH);
    ~PluginLibrary();
    PluginLibrary(const PluginLibrary&) = delete;
    PluginLibrary& operator=(const PluginLibrary&) = delete;

    bool loaded() const { return handle_ != nullptr; }
    const std::string& error() const { return error_; }
    /// The root object from GetInterfaceFactory, or null.
    void* root() const;
    /// Slot 0 of the root: an interface by name.
    void* rootInterface(const char* name) const;

private:
    void* handle_ = nullptr;
    std::string error_;
};

/// The whole file as bytes; empty when it cannot be read.
std::string readWholeFile(const std::string& path);

}  // namespace xtok::test
