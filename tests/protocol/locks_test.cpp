// The protocol's locks under load: the receive task pushing, runtime threads
// reading, acknowledging, applying settings and toggling the connection, and
// the console's queue commands, all at once. Nothing may deadlock (the test
// would not end), nothing read may be torn, nothing lost but what the queue
// limit and SP_Done drop. Run under ThreadSanitizer in CI.
#include <gtest/gtest.h>

#include <atomic>
#include <cstdio>
#include <thread>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

std::string framedTokens(int first, int count) {
    std::string out;
    for (int i = first; i < first + count; ++i) {
        char text[16];
        std::snprintf(text, sizeof text, "\x02T%05d\x03", i);
        out += text;
    }
    return out;
}

/// The number of a token "Tnnnnn", -1 for anything else (a torn read); the
/// empty queue reads as -2.
int tokenNumber(const std::string& token) {
    const bool digits = token.size() == 6 && token[0] == 'T' &&
                        token.find_first_not_of("0123456789", 1) == std::string::npos;
    return token.empty() ? -2 : digits ? std::stoi(token.substr(1)) : -1;
}

class Locks : public ProtocolFixture {};

TEST_F(Locks, EverythingAtOnce) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03 token_queue_size=4"));
    for (const char* uri :
         {"0?rx_token?string-16", "0?token_ack?boolean", "0?SP_Done?boolean", "0?connect?boolean",
          "0?SP_Gap?unsignedInt", "0?SP_RxSuffix?string-8", "0?tokens_available?unsignedInt"}) {
        tag(uri);  // made here: only reads and writes are concurrent
    }
    std::atomic<bool> stop{false};
    std::atomic<int> bad{0}, toggles{0};
    std::vector<std::thread> workers;
    workers.emplace_back([&] {  // applies settings, which clears the queue
        for (int32_t gap = 1; !stop; gap = gap % 20 + 1) {
            std::string failed = write("SP_Gap?unsignedInt", std::to_string(gap));
            failed += write("SP_RxSuffix?string-8", "03");
            failed += write("SP_Done?boolean", "1");
            bad += !failed.empty();
            bad += read("SP_RxSuffix?string-8") != "03";
        }
    });
    workers.emplace_back([&] {  // the only one that changes the connection
        for (; toggles < 100 && !stop; ++toggles) {
            std::string failed = write("connect?boolean", "0");
            failed += write("connect?boolean", "1");
            bad += !failed.empty();
        }
    });
    workers.emplace_back([&] {  // the console, reading the same queue
        while (!stop) {
            bad += tokenNumber(command("get")) == -1;
            const int32_t count = std::stoi(command("tokens_available"));
            bad += count < 0 || count > 4;
            command("get_token_length");
        }
    });
    std::atomic<int> last{-1};
    std::thread consumer([&] {  // each token read once and later than the one before
        while (!stop) {
            const int number = tokenNumber(read("rx_token?string-16"));
            bad += number == -1 || (number >= 0 && number <= last);
            last = number >= 0 ? number : last.load();
            number == -2 ? std::this_thread::yield() : void(write("token_ack?boolean", "1"));
        }
    });
    host.serial().feed(framedTokens(0, 2000));
    EXPECT_TRUE(eventually([&] { return toggles >= 100; }));
    EXPECT_TRUE(host.serial().waitDrained(15000));
    stop = true;
    for (auto& t : workers) {
        t.join();
    }
    consumer.join();
    EXPECT_EQ(bad, 0);
    ASSERT_EQ(write("SP_Done?boolean", "1"), "");  // still receiving afterwards
    host.serial().feed(framedTokens(2000, 1));
    ASSERT_TRUE(host.serial().waitDrained());
    EXPECT_EQ(read("rx_token?string-16"), "T02000");
}

}  // namespace
}  // namespace xtok::test
