// The line of a configuration is checked as the host checks one, before the
// plug-in starts: also where a description offers more than the host can set.
#include "tools/config_check.h"

#include <gtest/gtest.h>

namespace xtok::tools {
namespace {

TEST(ConfigCheck, ALineTheHostCannotSetIsRefused) {
    PluginDescription description;
    std::string error;
    ASSERT_TRUE(readDescription(XTOK_PLUGIN_PATH, description, error)) << error;
    for (ParameterInfo& parameter : description.parameters) {
        if (parameter.key == "bits") {
            parameter.choices.push_back("9");
        }
    }
    const ConfigText config(
        "CfgVer=1 model=1 port=/dev/null baudrate=9600 parity=none bits=9 "
        "stopbits=1 mode=RS-232");
    EXPECT_EQ(checkConfiguration(config, description, {}),
              std::vector<std::string>{"the host cannot set this line: 9 data bits are not valid"});
}

}  // namespace
}  // namespace xtok::tools
