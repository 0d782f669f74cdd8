// In-memory permanent storage with a call log, with or without the
// extended interface, and with read or write failures on demand.
#pragma once

#include <atomic>
#include <map>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

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

    // Settings and faults.
    std::atomic<bool> extended{true};  ///< answers "IPermanentStorage2"
    std::atomic<bool> failWrites{false};
    std::atomic<bool> failReads{false};  ///< ReadTextTo fails, other reads give empty values

    /// Values are kept as text; "section/key" → text.
    void put(const std::string& section, const std::string& key, const std::string& text);
    bool has(const std::string& section, const std::string& key) const;
    std::string get(const std::string& section, const std::string& key) const;
    std::vector<std::string> calls() const;  ///< e.g. "IsStored XTOK baud", "WriteInt XTOK gap 5"
    void clearCalls();

private:
    using Key = std::pair<std::string, std::string>;
    void log(const std::string& line);
    std::string value(const char* section, const char* key);

    mutable std::mutex mutex_;
    std::map<Key, std::string> values_;
    std::vector<std::string> calls_;
    std::string lastText_;
};

}  // namespace xtok::test
