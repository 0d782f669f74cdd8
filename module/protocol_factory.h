// Creates and destroys protocol objects by short name.
#pragma once

#include "xtokline/plugin.h"

namespace xtok {

class ProtocolFactory final : public IProtocolFactory {
public:
    void* Destroy(unsigned flags) override;
    void* GetInterface(const char* name) override;
    const char* GetName() override { return "ProtFactoryInDLL"; }
    int32_t GetVersion() override { return 100; }
    IProtocol7* CreateProtocol(const char* name) override;
    void DestroyProtocol(IProtocol7* protocol) override;
};

}  // namespace xtok
