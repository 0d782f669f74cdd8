#include "protocol/token_model.h"

#include "framework/data_types.h"

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
const Row kRows[] = {
    {"tx_token", kByte, 0x200, false, true, kMany, kMany, kMany},
    {"rx_token", kByte, 0x200, true, false, kMany, kMany, 0},
    {"rx_token_len", kUnsignedInt, 0x40, true, false, 1, kMany, 0},
    {"tokens_available", kUnsignedInt, 0x40, true, false, 1, 0, 0},
    {"token_ack", kBoolean, 0x1, false, true, 1, 0, 0},
    {"connect", kBoolean, 0x1, false, false, 1, 0, 0},
    {"SP_Baud", kUnsignedInt, 0x40, false, false, 1, 0, 0},
    {"SP_Bits", kUnsignedByte, 0x10, false, false, 1, 0, 0},
    {"SP_Stop", kUnsignedByte, 0x10, false, false, 1, 0, 0},
    {"SP_Par", kUnsignedByte, 0x10, false, false, 1, 0, 0},
    {"SP_Mode", kUnsignedByte, 0x10, false, false, 1, 0, 0},
    {"SP_RxPrefix", kByte, 0x200, false, false, 9999, 9999, 9999},
    {"SP_RxSuffix", kByte, 0x200, false, false, 9999, 9999, 9999},
    {"SP_Gap", kUnsignedInt, 0x40, false, false, 1, 0, 0},
    {"SP_TxPrefix", kByte, 0x200, false, false, 9999, 9999, 9999},
    {"SP_TxSuffix", kByte, 0x200, false, false, 9999, 9999, 9999},
    {"SP_HexTokens", kBoolean, 0x1, false, false, 1, 0, 0},
    {"SP_TokenQueueSize", kUnsignedInt, 0x40, false, false, 1, 0, 0},
    {"SP_Done", kBoolean, 0x1, false, false, 1, 0, 0},
};
static_assert(sizeof kRows / sizeof kRows[0] == 19, "the model has 19 memory types");

}  // namespace

Model buildTokenModel() {
    Model model;
    model.name = "1";
    for (const Row& row : kRows) {
        MemoryType type;  // every field not in the row keeps its default
        type.name = row.name;
        type.naturalType = row.naturalType;
        type.icomMask = row.icomMask;
        type.readOnly = row.readOnly;
        type.writeOnly = row.writeOnly;
        type.max = row.max;
        type.blockReadCount = row.blockRead;
        type.blockWriteCount = row.blockWrite;
        model.memoryTypes.push_back(type);
    }
    return model;
}

bool isSettingsTypeName(const std::string& name) {
    static const char* const names[] = {
        "SP_Baud",      "SP_Par",      "SP_Bits",          "SP_Stop",     "SP_Mode",
        "SP_RxPrefix",  "SP_RxSuffix", "SP_TxPrefix",      "SP_TxSuffix", "SP_Gap",
        "SP_HexTokens", "SP_Done",     "SP_TokenQueueSize"};
    for (const char* n : names) {
        if (name == n) {
            return true;
        }
    }
    return false;
}

}  // namespace xtok
