// The root object handed out by GetInterfaceFactory.
#pragma once

#include "module/prot_module.h"
#include "module/protocol_factory.h"
#include "xtokline/plugin.h"

namespace xtok {

class InterfaceFactory final : public IInterfaceFactory {
public:
    explicit InterfaceFactory(ProtocolMaker make) : factory_(make, services()) {}
    void* GetInterface(const char* name) override;
    void Release() override {}

    ProtocolFactory& factory() { return factory_; }
    ProtModule& module() { return module_; }

private:
    ProtocolFactory factory_;
    ProtModule module_;
};

/// The one root object of the loaded library, built at load time by the
/// layer that knows the library's protocol.
InterfaceFactory& rootObject();

}  // namespace xtok
