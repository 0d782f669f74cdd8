// A tag of the token protocol: "node?memorytype?datatype".
#pragma once

#include <cstdint>
#include <string>

#include "framework/tag_base.h"
#include "protocol/xtok_config.h"

namespace xtok {

class Protocol_XTOK;

class XtokTag final : public TagBase {
public:
    /// Parses and checks `uri` against the protocol's configuration and
    /// models; `valid` tells the result and the error text the reason.
    XtokTag(Protocol_XTOK& protocol, const std::string& uri);
    ITag* Clone() override;

    const XtokNode& nodeRecord() const { return nodeRecord_; }
    const XtokCommonParams* commonParams() const { return commonParams_; }
    const Model* model() const { return model_; }
    bool isSettingsTag() const { return isSettingsTag_; }
    /// Index of the datum within its memory type (0: a token or setting is
    /// one datum).
    int32_t start() const { return address; }

private:
    bool init(Protocol_XTOK& protocol);

    XtokNode nodeRecord_;  ///< a copy: a later Configure may rebuild the node list
    const XtokCommonParams* commonParams_ = nullptr;
    const Model* model_ = nullptr;
    bool isSettingsTag_ = false;
};

/// The text of a value written to a tag: up to its first zero byte, and
/// never past the `available` bytes the tag holds, which need not contain one.
std::string takeText(const uint8_t* value, int32_t available);

}  // namespace xtok
