// What the token protocol takes from its configuration text.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace xtok {

class ParamParser;

/// A node section: its number (-1 for the common section) and model name.
struct XtokNode {
    int32_t number = -1;
    std::string model = "1";
};

/// The common parameters, with the defaults of the optional ones.
struct XtokCommonParams {
    std::string port;
    int32_t baudrate = 0;
    std::string parity;
    int32_t bits = 0;
    int32_t stopbits = 0;
    std::string mode;
    std::string rx_prefix;
    std::string rx_suffix;
    int32_t gap = 0;
    std::string tx_prefix;
    std::string tx_suffix;
    bool hex_tokens = false;
    int32_t token_queue_size = 100;
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

    XtokNode defaultNode_;
    std::vector<XtokNode> nodes_;
    XtokCommonParams common_;
    std::string errorText_;
};

}  // namespace xtok
