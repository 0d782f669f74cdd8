#include "tools/token_framer.h"

#include "xtokline/text.h"

namespace xtok::tools {

namespace {

// A frame (prefix and suffix included) past this many bytes is dropped.
constexpr std::size_t kMaxFrame = 1000;
// A gap of 0 or less stands for this many milliseconds of silence.
constexpr int32_t kDefaultGap = 500;

}  // namespace

const char* tokenEndName(TokenEnd end) {
    switch (end) {
        case TokenEnd::Suffix:
            return "suffix";
        case TokenEnd::NextPrefix:
            return "next prefix";
        case TokenEnd::Gap:
            break;
    }
    return "gap";
}

void TokenFramer::restart() {
    inPass_ = false;
    frame_.clear();
    silentMs_ = 0;
}

// Taken at once when a pass ends, as the plug-in takes its framing right
// after: a setting changed a moment later applies from the pass after.
void TokenFramer::beginPass() {
    const RxFraming rules = rules_();
    prefix_ = hexTextToBytes(rules.prefix);
    suffix_ = hexTextToBytes(rules.suffix);
    gapMs_ = rules.gap <= 0 ? kDefaultGap : rules.gap;
    inPass_ = true;
    frame_.clear();
    silentMs_ = 0;
}

bool TokenFramer::byte(uint8_t value, FramedToken& token) {
    if (!inPass_) {
        beginPass();
    }
    silentMs_ = 0;
    const char c = static_cast<char>(value);
    if (frame_.size() < prefix_.size()) {
        hunt(c);
        return false;
    }
    const bool ended = collect(c, token);
    if (frame_.size() > kMaxFrame) {
        beginPass();
    }
    return ended;
}

// A prefix byte compares as a signed value with the byte as an unsigned one,
// and a mismatch starts over at the first prefix byte alone, as the plug-in
// hunts.
void TokenFramer::hunt(char c) {
    const auto byte = static_cast<int>(static_cast<uint8_t>(c));
    if (static_cast<int>(static_cast<int8_t>(prefix_[frame_.size()])) == byte) {
        frame_ += c;
        return;
    }
    frame_.clear();
    if (static_cast<uint8_t>(prefix_[0]) == byte) {
        frame_ += c;
    }
}

bool TokenFramer::collect(char c, FramedToken& token) {
    frame_ += c;
    const std::size_t p = prefix_.size(), length = frame_.size();
    if (length < p + suffix_.size()) {
        return false;
    }
    if (!suffix_.empty() && endsWith(suffix_)) {
        token = {frame_.substr(p, length - p - suffix_.size()), TokenEnd::Suffix};
        beginPass();
        return true;
    }
    if (suffix_.empty() && p > 0 && endsWith(prefix_)) {
        // With a self-overlapping prefix the plug-in's length wraps and the
        // token is everything after the first prefix.
        const std::size_t between = length >= 2 * p ? length - 2 * p : length - p;
        token = {frame_.substr(p, between), TokenEnd::NextPrefix};
        frame_ = prefix_;
        return true;
    }
    return false;
}

bool TokenFramer::endsWith(const std::string& tail) const {
    return frame_.compare(frame_.size() - tail.size(), tail.size(), tail) == 0;
}

bool TokenFramer::silence(int32_t ms, FramedToken& token) {
    if (!inPass_) {
        beginPass();
    }
    // A gap above half a second is waited out in several shorter reads.
    silentMs_ += ms > 0 ? ms : 0;
    if (silentMs_ < gapMs_) {
        return false;
    }
    const std::size_t p = prefix_.size();
    const bool ended = frame_.size() > p && suffix_.empty();
    if (ended) {
        token = {frame_.substr(p), TokenEnd::Gap};
    }
    beginPass();
    return ended;
}

}  // namespace xtok::tools
