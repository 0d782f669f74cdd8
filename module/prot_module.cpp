#include "module/prot_module.h"

#include <cstring>

#include "module/service_table.h"

namespace xtok {

namespace {

template <class T>
T* take(IServiceProvider* host, const char* name) {
    return static_cast<T*>(host->GetService(name));
}

}  // namespace

void* ProtModule::Destroy(unsigned) {
    // The module is a static part of the root object: nothing to free.
    return this;
}

void* ProtModule::GetInterface(const char* name) {
    if (name && (std::strcmp(name, "ProtModule") == 0 || std::strcmp(name, "IProtModule") == 0)) {
        return this;
    }
    return nullptr;
}

bool ProtModule::acquireRequired(IServiceProvider* host) {
    ServiceTable& table = services();
    table.multiTask = take<IMultiTask2>(host, "IMultiTask2");
    if (!table.multiTask) {
        errorText_ = "IMultiTask2 not created";
        return false;
    }
    table.serialFactory = take<ISerialFactory>(host, "ISerialFactory");
    if (!table.serialFactory) {
        host->ReleaseService(table.multiTask);
        errorText_ = "ISerialFactory not created";
        return false;
    }
    table.socketFactory = take<ISocketFactory>(host, "ISocketFactory");
    if (!table.socketFactory) {
        host->ReleaseService(table.multiTask);
        host->ReleaseService(table.serialFactory);
        errorText_ = "ISocketFactory not created";
        return false;
    }
    table.cdsBuffer = take<ICDSBuffer>(host, "ICDSBuffer");
    if (!table.cdsBuffer) {
        host->ReleaseService(table.multiTask);
        host->ReleaseService(table.serialFactory);
        host->ReleaseService(table.socketFactory);
        // The text names the runtime's own variable; runtimes match on it.
        errorText_ = "piCDSBuffer not created";
        return false;
    }
    return true;
}

int32_t ProtModule::Init(IServiceProvider* host) {
    if (initCount_ != 0) {
        ++initCount_;
        return 1;
    }
    if (!host) {
        errorText_ = "IMultiTask2 not created";
        return 0;
    }
    if (!acquireRequired(host)) {
        return 0;
    }
    ServiceTable& table = services();
    table.diag = take<IDiag>(host, "IDiag");
    table.permanentStorage = take<IPermanentStorage>(host, "IPermanentStorage");
    table.driverInterface = take<IDriverInterface>(host, "IDriverInterface");
    table.smux = take<ISmux>(host, "ISmux");
    table.fastTimer = take<IFastTimer>(host, "IFastTimer");
    table.held = true;
    host_ = host;
    initCount_ = 1;
    return 1;
}

namespace {

template <class T>
void releaseOptional(IServiceProvider* host, T*& service) {
    if (service) {
        host->ReleaseService(service);
        service = nullptr;
    }
}

template <class T>
void releaseRequired(IServiceProvider* host, T*& service) {
    host->ReleaseService(service);
    service = nullptr;
}

}  // namespace

void ProtModule::Exit() {
    if (initCount_ == 1) {
        ServiceTable& table = services();
        releaseOptional(host_, table.fastTimer);
        releaseOptional(host_, table.smux);
        releaseOptional(host_, table.driverInterface);
        releaseOptional(host_, table.diag);
        releaseOptional(host_, table.permanentStorage);
        releaseRequired(host_, table.multiTask);
        releaseRequired(host_, table.serialFactory);
        releaseRequired(host_, table.socketFactory);
        releaseRequired(host_, table.cdsBuffer);
        table.held = false;
        host_ = nullptr;
    }
    if (initCount_ != 0) {
        --initCount_;
    }
}

}  // namespace xtok
