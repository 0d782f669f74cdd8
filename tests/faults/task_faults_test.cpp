// A host that will not make the receive task, or cannot stop it in time.
// The protocol starts and stops regardless, keeps what is queued, never
// leaves its task running on a destroyed object, and receives again once
// the host lets it.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/faults/fault_fixture.h"

namespace xtok::test::faults {
namespace {

class TaskFaults : public FaultFixture {
protected:
    int createTaskCalls() {
        int n = 0;
        for (const std::string& call : host.tasks().calls()) {
            n += call.rfind("CreateTask", 0) == 0;
        }
        return n;
    }
};

TEST_F(TaskFaults, RefusedTaskStartsWithoutReceivingAndTheQueueStays) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    ASSERT_TRUE(protocol->Stop());
    host.tasks().refuseTasks = true;

    EXPECT_TRUE(protocol->Start()) << error();
    EXPECT_EQ(createTaskCalls(), 2);
    EXPECT_TRUE(host.serial().isOpen());
    // Nobody reads the line, but tags, transmits and the console work.
    const long reads = host.serial().reads();
    host.serial().feed(
        "\x02"
        "EF\x03");
    EXPECT_EQ(command("get"), "AB");
    EXPECT_TRUE(writeText("tx_token", "x"));
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD"}));
    EXPECT_TRUE(protocol->Stop());
    EXPECT_EQ(host.serial().reads(), reads);

    // The next start asks again, and the line is read from where it was.
    host.tasks().refuseTasks = false;
    ASSERT_TRUE(protocol->Start()) << error();
    EXPECT_EQ(createTaskCalls(), 3);
    ASSERT_TRUE(host.serial().waitDrained());
    EXPECT_EQ(takeTokens(), std::vector<std::string>{"EF"});
}

TEST_F(TaskFaults, StopThatTimesOutClosesThePortAndKeepsTheQueue) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    host.tasks().stopTimesOut = true;

    EXPECT_TRUE(protocol->Stop());
    EXPECT_FALSE(host.serial().isOpen());
    EXPECT_EQ(command("get_stat"), "Disconnected");
    // The task the host could not stop runs on, idle, and is used again.
    ASSERT_TRUE(protocol->Start()) << error();
    EXPECT_EQ(host.tasks().tasksCreated(), 1);
    play(
        "\x02"
        "EF\x03");
    EXPECT_EQ(takeTokens(), (std::vector<std::string>{"AB", "CD", "EF"}));
}

// The task the host could not stop must not outlive the protocol it reads:
// destruction ends it, whatever the host's stop answers.
TEST_F(TaskFaults, DestroyingAfterAStopThatTimedOutEndsTheTask) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03")) << error();
    queueTwoTokens();
    host.tasks().stopTimesOut = true;
    EXPECT_TRUE(protocol->Stop());
    FakeTask* task = host.tasks().lastTask();
    ASSERT_NE(task, nullptr);
    EXPECT_FALSE(task->waitEnded(0));

    destroy();
    EXPECT_TRUE(task->waitEnded(5000));
}

// The same when the runtime destroys a started protocol without Stop.
TEST_F(TaskFaults, DestroyingWithoutStopWhenTheStopTimesOutEndsTheTask) {
    ASSERT_TRUE(start("gap=5")) << error();
    host.tasks().stopTimesOut = true;
    FakeTask* task = host.tasks().lastTask();
    ASSERT_NE(task, nullptr);

    rootObject().factory().DestroyProtocol(protocol);
    protocol = nullptr;
    EXPECT_TRUE(task->waitEnded(5000));
}

}  // namespace
}  // namespace xtok::test::faults
