// In-memory permanent storage, with or without the extended interface, and
// with read or write failures on demand.
#pragma once

#include <atomic>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "tests/support/fake_service.h"

namespace xtok::test {

class FakeStorage final : public FakeService<IPermanentStorage2> {
public:
    FakeStorage() : FakeService("IPermanentStorage", 400) {}

    void* GetInterface(const char* name) override;
    bool WriteText(const char* section, const char* key, const char* text) override;
    bool WriteBool(const char* section, const char* key, bool value) override;
    bool WriteInt(const char* section, const char* key, int32_t value) override;
    const char* ReadText(const char* section, const char* key) override;
    bool ReadBool(const char* section, const char* key) override;
    int32_t ReadInt(const char* section, const char* key) override;
    bool IsStored(const char* section, const char* key) override;
    int32_t Reserved11() override { return 0; }
    int32_t Reserved12() override { return 0; }
    int32_t Reserved13() override { return 0; }
    bool ReadTextTo(const char* section, const char* key, char* buffer, int32_t size) override;

    std::atomic<bool> extended{true};  ///< answers "IPermanentStorage2"
    std::atomic<bool> failWrites{false};
    std::atomic<bool> failReads{false};  ///< ReadTextTo fails, other reads give empty values

    /// Values as text, by section and key.
    void put(const std::string& section, const std::string& key, const std::string& text);
    bool has(const std::string& section, const std::string& key) const;
    std::string get(const std::string& section, const std::string& key) const;
    /// Writes asked for, failed ones too.
    int writes() const { return writes_.load(); }

private:
    bool write(const char* section, const char* key, const std::string& text);
    std::string read(const char* section, const char* key);

    mutable std::mutex mutex_;
    std::map<std::pair<std::string, std::string>, std::string> values_;
    std::string lastText_;
    std::atomic<int> writes_{0};
};

}  // namespace xtok::test
