#include "host/service_provider.h"

#include <gtest/gtest.h>

#include "tests/host/notice_log.h"
#include "tests/host/temp_dir.h"

namespace xtok::host {
namespace {

class Provider : public ::testing::Test {
protected:
    std::unique_ptr<ServiceProvider> create(bool withStorage = true) {
        HostOptions options;
        options.storagePath = dir_.file("retained.sqlite3");
        options.permanentStorage = withStorage;
        options.notice = notices_.sink();
        std::string error;
        auto provider = ServiceProvider::create(options, error);
        EXPECT_NE(provider, nullptr) << error;
        return provider;
    }

    test::TempDir dir_;
    test::NoticeLog notices_;
};

TEST_F(Provider, HandsOutEachServiceAsItsOwnInterface) {
    auto provider = create();
    ASSERT_NE(provider, nullptr);
    for (const char* name :
         {"IMultiTask2", "ISerialFactory", "ISocketFactory", "ICDSBuffer", "IPermanentStorage"}) {
        auto* service = static_cast<IHostService*>(provider->GetService(name));
        ASSERT_NE(service, nullptr) << name;
        EXPECT_STREQ(service->GetName(), name);
        EXPECT_EQ(service->GetVersion(), kServiceVersion);
        EXPECT_EQ(service->GetInterface(name), static_cast<void*>(service));
        provider->ReleaseService(service);
    }
    // Calls through the pointer a plug-in casts to reach the service's own slots.
    auto* storage = static_cast<IPermanentStorage*>(provider->GetService("IPermanentStorage"));
    EXPECT_TRUE(storage->WriteInt("s", "k", 5));
    EXPECT_EQ(storage->ReadInt("s", "k"), 5);
    provider->ReleaseService(storage);
    EXPECT_EQ(provider->outstanding(), 0);
}

TEST_F(Provider, OptionalServicesAreAbsent) {
    auto provider = create(false);
    ASSERT_NE(provider, nullptr);
    for (const char* name : {"IDiag", "IDriverInterface", "ISmux", "IFastTimer",
                             "IPermanentStorage", "imultitask2", ""}) {
        EXPECT_EQ(provider->GetService(name), nullptr) << name;
    }
    EXPECT_EQ(provider->GetService(nullptr), nullptr);
    EXPECT_EQ(provider->permanentStorage(), nullptr);
    EXPECT_EQ(provider->outstanding(), 0);
}

TEST_F(Provider, CountsWhatIsHandedOutAndGivenBack) {
    auto provider = create();
    ASSERT_NE(provider, nullptr);
    void* tasks = provider->GetService("IMultiTask2");
    EXPECT_EQ(provider->GetService("IMultiTask2"), tasks);
    provider->GetService("ICDSBuffer");
    EXPECT_EQ(provider->outstanding(), 3);
    provider->ReleaseService(tasks);
    EXPECT_EQ(provider->outstanding(), 2);
    provider->ReleaseService(tasks);
    provider->ReleaseService(tasks);  // one too many
    int dummy = 0;
    provider->ReleaseService(&dummy);
    EXPECT_EQ(provider->outstanding(), 1);
    EXPECT_EQ(notices_.count("not given"), 2);
}

}  // namespace
}  // namespace xtok::host
