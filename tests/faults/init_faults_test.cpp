// A runtime that lacks a service: the module refuses Init with the runtime's
// own text and keeps nothing; without an optional one the protocol still
// does its whole job.
#include <gtest/gtest.h>

#include <string>

#include "module/interface_factory.h"
#include "tests/faults/fault_fixture.h"
#include "tests/support/fake_host.h"

namespace xtok::test::faults {
namespace {

struct Refusal {
    const char* service;
    const char* text;
};

void PrintTo(const Refusal& r, std::ostream* os) {
    *os << r.service;
}

class RequiredServiceRefused : public ::testing::TestWithParam<Refusal> {};

TEST_P(RequiredServiceRefused, InitFailsWithTheTextAndGivesBackWhatItTook) {
    ProtModule& module = rootObject().module();
    {
        FakeHost host;
        host.refuse(GetParam().service);
        EXPECT_EQ(module.Init(&host), 0);
        EXPECT_STREQ(module.GetErrorText(), GetParam().text);
        EXPECT_EQ(host.outstanding(), 0);
        // Nothing is held, so an Exit has nothing to give back.
        host.clearCalls();
        module.Exit();
        EXPECT_TRUE(host.calls().empty());
    }
    // The next runtime with every service gets a working module.
    FakeHost host;
    ASSERT_EQ(module.Init(&host), 1);
    IProtocol7* protocol = rootObject().factory().CreateProtocol("XTOK");
    ASSERT_NE(protocol, nullptr);
    const std::string config = kBaseConfig;
    EXPECT_TRUE(protocol->Configure(config.c_str()));
    EXPECT_TRUE(protocol->Start());
    EXPECT_TRUE(host.serial().isOpen());
    protocol->Stop();
    rootObject().factory().DestroyProtocol(protocol);
    module.Exit();
    EXPECT_EQ(host.outstanding(), 0);
}

INSTANTIATE_TEST_SUITE_P(Services, RequiredServiceRefused,
                         ::testing::Values(Refusal{"IMultiTask2", "IMultiTask2 not created"},
                                           Refusal{"ISerialFactory", "ISerialFactory not created"},
                                           Refusal{"ISocketFactory", "ISocketFactory not created"},
                                           Refusal{"ICDSBuffer", "piCDSBuffer not created"}),
                         [](const ::testing::TestParamInfo<Refusal>& info) {
                             return std::string(info.param.service);
                         });

TEST(InitFaults, NullHostIsRefused) {
    EXPECT_EQ(rootObject().module().Init(nullptr), 0);
    EXPECT_STREQ(rootObject().module().GetErrorText(), "IMultiTask2 not created");
}

// Without any optional service, and so without permanent storage, settings
// still apply for as long as the protocol lives.
class WithoutOptionalServices : public FaultFixture {
protected:
    void SetUp() override {
        for (const char* name :
             {"IDiag", "IPermanentStorage", "IDriverInterface", "ISmux", "IFastTimer"}) {
            host.refuse(name);
        }
        FaultFixture::SetUp();
    }
};

TEST_F(WithoutOptionalServices, TheProtocolDoesItsWholeJob) {
    ASSERT_TRUE(start("rx_prefix=02 rx_suffix=03 tx_prefix=02 tx_suffix=03")) << error();
    queueTwoTokens();
    EXPECT_TRUE(writeText("tx_token", "hi"));
    EXPECT_EQ(host.serial().written(), "\x02hi\x03");

    EXPECT_TRUE(writeInt("SP_Gap", 25));
    EXPECT_TRUE(writeBool("SP_Done", true)) << error();
    EXPECT_EQ(readInt("SP_Gap"), 25);
    ASSERT_TRUE(protocol->Stop());
    ASSERT_TRUE(protocol->Start());
    EXPECT_EQ(readInt("SP_Gap"), 25);
    EXPECT_TRUE(host.storage().calls().empty());
}

// A runtime that skipped Init, or called it after Exit, gets no protocol
// rather than one without locks and port.
TEST(InitFaults, NoProtocolWithoutServices) {
    {
        FakeHost host;
        ModuleSession session(host);  // Init and Exit: the table is empty again
    }
    EXPECT_EQ(rootObject().factory().CreateProtocol("XTOK"), nullptr);
}

}  // namespace
}  // namespace xtok::test::faults
