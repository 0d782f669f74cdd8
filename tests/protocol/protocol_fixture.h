// A token protocol made by the plug-in's factory over the test host, with
// helpers to configure and start it, to read and write its memory types
// through tags, to talk to its console and to play bytes on its line.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
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

namespace xtok::test {

/// The mandatory keys; tests append what they need.
inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

/// Bytes from hex pairs, blanks between them optional: "02 41" or "0241".
inline std::string hexBytes(const std::string& hex) {
    std::string digits, out;
    for (char c : hex) {
        digits += c == ' ' ? "" : std::string(1, c);
    }
    for (std::size_t i = 0; i + 1 < digits.size(); i += 2) {
        out.push_back(static_cast<char>(std::stoi(digits.substr(i, 2), nullptr, 16)));
    }
    return out;
}

/// Polls `condition` until it holds or five seconds passed; true when it held.
inline bool eventually(const std::function<bool()>& condition) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

class ProtocolFixture : public ::testing::Test {
public:
    void SetUp() override {
        session_ = std::make_unique<ModuleSession>(host);
        create();
    }
    void TearDown() override {
        destroy();
        session_.reset();
    }
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
        return protocol->Configure((kBaseConfig + " " + extra).c_str());
    }
    /// Configures with the base keys and `extra`, then starts.
    bool start(const std::string& extra = "") {
        EXPECT_TRUE(configure(extra)) << error();
        return protocol->Start();
    }
    std::string error() const { return protocol->GetLastErrorText(); }
    int32_t code() const { return protocol->GetLastErrorCode(); }

    /// A tag made once per address, kept for the test.
    ITag* tag(const std::string& uri) {
        auto it = tags_.find(uri);
        ITag* made = it != tags_.end() ? it->second : tags_[uri] = protocol->CreateTag(uri.c_str());
        EXPECT_NE(made, nullptr) << uri << ": " << error();
        return made;
    }
    /// A tag's value read through ReadTag as `size` bytes; none when it fails.
    std::optional<std::string> read(const std::string& uri, std::size_t size) {
        ITag* t = tag(uri);
        // ReadTag writes the tag's whole value, whatever part the test looks at.
        std::vector<char> buffer(std::max<std::size_t>(size, t ? t->GetSize() : 0) + 16, '\0');
        return t && protocol->ReadTag(t, buffer.data())
                   ? std::optional(std::string(buffer.data(), size))
                   : std::nullopt;
    }
    /// Each tag's value as hex text ("-" when the read fails), blank-separated.
    std::string readHex(const std::vector<std::pair<std::string, std::size_t>>& tags) {
        std::string out;
        for (const auto& [uri, size] : tags) {
            const auto bytes = read(uri, size);
            out += out.empty() ? "" : " ";
            for (std::size_t i = 0; bytes && i < size; ++i) {
                out += "0123456789ABCDEF"[static_cast<uint8_t>((*bytes)[i]) >> 4];
                out += "0123456789ABCDEF"[(*bytes)[i] & 15];
            }
            out += bytes ? "" : "-";
        }
        return out;
    }
    std::optional<int32_t> readInt(const std::string& type) {
        auto bytes = read("0?" + type + "?unsignedInt", 4);
        int32_t value = 0;
        return bytes ? (std::memcpy(&value, bytes->data(), 4), std::optional(value)) : std::nullopt;
    }
    std::optional<int> readByte(const std::string& type, const char* dataType = "unsignedByte") {
        auto bytes = read("0?" + type + "?" + dataType, 1);
        return bytes ? std::optional<int>(static_cast<uint8_t>((*bytes)[0])) : std::nullopt;
    }
    std::optional<bool> readBool(const std::string& type) {
        auto value = readByte(type, "boolean");
        return value ? std::optional<bool>(*value != 0) : std::nullopt;
    }
    std::optional<std::string> readText(const std::string& type, int size = 64) {
        auto bytes = read("0?" + type + "?string-" + std::to_string(size), size);
        return bytes ? std::optional(std::string(bytes->c_str())) : std::nullopt;
    }
    bool write(const std::string& uri, const void* value) {
        ITag* t = tag(uri);
        return t && protocol->WriteTag(t, value);
    }
    bool writeInt(const std::string& type, int32_t value) {
        return write("0?" + type + "?unsignedInt", &value);
    }
    bool writeByte(const std::string& type, uint8_t value, const char* dataType = "unsignedByte") {
        return write("0?" + type + "?" + dataType, &value);
    }
    bool writeBool(const std::string& type, bool value) {
        return writeByte(type, value ? 1 : 0, "boolean");
    }
    bool writeText(const std::string& type, const std::string& text, int size = 64) {
        std::string value(static_cast<std::size_t>(size), '\0');
        std::memcpy(value.data(), text.data(), std::min(text.size(), value.size()));
        return write("0?" + type + "?string-" + std::to_string(size), value.data());
    }

    /// The console's reply up to its first zero, and its result.
    std::string command(const std::string& line, bool* result = nullptr) {
        std::vector<char> reply(8192, '\0');
        const bool ok = protocol->DoCommand(line.c_str(), reply.data(), 8192);
        if (result) {
            *result = ok;
        }
        return reply.data();
    }

    /// Plays hex byte pairs on the line, '|' standing for a silence (one read
    /// that times out), and a silence at the end; returns once the receive
    /// task has read all of it.
    void play(const std::string& script) {
        std::size_t at = 0;
        for (std::size_t bar; (bar = script.find('|', at)) != std::string::npos; at = bar + 1) {
            host.serial().feed(hexBytes(script.substr(at, bar - at)));
            host.serial().silence();
        }
        host.serial().feed(hexBytes(script.substr(at)));
        host.serial().silence();
        ASSERT_TRUE(host.serial().waitDrained()) << "the receive task did not read the script";
    }
    /// Waits until the receive task is in a pass begun after this call: a
    /// pass takes the framing and the gap when it begins.
    void settle() {
        ASSERT_TRUE(host.serial().waitDrained());
        ASSERT_TRUE(host.serial().waitDrained());
    }
    /// Every queued token, oldest first, each read through rx_token and then
    /// acknowledged; the queue is empty afterwards.
    std::vector<std::string> takeTokens() {
        std::vector<std::string> out;
        for (int32_t n = readInt("tokens_available").value_or(0); n > 0; --n) {
            out.push_back(readText("rx_token", 4096).value_or("?"));
            EXPECT_TRUE(writeBool("token_ack", true)) << error();
        }
        return out;
    }
    /// The port's settings as the protocol reports them.
    std::string settingsText() {
        char text[64] = {};
        protocol->GetSerialSettings(text, sizeof text);
        return text;
    }

    FakeHost host;
    IProtocol7* protocol = nullptr;

private:
    std::unique_ptr<ModuleSession> session_;
    std::map<std::string, ITag*> tags_;
};

}  // namespace xtok::test
