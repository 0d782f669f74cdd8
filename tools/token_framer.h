// The plug-in's receive framing followed from outside: the same rules applied
// to the same bytes and silences the plug-in reads, so that xtok-host can say
// where each token ended and why. The plug-in's interface has no room for
// that; a test keeps the two in agreement on the plug-in's framing table.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace xtok::tools {

/// The receive framing in force, as the plug-in holds it: prefix and suffix
/// as hex texts ("none" for none), the gap in milliseconds (0 or less: 500).
struct RxFraming {
    std::string prefix = "none";
    std::string suffix = "none";
    int32_t gap = 0;
};

enum class TokenEnd { Suffix, NextPrefix, Gap };
/// "suffix", "next prefix", "gap".
const char* tokenEndName(TokenEnd end);

struct FramedToken {
    std::string bytes;
    TokenEnd end = TokenEnd::Gap;
};

class TokenFramer {
public:
    /// `rules` is asked at the start of each pass, when the plug-in takes
    /// its framing too: at the end of the pass before, or after a restart
    /// at the first byte or silence.
    explicit TokenFramer(std::function<RxFraming()> rules) : rules_(std::move(rules)) {}

    /// A byte the plug-in read; true when it ended a token, given in `token`.
    bool byte(uint8_t value, FramedToken& token);
    /// A read that found nothing for `ms`; true when the silence ended a token.
    bool silence(int32_t ms, FramedToken& token);
    /// The plug-in's pass ends without a token (its port closed); the next
    /// byte or silence begins a new one.
    void restart();

private:
    void beginPass();
    void hunt(char c);
    bool collect(char c, FramedToken& token);
    bool endsWith(const std::string& tail) const;

    std::function<RxFraming()> rules_;
    bool inPass_ = false;
    std::string prefix_, suffix_;
    int64_t gapMs_ = 0;
    int64_t silentMs_ = 0;
    std::string frame_;  // the prefix included
};

}  // namespace xtok::tools
