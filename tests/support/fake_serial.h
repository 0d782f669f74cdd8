// A scriptable serial factory: ports can be refused, Configure can fail,
// configure arguments and written bytes are recorded, and ReadByte plays a
// script of bytes, silences and hang-ups, answering a time-out at once
// instead of waiting.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "tests/support/fake_service.h"

namespace xtok::test {

struct LineSettings {
    int32_t baud, parity, bits, stop, mode;
    bool operator==(const LineSettings& o) const {
        return baud == o.baud && parity == o.parity && bits == o.bits && stop == o.stop &&
               mode == o.mode;
    }
};

class FakeSerialFactory;

class FakeSerialPort final : public ISerialPort {
public:
    FakeSerialPort(FakeSerialFactory& factory, std::string name)
        : factory_(factory), name_(std::move(name)) {}
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    int32_t Reserved2() override { return 0; }
    int32_t Reserved3() override { return 0; }
    bool Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop, int32_t mode) override;
    int32_t Reserved5() override { return 0; }
    bool ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t flags) override;
    bool Write(const uint8_t* data, int32_t length, int32_t flags) override;
    const std::string& name() const { return name_; }

private:
    FakeSerialFactory& factory_;
    std::string name_;
};

class FakeSerialFactory final : public FakeService<ISerialFactory> {
public:
    FakeSerialFactory() : FakeService("ISerialFactory", 300) {}

    ISerialPort* Open(const char* name) override;
    void Close(ISerialPort* port) override;

    // The script the next ReadByte calls play, whichever port is open.
    void feed(const std::string& bytes);  ///< bytes arrive, one per read
    void feedBytes(const std::vector<uint8_t>& bytes);
    void silence();  ///< one read answers a time-out
    /// One read fails at once, as a port that reports a line error does.
    void readError();
    /// The device hangs up: from this event on every read fails at once,
    /// until the port is opened again.
    void hangUp();
    /// Scripted events not read yet.
    std::size_t pending() const;
    /// Waits (bounded) until every scripted event has been read and one
    /// more read found the script empty: the reader has acted on all of it.
    bool waitDrained(int timeoutMs = 5000);

    // Faults to inject.
    std::atomic<bool> refuseOpen{false};
    std::atomic<bool> failConfigure{false};
    std::atomic<bool> failWrite{false};

    // What happened.
    int opens() const;
    int closes() const;
    bool isOpen() const;
    std::vector<LineSettings> configured() const;
    std::string written() const;              ///< all bytes written, in order
    std::vector<std::string> writes() const;  ///< one entry per Write call
    std::vector<std::string> openedNames() const;
    /// Time-out arguments seen by ReadByte, most recent last (bounded).
    std::vector<int32_t> readTimeouts() const;
    /// ReadByte calls so far (not bounded like readTimeouts).
    long reads() const;
    bool hungUp() const;

private:
    friend class FakeSerialPort;
    enum class Kind { Byte, Silence, Error, HangUp };
    struct Event {
        Kind kind;
        uint8_t byte;
    };
    bool read(uint8_t* destination, int32_t timeoutMs);

    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Event> script_;
    bool readAfterEmpty_ = false;
    bool hungUp_ = false;
    std::vector<std::unique_ptr<FakeSerialPort>> ports_;
    int open_ = 0, opens_ = 0, closes_ = 0;
    std::vector<LineSettings> configured_;
    std::vector<std::string> writes_;
    std::vector<std::string> names_;
    std::vector<int32_t> timeouts_;
    long reads_ = 0;
};

}  // namespace xtok::test
