// A token protocol made by the plug-in's factory over a fake host, with
// helpers to configure and start it, to read and write its memory types
// through tags, to talk to its console and to play bytes on its line.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <cstring>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "module/interface_factory.h"
#include "tests/support/fake_host.h"
#include "tests/support/module_session.h"
#include "xtokline/protocol.h"

namespace xtok::test {

/// The mandatory keys; tests append what they need.
inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

/// Bytes from hex pairs, blanks between them optional: "02 41" or "0241".
inline std::string hexBytes(const std::string& hex) {
    std::string out;
    std::string digits;
    for (char c : hex) {
        if (c != ' ') {
            digits.push_back(c);
        }
    }
    for (std::size_t i = 0; i + 1 < digits.size(); i += 2) {
        out.push_back(static_cast<char>(std::stoi(digits.substr(i, 2), nullptr, 16)));
    }
    return out;
}

/// Polls `condition` until it holds or `timeoutMs` passed; true when it held.
inline bool eventually(const std::function<bool()>& condition, int timeoutMs = 5000) {
    auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(timeoutMs);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

class ProtocolFixture : public ::testing::Test {
protected:
    void SetUp() override {
        prepareHost();
        session_ = std::make_unique<ModuleSession>(host);
        create();
    }

    void TearDown() override {
        destroy();
        session_.reset();
    }

    /// Runs before the module takes the host's services.
    virtual void prepareHost() {}

    void create() {
        protocol = rootObject().factory().CreateProtocol("XTOK");
        ASSERT_NE(protocol, nullptr);
    }

    /// Stops and destroys the protocol, as a runtime does.
    void destroy() {
        tags_.clear();
        if (protocol) {
            protocol->Stop();
            rootObject().factory().DestroyProtocol(protocol);
            protocol = nullptr;
        }
    }

    bool configure(const std::string& extra = "") {
        std::string text = extra.empty() ? kBaseConfig : kBaseConfig + " " + extra;
        return protocol->Configure(text.c_str());
    }

    /// Configures with the base keys and `extra`, then starts.
    void start(const std::string& extra = "") {
        ASSERT_TRUE(configure(extra)) << error();
        ASSERT_TRUE(protocol->Start()) << error();
    }

    std::string error() const { return protocol->GetLastErrorText(); }
    int32_t code() const { return protocol->GetLastErrorCode(); }

    /// A tag made once per address (the runtime's CreateTag), kept for the test.
    ITag* tag(const std::string& uri) {
        auto it = tags_.find(uri);
        if (it != tags_.end()) {
            return it->second;
        }
        ITag* made = protocol->CreateTag(uri.c_str());
        EXPECT_NE(made, nullptr) << uri << ": " << error();
        tags_[uri] = made;
        return made;
    }

    static std::string intUri(const std::string& type) { return "0?" + type + "?unsignedInt"; }
    static std::string byteUri(const std::string& type) { return "0?" + type + "?unsignedByte"; }
    static std::string boolUri(const std::string& type) { return "0?" + type + "?boolean"; }
    static std::string textUri(const std::string& type, int size) {
        return "0?" + type + "?string-" + std::to_string(size);
    }

    // Reads through the runtime's ReadTag; empty when the read fails.
    std::optional<int32_t> readInt(const std::string& type) {
        int32_t value = 0;
        return read(tag(intUri(type)), &value, sizeof value) ? std::optional<int32_t>(value)
                                                             : std::nullopt;
    }
    std::optional<int> readByte(const std::string& type) {
        uint8_t value = 0;
        return read(tag(byteUri(type)), &value, 1) ? std::optional<int>(value) : std::nullopt;
    }
    std::optional<bool> readBool(const std::string& type) {
        uint8_t value = 0;
        return read(tag(boolUri(type)), &value, 1) ? std::optional<bool>(value != 0) : std::nullopt;
    }
    std::optional<std::string> readText(const std::string& type, int size = 64) {
        std::vector<char> value(static_cast<std::size_t>(size) + 1, '\0');
        if (!read(tag(textUri(type, size)), value.data(), size)) {
            return std::nullopt;
        }
        return std::string(value.data());
    }

    bool writeInt(const std::string& type, int32_t value) {
        return protocol->WriteTag(tag(intUri(type)), &value);
    }
    bool writeByte(const std::string& type, uint8_t value) {
        return protocol->WriteTag(tag(byteUri(type)), &value);
    }
    bool writeBool(const std::string& type, bool value) {
        uint8_t byte = value ? 1 : 0;
        return protocol->WriteTag(tag(boolUri(type)), &byte);
    }
    bool writeText(const std::string& type, const std::string& text, int size = 64) {
        std::vector<char> value(static_cast<std::size_t>(size), '\0');
        std::memcpy(value.data(), text.data(), std::min(text.size(), value.size()));
        return protocol->WriteTag(tag(textUri(type, size)), value.data());
    }

    /// The console's reply up to its first zero, and its result.
    std::string command(const std::string& line, bool* result = nullptr) {
        std::vector<char> reply(8192, '\0');
        bool ok =
            protocol->DoCommand(line.c_str(), reply.data(), static_cast<int32_t>(reply.size()));
        if (result) {
            *result = ok;
        }
        return std::string(reply.data());
    }

    /// Plays `script` on the line: hex byte pairs, '|' for a silence (one
    /// read that times out). A silence is added at the end, so a token that
    /// only the gap ends is complete too. Returns once the receive task has
    /// read all of it.
    void play(const std::string& script) {
        std::string run;
        auto flush = [&] {
            if (!run.empty()) {
                host.serial().feed(hexBytes(run));
                run.clear();
            }
        };
        for (char c : script) {
            if (c == '|') {
                flush();
                host.serial().silence();
            } else {
                run.push_back(c);
            }
        }
        flush();
        host.serial().silence();
        ASSERT_TRUE(host.serial().waitDrained()) << "the receive task did not read the script";
    }

    /// Waits until the receive task is in a pass that began after this call.
    /// A pass takes the framing and the gap when it begins, so changes made
    /// before apply to whatever is played next.
    void settle() {
        // The first read seen on the empty line may belong to a pass begun
        // earlier; it ends that pass, so the next one belongs to a new pass.
        ASSERT_TRUE(host.serial().waitDrained());
        ASSERT_TRUE(host.serial().waitDrained());
    }

    /// Every queued token, oldest first, each read through rx_token and then
    /// acknowledged; the queue is empty afterwards.
    std::vector<std::string> takeTokens(int size = 4096) {
        std::vector<std::string> out;
        std::optional<int32_t> count = readInt("tokens_available");
        EXPECT_TRUE(count.has_value()) << error();
        for (int32_t i = 0; count && i < *count; ++i) {
            std::optional<std::string> token = readText("rx_token", size);
            EXPECT_TRUE(token.has_value()) << error();
            out.push_back(token.value_or("?"));
            EXPECT_TRUE(writeBool("token_ack", true)) << error();
        }
        return out;
    }

    FakeHost host;
    IProtocol7* protocol = nullptr;

private:
    bool read(ITag* t, void* value, std::size_t size) {
        if (!t) {
            return false;
        }
        // ReadTag writes exactly the tag's value size; pad for safety.
        std::vector<uint8_t> buffer(size + 16, 0);
        if (!protocol->ReadTag(t, buffer.data())) {
            return false;
        }
        std::memcpy(value, buffer.data(), size);
        return true;
    }

    std::unique_ptr<ModuleSession> session_;
    std::map<std::string, ITag*> tags_;
};

}  // namespace xtok::test
