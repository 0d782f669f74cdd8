#include "host/service_provider.h"

#include <utility>

namespace xtok::host {

std::unique_ptr<ServiceProvider> ServiceProvider::create(HostOptions options, std::string& error) {
    std::unique_ptr<PermanentStorage> storage;
    if (options.permanentStorage) {
        std::string path = options.storagePath.empty() ? defaultStoragePath() : options.storagePath;
        storage = PermanentStorage::open(path, error);
        if (!storage) {
            return nullptr;
        }
    }
    return std::unique_ptr<ServiceProvider>(new ServiceProvider(options, std::move(storage)));
}

ServiceProvider::ServiceProvider(const HostOptions& options,
                                 std::unique_ptr<PermanentStorage> storage)
    : notice_(options.notice),
      serialFactory_(options.ports, options.notice, options.reconnect),
      storage_(std::move(storage)),
      multiTask_(options.notice) {
    offer(&multiTask_, static_cast<IMultiTask2*>(&multiTask_));
    offer(&serialFactory_, static_cast<ISerialFactory*>(&serialFactory_));
    offer(&socketFactory_, static_cast<ISocketFactory*>(&socketFactory_));
    offer(&cdsBuffer_, static_cast<ICDSBuffer*>(&cdsBuffer_));
    if (storage_) {
        offer(storage_.get(), static_cast<IPermanentStorage*>(storage_.get()));
    }
}

void ServiceProvider::offer(IHostService* service, void* asItsInterface) {
    offered_.emplace(service->GetName(), asItsInterface);
}

void* ServiceProvider::GetService(const char* name) {
    auto it = name ? offered_.find(name) : offered_.end();
    if (it == offered_.end()) {
        return nullptr;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    ++handedOut_[it->second];
    return it->second;
}

void ServiceProvider::ReleaseService(void* service) {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = handedOut_.find(service);
    if (it == handedOut_.end()) {
        notice_("a plug-in gave back a service it was not given");
        return;
    }
    if (--it->second == 0) {
        handedOut_.erase(it);
    }
}

int ServiceProvider::outstanding() const {
    std::lock_guard<std::mutex> lock(mutex_);
    int count = 0;
    for (const auto& entry : handedOut_) {
        count += entry.second;
    }
    return count;
}

}  // namespace xtok::host
