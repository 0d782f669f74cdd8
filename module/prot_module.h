// The module object: connects the library to the host's services.
#pragma once

#include <cstdint>
#include <string>

#include "xtokline/plugin.h"

namespace xtok {

class ProtModule final : public IProtModule {
public:
    ProtModule() = default;
    ProtModule(const ProtModule&) = delete;
    ProtModule& operator=(const ProtModule&) = delete;
    /// Library unload: gives the services back if exactly one Init is open.
    ~ProtModule() { Exit(); }

    void* Destroy(unsigned flags) override;
    void* GetInterface(const char* name) override;
    const char* GetName() override { return "ProtModule"; }
    int32_t GetVersion() override { return 100; }
    int32_t Init(IServiceProvider* host) override;
    void Exit() override;
    const char* GetErrorText() override { return errorText_.c_str(); }

    uint32_t initCount() const { return initCount_; }

private:
    bool acquireRequired(IServiceProvider* host);

    std::string errorText_;
    IServiceProvider* host_ = nullptr;
    uint32_t initCount_ = 0;
};

}  // namespace xtok
