// Loading a plug-in file and connecting it to the host's services, the way a
// panel runtime does, with every step undone on every path.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "xtokline/plugin.h"

namespace xtok::host {

class ServiceProvider;

class LoadedPlugin {
public:
    /// dlopen, GetInterfaceFactory, "IProtModule" -> Init(host), and
    /// "IProtocolFactory". Null with `error` set when any step fails; what was
    /// done up to then is undone. `host` must outlive the result.
    static std::unique_ptr<LoadedPlugin> load(const std::string& path, ServiceProvider& host,
                                              std::string& error);
    /// Stops and destroys the protocols still held, Exit, dlclose.
    ~LoadedPlugin();
    LoadedPlugin(const LoadedPlugin&) = delete;
    LoadedPlugin& operator=(const LoadedPlugin&) = delete;

    /// A new protocol by short name, held by this object until
    /// destroyProtocol or the end of the plug-in. Null with `error` set.
    IProtocol7* createProtocol(const std::string& name, std::string& error);
    /// Stop, then DestroyProtocol. Ignores protocols it does not hold.
    void destroyProtocol(IProtocol7* protocol);

    IProtModule& module() { return *module_; }
    IProtocolFactory& factory() { return *factory_; }

private:
    LoadedPlugin(std::string path, ServiceProvider& host, void* handle);
    bool connect(std::string& error);
    void unload();

    std::string path_;
    ServiceProvider& host_;
    void* handle_;
    IProtModule* module_ = nullptr;
    bool initialised_ = false;
    IProtocolFactory* factory_ = nullptr;
    std::vector<IProtocol7*> protocols_;
};

}  // namespace xtok::host
