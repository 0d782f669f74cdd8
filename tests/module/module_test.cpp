#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

#include "module/interface_factory.h"
#include "module/prot_module.h"
#include "module/service_table.h"
#include "tests/support/fake_host.h"

namespace xtok {
namespace {

using test::FakeHost;
using Calls = std::vector<std::string>;

const Calls kAllGets = {"get IMultiTask2",      "get ISerialFactory", "get ISocketFactory",
                        "get ICDSBuffer",       "get IDiag",          "get IPermanentStorage",
                        "get IDriverInterface", "get ISmux",          "get IFastTimer"};

struct MissingRequired {
    const char* service;
    const char* text;
    Calls calls;
};

void PrintTo(const MissingRequired& c, std::ostream* os) {
    *os << c.service;
}

class InitFailure : public ::testing::TestWithParam<MissingRequired> {};

TEST_P(InitFailure, ReleasesWhatItTookAndSaysWhy) {
    const MissingRequired& c = GetParam();
    FakeHost host;
    host.refuse(c.service);
    ProtModule module;
    EXPECT_EQ(module.Init(&host), 0);
    EXPECT_STREQ(module.GetErrorText(), c.text);
    EXPECT_EQ(host.calls(), c.calls);
    EXPECT_EQ(host.outstanding(), 0);
    EXPECT_EQ(module.initCount(), 0u);
    module.Exit();  // without a successful Init: nothing happens
    EXPECT_EQ(host.calls(), c.calls);
}

INSTANTIATE_TEST_SUITE_P(
    EachRequiredService, InitFailure,
    ::testing::Values(
        MissingRequired{"IMultiTask2", "IMultiTask2 not created", {"get IMultiTask2"}},
        MissingRequired{"ISerialFactory",
                        "ISerialFactory not created",
                        {"get IMultiTask2", "get ISerialFactory", "release IMultiTask2"}},
        MissingRequired{"ISocketFactory",
                        "ISocketFactory not created",
                        {"get IMultiTask2", "get ISerialFactory", "get ISocketFactory",
                         "release IMultiTask2", "release ISerialFactory"}},
        MissingRequired{
            "ICDSBuffer",
            "piCDSBuffer not created",
            {"get IMultiTask2", "get ISerialFactory", "get ISocketFactory", "get ICDSBuffer",
             "release IMultiTask2", "release ISerialFactory", "release ISocketFactory"}}));

TEST(ModuleInit, AcquiresInOrderAndReleasesInTheDocumentedOrder) {
    FakeHost host;
    ProtModule module;
    ASSERT_EQ(module.Init(&host), 1);
    EXPECT_EQ(host.calls(), kAllGets);
    EXPECT_STREQ(module.GetErrorText(), "");
    EXPECT_NE(services().multiTask, nullptr);
    EXPECT_NE(services().fastTimer, nullptr);

    host.clearCalls();
    module.Exit();
    EXPECT_EQ(host.calls(),
              (Calls{"release IFastTimer", "release ISmux", "release IDriverInterface",
                     "release IDiag", "release IPermanentStorage", "release IMultiTask2",
                     "release ISerialFactory", "release ISocketFactory", "release ICDSBuffer"}));
    EXPECT_EQ(host.outstanding(), 0);
    EXPECT_EQ(services().multiTask, nullptr);
    EXPECT_EQ(services().permanentStorage, nullptr);
}

TEST(ModuleInit, OptionalServicesMayBeMissing) {
    FakeHost host;
    for (const char* name :
         {"IDiag", "IPermanentStorage", "IDriverInterface", "ISmux", "IFastTimer"}) {
        host.refuse(name);
    }
    ProtModule module;
    ASSERT_EQ(module.Init(&host), 1);
    EXPECT_EQ(services().diag, nullptr);
    EXPECT_EQ(services().permanentStorage, nullptr);
    EXPECT_EQ(services().fastTimer, nullptr);
    host.clearCalls();
    module.Exit();
    EXPECT_EQ(host.calls(), (Calls{"release IMultiTask2", "release ISerialFactory",
                                   "release ISocketFactory", "release ICDSBuffer"}));
}

TEST(ModuleInit, UseCountKeepsServicesUntilTheLastExit) {
    FakeHost host;
    FakeHost other;
    ProtModule module;
    ASSERT_EQ(module.Init(&host), 1);
    ASSERT_EQ(module.Init(&other), 1);  // counted; the second host is ignored
    EXPECT_TRUE(other.calls().empty());
    EXPECT_EQ(module.initCount(), 2u);

    host.clearCalls();
    module.Exit();
    EXPECT_TRUE(host.calls().empty());
    EXPECT_NE(services().multiTask, nullptr);
    module.Exit();
    EXPECT_EQ(host.outstanding(), 0);
    EXPECT_EQ(module.initCount(), 0u);
    module.Exit();
    EXPECT_EQ(module.initCount(), 0u);
}

TEST(ModuleInit, FailedInitCanBeRetried) {
    FakeHost host;
    host.refuse("ICDSBuffer");
    ProtModule module;
    ASSERT_EQ(module.Init(&host), 0);
    FakeHost good;
    ASSERT_EQ(module.Init(&good), 1);
    EXPECT_EQ(good.calls(), kAllGets);
    module.Exit();
    EXPECT_EQ(good.outstanding(), 0);
}

TEST(ModuleInit, NoProtocolWithoutHeldServices) {
    ProtocolFactory& factory = rootObject().factory();
    EXPECT_EQ(factory.CreateProtocol("XTOK"), nullptr);  // before any Init
    FakeHost refusing;
    refusing.refuse("ICDSBuffer");
    ProtModule module;
    ASSERT_EQ(module.Init(&refusing), 0);
    EXPECT_EQ(factory.CreateProtocol("XTOK"), nullptr);  // released services stay unused
    FakeHost host;
    ASSERT_EQ(module.Init(&host), 1);
    IProtocol7* protocol = factory.CreateProtocol("XTOK");
    EXPECT_NE(protocol, nullptr);
    factory.DestroyProtocol(protocol);
    module.Exit();
    EXPECT_EQ(factory.CreateProtocol("XTOK"), nullptr);  // after the last Exit
}

TEST(ModuleInit, NullHostIsRefused) {
    ProtModule module;
    EXPECT_EQ(module.Init(nullptr), 0);
    EXPECT_STREQ(module.GetErrorText(), "IMultiTask2 not created");
}

TEST(ModuleDestruction, ReleasesServicesOfTheOneOpenInit) {
    FakeHost host;
    {
        ProtModule module;
        ASSERT_EQ(module.Init(&host), 1);
    }
    EXPECT_EQ(host.outstanding(), 0);
}

TEST(RootObject, NamesAreExactAndCaseSensitive) {
    InterfaceFactory& root = rootObject();
    void* factory = root.GetInterface("IProtocolFactory");
    void* module = root.GetInterface("IProtModule");
    ASSERT_NE(factory, nullptr);
    ASSERT_NE(module, nullptr);
    EXPECT_NE(factory, module);
    EXPECT_EQ(root.GetInterface("ProtocolFactory"), factory);
    EXPECT_EQ(root.GetInterface("ProtModule"), module);
    for (const char* name : {"iprotmodule", "IProtModule ", "", "IProtocol7", "IProtocolFactor"}) {
        EXPECT_EQ(root.GetInterface(name), nullptr) << name;
    }
    EXPECT_EQ(root.GetInterface(nullptr), nullptr);
}

TEST(RootObject, SubObjectsAnswerTheirOwnNames) {
    ProtocolFactory& factory = rootObject().factory();
    ProtModule& module = rootObject().module();
    EXPECT_EQ(factory.GetInterface("ProtocolFactory"), &factory);
    EXPECT_EQ(factory.GetInterface("IProtocolFactory"), &factory);
    EXPECT_EQ(factory.GetInterface("IProtModule"), nullptr);
    EXPECT_EQ(module.GetInterface("ProtModule"), &module);
    EXPECT_EQ(module.GetInterface("IProtModule"), &module);
    EXPECT_EQ(module.GetInterface("ProtocolFactory"), nullptr);
    EXPECT_STREQ(factory.GetName(), "ProtFactoryInDLL");
    EXPECT_EQ(factory.GetVersion(), 100);
    EXPECT_STREQ(module.GetName(), "ProtModule");
    EXPECT_EQ(module.GetVersion(), 100);
}

TEST(RootObject, FactoryRefusesUnknownNamesAndIgnoresNullDestroy) {
    ProtocolFactory& factory = rootObject().factory();
    EXPECT_EQ(factory.CreateProtocol(""), nullptr);
    EXPECT_EQ(factory.CreateProtocol("xtok"), nullptr);
    EXPECT_EQ(factory.CreateProtocol(nullptr), nullptr);
    factory.DestroyProtocol(nullptr);
}

}  // namespace
}  // namespace xtok

#include "module/description_block.h"

namespace xtok {
namespace {

TEST(DescriptionBlockInMemory, SizeLineFollowsHeaderAndCountsTheStream) {
    const char* block = descriptionBlock();
    std::string header = block;
    EXPECT_EQ(header.rfind("<<ICOM_XML_START>>Name=XTOK?", 0), 0u);
    const char* sizeLine = descriptionSizeLine();
    EXPECT_EQ(sizeLine, block + header.size() + 1);
    std::string line = sizeLine;
    ASSERT_EQ(line.rfind("compressedXML=", 0), 0u);
    std::size_t streamSize = std::stoul(line.substr(14));
    const char* end = sizeLine + line.size() + 1 + streamSize;
    EXPECT_STREQ(end, "<<ICOM_XML_END>>");
    EXPECT_EQ(end + 17, block + descriptionBlockSize());
}

}  // namespace
}  // namespace xtok
