// The four slots every host service begins with, for the test doubles.
#pragma once

#include <cstdint>
#include <string>

#include "xtokline/host.h"

namespace xtok::test {

/// The four common slots for any fake service; `Base` is the service's
/// interface.
template <class Base>
class FakeService : public Base {
public:
    FakeService(std::string name, int32_t version) : name_(std::move(name)), version_(version) {}
    void* Destroy(unsigned) override { return this; }
    void* GetInterface(const char* name) override { return name && name_ == name ? this : nullptr; }
    const char* GetName() override { return name_.c_str(); }
    int32_t GetVersion() override { return version_; }

private:
    std::string name_;
    int32_t version_;
};

}  // namespace xtok::test
