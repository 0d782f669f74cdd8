// The token protocol's one model and its memory types.
#pragma once

#include <string>

#include "framework/memory_type.h"

namespace xtok {

/// Model "1" with its 19 memory types in order.
Model buildTokenModel();

/// The SP_ memory types: line and framing settings changed at run time.
bool isSettingsTypeName(const std::string& name);

}  // namespace xtok
