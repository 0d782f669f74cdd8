// Plug-in side of the contract: the one exported function and the objects
// reached from it.
//
// Order of use by a runtime, all on its management thread:
//   GetInterfaceFactory() -> root; root->GetInterface("IProtModule")->Init(host);
//   root->GetInterface("IProtocolFactory")->CreateProtocol("XTOK") ... drive the
//   protocol ... DestroyProtocol(p); module->Exit(); unload.
#pragma once

#include <cstdint>

#include "xtokline/host.h"
#include "xtokline/protocol.h"

namespace xtok {

/// The root object: static inside the library, never destroyed by the
/// runtime, so it has no Destroy slot.
class IInterfaceFactory {
public:
    /// slot 0: "IProtocolFactory"/"ProtocolFactory" give the factory,
    /// "IProtModule"/"ProtModule" the module; other names null. Exact,
    /// case-sensitive.
    virtual void* XTOK_SLOT_CALL GetInterface(const char* name) = 0;
    /// slot 1: does nothing; the root lives as long as the library.
    virtual void XTOK_SLOT_CALL Release() = 0;
};

/// Creates protocol objects by short name. Owned by the library.
class IProtocolFactory {
public:
    /// slot 0: the factory is static; this does nothing and returns its address.
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1
    virtual void* XTOK_SLOT_CALL GetInterface(const char* name) = 0;
    /// slot 2: "ProtFactoryInDLL"
    virtual const char* XTOK_SLOT_CALL GetName() = 0;
    /// slot 3: 100
    virtual int32_t XTOK_SLOT_CALL GetVersion() = 0;
    /// slot 4: a new protocol for the exact short name, or null. The caller
    /// owns it until DestroyProtocol. IProtModule::Init must have succeeded.
    virtual IProtocol7* XTOK_SLOT_CALL CreateProtocol(const char* name) = 0;
    /// slot 5: destroys a protocol made by CreateProtocol; null is ignored.
    /// The runtime stops the protocol first.
    virtual void XTOK_SLOT_CALL DestroyProtocol(IProtocol7* protocol) = 0;
};

/// Connects the library to the host's services. Owned by the library.
class IProtModule {
public:
    /// slot 0: the module is static; this does nothing and returns its address.
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1
    virtual void* XTOK_SLOT_CALL GetInterface(const char* name) = 0;
    /// slot 2: "ProtModule"
    virtual const char* XTOK_SLOT_CALL GetName() = 0;
    /// slot 3: 100
    virtual int32_t XTOK_SLOT_CALL GetVersion() = 0;
    /// slot 4: takes the host's services; 1 on success, 0 with GetErrorText
    /// saying which required service is missing. Counted: only the first of
    /// nested calls acquires anything. `host` must outlive the last Exit.
    virtual int32_t XTOK_SLOT_CALL Init(IServiceProvider* host) = 0;
    /// slot 5: undoes one Init; the last one releases the services. Every
    /// protocol must be destroyed before the last Exit.
    virtual void XTOK_SLOT_CALL Exit() = 0;
    /// slot 6: the text of the last failed Init, "" before any.
    virtual const char* XTOK_SLOT_CALL GetErrorText() = 0;
};

}  // namespace xtok

/// The library's only exported symbol: the address of the static root object
/// (an IInterfaceFactory). Never fails, never allocates.
extern "C" void* GetInterfaceFactory(void);
