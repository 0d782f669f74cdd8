// The in-process test host: a service provider whose services can each be
// present or refused, and which records every GetService and ReleaseService
// in order.
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "xtokline/host.h"

namespace xtok::test {

/// The four common slots for any fake service; `Base` is the service's
/// interface.
template <class Base>
class FakeService : public Base {
public:
    FakeService(std::string name, int32_t version) : name_(std::move(name)), version_(version) {}
    void* Destroy(unsigned) override { return this; }
    void* GetInterface(const char* name) override {
        return name && name_ == name ? this : nullptr;
    }
    const char* GetName() override { return name_.c_str(); }
    int32_t GetVersion() override { return version_; }

private:
    std::string name_;
    int32_t version_;
};

/// The service names a runtime offers, in the order the module asks for them.
extern const char* const kServiceNames[9];

class FakeHost : public IServiceProvider {
public:
    FakeHost();
    ~FakeHost();

    void* GetService(const char* name) override;
    void ReleaseService(void* service) override;

    /// Makes GetService answer null for this name.
    void refuse(const std::string& name) { refused_.insert(name); }
    /// Replaces the object handed out for a name (the host keeps ownership
    /// of its own; the caller keeps ownership of `service`).
    void provide(const std::string& name, void* service) { services_[name] = service; }
    /// "get NAME" and "release NAME" lines, in call order.
    std::vector<std::string> calls() const;
    void clearCalls();
    /// Services handed out and not given back yet.
    int outstanding() const;

private:
    std::string nameOf(void* service) const;

    std::map<std::string, void*> services_;
    std::vector<std::unique_ptr<IHostService>> owned_;
    std::set<std::string> refused_;
    mutable std::mutex mutex_;
    std::vector<std::string> calls_;
    int outstanding_ = 0;
};

}  // namespace xtok::test
