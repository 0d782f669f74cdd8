// The settings table against the description the project editor reads: a
// row without its description entry, or with another type there, is a
// setting the editor cannot offer or a panel reads wrongly.
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <regex>

#include "framework/data_types.h"
#include "protocol/settings.h"
#include "protocol/token_model.h"

namespace xtok {
namespace {

TEST(SettingsTable, EveryRowIsInTheDescriptionWithItsType) {
    std::ifstream file(XTOK_DESCRIPTION_XML);
    const std::string xml(std::istreambuf_iterator<char>(file), {});
    // The value of `attribute` of the element `tag` whose text begins with `name`.
    auto attributeOf = [&xml](const char* tag, const std::string& name, const char* attribute) {
        std::smatch found;
        const std::regex element(std::string("<") + tag + "[^>]*\\b" + attribute +
                                 "=\"([^\"]*)\"[^>]*>\\s*" + name + "\\b");
        return std::regex_search(xml, found, element) ? found[1].str() : "missing";
    };
    for (const MemoryType& type : buildTokenModel().memoryTypes) {
        EXPECT_EQ(attributeOf("memtype", type.name, "naturalType"),
                  DataTypeName(type.naturalType, ElementSize(type.naturalType)))
            << type.name;
    }
    for (const Setting& setting : kSettings) {
        EXPECT_EQ(attributeOf("parameter", setting.configKey, "isMandatory"),
                  setting.mandatory ? "true" : "false")
            << setting.configKey;
        EXPECT_EQ(kSettings[setting.id].memoryType, setting.memoryType);
    }
    // Every SP_ memory type but SP_Done is a row.
    const std::regex described(">(SP_\\w+)</memtype>");
    int rows = 0;
    for (std::sregex_iterator it(xml.begin(), xml.end(), described), end; it != end; ++it) {
        rows += (*it)[1] != "SP_Done";
        EXPECT_TRUE((*it)[1] == "SP_Done" || findSettingByMemoryType((*it)[1])) << (*it)[1];
    }
    EXPECT_EQ(rows, kSettingCount);
}

}  // namespace
}  // namespace xtok
