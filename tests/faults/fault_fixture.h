// A token protocol over a fake host whose services can be made to fail:
// configure and start it, read and write its memory types through tags,
// talk to its console and play bytes, silences, read errors and hang-ups on
// its line.
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

namespace xtok::test::faults {

inline const std::string kBaseConfig =
    "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 mode=RS-232";

/// Polls `condition` until it holds or `timeoutMs` passed.
inline bool eventually(const std::function<bool()>& condition, int timeoutMs = 5000) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(timeoutMs);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

class FaultFixture : public ::testing::Test {
protected:
    void SetUp() override {
        session_ = std::make_unique<ModuleSession>(host);
        protocol = rootObject().factory().CreateProtocol("XTOK");
        ASSERT_NE(protocol, nullptr);
    }

    void TearDown() override {
        destroy();
        session_.reset();
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
        const std::string text = kBaseConfig + " " + extra;
        return protocol->Configure(text.c_str());
    }

    /// Configures with the base keys and `extra`, then starts; the result of
    /// Start.
    bool start(const std::string& extra = "") {
        EXPECT_TRUE(configure(extra)) << error();
        return protocol->Start();
    }

    std::string error() const { return protocol->GetLastErrorText(); }
    int32_t code() const { return protocol->GetLastErrorCode(); }

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

    std::optional<int32_t> readInt(const std::string& type) {
        int32_t value = 0;
        ITag* t = tag("0?" + type + "?unsignedInt");
        return t && protocol->ReadTag(t, &value) ? std::optional<int32_t>(value) : std::nullopt;
    }
    std::optional<std::string> readText(const std::string& type, int size = 64) {
        std::vector<char> value(static_cast<std::size_t>(size) + 1, '\0');
        ITag* t = tag("0?" + type + "?string-" + std::to_string(size));
        if (!t || !protocol->ReadTag(t, value.data())) {
            return std::nullopt;
        }
        return std::string(value.data());
    }
    bool writeInt(const std::string& type, int32_t value) {
        ITag* t = tag("0?" + type + "?unsignedInt");
        return t && protocol->WriteTag(t, &value);
    }
    bool writeBool(const std::string& type, bool value) {
        uint8_t byte = value ? 1 : 0;
        ITag* t = tag("0?" + type + "?boolean");
        return t && protocol->WriteTag(t, &byte);
    }
    bool writeText(const std::string& type, const std::string& text, int size = 64) {
        std::vector<char> value(static_cast<std::size_t>(size), '\0');
        std::memcpy(value.data(), text.data(), std::min(text.size(), value.size()));
        ITag* t = tag("0?" + type + "?string-" + std::to_string(size));
        return t && protocol->WriteTag(t, value.data());
    }

    /// The console's reply up to its first zero.
    std::string command(const std::string& line, bool* result = nullptr) {
        std::vector<char> reply(8192, '\0');
        const bool ok =
            protocol->DoCommand(line.c_str(), reply.data(), static_cast<int32_t>(reply.size()));
        if (result) {
            *result = ok;
        }
        return std::string(reply.data());
    }

    /// Plays `bytes` followed by a silence and waits until the receive task
    /// has read all of it.
    void play(const std::string& bytes) {
        host.serial().feed(bytes);
        host.serial().silence();
        ASSERT_TRUE(host.serial().waitDrained()) << "the receive task did not read the script";
    }

    /// Every queued token, oldest first, read through rx_token and then
    /// acknowledged.
    std::vector<std::string> takeTokens() {
        std::vector<std::string> out;
        const std::optional<int32_t> count = readInt("tokens_available");
        EXPECT_TRUE(count.has_value()) << error();
        for (int32_t i = 0; count && i < *count; ++i) {
            std::optional<std::string> token = readText("rx_token", 1024);
            EXPECT_TRUE(token.has_value()) << error();
            out.push_back(token.value_or("?"));
            EXPECT_TRUE(writeBool("token_ack", true)) << error();
        }
        return out;
    }

    /// Queues "AB" and "CD" through a working line (prefix 02, suffix 03).
    void queueTwoTokens() {
        play(
            "\x02"
            "AB\x03\x02"
            "CD\x03");
        ASSERT_EQ(readInt("tokens_available"), 2);
    }

    FakeHost host;
    IProtocol7* protocol = nullptr;

private:
    std::unique_ptr<ModuleSession> session_;
    std::map<std::string, ITag*> tags_;
};

}  // namespace xtok::test::faults
