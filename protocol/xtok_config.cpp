#include "protocol/xtok_config.h"

#include "params/param_parser.h"
#include "protocol/hex_text.h"

namespace xtok {

bool XtokConfig::Parse(const std::string& configText) {
    // A second Configure starts from scratch rather than adding nodes.
    nodes_.clear();
    common_ = XtokCommonParams();
    defaultNode_ = XtokNode();

    ParamParser parser(configText);
    if (!parser.formatKnown()) {
        errorText_ = "Parser: unknown format";
        return false;
    }
    defaultNode_.number = -1;
    if (!getParamString(parser, "model", -1, defaultNode_.model, 0, false, errorText_)) {
        return false;
    }
    for (int32_t i = 0; i < parser.nodeCount(); ++i) {
        XtokNode node = defaultNode_;
        node.number = parser.nodeAt(i);
        if (!getParamString(parser, "model", node.number, node.model, 0, false, errorText_)) {
            return false;
        }
        nodes_.push_back(node);
    }
    return readCommon(parser);
}

bool XtokConfig::readCommon(ParamParser& parser) {
    const int common = PARAM_NODE_INDEPENDENT;
    std::string& e = errorText_;
    XtokCommonParams& c = common_;
    bool ok = getParamString(parser, "port", -1, c.port, common, false, e) &&
              getParamInt(parser, "baudrate", -1, c.baudrate, common, false, e) &&
              getParamString(parser, "parity", -1, c.parity, common, false, e) &&
              getParamInt(parser, "bits", -1, c.bits, common, false, e) &&
              getParamInt(parser, "stopbits", -1, c.stopbits, common, false, e) &&
              getParamString(parser, "mode", -1, c.mode, common, false, e) &&
              getParamString(parser, "rx_prefix", -1, c.rx_prefix, common, true, e) &&
              getParamString(parser, "rx_suffix", -1, c.rx_suffix, common, true, e) &&
              getParamInt(parser, "gap", -1, c.gap, common, true, e) &&
              getParamString(parser, "tx_prefix", -1, c.tx_prefix, common, true, e) &&
              getParamString(parser, "tx_suffix", -1, c.tx_suffix, common, true, e) &&
              getParamBool(parser, "hex_tokens", -1, c.hex_tokens, common, true, e) &&
              getParamInt(parser, "token_queue_size", -1, c.token_queue_size, common, true, e);
    if (!ok) {
        return false;
    }
    // The range check comes before the hex checks, so it wins when both fail.
    if (c.token_queue_size < 1 || c.token_queue_size > 10000) {
        e = "parameter 'token_queue_size' out of range";
        return false;
    }
    c.autoConnect = true;
    if (!getParamBool(parser, "autoConnect", -1, c.autoConnect, common, true, e)) {
        return false;
    }
    const std::pair<const std::string*, const char*> framing[] = {
        {&c.rx_prefix, "rx_prefix not in hex format"},
        {&c.rx_suffix, "rx_suffix not in hex format"},
        {&c.tx_prefix, "tx_prefix not in hex format"},
        {&c.tx_suffix, "tx_suffix not in hex format"}};
    for (const auto& [text, message] : framing) {
        if (!isHexText(*text)) {
            e = message;
            return false;
        }
    }
    return true;
}

const XtokNode& XtokConfig::FindNode(int32_t number) const {
    for (const XtokNode& node : nodes_) {
        if (node.number == number) {
            return node;
        }
    }
    return defaultNode_;
}

}  // namespace xtok
