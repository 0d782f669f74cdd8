#include "tools/help_topics.h"

#include <sstream>

#include "framework/data_types.h"
#include "tools/describe.h"
#include "tools/json_line.h"

namespace xtok::tools {

std::vector<std::string> dataTypeNames() {
    std::vector<std::string> names;
    for (int32_t code = 1; DataTypeName(code, 0) != "??"; ++code) {
        std::string name = DataTypeName(code, 0);
        // A type of no fixed size is named with its length, here 0.
        if (ElementSize(code) == 0 && name.back() == '0') {
            name.pop_back();
            name += name.back() == '-' ? "N" : "";
        }
        names.push_back(name);
    }
    return names;
}

std::string dataTypesText() {
    std::string text =
        "Data types, the last field of a tag address (N: a length), e.g. 0?rx_token?string-64:\n";
    std::string line;
    for (const std::string& name : dataTypeNames()) {
        if (line.size() + name.size() > 76) {
            text += line + "\n";
            line.clear();
        }
        line += "  " + name;
    }
    return text + line + "\n";
}

std::string memoryTypesText(const PluginDescription& description) {
    std::ostringstream text;
    text << "A tag address reads node?memorytype?datatype.";
    printMemoryTypes(description.memoryTypes, text);
    return text.str();
}

std::string dataTypesJson() {
    std::string json;
    for (const std::string& name : dataTypeNames()) {
        json += (json.empty() ? "" : ",") + jsonString(name);
    }
    return "[" + json + "]";
}

std::string memoryTypesJson(const PluginDescription& description) {
    std::string json;
    for (const MemoryTypeInfo& m : description.memoryTypes) {
        json += (json.empty() ? "" : ",") + JsonLine()
                                                .text("name", m.name)
                                                .text("type", m.naturalType)
                                                .text("access", m.access)
                                                .text("display", m.display)
                                                .str();
    }
    return "[" + json + "]";
}

}  // namespace xtok::tools
