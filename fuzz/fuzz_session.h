// What every fuzz target shares: a token protocol made by the plug-in's own
// factory over a fresh test host for each input (so nothing carries over from
// one input to the next), with the host's task creation refused so that no
// thread runs and every run is repeatable; and buffers that catch a write
// past their size or a read past a value.
#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "framework/data_types.h"
#include "module/interface_factory.h"
#include "protocol/protocol_xtok.h"
#include "tests/support/fake_host.h"

namespace xtok::fuzz {

/// Ends the run like a sanitizer finding, so that libFuzzer keeps the input.
[[noreturn]] inline void broken(const char* what, const char* file, int line) {
    std::fprintf(stderr, "%s:%d: broken: %s\n", file, line, what);
    std::abort();
}

#define FUZZ_CHECK(condition)                                     \
    do {                                                          \
        if (!(condition)) {                                       \
            ::xtok::fuzz::broken(#condition, __FILE__, __LINE__); \
        }                                                         \
    } while (0)

/// The mandatory keys of a configuration.
inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

/// The module initialised over a fresh host, and one protocol made by the
/// factory; undone in the order a runtime undoes it.
class Session {
public:
    Session() {
        host.tasks().refuseTasks = true;
        FUZZ_CHECK(rootObject().module().Init(&host) == 1);
        IProtocol7* made = rootObject().factory().CreateProtocol("XTOK");
        FUZZ_CHECK(made != nullptr);
        protocol = static_cast<Protocol_XTOK*>(made);
    }
    ~Session() {
        protocol->Stop();
        rootObject().factory().DestroyProtocol(protocol);
        rootObject().module().Exit();
        // Nothing may keep a service the module took.
        FUZZ_CHECK(host.outstanding() == 0);
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    /// Configures with the mandatory keys and `extra`, then starts.
    bool start(const std::string& extra) {
        const std::string text = kBaseConfig + " " + extra;
        return protocol->Configure(text.c_str()) && protocol->Start();
    }

    test::FakeHost host;
    Protocol_XTOK* protocol = nullptr;
};

/// A caller's reply buffer of `size` bytes followed by guard bytes: nothing
/// may be written past `size`, and a cut reply needs no terminator.
class ReplyBuffer {
public:
    explicit ReplyBuffer(int32_t size)
        : size_(size > 0 ? static_cast<std::size_t>(size) : 0), bytes_(new char[size_ + kGuard]) {
        std::memset(bytes_.get(), kPattern, size_ + kGuard);
    }
    char* data() { return bytes_.get(); }
    int32_t size() const { return static_cast<int32_t>(size_); }
    /// True while the guard bytes are as they were.
    bool guardIntact() const {
        for (std::size_t i = size_; i < size_ + kGuard; ++i) {
            if (bytes_[i] != kPattern) {
                return false;
            }
        }
        return true;
    }

private:
    static constexpr std::size_t kGuard = 32;
    static constexpr char kPattern = 0x5A;
    std::size_t size_;
    std::unique_ptr<char[]> bytes_;
};

/// A tag's value buffer: exactly `size` bytes on the heap, so that the
/// sanitizer reports any read or write past it.
class ValueBuffer {
public:
    explicit ValueBuffer(int32_t size)
        : size_(size > 0 ? static_cast<std::size_t>(size) : 0), bytes_(new uint8_t[size_]()) {}
    /// `bytes` repeated or cut to `size`; without any, 'A's. No terminator
    /// is added, so a text read that looks for one past the value is caught.
    ValueBuffer(int32_t size, const std::string& bytes) : ValueBuffer(size) {
        for (std::size_t i = 0; i < size_; ++i) {
            bytes_[i] = bytes.empty() ? 'A' : static_cast<uint8_t>(bytes[i % bytes.size()]);
        }
    }
    uint8_t* data() { return bytes_.get(); }
    std::size_t size() const { return size_; }

private:
    std::size_t size_;
    std::unique_ptr<uint8_t[]> bytes_;
};

/// The input as text lines (a line feed ends each; a zero byte ends a line's
/// text, as it would for the runtime).
inline std::vector<std::string> lines(const uint8_t* data, std::size_t size) {
    std::vector<std::string> out(1);
    for (std::size_t i = 0; i < size; ++i) {
        if (data[i] == '\n') {
            out.emplace_back();
        } else {
            out.back().push_back(static_cast<char>(data[i]));
        }
    }
    for (std::string& line : out) {
        line.resize(std::strlen(line.c_str()));
    }
    return out;
}

/// Bytes from hex pairs; anything else between them (blanks) is skipped,
/// and '|' ends the text.
inline std::string hexBytes(const std::string& text) {
    std::string out;
    int high = -1;
    for (char c : text) {
        int digit = c >= '0' && c <= '9'   ? c - '0'
                    : c >= 'a' && c <= 'f' ? c - 'a' + 10
                    : c >= 'A' && c <= 'F' ? c - 'A' + 10
                                           : -1;
        if (c == '|') {
            break;
        }
        if (digit < 0) {
            continue;
        }
        if (high < 0) {
            high = digit;
        } else {
            out.push_back(static_cast<char>(high * 16 + digit));
            high = -1;
        }
    }
    return out;
}

/// The first word of `line` and the rest after one blank.
inline std::pair<std::string, std::string> firstWord(const std::string& line) {
    const std::size_t blank = line.find(' ');
    if (blank == std::string::npos) {
        return {line, std::string()};
    }
    return {line.substr(0, blank), line.substr(blank + 1)};
}

/// A decimal number at the start of `text`, clamped to [low, high]; `fallback`
/// when there is none.
inline int32_t number(const std::string& text, int32_t low, int32_t high, int32_t fallback) {
    char* end = nullptr;
    const long long value = std::strtoll(text.c_str(), &end, 10);
    if (end == text.c_str()) {
        return fallback;
    }
    return static_cast<int32_t>(value < low ? low : value > high ? high : value);
}

/// Every conversion name, and one that does not exist.
inline constexpr const char* kConversionNames[] = {"swapnibble", "swap2", "swap4", "swap8",
                                                   "bcd",        "neg",   "inv",   "nosuch"};

}  // namespace xtok::fuzz
