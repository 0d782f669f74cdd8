#include "host/com_map.h"

#include <gtest/gtest.h>

namespace xtok::host {
namespace {

TEST(ComMap, ResolvesPortNames) {
    ComMap ports;
    std::string error;
    ASSERT_TRUE(ports.assign("com3=/dev/ttyUSB0", error)) << error;
    const std::pair<const char*, const char*> cases[] = {
        {"com1", "/dev/ttyS0"},       {"COM16", "/dev/ttyS15"},
        {"Com10", "/dev/ttyS9"},      {"com3", "/dev/ttyUSB0"},
        {"/dev/pts/7", "/dev/pts/7"}, {"./tty", "./tty"},
        {"com17", nullptr},           {"com0", nullptr},
        {"com01", nullptr},           {"com", nullptr},
        {"com1x", nullptr},           {"abc1", nullptr},
        {"ttyS0", nullptr},           {"", nullptr}};
    for (const auto& [name, expected] : cases) {
        std::string device;
        error.clear();
        EXPECT_EQ(ports.resolve(name, device, error), expected != nullptr) << name;
        EXPECT_EQ(expected ? device : error.substr(0, 17),
                  expected ? expected : "unknown port name")
            << name;
    }
}

}  // namespace
}  // namespace xtok::host
