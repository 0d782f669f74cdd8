#include "tests/support/fake_storage.h"

#include <cstdlib>
#include <cstring>

namespace xtok::test {

namespace {
std::string str(const char* s) {
    return s ? s : "(null)";
}
}  // namespace

void* FakeStorage::GetInterface(const char* name) {
    log("GetInterface " + str(name));
    if (name && std::strcmp(name, "IPermanentStorage2") == 0) {
        return extended ? static_cast<IPermanentStorage2*>(this) : nullptr;
    }
    if (name && std::strcmp(name, "IPermanentStorage") == 0) {
        return static_cast<IPermanentStorage*>(this);
    }
    return nullptr;
}

void FakeStorage::log(const std::string& line) {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.push_back(line);
}

std::string FakeStorage::value(const char* section, const char* key) {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = values_.find({str(section), str(key)});
    return it == values_.end() || failReads ? std::string() : it->second;
}

bool FakeStorage::WriteText(const char* section, const char* key, const char* text) {
    log("WriteText " + str(section) + " " + str(key) + " " + str(text));
    if (failWrites) {
        return false;
    }
    put(str(section), str(key), str(text));
    return true;
}

bool FakeStorage::WriteBool(const char* section, const char* key, bool value) {
    log("WriteBool " + str(section) + " " + str(key) + " " + (value ? "1" : "0"));
    if (failWrites) {
        return false;
    }
    put(str(section), str(key), value ? "1" : "0");
    return true;
}

bool FakeStorage::WriteInt(const char* section, const char* key, int32_t value) {
    log("WriteInt " + str(section) + " " + str(key) + " " + std::to_string(value));
    if (failWrites) {
        return false;
    }
    put(str(section), str(key), std::to_string(value));
    return true;
}

const char* FakeStorage::ReadText(const char* section, const char* key) {
    log("ReadText " + str(section) + " " + str(key));
    std::string text = value(section, key);
    std::lock_guard<std::mutex> lock(mutex_);
    lastText_ = text;
    return lastText_.c_str();
}

bool FakeStorage::ReadBool(const char* section, const char* key) {
    log("ReadBool " + str(section) + " " + str(key));
    return value(section, key) == "1";
}

int32_t FakeStorage::ReadInt(const char* section, const char* key) {
    log("ReadInt " + str(section) + " " + str(key));
    return static_cast<int32_t>(std::strtol(value(section, key).c_str(), nullptr, 10));
}

bool FakeStorage::IsStored(const char* section, const char* key) {
    log("IsStored " + str(section) + " " + str(key));
    return has(str(section), str(key));
}

bool FakeStorage::ReadTextTo(const char* section, const char* key, char* buffer, int32_t size) {
    log("ReadTextTo " + str(section) + " " + str(key) + " " + std::to_string(size));
    if (failReads || !has(str(section), str(key))) {
        return false;
    }
    std::string text = value(section, key);
    if (size <= 0 || text.size() + 1 > static_cast<std::size_t>(size)) {
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
    return values_.count({section, key}) != 0;
}

std::string FakeStorage::get(const std::string& section, const std::string& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = values_.find({section, key});
    return it == values_.end() ? std::string() : it->second;
}

std::vector<std::string> FakeStorage::calls() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return calls_;
}

void FakeStorage::clearCalls() {
    std::lock_guard<std::mutex> lock(mutex_);
    calls_.clear();
}

}  // namespace xtok::test
