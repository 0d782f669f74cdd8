// The host as a plug-in sees it: the service provider handed to Init, and the
// services it offers by name.
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "host/com_map.h"
#include "host/host_service.h"
#include "host/multitask.h"
#include "host/notice.h"
#include "host/permanent_storage.h"
#include "host/serial_factory.h"

namespace xtok::host {

struct HostOptions {
    /// Device files for "com1" ... "com16" beyond the /dev/ttyS defaults.
    ComMap ports;
    /// Whether to offer "IPermanentStorage" at all.
    bool permanentStorage = true;
    /// Its file; "" for defaultStoragePath().
    std::string storagePath;
    /// Where the services' complaints go.
    Notice notice = printNotice;
    /// Whether a serial port reopens its device after a hang-up or failure.
    bool reconnect = false;
};

class ServiceProvider final : public IServiceProvider {
public:
    /// Null with `error` set when a service cannot be set up (the storage
    /// file, in practice).
    static std::unique_ptr<ServiceProvider> create(HostOptions options, std::string& error);
    ServiceProvider(const ServiceProvider&) = delete;
    ServiceProvider& operator=(const ServiceProvider&) = delete;

    void* GetService(const char* name) override;
    void ReleaseService(void* service) override;

    /// Services handed out by GetService and not given back yet.
    int outstanding() const;
    MultiTask& multiTask() { return multiTask_; }
    void notice(const std::string& text) const { notice_(text); }
    SerialFactory& serialFactory() { return serialFactory_; }
    /// Null when the options left it out.
    PermanentStorage* permanentStorage() { return storage_.get(); }

private:
    ServiceProvider(const HostOptions& options, std::unique_ptr<PermanentStorage> storage);
    void offer(IHostService* service, void* asItsInterface);

    Notice notice_;
    SerialFactory serialFactory_;
    SocketFactory socketFactory_;
    CDSBuffer cdsBuffer_;
    std::unique_ptr<PermanentStorage> storage_;
    // Last of the services, so first to go: tasks still running get their
    // grace period while the services they may use are all still there.
    MultiTask multiTask_;

    // By name, each service as a pointer to its own interface: that pointer,
    // not some base of it, is what the plug-in calls slots on.
    std::map<std::string, void*> offered_;
    mutable std::mutex mutex_;
    std::map<void*, int> handedOut_;
};

}  // namespace xtok::host
