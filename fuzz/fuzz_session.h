// What every fuzz target shares: a token protocol made by the plug-in's own
// factory over a fresh test host for each input, with task creation refused
// so that no thread runs and every run repeats (the target drives the receive
// passes itself); buffers that catch a write past their size; and the small
// readers of the input's lines.
#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "module/interface_factory.h"
#include "protocol/protocol_xtok.h"
#include "tests/support/fake_host.h"

namespace xtok::fuzz {

using test::hexBytes;

/// Ends the run like a sanitizer finding, so that libFuzzer keeps the input.
#define FUZZ_CHECK(condition)                                                            \
    do {                                                                                 \
        if (!(condition)) {                                                              \
            std::fprintf(stderr, "%s:%d: broken: %s\n", __FILE__, __LINE__, #condition); \
            std::abort();                                                                \
        }                                                                                \
    } while (0)

inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

class Session {
public:
    Session() {
        host.tasks().refuseTasks = true;
        FUZZ_CHECK(rootObject().module().Init(&host) == 1);
        protocol = static_cast<Protocol_XTOK*>(rootObject().factory().CreateProtocol("XTOK"));
        FUZZ_CHECK(protocol != nullptr);
    }
    ~Session() {
        protocol->Stop();
        rootObject().factory().DestroyProtocol(protocol);
        rootObject().module().Exit();
        FUZZ_CHECK(host.outstanding() == 0);  // nothing keeps a service
    }
    bool start(const std::string& extra) {
        return protocol->Configure((kBaseConfig + " " + extra).c_str()) && protocol->Start();
    }
    /// Runs receive passes until the line's script is read.
    void receiveAll() {
        host.serial().silence();
        for (int pass = 0; pass < 100000 && host.serial().isOpen() && host.serial().pending();
             ++pass) {
            protocol->receiveToken();
        }
    }
    /// A tag's value through ReadTag, all its bytes, or "?" when the read fails.
    std::string read(const std::string& uri) {
        ITag* tag = protocol->CreateTag(uri.c_str());
        std::string value(static_cast<std::size_t>(tag ? tag->GetSize() : 0), '\0');
        const bool ok = tag && protocol->ReadTag(tag, value.data());
        protocol->DeleteTag(tag);
        return ok ? value : "?";
    }
    int32_t readInt(const std::string& type) {
        int32_t value = -1;
        const std::string bytes = read("0?" + type + "?unsignedInt");
        std::memcpy(&value, bytes.data(), bytes.size() == 4 ? 4 : 0);
        return bytes.size() == 4 ? value : -1;
    }
    /// `bytes` repeated over a tag's `size` ('A' when there are none), with no
    /// terminator: a read past the value is caught.
    static std::string filled(const std::string& bytes, int32_t size) {
        std::string value(static_cast<std::size_t>(size), 'A');
        for (std::size_t i = 0; i < value.size() && !bytes.empty(); ++i) {
            value[i] = bytes[i % bytes.size()];
        }
        return value;
    }
    bool write(const std::string& uri, const std::string& bytes) {
        ITag* tag = protocol->CreateTag(uri.c_str());
        const std::string value = filled(bytes, tag ? tag->GetSize() : 0);
        std::unique_ptr<char[]> exact(new char[value.size()]);
        std::memcpy(exact.get(), value.data(), value.size());
        const bool ok = tag && protocol->WriteTag(tag, exact.get());
        protocol->DeleteTag(tag);
        return ok;
    }

    test::FakeHost host;
    Protocol_XTOK* protocol = nullptr;
};

/// A caller's buffer of `size` bytes followed by guard bytes that nothing may touch.
class ReplyBuffer {
public:
    explicit ReplyBuffer(int32_t size) : size_(size > 0 ? size : 0), bytes_(size_ + kGuard, 'Z') {}
    char* data() { return bytes_.data(); }
    int32_t size() const { return size_; }
    bool guardIntact() const { return bytes_.find_first_not_of('Z', size_) == std::string::npos; }
    bool untouched() const { return bytes_.find_first_not_of('Z') == std::string::npos; }

private:
    static constexpr int32_t kGuard = 32;
    int32_t size_;
    std::string bytes_;
};

/// The input's lines; a zero byte ends a line's text, as for the runtime.
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

/// The first word of `line` and the rest after one blank.
inline std::pair<std::string, std::string> firstWord(const std::string& line) {
    const std::size_t blank = line.find(' ');
    return blank == std::string::npos ? std::pair{line, std::string()}
                                      : std::pair{line.substr(0, blank), line.substr(blank + 1)};
}

}  // namespace xtok::fuzz
