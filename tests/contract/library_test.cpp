// The built libxtok.so through dlopen and raw slot numbers only.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/support/fake_host.h"
#include "tests/support/plugin_library.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

// Slot numbers of the contract, written out as a foreign runtime knows them.
enum RootSlot { kRootGetInterface = 0, kRootRelease = 1 };
enum FactorySlot {
    kGetInterface = 1,
    kGetName = 2,
    kGetVersion = 3,
    kCreate = 4,
    kDestroyProtocol = 5
};
enum ModuleSlot { kInit = 4, kExit = 5, kErrorText = 6 };

class Library : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_TRUE(lib.loaded()) << lib.error(); }
    PluginLibrary lib;
};

TEST_F(Library, ExportsOnlyTheEntry) {
    EXPECT_EQ(definedDynamicSymbols(XTOK_PLUGIN_PATH),
              std::vector<std::string>{"GetInterfaceFactory"});
}

TEST_F(Library, RootHandsOutFactoryAndModuleByName) {
    void* root = lib.root();
    ASSERT_NE(root, nullptr);
    EXPECT_EQ(lib.root(), root);  // static: the same object every time
    void* factory = callSlot<void*>(root, kRootGetInterface, "IProtocolFactory");
    void* module = callSlot<void*>(root, kRootGetInterface, "IProtModule");
    ASSERT_NE(factory, nullptr);
    ASSERT_NE(module, nullptr);
    EXPECT_EQ(callSlot<void*>(root, kRootGetInterface, "ProtocolFactory"), factory);
    EXPECT_EQ(callSlot<void*>(root, kRootGetInterface, "ProtModule"), module);
    EXPECT_EQ(callSlot<void*>(root, kRootGetInterface, "iprotmodule"), nullptr);
    EXPECT_EQ(callSlot<void*>(root, kRootGetInterface, "IProtocol7"), nullptr);
    callSlot<void>(root, kRootRelease);
    EXPECT_EQ(callSlot<void*>(root, kRootGetInterface, "IProtModule"), module);
}

TEST_F(Library, FactoryIdentity) {
    void* factory = lib.rootInterface("IProtocolFactory");
    ASSERT_NE(factory, nullptr);
    EXPECT_STREQ(callSlot<const char*>(factory, kGetName), "ProtFactoryInDLL");
    EXPECT_EQ(callSlot<int32_t>(factory, kGetVersion), 100);
    EXPECT_EQ(callSlot<void*>(factory, kGetInterface, "ProtocolFactory"), factory);
    EXPECT_EQ(callSlot<void*>(factory, kGetInterface, "IProtocolFactory"), factory);
    EXPECT_EQ(callSlot<void*>(factory, kGetInterface, "IProtModule"), nullptr);
    EXPECT_EQ(callSlot<void*>(factory, kCreate, ""), nullptr);
    EXPECT_EQ(callSlot<void*>(factory, kCreate, "NOPE"), nullptr);
    callSlot<void>(factory, kDestroyProtocol, static_cast<void*>(nullptr));
}

TEST_F(Library, ModuleInitAndExitThroughSlots) {
    void* module = lib.rootInterface("IProtModule");
    ASSERT_NE(module, nullptr);
    EXPECT_STREQ(callSlot<const char*>(module, kGetName), "ProtModule");
    EXPECT_EQ(callSlot<int32_t>(module, kGetVersion), 100);
    EXPECT_EQ(callSlot<void*>(module, kGetInterface, "ProtModule"), module);

    FakeHost refusing;
    refusing.refuse("ISocketFactory");
    EXPECT_EQ(callSlot<int32_t>(module, kInit, static_cast<IServiceProvider*>(&refusing)), 0);
    EXPECT_STREQ(callSlot<const char*>(module, kErrorText), "ISocketFactory not created");
    EXPECT_EQ(refusing.outstanding(), 0);

    FakeHost host;
    IServiceProvider* provider = &host;
    EXPECT_EQ(callSlot<int32_t>(module, kInit, provider), 1);
    EXPECT_EQ(callSlot<int32_t>(module, kInit, provider), 1);
    EXPECT_EQ(host.outstanding(), 9);
    callSlot<void>(module, kExit);
    EXPECT_EQ(host.outstanding(), 9);
    callSlot<void>(module, kExit);
    EXPECT_EQ(host.outstanding(), 0);
}

TEST(LibraryUnload, ReleasesTheServicesOfAnOpenInit) {
    FakeHost host;
    {
        PluginLibrary lib;
        ASSERT_TRUE(lib.loaded()) << lib.error();
        void* module = lib.rootInterface("IProtModule");
        ASSERT_EQ(callSlot<int32_t>(module, kInit, static_cast<IServiceProvider*>(&host)), 1);
    }
    // dlclose ran the library's static destructors (nothing else holds it).
    EXPECT_EQ(host.outstanding(), 0);
}

}  // namespace
}  // namespace xtok::test
