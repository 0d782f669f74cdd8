// The host services held by the library, shared by every protocol object.
#pragma once

#include "xtokline/host.h"

namespace xtok {

/// One pointer per host service, null when not held. Filled by
/// ProtModule::Init, emptied by the last ProtModule::Exit; protocol code
/// reads it and never acquires services itself.
struct ServiceTable {
    IMultiTask2* multiTask = nullptr;
    ISerialFactory* serialFactory = nullptr;
    ISocketFactory* socketFactory = nullptr;
    ICDSBuffer* cdsBuffer = nullptr;
    IDiag* diag = nullptr;
    IPermanentStorage* permanentStorage = nullptr;
    IDriverInterface* driverInterface = nullptr;
    ISmux* smux = nullptr;
    IFastTimer* fastTimer = nullptr;
    /// True between a successful Init and the last Exit. A failed Init leaves
    /// the services it gave back in the table; this says they are not held.
    bool held = false;
};

/// The process-wide table.
ServiceTable& services();

}  // namespace xtok
