// What the console's tag addresses take, for "help datatypes" and
// "help memorytypes": read from the framework's data type table and the
// plug-in's description, so the lists are the ones the plug-in checks.
#pragma once

#include <string>
#include <vector>

#include "tools/plugin_description.h"

namespace xtok::tools {

/// The data type names in code order; "N" stands for a length, as in "string-N".
std::vector<std::string> dataTypeNames();

std::string dataTypesText();
std::string memoryTypesText(const PluginDescription& description);

/// The same as JSON arrays.
std::string dataTypesJson();
std::string memoryTypesJson(const PluginDescription& description);

}  // namespace xtok::tools
