// A configuration text checked before the plug-in sees it, against the
// plug-in's description (keys, mandatory keys, choices, bounds) and the
// settings table (hex framing, ranges), with the line it sets checked as
// the host would apply it. Every fault is reported, not only the first; the
// plug-in's own Configure still has the last word.
#pragma once

#include <string>
#include <vector>

#include "host/com_map.h"
#include "tools/config_text.h"
#include "tools/plugin_description.h"

namespace xtok::tools {

/// One line per fault; none when the text is fit to configure with.
std::vector<std::string> checkConfiguration(const ConfigText& config,
                                            const PluginDescription& description,
                                            const host::ComMap& ports);

}  // namespace xtok::tools
