// The four slots every host service begins with.
#pragma once

#include <cstdint>
#include <cstring>

#include "xtokline/host.h"

namespace xtok::host {

/// Version every service of this host reports.
constexpr int32_t kServiceVersion = 1;

/// `Interface` is the service's interface (IMultiTask2, ...); `name` is what the
/// service answers to, and the name it is offered under by the provider.
template <class Interface>
class HostService : public Interface {
public:
    explicit HostService(const char* name) : name_(name) {}
    HostService(const HostService&) = delete;
    HostService& operator=(const HostService&) = delete;

    // The provider owns its services; a plug-in calling this must not free one.
    void* Destroy(unsigned) override { return this; }
    void* GetInterface(const char* name) override {
        return name && std::strcmp(name, name_) == 0 ? static_cast<Interface*>(this) : nullptr;
    }
    const char* GetName() override { return name_; }
    int32_t GetVersion() override { return kServiceVersion; }

private:
    const char* name_;
};

/// Services a plug-in holds without calling anything beyond the four slots.
class SocketFactory final : public HostService<ISocketFactory> {
public:
    SocketFactory() : HostService("ISocketFactory") {}
};

class CDSBuffer final : public HostService<ICDSBuffer> {
public:
    CDSBuffer() : HostService("ICDSBuffer") {}
};

}  // namespace xtok::host
