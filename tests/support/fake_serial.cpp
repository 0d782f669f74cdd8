#include "tests/support/fake_serial.h"

#include <chrono>

namespace xtok::test {

namespace {
constexpr std::size_t kMaxTimeouts = 10000;
}

bool FakeSerialPort::Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop,
                               int32_t mode) {
    std::lock_guard<std::mutex> lock(factory_.mutex_);
    factory_.configured_.push_back({baud, parity, bits, stop, mode});
    return !factory_.failConfigure;
}

bool FakeSerialPort::ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t) {
    return factory_.read(destination, timeoutMs);
}

bool FakeSerialPort::Write(const uint8_t* data, int32_t length, int32_t) {
    std::lock_guard<std::mutex> lock(factory_.mutex_);
    factory_.writes_.emplace_back(reinterpret_cast<const char*>(data),
                                  static_cast<std::size_t>(length > 0 ? length : 0));
    return !factory_.failWrite;
}

ISerialPort* FakeSerialFactory::Open(const char* name) {
    std::lock_guard<std::mutex> lock(mutex_);
    names_.push_back(name ? name : "");
    if (refuseOpen) {
        return nullptr;
    }
    ++opens_;
    ++open_;
    hungUp_ = false;  // a port opened again has a live line
    ports_.push_back(std::make_unique<FakeSerialPort>(*this, names_.back()));
    return ports_.back().get();
}

void FakeSerialFactory::Close(ISerialPort*) {
    std::lock_guard<std::mutex> lock(mutex_);
    ++closes_;
    --open_;
}

void FakeSerialFactory::feed(const std::string& bytes) {
    feedBytes(std::vector<uint8_t>(bytes.begin(), bytes.end()));
}

void FakeSerialFactory::feedBytes(const std::vector<uint8_t>& bytes) {
    std::lock_guard<std::mutex> lock(mutex_);
    for (uint8_t b : bytes) {
        script_.push_back({Kind::Byte, b});
    }
    readAfterEmpty_ = false;
    changed_.notify_all();
}

void FakeSerialFactory::silence() {
    std::lock_guard<std::mutex> lock(mutex_);
    script_.push_back({Kind::Silence, 0});
    readAfterEmpty_ = false;
    changed_.notify_all();
}

void FakeSerialFactory::readError() {
    std::lock_guard<std::mutex> lock(mutex_);
    script_.push_back({Kind::Error, 0});
    readAfterEmpty_ = false;
    changed_.notify_all();
}

void FakeSerialFactory::hangUp() {
    std::lock_guard<std::mutex> lock(mutex_);
    script_.push_back({Kind::HangUp, 0});
    readAfterEmpty_ = false;
    changed_.notify_all();
}

std::size_t FakeSerialFactory::pending() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return script_.size();
}

bool FakeSerialFactory::read(uint8_t* destination, int32_t timeoutMs) {
    std::unique_lock<std::mutex> lock(mutex_);
    ++reads_;
    if (timeouts_.size() < kMaxTimeouts) {
        timeouts_.push_back(timeoutMs);
    }
    if (hungUp_) {
        // Fails at once; what is still scripted waits for the port to be
        // opened again.
        if (script_.empty()) {
            readAfterEmpty_ = true;
            changed_.notify_all();
        }
        return false;
    }
    if (script_.empty()) {
        readAfterEmpty_ = true;
        changed_.notify_all();
        // Nothing scripted: a time-out, answered within a millisecond (not
        // after timeoutMs), unless the test feeds more meanwhile. The short
        // wait keeps an idle reader from flooding the lock log.
        changed_.wait_for(lock, std::chrono::milliseconds(timeoutMs > 0 ? 1 : 0),
                          [this] { return !script_.empty(); });
        if (script_.empty()) {
            return false;
        }
    }
    Event event = script_.front();
    script_.pop_front();
    if (event.kind == Kind::HangUp) {
        hungUp_ = true;
    }
    if (event.kind != Kind::Byte) {
        return false;
    }
    *destination = event.byte;
    return true;
}

bool FakeSerialFactory::waitDrained(int timeoutMs) {
    std::unique_lock<std::mutex> lock(mutex_);
    readAfterEmpty_ = false;
    return changed_.wait_for(lock, std::chrono::milliseconds(timeoutMs),
                             [this] { return script_.empty() && readAfterEmpty_; });
}

int FakeSerialFactory::opens() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return opens_;
}

int FakeSerialFactory::closes() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return closes_;
}

bool FakeSerialFactory::isOpen() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return open_ > 0;
}

std::vector<LineSettings> FakeSerialFactory::configured() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return configured_;
}

std::string FakeSerialFactory::written() const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string all;
    for (const auto& w : writes_) {
        all += w;
    }
    return all;
}

std::vector<std::string> FakeSerialFactory::writes() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return writes_;
}

std::vector<std::string> FakeSerialFactory::openedNames() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return names_;
}

std::vector<int32_t> FakeSerialFactory::readTimeouts() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return timeouts_;
}

long FakeSerialFactory::reads() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return reads_;
}

bool FakeSerialFactory::hungUp() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return hungUp_;
}

}  // namespace xtok::test
