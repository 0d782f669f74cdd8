#include "tests/support/fake_storage.h"

#include <cstdlib>
#include <cstring>

namespace xtok::test {

void* FakeStorage::GetInterface(const char* name) {
    const bool base = name && std::strcmp(name, "IPermanentStorage") == 0;
    const bool two = name && std::strcmp(name, "IPermanentStorage2") == 0 && extended;
    return base || two ? this : nullptr;
}

bool FakeStorage::write(const char* section, const char* key, const std::string& text) {
    ++writes_;
    if (!failWrites) {
        put(section, key, text);
    }
    return !failWrites;
}

std::string FakeStorage::read(const char* section, const char* key) {
    return failReads ? "" : get(section, key);
}

bool FakeStorage::WriteText(const char* section, const char* key, const char* text) {
    return write(section, key, text);
}

bool FakeStorage::WriteBool(const char* section, const char* key, bool value) {
    return write(section, key, value ? "1" : "0");
}

bool FakeStorage::WriteInt(const char* section, const char* key, int32_t value) {
    return write(section, key, std::to_string(value));
}

const char* FakeStorage::ReadText(const char* section, const char* key) {
    std::string text = read(section, key);
    std::lock_guard<std::mutex> lock(mutex_);
    lastText_ = text;
    return lastText_.c_str();
}

bool FakeStorage::ReadBool(const char* section, const char* key) {
    return read(section, key) == "1";
}

int32_t FakeStorage::ReadInt(const char* section, const char* key) {
    return static_cast<int32_t>(std::strtol(read(section, key).c_str(), nullptr, 10));
}

bool FakeStorage::IsStored(const char* section, const char* key) {
    return has(section, key);
}

bool FakeStorage::ReadTextTo(const char* section, const char* key, char* buffer, int32_t size) {
    const std::string text = read(section, key);
    if (failReads || !has(section, key) || size <= 0 ||
        text.size() + 1 > static_cast<std::size_t>(size)) {
        return false;
    }
    std::memcpy(buffer, text.c_str(), text.size() + 1);
    return true;
}

void FakeStorage::put(const std::string& section, const std::string& key, const std::string& text) {
    std::lock_guard<std::mutex> lock(mutex_);
    values_[{section, key}] = text;
}

bool FakeStorage::has(const std::string& section, const std::string& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    return values_.count({section, key}) > 0;
}

std::string FakeStorage::get(const std::string& section, const std::string& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = values_.find({section, key});
    return it == values_.end() ? "" : it->second;
}

}  // namespace xtok::test
