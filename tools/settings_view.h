// The console's "settings": for each setting its active value and where that
// came from, its staged value and its retained one.
#pragma once

#include <string>

#include "tools/settings_model.h"

namespace xtok::tools {

/// A table for a person, under the active line as the plug-in reports it.
std::string settingsText(const SettingsModel& model, const std::string& activeLine);

/// One JSON object keyed by memory type: {"SP_Baud":{"key":"baudrate",
/// "active":9600,"source":"configuration","staged":null,"retained":null},...}.
std::string settingsJson(const SettingsModel& model);

}  // namespace xtok::tools
