#include <gtest/gtest.h>

#include "module/interface_factory.h"
#include "tests/support/fake_host.h"

namespace xtok {
namespace {

using test::FakeHost;
using test::kServiceNames;
using Calls = std::vector<std::string>;

// `calls`, then "VERB NAME" for the services numbered `from` to `to` - 1.
Calls named(Calls calls, const char* verb, int from, int to) {
    for (int i = from; i < to; ++i) {
        calls.push_back(std::string(verb) + " " + kServiceNames[i]);
    }
    return calls;
}

// The services taken before the missing one go back in the order taken; a
// failed Init holds nothing, and a later Init may succeed.
TEST(ModuleInit, EachMissingRequiredServiceFailsWithItsOwnText) {
    const char* const texts[] = {"IMultiTask2 not created", "ISerialFactory not created",
                                 "ISocketFactory not created", "piCDSBuffer not created"};
    for (int missing = 0; missing < 4; ++missing) {
        FakeHost host;
        FakeHost good;
        host.refuse(kServiceNames[missing]);
        ProtModule module;
        EXPECT_EQ(module.Init(&host), 0);
        EXPECT_STREQ(module.GetErrorText(), texts[missing]);
        EXPECT_EQ(host.calls(), named(named({}, "get", 0, missing + 1), "release", 0, missing));
        EXPECT_EQ(module.Init(&good), 1);  // given back by the module's destructor
    }
}

// A second Init only counts (its host is ignored) and protocols exist only
// while the services are held; the last Exit gives back the optional services
// held, newest first, then the required ones.
TEST(ModuleInit, LastExitReleasesInTheDocumentedOrder) {
    const Calls order = {"release IFastTimer", "release ISmux", "release IDriverInterface",
                         "release IDiag", "release IPermanentStorage"};
    ProtocolFactory& factory = rootObject().factory();
    for (bool optionalOffered : {true, false}) {
        FakeHost host;
        for (int i = 4; i < 9 && !optionalOffered; ++i) {
            host.refuse(kServiceNames[i]);
        }
        ProtModule module;
        ASSERT_EQ(module.Init(&host), 1);
        ASSERT_EQ(module.Init(nullptr), 1);
        module.Exit();
        IProtocol7* protocol = factory.CreateProtocol("XTOK");
        EXPECT_NE(protocol, nullptr);
        factory.DestroyProtocol(protocol);
        for (const char* name : {"", "xtok", "XTOK ", static_cast<const char*>(nullptr)}) {
            EXPECT_EQ(factory.CreateProtocol(name), nullptr);
        }
        factory.DestroyProtocol(nullptr);
        module.Exit();
        module.Exit();  // one too many changes nothing
        EXPECT_EQ(factory.CreateProtocol("XTOK"), nullptr);
        Calls expected = named({}, "get", 0, 9);
        expected.insert(expected.end(), order.begin(),
                        optionalOffered ? order.end() : order.begin());
        EXPECT_EQ(host.calls(), named(expected, "release", 0, 4));
        ASSERT_EQ(module.Init(&host), 1);
        EXPECT_EQ(host.outstanding(), optionalOffered ? 9 : 4);
    }
}

TEST(RootObject, AnswersExactCaseSensitiveNamesOnEveryLevel) {
    InterfaceFactory& root = rootObject();
    auto expect = [&](const char* name, void* fromRoot, void* fromFactory, void* fromModule) {
        EXPECT_EQ(root.GetInterface(name), fromRoot) << name;
        EXPECT_EQ(root.factory().GetInterface(name), fromFactory) << name;
        EXPECT_EQ(root.module().GetInterface(name), fromModule) << name;
    };
    expect("IProtocolFactory", &root.factory(), &root.factory(), nullptr);
    expect("ProtocolFactory", &root.factory(), &root.factory(), nullptr);
    expect("IProtModule", &root.module(), nullptr, &root.module());
    expect("ProtModule", &root.module(), nullptr, &root.module());
    for (const char* name :
         {"iprotmodule", "IProtModule ", "", static_cast<const char*>(nullptr)}) {
        expect(name, nullptr, nullptr, nullptr);
    }
    EXPECT_STREQ(root.factory().GetName(), "ProtFactoryInDLL");
    EXPECT_EQ(root.factory().GetVersion(), 100);
    EXPECT_STREQ(root.module().GetName(), "ProtModule");
    EXPECT_EQ(root.module().GetVersion(), 100);
}

}  // namespace
}  // namespace xtok
