#include "host/plugin_loader.h"

#include <dlfcn.h>
#include <link.h>

#include <algorithm>

#include "host/service_provider.h"
#include "host/shared_object_check.h"

namespace xtok::host {

namespace {

void* loadLibrary(const std::string& path, std::string& error) {
    error = sharedObjectProblem(path);
    if (!error.empty()) {
        return nullptr;
    }
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!handle) {
        const char* why = dlerror();
        error = "cannot load " + path + ": " + (why ? why : "dlopen failed");
    }
    return handle;
}

/// Whether the symbol at `address` is code: calling a data object would
/// crash the host.
bool isFunction(void* address) {
    Dl_info info;
    void* entry = nullptr;
    if (dladdr1(address, &info, &entry, RTLD_DL_SYMENT) == 0 || !entry) {
        return false;
    }
    // The type field is the same for both word sizes.
    const unsigned type = ELF64_ST_TYPE(static_cast<const ElfW(Sym)*>(entry)->st_info);
    return type == STT_FUNC || type == STT_GNU_IFUNC;
}

}  // namespace

LoadedPlugin::LoadedPlugin(std::string path, ServiceProvider& host, void* handle)
    : path_(std::move(path)), host_(host), handle_(handle) {}

LoadedPlugin::~LoadedPlugin() {
    while (!protocols_.empty()) {
        destroyProtocol(protocols_.back());
    }
    if (initialised_) {
        module_->Exit();
    }
    unload();
}

std::unique_ptr<LoadedPlugin> LoadedPlugin::load(const std::string& path, ServiceProvider& host,
                                                 std::string& error) {
    // Without a "/" dlopen would search the library path instead of the file.
    std::string file = path.find('/') == std::string::npos ? "./" + path : path;
    void* handle = loadLibrary(file, error);
    if (!handle) {
        return nullptr;
    }
    std::unique_ptr<LoadedPlugin> plugin(new LoadedPlugin(file, host, handle));
    if (!plugin->connect(error)) {
        return nullptr;
    }
    return plugin;
}

bool LoadedPlugin::connect(std::string& error) {
    void* symbol = dlsym(handle_, "GetInterfaceFactory");
    if (symbol && !isFunction(symbol)) {
        error = path_ + " is not a protocol plug-in: its GetInterfaceFactory is not a function";
        return false;
    }
    auto entry = reinterpret_cast<void* (*)()>(symbol);
    auto* root = entry ? static_cast<IInterfaceFactory*>(entry()) : nullptr;
    if (root) {
        module_ = static_cast<IProtModule*>(root->GetInterface("IProtModule"));
        factory_ = static_cast<IProtocolFactory*>(root->GetInterface("IProtocolFactory"));
    }
    if (!module_ || !factory_) {
        error = path_ + " is not a protocol plug-in: " +
                (entry ? "it offers no IProtModule and IProtocolFactory"
                       : "it has no GetInterfaceFactory");
        return false;
    }
    if (module_->Init(&host_) == 0) {
        const char* why = module_->GetErrorText();
        error = path_ + " could not take the host's services: " + (why ? why : "");
        return false;
    }
    initialised_ = true;
    return true;
}

IProtocol7* LoadedPlugin::createProtocol(const std::string& name, std::string& error) {
    IProtocol7* protocol = factory_->CreateProtocol(name.c_str());
    if (!protocol) {
        error = path_ + " has no protocol named '" + name + "'";
        return nullptr;
    }
    protocols_.push_back(protocol);
    return protocol;
}

void LoadedPlugin::destroyProtocol(IProtocol7* protocol) {
    auto it = std::find(protocols_.begin(), protocols_.end(), protocol);
    if (it == protocols_.end()) {
        return;
    }
    protocols_.erase(it);
    // A runtime stops every protocol before destroying it, whether it was
    // started or not.
    protocol->Stop();
    factory_->DestroyProtocol(protocol);
}

// A task that outlived its StopTask still runs the plug-in's code; unmapping
// that code would crash the process the next time the task is scheduled.
void LoadedPlugin::unload() {
    if (host_.multiTask().liveTasks() > 0) {
        host_.notice("a plug-in task is still running; " + path_ + " stays loaded");
        return;
    }
    dlclose(handle_);
}

}  // namespace xtok::host
