#include "protocol/xtok_config.h"

#include "params/param_parser.h"
#include "xtokline/text.h"

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

bool XtokConfig::readSetting(ParamParser& parser, const Setting& setting) {
    const int common = PARAM_NODE_INDEPENDENT;
    const bool optional = !setting.mandatory;
    const SettingId id = setting.id;
    common_.number[id] = setting.defaultValue;
    if (setting.kind == SettingKind::Hex || setting.spelledAs != SpelledAs::Number) {
        return getParamString(parser, setting.configKey, -1, common_.text[id], common, optional,
                              errorText_);
    }
    if (setting.kind == SettingKind::Flag) {
        bool flag = setting.defaultValue != 0;
        bool ok = getParamBool(parser, setting.configKey, -1, flag, common, optional, errorText_);
        common_.number[id] = flag;
        return ok;
    }
    return getParamInt(parser, setting.configKey, -1, common_.number[id], common, optional,
                       errorText_);
}

bool XtokConfig::readCommon(ParamParser& parser) {
    const int common = PARAM_NODE_INDEPENDENT;
    if (!getParamString(parser, "port", -1, common_.port, common, false, errorText_)) {
        return false;
    }
    for (const Setting& setting : kSettings) {
        if (!readSetting(parser, setting)) {
            return false;
        }
    }
    // The range checks come before the hex checks, so they win when both fail.
    for (const Setting& setting : kSettings) {
        const int32_t value = common_.number[setting.id];
        if (setting.editorLow != setting.editorHigh &&
            (value < setting.editorLow || value > setting.editorHigh)) {
            errorText_ = std::string("parameter '") + setting.configKey + "' out of range";
            return false;
        }
    }
    common_.autoConnect = true;
    if (!getParamBool(parser, "autoConnect", -1, common_.autoConnect, common, true, errorText_)) {
        return false;
    }
    for (const Setting& setting : kSettings) {
        if (setting.kind == SettingKind::Hex && !isHexText(common_.text[setting.id])) {
            errorText_ = std::string(setting.configKey) + " not in hex format";
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
