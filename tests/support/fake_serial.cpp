#include "tests/support/fake_serial.h"

#include <chrono>

namespace xtok::test {

namespace {

enum Event { kSilence = 256, kError, kHangUp, kHold };

}  // namespace

ISerialPort* FakeSerialFactory::Open(const char* name) {
    std::lock_guard<std::mutex> lock(mutex_);
    record_.names.push_back(name ? name : "");
    if (refuseOpen) {
        return nullptr;
    }
    ++record_.opens;
    ++record_.open;
    record_.hungUp = false;  // a port opened again has a live line
    return this;
}

void FakeSerialFactory::Close(ISerialPort*) {
    std::lock_guard<std::mutex> lock(mutex_);
    ++record_.closes;
    --record_.open;
}

bool FakeSerialFactory::Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop,
                                  int32_t mode) {
    std::lock_guard<std::mutex> lock(mutex_);
    record_.configured.push_back({baud, parity, bits, stop, mode});
    return !failConfigure;
}

bool FakeSerialFactory::Write(const uint8_t* data, int32_t length, int32_t) {
    std::lock_guard<std::mutex> lock(mutex_);
    record_.writes.emplace_back(reinterpret_cast<const char*>(data), length > 0 ? length : 0);
    return !failWrite;
}

void FakeSerialFactory::push(const std::vector<int>& events) {
    std::lock_guard<std::mutex> lock(mutex_);
    script_.insert(script_.end(), events.begin(), events.end());
    readAfterEmpty_ = false;
    changed_.notify_all();
}

// All at once: a reader must not take a pause between two bytes for a silence.
void FakeSerialFactory::feed(const std::string& bytes) {
    push(std::vector<int>(reinterpret_cast<const uint8_t*>(bytes.data()),
                          reinterpret_cast<const uint8_t*>(bytes.data()) + bytes.size()));
}

void FakeSerialFactory::silence() {
    push({kSilence});
}

void FakeSerialFactory::readError() {
    push({kError});
}

void FakeSerialFactory::hangUp() {
    push({kHangUp});
}

void FakeSerialFactory::hold(const std::string& bytes) {
    std::vector<int> events(reinterpret_cast<const uint8_t*>(bytes.data()),
                            reinterpret_cast<const uint8_t*>(bytes.data()) + bytes.size());
    events.push_back(kHold);
    push(events);
}

bool FakeSerialFactory::waitHeld() {
    std::unique_lock<std::mutex> lock(mutex_);
    return changed_.wait_for(lock, std::chrono::seconds(5), [this] { return held_; });
}

void FakeSerialFactory::release(int byte) {
    std::lock_guard<std::mutex> lock(mutex_);
    released_ = byte;
    changed_.notify_all();
}

std::size_t FakeSerialFactory::pending() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return script_.size();
}

bool FakeSerialFactory::ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t) {
    std::unique_lock<std::mutex> lock(mutex_);
    ++record_.reads;
    record_.lastTimeout = timeoutMs;
    if (script_.empty() || record_.hungUp) {
        // Hung up, a read fails at once and the script waits for a new open.
        // Otherwise a time-out comes within a millisecond, not after
        // timeoutMs, unless the test feeds more meanwhile.
        readAfterEmpty_ = script_.empty();
        changed_.notify_all();
        if (record_.hungUp || !changed_.wait_for(lock, std::chrono::milliseconds(1),
                                                 [this] { return !script_.empty(); })) {
            return false;
        }
    }
    const int event = script_.front();
    script_.pop_front();
    record_.hungUp = record_.hungUp || event == kHangUp;
    if (event == kHold) {
        held_ = true;
        changed_.notify_all();
        changed_.wait_for(lock, std::chrono::seconds(5), [this] { return released_ > -2; });
        *destination = static_cast<uint8_t>(released_);
        return released_ >= 0;
    }
    if (event >= kSilence) {
        return false;
    }
    *destination = static_cast<uint8_t>(event);
    return true;
}

bool FakeSerialFactory::waitDrained(int timeoutMs) {
    std::unique_lock<std::mutex> lock(mutex_);
    readAfterEmpty_ = false;
    return changed_.wait_for(lock, std::chrono::milliseconds(timeoutMs),
                             [this] { return script_.empty() && readAfterEmpty_; });
}

LineRecord FakeSerialFactory::record() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return record_;
}

std::string FakeSerialFactory::written() const {
    std::string all;
    for (const std::string& write : writes()) {
        all += write;
    }
    return all;
}

}  // namespace xtok::test
