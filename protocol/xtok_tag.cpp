#include "protocol/xtok_tag.h"

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <new>
#include <vector>

#include "protocol/protocol_xtok.h"
#include "protocol/token_model.h"
#include "xtokline/text.h"

namespace xtok {

namespace {

// Decimal, "0x" hexadecimal or leading-zero octal; stops at the first
// character that does not fit; out of range clamps.
int32_t nodeNumber(const std::string& field) {
    int32_t number = 0;
    parseClamped(field, 0, number);
    return number;
}

const MemoryType* findMemoryType(const Model& model, const std::string& name) {
    for (const MemoryType& type : model.memoryTypes) {
        if (type.name == name) {
            return &type;
        }
    }
    return nullptr;
}

}  // namespace

XtokTag::XtokTag(Protocol_XTOK& protocol, const std::string& text) {
    uri = text;
    node = 0;
    address = 0;
    index = 0;
    valid = init(protocol);
}

ITag* XtokTag::Clone() {
    auto* copy = new (std::nothrow) XtokTag(*this);
    if (copy) {
        copy->nodeParams = &copy->nodeRecord_;
    }
    return copy;
}

bool XtokTag::init(Protocol_XTOK& protocol) {
    std::vector<std::string> fields;
    splitTrimmed(uri, '?', fields);
    if (fields.size() != 3) {
        SetError("there must be 3 tag specification fields");
        return false;
    }
    if (fields[1].empty()) {
        SetError("memorytype field missing");
        return false;
    }
    if (fields[2].empty()) {
        SetError("icomType field missing");
        return false;
    }
    commonParams_ = &protocol.config().GetCommon();
    node = fields[0].empty() ? 0 : nodeNumber(fields[0]);
    nodeRecord_ = protocol.config().FindNode(node);
    nodeParams = &nodeRecord_;
    for (const Model& m : protocol.models()) {
        if (m.name == nodeRecord_.model) {
            model_ = &m;
            break;
        }
    }
    if (!model_) {
        SetError("Can't access model");
        return false;
    }
    memoryType = findMemoryType(*model_, fields[1]);
    if (!memoryType) {
        SetError("Can't access memory type");
        return false;
    }
    if (!ParseDataType(fields[2], dataType)) {
        SetError(fields[2] + ": data type unknown");
        return false;
    }
    if ((DataTypeBit(dataType.code) & memoryType->icomMask) == 0) {
        SetError("not allowed icom type");
        return false;
    }
    if (ElementSize(memoryType->naturalType) == 0) {
        SetError("invalid natural data type for this memory type");
        return false;
    }
    isSettingsTag_ = isSettingsTypeName(memoryType->name);
    return true;
}

}  // namespace xtok
