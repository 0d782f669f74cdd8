// Loading the real plug-in, and files that are no plug-in at all or one
// that cannot be loaded here.
#include "host/plugin_loader.h"

#include <elf.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>

#include "host/service_provider.h"
#include "tests/host/temp_dir.h"

namespace xtok::host {
namespace {

class Loader : public ::testing::Test {
protected:
    void SetUp() override {
        HostOptions options;
        options.storagePath = dir_.file("retained.sqlite3");
        options.notice = [](const std::string&) {};
        provider_ = ServiceProvider::create(options, error_);
        ASSERT_NE(provider_, nullptr) << error_;
    }

    test::TempDir dir_;
    std::unique_ptr<ServiceProvider> provider_;
    std::string error_;
};

/// The real plug-in's first `size` bytes (all when 0), with `patches` of
/// single bytes at their offsets.
std::string pluginCopy(const test::TempDir& dir, const std::string& name, std::size_t size,
                       std::vector<std::pair<std::size_t, char>> patches = {}) {
    std::ifstream in(XTOK_PLUGIN_PATH, std::ios::binary);
    std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    bytes.resize(size ? size : bytes.size());
    for (const auto& [at, value] : patches) {
        bytes[at] = value;
    }
    std::ofstream(dir.file(name), std::ios::binary) << bytes;
    return dir.file(name);
}

// None of these may reach dlopen or the entry: a truncated file can fault
// inside the loader, and a data entry faults when called.
TEST_F(Loader, SaysWhyAFileIsNoPlugin) {
    std::ofstream(dir_.file("notes.so")) << "just text";
    ASSERT_EQ(mkfifo(dir_.file("fifo.so").c_str(), 0600), 0);
    const auto whole = std::filesystem::file_size(XTOK_PLUGIN_PATH);
    const std::size_t kMachine = 18;  // e_machine, low byte first
    const std::pair<std::string, std::string> cases[] = {
        {dir_.file("missing.so"), "not found"},
        {dir_.file("notes.so"), "is not a shared object"},
        {dir_.file(""), "is not a shared object"},
        {dir_.file("fifo.so"), "is not a shared object"},  // and never opened
        {XTOK_ZLIB_PATH, "has no GetInterfaceFactory"},
        {XTOK_DATA_ENTRY_PATH, "its GetInterfaceFactory is not a function"},
        {pluginCopy(dir_, "cut-10.so", 10), "its ELF header is cut off"},
        {pluginCopy(dir_, "cut-64.so", 64), "its program headers reach past its end"},
        {pluginCopy(dir_, "cut-2000.so", 2000), "its segments reach past its end"},
        {pluginCopy(dir_, "cut-last.so", whole - 1), "its section headers reach past its end"},
        {pluginCopy(dir_, "arm.so", 0, {{EI_CLASS, ELFCLASS32}, {kMachine, EM_ARM}}),
         "is built for ARM 32-bit, this machine is x86-64"},
        {pluginCopy(dir_, "arm64.so", 0, {{kMachine, static_cast<char>(EM_AARCH64)}}),
         "is built for ARM 64-bit, this machine is x86-64"},
    };
    for (const auto& [path, reason] : cases) {
        EXPECT_EQ(LoadedPlugin::load(path, *provider_, error_), nullptr) << path;
        EXPECT_NE(error_.find(reason), std::string::npos) << path << ": " << error_;
    }
    EXPECT_EQ(provider_->outstanding(), 0);
}

}  // namespace
}  // namespace xtok::host
