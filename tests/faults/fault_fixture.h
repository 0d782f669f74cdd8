// The protocol fixture for faults: a Start that a fault may make fail, raw
// bytes on the line, and two tokens queued through a working line first.
#pragma once

#include <string>
#include <vector>

#include "tests/protocol/protocol_fixture.h"

namespace xtok::test::faults {

using test::eventually;
using test::kBaseConfig;

class FaultFixture : public ProtocolFixture {
protected:
    /// Configures with the base keys and `extra`, then starts; the result of
    /// Start, which a fault may make fail.
    bool start(const std::string& extra = "") {
        EXPECT_TRUE(configure(extra)) << error();
        return protocol->Start();
    }

    /// Plays raw `bytes` followed by a silence and waits until the receive
    /// task has read all of it.
    void play(const std::string& bytes) {
        host.serial().feed(bytes);
        host.serial().silence();
        ASSERT_TRUE(host.serial().waitDrained()) << "the receive task did not read the script";
    }

    std::vector<std::string> takeTokens() { return ProtocolFixture::takeTokens(1024); }

    /// Queues "AB" and "CD" through a working line (prefix 02, suffix 03).
    void queueTwoTokens() {
        play(
            "\x02"
            "AB\x03\x02"
            "CD\x03");
        ASSERT_EQ(readInt("tokens_available"), 2);
    }
};

}  // namespace xtok::test::faults
