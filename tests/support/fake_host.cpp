#include "tests/support/fake_host.h"

namespace xtok::test {

const char* const kServiceNames[9] = {"IMultiTask2",      "ISerialFactory", "ISocketFactory",
                                      "ICDSBuffer",       "IDiag",          "IPermanentStorage",
                                      "IDriverInterface", "ISmux",          "IFastTimer"};

FakeHost::FakeHost() {
    // Services the plug-in only holds answer the four common slots.
    for (const char* name : kServiceNames) {
        owned_.push_back(std::make_unique<PlainService>(name, 100));
        services_[name] = owned_.back().get();
    }
    services_["IMultiTask2"] = static_cast<IMultiTask2*>(&tasks_);
    services_["ISerialFactory"] = static_cast<ISerialFactory*>(&serial_);
    services_["IPermanentStorage"] = static_cast<IPermanentStorage*>(&storage_);
}

FakeHost::~FakeHost() = default;

void* FakeHost::GetService(const char* name) {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string key = name ? name : "";
    calls_.push_back("get " + key);
    if (refused_.count(key) || !services_.count(key)) {
        return nullptr;
    }
    ++outstanding_;
    return services_[key];
}

void FakeHost::ReleaseService(void* service) {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.push_back("release " + nameOf(service));
    --outstanding_;
}

std::string FakeHost::nameOf(void* service) const {
    for (const auto& [name, object] : services_) {
        if (object == service) {
            return name;
        }
    }
    return service ? "?" : "null";
}

std::vector<std::string> FakeHost::calls() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return calls_;
}

int FakeHost::outstanding() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return outstanding_;
}

}  // namespace xtok::test
