// The in-process test host: a service provider whose services can each be
// present, refused or replaced, and which records every GetService and
// ReleaseService in order.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "tests/support/fake_multitask.h"
#include "tests/support/fake_serial.h"
#include "tests/support/fake_service.h"
#include "tests/support/fake_storage.h"
#include "xtokline/host.h"

namespace xtok::test {

/// The service names a runtime offers, in the order the module asks for them.
extern const char* const kServiceNames[9];

/// A service the plug-in only holds: the four common slots. Final, so that
/// the host can own it without a virtual destructor in the contract's table.
class PlainService final : public FakeService<IHostService> {
public:
    using FakeService::FakeService;
};

/// Every service a runtime offers, backed by the fakes above.
class FakeHost : public IServiceProvider {
public:
    FakeHost();
    ~FakeHost();

    FakeMultiTask& tasks() { return tasks_; }
    FakeSerialFactory& serial() { return serial_; }
    FakeStorage& storage() { return storage_; }

    void* GetService(const char* name) override;
    void ReleaseService(void* service) override;

    /// Makes GetService answer null for this name.
    void refuse(const std::string& name) { refused_.insert(name); }
    /// "get NAME" and "release NAME" lines, in call order.
    std::vector<std::string> calls() const;
    /// Services handed out and not given back yet.
    int outstanding() const;

private:
    std::string nameOf(void* service) const;

    FakeSerialFactory serial_;
    FakeStorage storage_;
    FakeMultiTask tasks_;  // last: its task threads end before the others go
    std::map<std::string, void*> services_;
    std::vector<std::unique_ptr<PlainService>> owned_;
    std::set<std::string> refused_;
    mutable std::mutex mutex_;
    std::vector<std::string> calls_;
    int outstanding_ = 0;
};

}  // namespace xtok::test
