#include "protocol/token_model.h"

#include "framework/data_types.h"
#include "protocol/settings.h"

namespace xtok {

namespace {

struct Row {
    const char* name;
    int32_t naturalType;
    uint32_t icomMask;
    bool readOnly, writeOnly;
    int32_t max, blockRead, blockWrite;
};

constexpr int32_t kMany = 999999999;

// rx_token_len's max is 1 although it reads in blocks: it holds one length.
const Row kTokenRows[] = {
    {"tx_token", kByte, 0x200, false, true, kMany, kMany, kMany},
    {"rx_token", kByte, 0x200, true, false, kMany, kMany, 0},
    {"rx_token_len", kUnsignedInt, 0x40, true, false, 1, kMany, 0},
    {"tokens_available", kUnsignedInt, 0x40, true, false, 1, 0, 0},
    {"token_ack", kBoolean, 0x1, false, true, 1, 0, 0},
    {"connect", kBoolean, 0x1, false, false, 1, 0, 0},
};
const Row kDoneRow = {"SP_Done", kBoolean, 0x1, false, false, 1, 0, 0};

// An SP_ memory type holds its setting in the natural type of its kind.
Row settingRow(const Setting& setting) {
    switch (setting.kind) {
        case SettingKind::Number:
            return {setting.memoryType, kUnsignedInt, 0x40, false, false, 1, 0, 0};
        case SettingKind::Byte:
            return {setting.memoryType, kUnsignedByte, 0x10, false, false, 1, 0, 0};
        case SettingKind::Flag:
            return {setting.memoryType, kBoolean, 0x1, false, false, 1, 0, 0};
        default:
            return {setting.memoryType, kByte, 0x200, false, false, 9999, 9999, 9999};
    }
}

MemoryType memoryType(const Row& row) {
    MemoryType type;  // every field not in the row keeps its default
    type.name = row.name;
    type.naturalType = row.naturalType;
    type.icomMask = row.icomMask;
    type.readOnly = row.readOnly;
    type.writeOnly = row.writeOnly;
    type.max = row.max;
    type.blockReadCount = row.blockRead;
    type.blockWriteCount = row.blockWrite;
    return type;
}

}  // namespace

// The token types, one per setting, then SP_Done: 19 in all.
Model buildTokenModel() {
    Model model;
    model.name = "1";
    for (const Row& row : kTokenRows) {
        model.memoryTypes.push_back(memoryType(row));
    }
    for (const Setting& setting : kSettings) {
        model.memoryTypes.push_back(memoryType(settingRow(setting)));
    }
    model.memoryTypes.push_back(memoryType(kDoneRow));
    return model;
}

bool isSettingsTypeName(const std::string& name) {
    return name == kDoneRow.name || findSettingByMemoryType(name) != nullptr;
}

}  // namespace xtok
