// The settings table against the description the project editor reads: a
// row without its description entry, or with another type there, is a
// setting the editor cannot offer or a panel reads wrongly.
#include <gtest/gtest.h>

#include <fstream>
#include <regex>
#include <sstream>

#include "protocol/settings.h"

namespace xtok {
namespace {

std::string description() {
    std::ifstream file(XTOK_DESCRIPTION_XML);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

// The value of `attribute` of the element `tag` whose text begins with `name`.
std::string attributeOf(const std::string& xml, const char* tag, const std::string& name,
                        const char* attribute) {
    std::smatch found;
    const std::regex element(std::string("<") + tag + "[^>]*\\b" + attribute +
                             "=\"([^\"]*)\"[^>]*>\\s*" + name + "\\b");
    return std::regex_search(xml, found, element) ? found[1].str() : "missing";
}

TEST(SettingsTable, EveryRowIsInTheDescriptionWithItsType) {
    const std::string xml = description();
    ASSERT_NE(xml.find("<protocol_cfg"), std::string::npos);
    // By SettingKind: Number, Byte, Flag, Hex.
    const char* const natural[] = {"unsignedInt", "unsignedByte", "boolean", "byte"};
    static_assert(sizeof natural / sizeof *natural == static_cast<int>(SettingKind::Hex) + 1);
    int rows = 0;
    for (const Setting& setting : kSettings) {
        EXPECT_EQ(attributeOf(xml, "memtype", setting.memoryType, "naturalType"),
                  natural[static_cast<int>(setting.kind)])
            << setting.memoryType;
        EXPECT_EQ(attributeOf(xml, "parameter", setting.configKey, "isMandatory"),
                  setting.mandatory ? "true" : "false")
            << setting.configKey;
        rows += kSettings[setting.id].memoryType == setting.memoryType;
    }
    EXPECT_EQ(rows, kSettingCount);
    // Every SP_ memory type but SP_Done is a row.
    std::smatch found;
    int described = 0;
    for (auto at = xml.cbegin();
         std::regex_search(at, xml.cend(), found, std::regex(">(SP_\\w+)</memtype>"));
         at = found[0].second) {
        described += found[1] != "SP_Done";
        EXPECT_TRUE(found[1] == "SP_Done" || findSettingByMemoryType(found[1])) << found[1];
    }
    EXPECT_EQ(described, kSettingCount);
}

}  // namespace
}  // namespace xtok
