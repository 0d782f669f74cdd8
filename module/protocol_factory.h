// Creates and destroys protocol objects by short name.
#pragma once

#include "module/service_table.h"
#include "xtokline/plugin.h"

namespace xtok {

/// Makes a protocol for its short name, or null; the library's protocol
/// layer provides it, with the services that Init acquired.
using ProtocolMaker = IProtocol7* (*)(const char* name, const ServiceTable& services);

class ProtocolFactory final : public IProtocolFactory {
public:
    ProtocolFactory(ProtocolMaker make, const ServiceTable& services)
        : make_(make), services_(services) {}

    void* Destroy(unsigned flags) override;
    void* GetInterface(const char* name) override;
    const char* GetName() override { return "ProtFactoryInDLL"; }
    int32_t GetVersion() override { return 100; }
    IProtocol7* CreateProtocol(const char* name) override;
    void DestroyProtocol(IProtocol7* protocol) override;

private:
    ProtocolMaker make_;
    const ServiceTable& services_;
};

}  // namespace xtok
