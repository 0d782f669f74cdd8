#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <map>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test {
namespace {

// Lock numbers in creation order, for the first protocol of a host.
constexpr int kQueueLock = 1;
constexpr int kPortLock = 2;

/// Events of one thread as text: "Q+ P+ P- Q-".
std::string trace(const std::vector<LockEvent>& events, std::thread::id thread) {
    std::string out;
    for (const LockEvent& e : events) {
        if (e.thread != thread) {
            continue;
        }
        if (!out.empty()) {
            out += ' ';
        }
        out += e.mutex == kQueueLock ? 'Q' : e.mutex == kPortLock ? 'P' : '?';
        out += e.lock ? '+' : '-';
    }
    return out;
}

std::string repeat(const std::string& text, int count) {
    std::string out;
    for (int i = 0; i < count; ++i) {
        out += (i ? " " : "") + text;
    }
    return out;
}

/// What lock-order rules the events break, one line per breach: the queue
/// lock taken while the port lock is held, on any thread; and on `task`,
/// both held at once.
std::vector<std::string> orderBreaches(const std::vector<LockEvent>& events, std::thread::id task) {
    std::map<std::thread::id, std::map<int, int>> held;
    std::vector<std::string> breaches;
    for (std::size_t i = 0; i < events.size(); ++i) {
        const LockEvent& e = events[i];
        std::map<int, int>& mine = held[e.thread];
        if (e.lock) {
            if (e.mutex == kQueueLock && mine[kPortLock] > 0) {
                breaches.push_back("queue lock under port lock at event " + std::to_string(i));
            }
            int other = e.mutex == kQueueLock ? kPortLock : kQueueLock;
            if (e.thread == task && mine[other] > 0) {
                breaches.push_back("receive task holds both at event " + std::to_string(i));
            }
            ++mine[e.mutex];
        } else {
            --mine[e.mutex];
        }
    }
    return breaches;
}

/// The one thread that is not among `known`: the receive task.
std::thread::id otherThread(const std::vector<LockEvent>& events,
                            const std::set<std::thread::id>& known) {
    for (const LockEvent& e : events) {
        if (!known.count(e.thread)) {
            return e.thread;
        }
    }
    return {};
}

class Locks : public ProtocolFixture {
protected:
    /// The lock events `action` causes on this thread.
    std::string locksOf(const std::function<void()>& action) {
        host.tasks().clearLockEvents();
        action();
        return trace(host.tasks().lockEvents(), std::this_thread::get_id());
    }
};

// With the port closed the receive task takes no locks, so every event is
// the test thread's.
TEST_F(Locks, WhichLockEachOperationTakes) {
    start("autoConnect=false");
    struct Case {
        std::string name;
        std::function<void()> action;
        std::string locks;
    };
    const std::string reads8 = repeat("Q+ Q-", 8);  // a boolean reads bit by bit
    const std::vector<Case> cases = {
        {"read rx_token", [&] { readText("rx_token"); }, "Q+ Q-"},
        {"read rx_token_len", [&] { readInt("rx_token_len"); }, "Q+ Q-"},
        {"read tokens_available", [&] { readInt("tokens_available"); }, "Q+ Q-"},
        {"read connect", [&] { readBool("connect"); }, reads8},
        {"read SP_Baud", [&] { readInt("SP_Baud"); }, ""},
        {"read SP_RxPrefix", [&] { readText("SP_RxPrefix"); }, ""},
        {"write SP_Baud", [&] { writeInt("SP_Baud", 19200); }, ""},
        {"write SP_Gap", [&] { writeInt("SP_Gap", 3); }, ""},
        {"write SP_RxPrefix", [&] { writeText("SP_RxPrefix", "02"); }, ""},
        {"write SP_HexTokens", [&] { writeBool("SP_HexTokens", false); }, ""},
        {"write SP_Done", [&] { writeBool("SP_Done", true); }, "Q+ Q-"},
        {"write token_ack", [&] { writeBool("token_ack", true); }, "Q+ Q-"},
        {"write tx_token", [&] { writeText("tx_token", "A"); }, "Q+ Q-"},
        {"connect", [&] { writeBool("connect", true); }, "Q+ P+ P- Q-"},
        {"disconnect", [&] { writeBool("connect", false); }, "Q+ P+ P- Q-"},
        {"console connect ON", [&] { command("connect ON"); }, "P+ P-"},
        {"console connect OFF", [&] { command("connect OFF"); }, "P+ P-"},
        {"console put", [&] { command("put A"); }, ""},
        {"console get", [&] { command("get"); }, ""},
        {"console set_rxGap", [&] { command("set_rxGap 5"); }, ""},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(locksOf(c.action), c.locks) << c.name;
    }
}

TEST_F(Locks, TheReceiveTaskLocksThePortPerByteAndTheQueuePerPushNeverBoth) {
    start("rx_prefix=02 rx_suffix=03 autoConnect=false");
    // Scripted before the port opens, so the task's first read is the first byte.
    host.serial().feed(hexBytes("02 41 03 02 42 42 03 44"));
    host.serial().silence();
    host.tasks().clearLockEvents();
    ASSERT_EQ(command("connect ON"), "OK");
    ASSERT_TRUE(host.serial().waitDrained());
    std::vector<LockEvent> events = host.tasks().lockEvents();
    std::thread::id task = otherThread(events, {std::this_thread::get_id()});
    std::string locks = trace(events, task);
    EXPECT_TRUE(orderBreaches(events, task).empty());
    // Each token is pushed under the queue lock after the byte that ends it;
    // then only reads: 44, the silence, the empty script.
    std::string expected =
        repeat("P+ P-", 3) + " Q+ Q- " + repeat("P+ P-", 4) + " Q+ Q- " + repeat("P+ P-", 2);
    EXPECT_EQ(locks.substr(0, expected.size()), expected);
    EXPECT_EQ(std::count(locks.begin(), locks.end(), 'Q'), 4);
}

/// Ends the process when a test does not finish in time: a deadlock cannot
/// be recovered from, only reported.
class Watchdog {
public:
    explicit Watchdog(int seconds)
        : thread_([this, seconds] {
              std::unique_lock<std::mutex> lock(mutex_);
              if (!done_changed_.wait_for(lock, std::chrono::seconds(seconds),
                                          [this] { return done_; })) {
                  std::fprintf(stderr, "watchdog: no progress in %d s, deadlocked\n", seconds);
                  std::abort();
              }
          }) {}
    ~Watchdog() {
        {
            std::lock_guard<std::mutex> lock(mutex_);
            done_ = true;
        }
        done_changed_.notify_all();
        thread_.join();
    }

private:
    std::mutex mutex_;
    std::condition_variable done_changed_;
    bool done_ = false;
    std::thread thread_;
};

std::string framedTokens(int first, int count) {
    std::string out;
    for (int i = first; i < first + count; ++i) {
        char text[16];
        std::snprintf(text, sizeof text, "T%05d", i);
        out += '\x02' + std::string(text) + '\x03';
    }
    return out;
}

/// The token's number, or -1 when it is not one of ours.
int tokenNumber(const std::string& token) {
    if (token.size() != 6 || token[0] != 'T') {
        return -1;
    }
    for (std::size_t i = 1; i < 6; ++i) {
        if (token[i] < '0' || token[i] > '9') {
            return -1;
        }
    }
    return std::stoi(token.substr(1));
}

class LockStress : public ProtocolFixture {
protected:
    /// A fresh protocol with prefix 02, suffix 03 and this queue size.
    void begin(int queueSize) {
        destroy();
        create();
        ASSERT_TRUE(
            configure("rx_prefix=02 rx_suffix=03 token_queue_size=" + std::to_string(queueSize)));
        ASSERT_TRUE(protocol->Start());
        // Tags are made here: only reads and writes are concurrent.
        rxToken = tag(textUri("rx_token", 16));
        available = tag(intUri("tokens_available"));
        ack = tag(boolUri("token_ack"));
        done = tag(boolUri("SP_Done"));
        connect = tag(boolUri("connect"));
        gap = tag(intUri("SP_Gap"));
        host.tasks().clearLockEvents();
    }

    std::string readToken() {
        char value[17] = {};
        return protocol->ReadTag(rxToken, value) ? std::string(value) : std::string("!");
    }
    int32_t readAvailable() {
        int32_t value = -1;
        return protocol->ReadTag(available, &value) ? value : -1;
    }
    bool write(ITag* t, uint8_t value) { return protocol->WriteTag(t, &value); }

    /// Reads the head and acknowledges it until `last` has been seen or
    /// `stop` is set; the numbers seen, in order.
    std::vector<int> consume(int last, const std::atomic<bool>& stop) {
        std::vector<int> seen;
        while (!stop) {
            std::string token = readToken();
            if (token.empty()) {
                std::this_thread::yield();
                continue;
            }
            seen.push_back(tokenNumber(token));
            write(ack, 1);
            if (seen.back() == last) {
                break;
            }
        }
        return seen;
    }

    void checkLockOrder(std::set<std::thread::id> known) {
        std::vector<LockEvent> events = host.tasks().lockEvents();
        known.insert(std::this_thread::get_id());
        std::thread::id task = otherThread(events, known);
        std::vector<std::string> breaches = orderBreaches(events, task);
        EXPECT_TRUE(breaches.empty()) << breaches.size() << " breaches, first: " << breaches[0];
    }

    ITag *rxToken = nullptr, *available = nullptr, *ack = nullptr, *done = nullptr,
         *connect = nullptr, *gap = nullptr;
};

// Readers only look, one consumer reads and acknowledges. With room for all
// every token arrives once, in order; with a small queue only the oldest are
// dropped, so what arrives is in order and ends with the last token.
TEST_F(LockStress, NoTokenIsLostBeyondDroppingTheOldest) {
    Watchdog watchdog(20);
    const int count = 2000;
    for (int queueSize : {10000, 4}) {
        SCOPED_TRACE("queue size " + std::to_string(queueSize));
        begin(queueSize);
        std::atomic<bool> stop{false};
        std::atomic<int> malformed{0};
        std::vector<std::thread> readers;
        for (int r = 0; r < 2; ++r) {
            readers.emplace_back([&] {
                while (!stop) {
                    std::string token = readToken();
                    if ((!token.empty() && tokenNumber(token) < 0) || readAvailable() < 0) {
                        ++malformed;
                    }
                    std::this_thread::yield();
                }
            });
        }
        std::vector<int> seen;
        std::thread consumer([&] { seen = consume(count - 1, stop); });
        host.serial().feed(framedTokens(0, count));
        std::set<std::thread::id> known = {consumer.get_id()};
        for (auto& t : readers) {
            known.insert(t.get_id());
        }
        consumer.join();
        stop = true;
        for (auto& t : readers) {
            t.join();
        }
        EXPECT_EQ(malformed, 0);
        ASSERT_FALSE(seen.empty());
        EXPECT_EQ(seen.back(), count - 1);
        if (queueSize >= count) {
            ASSERT_EQ(seen.size(), static_cast<std::size_t>(count));
        }
        // In order and ending with the last: with all of them, exactly 0 to count - 1.
        EXPECT_GE(seen.front(), 0);
        for (std::size_t i = 1; i < seen.size(); ++i) {
            ASSERT_GT(seen[i], seen[i - 1]) << i;
        }
        checkLockOrder(known);
    }
}

// Everything at once: the consumer, SP_Done clearing the queue, connect
// toggled by tag and settings staged. Nothing may deadlock, the lock order
// must hold, and what is read stays well-formed and in order.
TEST_F(LockStress, EverythingAtOnce) {
    Watchdog watchdog(20);
    begin(4);
    const int count = 2000;
    std::atomic<bool> stop{false};
    std::atomic<int> bad{0};
    std::vector<std::thread> workers;
    workers.emplace_back([&] {  // reader
        while (!stop) {
            int32_t n = readAvailable();
            if (n < 0 || n > 4) {
                ++bad;
            }
            std::string token = readToken();
            if (!token.empty() && tokenNumber(token) < 0) {
                ++bad;
            }
            std::this_thread::yield();
        }
    });
    workers.emplace_back([&] {  // applies settings
        int32_t value = 1;
        while (!stop) {
            value = value % 20 + 1;
            protocol->WriteTag(gap, &value);
            if (!write(done, 1)) {
                ++bad;
            }
            std::this_thread::sleep_for(std::chrono::microseconds(300));
        }
    });
    std::atomic<int> toggles{0};
    workers.emplace_back([&] {  // the only one that changes the connection
        for (int i = 0; i < 100 && !stop; ++i) {
            if (!write(connect, 0) || !write(connect, 1)) {
                ++bad;
            }
            ++toggles;
            std::this_thread::sleep_for(std::chrono::microseconds(100));
        }
    });
    std::vector<int> seen;
    // Runs until the stop below: tokens that SP_Done cleared never come.
    std::thread consumer([&] { seen = consume(-2, stop); });
    host.serial().feed(framedTokens(0, count));
    EXPECT_TRUE(eventually([&] { return toggles >= 100; }, 15000));
    EXPECT_TRUE(host.serial().waitDrained(15000));
    stop = true;
    std::set<std::thread::id> known = {consumer.get_id()};
    for (auto& t : workers) {
        known.insert(t.get_id());
        t.join();
    }
    consumer.join();
    EXPECT_EQ(bad, 0);
    for (std::size_t i = 0; i < seen.size(); ++i) {
        ASSERT_GE(seen[i], 0) << i;
        if (i > 0) {
            ASSERT_GT(seen[i], seen[i - 1]) << i;
        }
    }
    checkLockOrder(known);

    // Still receiving afterwards.
    ASSERT_TRUE(write(ack, 1) && write(done, 1));
    host.serial().feed(framedTokens(count, 1));
    ASSERT_TRUE(host.serial().waitDrained());
    EXPECT_EQ(readToken(), "T02000");
}

}  // namespace
}  // namespace xtok::test
