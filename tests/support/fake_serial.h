// A scriptable serial line: ports can be refused, settings and writes fail on
// demand and are recorded, and reads play a script of bytes, silences, read
// errors and hang-ups, answering a time-out at once instead of waiting.
#pragma once

#include <atomic>
#include <cctype>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "tests/support/fake_service.h"
#include "xtokline/constants.h"
#include "xtokline/text.h"

namespace xtok::test {

using xtok::LineSettings;

/// Bytes from hex pairs, anything but hex digits skipped: "02 41" or "0241".
inline std::string hexBytes(const std::string& text) {
    std::string digits;
    for (char c : text) {
        digits += std::isxdigit(static_cast<unsigned char>(c)) ? std::string(1, c) : "";
    }
    return hexTextToBytes(digits);
}

/// What happened on the line so far.
struct LineRecord {
    int opens = 0, closes = 0, open = 0;
    long reads = 0;
    int32_t lastTimeout = 0;  ///< of the most recent read
    bool hungUp = false;
    std::vector<std::string> names;  ///< asked to open, refused ones too
    std::vector<LineSettings> configured;
    std::vector<std::string> writes;  ///< one entry per write
};

class FakeSerialFactory final : public FakeService<ISerialFactory>, private ISerialPort {
public:
    FakeSerialFactory() : FakeService("ISerialFactory", 300) {}

    ISerialPort* Open(const char* name) override;
    void Close(ISerialPort* port) override;

    // The script the next reads play, one event per read.
    void feed(const std::string& bytes);
    void silence();    ///< a time-out
    void readError();  ///< fails at once, as a port that reports a line error does
    /// From this event on every read fails at once, until the port is opened again.
    void hangUp();
    /// `bytes`, then a read that waits, holding the reader's lock, until
    /// release() gives it a byte (or -1: a time-out) or five seconds passed.
    void hold(const std::string& bytes);
    bool waitHeld();
    void release(int byte);
    std::size_t pending() const;
    /// Waits (bounded) until the script is read and one more read found it
    /// empty: the reader has acted on all of it.
    bool waitDrained(int timeoutMs = 5000);

    std::atomic<bool> refuseOpen{false}, failConfigure{false}, failWrite{false};

    LineRecord record() const;
    bool isOpen() const { return record().open > 0; }
    std::vector<LineSettings> configured() const { return record().configured; }
    std::vector<std::string> writes() const { return record().writes; }
    std::string written() const;

private:
    // The one port this line opens, shared by every Open.
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    int32_t Reserved2() override { return 0; }
    int32_t Reserved3() override { return 0; }
    bool Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop, int32_t mode) override;
    int32_t Reserved5() override { return 0; }
    bool ReadByte(uint8_t* destination, int32_t timeoutMs, int32_t flags) override;
    bool Write(const uint8_t* data, int32_t length, int32_t flags) override;
    void push(const std::vector<int>& events);

    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<int> script_;  ///< a byte, or one of the events below
    bool readAfterEmpty_ = false;
    bool held_ = false;
    int released_ = -2;  ///< the byte release() gave, -2 before
    LineRecord record_;
};

}  // namespace xtok::test
