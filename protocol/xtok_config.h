// What the token protocol takes from its configuration text.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "protocol/settings.h"

namespace xtok {

class ParamParser;

/// A node section: its number (-1 for the common section) and model name.
struct XtokNode {
    int32_t number = -1;
    std::string model = "1";
};

/// The common parameters: the port, each setting's configured value (the
/// active value at Start unless a retained one overrides it) and autoConnect.
struct XtokCommonParams {
    std::string port;
    /// Numbers, flags (0 or 1) and, after Configure, parity and mode codes.
    int32_t number[kSettingCount] = {};
    /// Hex texts, and parity and mode as named in the text.
    std::string text[kSettingCount];
    bool autoConnect = true;
};

class XtokConfig {
public:
    /// Reads the text; false with the reason in GetLastError(). What was read
    /// before a failure stays.
    bool Parse(const std::string& configText);
    /// The first node section with that number, else the default node (whose
    /// model is the common "model" value). Never fails.
    const XtokNode& FindNode(int32_t number) const;
    XtokCommonParams& GetCommon() { return common_; }
    const XtokCommonParams& GetCommon() const { return common_; }
    const std::string& GetLastError() const { return errorText_; }
    const std::vector<XtokNode>& nodes() const { return nodes_; }

private:
    bool readCommon(ParamParser& parser);
    bool readSetting(ParamParser& parser, const Setting& setting);

    XtokNode defaultNode_;
    std::vector<XtokNode> nodes_;
    XtokCommonParams common_;
    std::string errorText_;
};

}  // namespace xtok
