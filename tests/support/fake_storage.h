// In-memory permanent storage, with or without the extended interface, and
// with read or write failures on demand.
#pragma once

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "tests/support/fake_service.h"

namespace xtok::test {

class FakeStorage final : public FakeService<IPermanentStorage2> {
public:
    FakeStorage() : FakeService("IPermanentStorage", 400) {}

    void* GetInterface(const char* name) override {
        const bool two = extended && name && std::strcmp(name, "IPermanentStorage2") == 0;
        return two || (name && std::strcmp(name, "IPermanentStorage") == 0) ? this : nullptr;
    }
    bool WriteText(const char* s, const char* k, const char* text) override {
        return write(s, k, text);
    }
    bool WriteBool(const char* s, const char* k, bool v) override {
        return write(s, k, v ? "1" : "0");
    }
    bool WriteInt(const char* s, const char* k, int32_t v) override {
        return write(s, k, std::to_string(v));
    }
    const char* ReadText(const char* section, const char* key) override {
        std::string text = read(section, key);
        std::lock_guard<std::mutex> lock(mutex_);
        lastText_ = text;
        return lastText_.c_str();
    }
    bool ReadBool(const char* section, const char* key) override {
        return read(section, key) == "1";
    }
    int32_t ReadInt(const char* section, const char* key) override {
        return static_cast<int32_t>(std::strtol(read(section, key).c_str(), nullptr, 10));
    }
    bool IsStored(const char* section, const char* key) override { return has(section, key); }
    int32_t Reserved11() override { return 0; }
    int32_t Reserved12() override { return 0; }
    int32_t Reserved13() override { return 0; }
    bool ReadTextTo(const char* section, const char* key, char* buffer, int32_t size) override {
        const std::string text = read(section, key);
        if (failReads || !has(section, key) || size <= 0 || text.size() >= std::size_t(size)) {
            return false;
        }
        std::memcpy(buffer, text.c_str(), text.size() + 1);
        return true;
    }

    std::atomic<bool> extended{true};  ///< answers "IPermanentStorage2"
    std::atomic<bool> failWrites{false};
    std::atomic<bool> failReads{false};  ///< ReadTextTo fails, other reads give empty values

    /// Values as text, by section and key.
    void put(const std::string& section, const std::string& key, const std::string& text) {
        std::lock_guard<std::mutex> lock(mutex_);
        values_[{section, key}] = text;
    }
    bool has(const std::string& section, const std::string& key) const {
        std::lock_guard<std::mutex> lock(mutex_);
        return values_.count({section, key}) > 0;
    }
    std::string get(const std::string& section, const std::string& key) const {
        std::lock_guard<std::mutex> lock(mutex_);
        auto it = values_.find({section, key});
        return it == values_.end() ? "" : it->second;
    }
    /// Writes asked for, failed ones too.
    int writes() const { return writes_.load(); }

private:
    bool write(const char* section, const char* key, const std::string& text) {
        ++writes_;
        if (!failWrites) {
            put(section, key, text);
        }
        return !failWrites;
    }
    std::string read(const char* section, const char* key) const {
        return failReads ? "" : get(section, key);
    }

    mutable std::mutex mutex_;
    std::map<std::pair<std::string, std::string>, std::string> values_;
    std::string lastText_;
    std::atomic<int> writes_{0};
};

}  // namespace xtok::test
