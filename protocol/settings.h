// The run-time settings: one row per setting, read by everything that knows
// settings (the configuration reader, the SP_ memory types, SP_Done, the
// retained load at Start, the console's setters, the memory type model and
// xtok-host's settings view). Adding a setting is one row here plus its
// entry in the description.
#pragma once

#include <climits>
#include <cstdint>
#include <string>

namespace xtok {

/// Row numbers of the table, in the order Configure reads the keys (which
/// decides the error reported first), Start loads the retained values and
/// SP_Done applies the staged ones. SP_Done's order matters only within
/// the line settings: bits are applied before the stop bits they fall back
/// to.
enum SettingId : int {
    kBaud,
    kParity,
    kBits,
    kStop,
    kMode,
    kRxPrefix,
    kRxSuffix,
    kGap,
    kTxPrefix,
    kTxSuffix,
    kHexTokens,
    kTokenQueueSize,
    kSettingCount
};

/// How the SP_ memory type and the stores hold the value.
enum class SettingKind : uint8_t {
    Number,  ///< signed 32-bit
    Byte,    ///< one byte, a code or a count
    Flag,    ///< boolean
    Hex,     ///< hex text (framing bytes)
};

enum class SpelledAs : uint8_t { Number, ParityName, ModeName };

/// When a new active value takes effect.
enum class Activation : uint8_t {
    PortReconfigure,  ///< the five line settings, together, through one reconfigure
    NextToken,        ///< framing and gap of the receive task, from its next pass
    NextTransmit,     ///< transmit framing
    NextPush,         ///< hex mode and queue limit, at the next received token
};

struct Setting {
    SettingId id;
    const char* memoryType;  ///< its SP_ memory type
    const char* key;         ///< its key in the staged and the retained store
    const char* configKey;   ///< its key in the configuration text
    SettingKind kind;
    bool mandatory;  ///< in the configuration text
    /// How the configuration spells a number or byte: as a number, or as a
    /// parity or mode name that Configure turns into its code.
    SpelledAs spelledAs;
    int32_t defaultValue;  ///< when an optional number or flag is absent
    /// Accepted by an SP_ write of a Number or Byte: within [low, high], and
    /// one of the baud rates when `baudRates` is set.
    int32_t low, high;
    bool baudRates;
    /// The range the configuration and the project editor accept for a
    /// number; none when equal.
    int32_t editorLow, editorHigh;
    /// The error text of a refused SP_ write. Refused codes set none, on
    /// purpose: panels show the previous error for them.
    const char* refusal;
    /// The error text of an SP_ read whose text does not fit the tag.
    const char* tooLongToRead;
    /// The console command that sets the active value at once, or null.
    const char* consoleSetter;
    /// The active value SP_Done falls back to when nothing is staged or
    /// retained: the setting's own, except for bits, which fall back to the
    /// active stop bits. Retained configurations rely on that irregularity.
    SettingId applyFallback;
    Activation activation;
};

namespace setting_rows {

using K = SettingKind;
using N = SpelledAs;
using A = Activation;
constexpr int32_t kAny = INT32_MIN, kAll = INT32_MAX;

// A line setting: mandatory in the configuration, active through one
// reconfigure of the open port.
constexpr Setting line(SettingId id, const char* type, const char* key, const char* configKey,
                       K kind, N spelledAs, int32_t low, int32_t high, bool baudRates,
                       const char* refusal, SettingId fallback) {
    return {id,        type,    key,     configKey, kind,      true,
            spelledAs, 0,       low,     high,      baudRates, 0,
            0,         refusal, nullptr, nullptr,   fallback,  A::PortReconfigure};
}

// A framing text: optional hex text, empty by default.
constexpr Setting framing(SettingId id, const char* type, const char* key, const char* refusal,
                          const char* tooLong, const char* setter, A activation) {
    return {id, type,  key, key, K::Hex,  false,   N::Number, 0,  0,
            0,  false, 0,   0,   refusal, tooLong, setter,    id, activation};
}

// An optional number or flag that any SP_ write may set.
constexpr Setting value(SettingId id, const char* type, const char* key, K kind,
                        int32_t defaultValue, int32_t editorLow, int32_t editorHigh,
                        const char* setter, A activation) {
    return {id,         type,         key,     key,    kind,  false,
            N::Number,  defaultValue, kAny,    kAll,   false, editorLow,
            editorHigh, nullptr,      nullptr, setter, id,    activation};
}

// Rows in SettingId order. The SP_ write messages are uneven on purpose
// (capitals, "intValue", none at all for the codes): panels match them as
// they are.
inline constexpr Setting kSettings[] = {
    line(kBaud, "SP_Baud", "baud", "baudrate", K::Number, N::Number, kAny, kAll, true,
         "illegal baudrate intValue", kBaud),
    line(kParity, "SP_Par", "parity", "parity", K::Byte, N::ParityName, 0, 4, false, nullptr,
         kParity),
    line(kBits, "SP_Bits", "bits", "bits", K::Byte, N::Number, 7, 8, false, nullptr, kStop),
    line(kStop, "SP_Stop", "stop", "stopbits", K::Byte, N::Number, 1, 2, false, nullptr, kStop),
    line(kMode, "SP_Mode", "mode", "mode", K::Byte, N::ModeName, 0, 2, false, nullptr, kMode),
    framing(kRxPrefix, "SP_RxPrefix", "rx_prefix", "Rx prefix value is not hex format",
            "rx prefix too long to read", "set_rxPrefix", A::NextToken),
    framing(kRxSuffix, "SP_RxSuffix", "rx_suffix", "Rx suffix value is not hex format",
            "rx suffix too long to read", "set_rxSuffix", A::NextToken),
    value(kGap, "SP_Gap", "gap", K::Number, 0, 0, 0, "set_rxGap", A::NextToken),
    framing(kTxPrefix, "SP_TxPrefix", "tx_prefix", "Tx prefix value is not hex format",
            "tx prefix too long to read", "set_txPrefix", A::NextTransmit),
    framing(kTxSuffix, "SP_TxSuffix", "tx_suffix", "Tx suffix value is not hex format",
            "tx suffix too long to read", "set_txSuffix", A::NextTransmit),
    value(kHexTokens, "SP_HexTokens", "hex_tokens", K::Flag, 0, 0, 0, "set_hexToken", A::NextPush),
    value(kTokenQueueSize, "SP_TokenQueueSize", "token_queue_size", K::Number, 100, 1, 10000,
          nullptr, A::NextPush),
};

}  // namespace setting_rows

using setting_rows::kSettings;

static_assert(sizeof kSettings / sizeof kSettings[0] == kSettingCount, "one row per setting");

constexpr bool rowsInIdOrder() {
    for (int i = 0; i < kSettingCount; ++i) {
        if (kSettings[i].id != i) {
            return false;
        }
    }
    return true;
}
static_assert(rowsInIdOrder(), "row i describes setting i");

/// The row of an SP_ memory type, or null (SP_Done has none).
const Setting* findSettingByMemoryType(const std::string& memoryType);
/// Whether an SP_ write of `value` is accepted for a Number or Byte row.
bool acceptsNumber(const Setting& setting, int32_t value);

}  // namespace xtok
