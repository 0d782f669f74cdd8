// The console reads and empties the token queue without queueLock while the
// receive task pushes into it: neither may see the other's half-done change.
// And the short locks inside the protocol must not spin forever when their
// holder has been preempted by the waiter.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "protocol/spin_lock.h"
#include "tests/faults/fault_fixture.h"

namespace xtok::test::faults {
namespace {

// Token i is letter 'A' + i % 26 repeated 1 + i % 37 times: a reply that
// mixes two tokens, or has a wrong length for its letter, was torn.
std::string token(int i) {
    return std::string(static_cast<std::size_t>(1 + i % 37), static_cast<char>('A' + i % 26));
}

bool whole(const std::string& reply) {
    if (reply.empty()) {
        return true;
    }
    for (int i = 0; i < 26 * 37; ++i) {
        if (reply == token(i)) {
            return true;
        }
    }
    return false;
}

TEST_F(FaultFixture, ConsoleQueueCommandsWhileTokensArriveSeeWholeTokens) {
    ASSERT_TRUE(start("rx_suffix=0A token_queue_size=2")) << error();
    std::atomic<bool> done{false};
    std::vector<std::string> torn;
    std::thread console([&] {
        for (int round = 0; !done; ++round) {
            const std::string head = command("get");
            if (!whole(head)) {
                torn.push_back(head);
            }
            command("get_token_length");
            command("tokens_available");
            command(round % 3 == 0 ? "token_ack all" : "token_ack");
        }
    });
    for (int i = 0; i < 2000; ++i) {
        host.serial().feed(token(i) + "\n");
    }
    EXPECT_TRUE(host.serial().waitDrained(30000));
    done = true;
    console.join();
    EXPECT_TRUE(torn.empty()) << torn.size() << " torn replies, first: " << torn.front();
    // The queue is whole too: its bound holds and its head reads.
    const std::optional<int32_t> count = readInt("tokens_available");
    ASSERT_TRUE(count.has_value());
    EXPECT_LE(*count, 2);
    EXPECT_TRUE(whole(readText("rx_token").value_or("?")));
}

// A holder preempted by a waiter of higher priority never runs again on a
// single core while the waiter only spins; past a short spin the waiter
// sleeps through the host, which lets any thread run.
TEST(SpinLockFaults, AWaiterThatKeepsFindingTheLockTakenSleepsThroughTheHost) {
    FakeHost host;
    ModuleSession session(host);
    SpinLock lock;
    lock.lock();
    std::thread waiter([&] {
        lock.lock();
        lock.unlock();
    });
    EXPECT_TRUE(eventually([&] {
        const std::vector<int32_t> sleeps = host.tasks().sleeps();
        return std::find(sleeps.begin(), sleeps.end(), 1) != sleeps.end();
    }));
    lock.unlock();
    waiter.join();
}

}  // namespace
}  // namespace xtok::test::faults
