// Loading the real plug-in, and files that are no plug-in at all.
#include "host/plugin_loader.h"

#include <gtest/gtest.h>

#include <fstream>

#include "host/service_provider.h"
#include "tests/host/notice_log.h"
#include "tests/host/temp_dir.h"

namespace xtok::host {
namespace {

class Loader : public ::testing::Test {
protected:
    void SetUp() override {
        HostOptions options;
        options.storagePath = dir_.file("retained.sqlite3");
        options.notice = notices_.sink();
        provider_ = ServiceProvider::create(options, error_);
        ASSERT_NE(provider_, nullptr) << error_;
    }

    test::TempDir dir_;
    test::NoticeLog notices_;
    std::unique_ptr<ServiceProvider> provider_;
    std::string error_;
};

TEST_F(Loader, SaysWhyAFileIsNoPlugin) {
    std::ofstream(dir_.file("notes.so")) << "just text";
    const std::pair<std::string, std::string> cases[] = {
        {dir_.file("missing.so"), "not found"},
        {dir_.file("notes.so"), "is not a shared object"},
        {dir_.file(""), "is not a shared object"},
        {XTOK_ZLIB_PATH, "has no GetInterfaceFactory"},
    };
    for (const auto& [path, reason] : cases) {
        EXPECT_EQ(LoadedPlugin::load(path, *provider_, error_), nullptr) << path;
        EXPECT_NE(error_.find(reason), std::string::npos) << path << ": " << error_;
    }
    EXPECT_EQ(provider_->outstanding(), 0);
}

TEST_F(Loader, ConnectsTheRealPluginAndGivesEverythingBack) {
    auto plugin = LoadedPlugin::load(XTOK_PLUGIN_PATH, *provider_, error_);
    ASSERT_NE(plugin, nullptr) << error_;
    EXPECT_STREQ(plugin->module().GetName(), "ProtModule");
    EXPECT_STREQ(plugin->factory().GetName(), "ProtFactoryInDLL");
    EXPECT_EQ(provider_->outstanding(), 5);  // the required four and the storage
    EXPECT_EQ(plugin->createProtocol("NOPE", error_), nullptr);
    EXPECT_NE(error_.find("no protocol named 'NOPE'"), std::string::npos) << error_;
    plugin.reset();
    EXPECT_EQ(provider_->outstanding(), 0);
    EXPECT_TRUE(notices_.lines().empty());
}

}  // namespace
}  // namespace xtok::host
