#include "params/param_parser.h"

#include "xtokline/text.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <limits>
#include <string_view>
#include <unordered_set>

namespace xtok {

namespace {

const char kMarker[] = "CfgVer=1";
const char kSectionStart[] = "CfgVer=";
const char kNbsp[] = "&nbsp;";

// The C locale's white space; bytes above 0x7F are never white space, whatever
// the signedness of char.
bool isWhite(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\v' || c == '\f' || c == '\r';
}

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// Decimal digits only; a run too long for a node number saturates instead of
// wrapping, and an empty run is node 0.
int32_t parseNodeNumber(const std::string& text, std::size_t first, std::size_t end) {
    const int32_t max = std::numeric_limits<int32_t>::max();
    int32_t number = 0;
    for (std::size_t i = first; i < end; ++i) {
        int digit = text[i] - '0';
        if (number > (max - digit) / 10) {
            return max;
        }
        number = number * 10 + digit;
    }
    return number;
}

}  // namespace

ParamParser::ParamParser(const std::string& text) : text_(text) {
    std::size_t marker = text_.find(kMarker);
    if (marker == std::string::npos) {
        return;
    }
    formatKnown_ = true;
    std::size_t start = marker + sizeof(kMarker) - 1;
    std::size_t next = text_.find(kSectionStart, start);
    text_ = next == std::string::npos ? text_.substr(start) : text_.substr(start, next - start);
    scanNodes();
    indexEntries();
}

// Any "Node", digits and "::" in a row name a node, even inside a value: the
// scan does not split the text into entries, and real values never take that
// shape. The "::" found last is kept while it lies ahead, so that many a
// "Node" before one far "::" does not search for it again each time.
void ParamParser::scanNodes() {
    std::unordered_set<int32_t> known;
    std::size_t pos = text_.find("Node");
    std::size_t colon = 0;
    bool colonAhead = false;
    while (pos != std::string::npos) {
        if (!colonAhead || colon < pos) {
            colon = text_.find("::", pos);
            colonAhead = true;
        }
        if (colon == std::string::npos) {
            return;
        }
        std::size_t digits = pos + 4;
        std::size_t i = digits;
        while (i < colon && isDigit(text_[i])) {
            ++i;
        }
        std::size_t next = digits;  // not a prefix: look again right after this "Node"
        if (i == colon) {
            const int32_t node = parseNodeNumber(text_, digits, colon);
            if (known.insert(node).second) {
                nodes_.push_back(node);
            }
            next = colon;
        }
        pos = text_.find("Node", next);
    }
}

// An entry begins where the text or a run of non-blanks begins, and its name
// runs to the run's first "=".
void ParamParser::indexEntries() {
    for (std::size_t p = 0; p < text_.size(); ++p) {
        if (isWhite(text_[p]) || (p > 0 && !isWhite(text_[p - 1]))) {
            continue;
        }
        std::size_t end = p;
        while (end < text_.size() && !isWhite(text_[end]) && text_[end] != '=') {
            ++end;
        }
        if (end < text_.size() && text_[end] == '=') {
            entries_.push_back({p, end - p});
        }
        p = end;
    }
    auto name = [this](const Entry& e) {
        return std::string_view(text_).substr(e.start, e.length);
    };
    std::sort(entries_.begin(), entries_.end(), [&](const Entry& a, const Entry& b) {
        const int order = name(a).compare(name(b));
        return order != 0 ? order < 0 : a.start < b.start;
    });
}

// A name with a blank or "=" may still match across entries, as the scan
// finds it; every other name is one entry's whole name.
std::size_t ParamParser::valueStart(const std::string& name) const {
    if (std::any_of(name.begin(), name.end(), [](char c) { return c == '=' || isWhite(c); })) {
        return scannedValueStart(name);
    }
    const std::string_view text(text_);
    auto first = std::lower_bound(
        entries_.begin(), entries_.end(), name,
        [&](const Entry& e, const std::string& n) { return text.substr(e.start, e.length) < n; });
    if (first == entries_.end() || text.substr(first->start, first->length) != name) {
        return std::string::npos;
    }
    return first->start + first->length + 1;
}

int32_t ParamParser::nodeAt(int32_t index) const {
    if (index < 0 || index >= nodeCount()) {
        return 0;
    }
    return nodes_[static_cast<std::size_t>(index)];
}

// A name only counts where an entry can begin, so "xport=" or "Node3::port="
// never answer for "port".
std::size_t ParamParser::scannedValueStart(const std::string& name) const {
    const std::string key = name + "=";
    std::size_t p = text_.find(key);
    while (p != std::string::npos && p != 0 && !isWhite(text_[p - 1])) {
        p = text_.find(key, p + 1);
    }
    return p == std::string::npos ? p : p + key.size();
}

const std::string* ParamParser::findValue(const std::string& name) {
    const std::size_t start = valueStart(name);
    if (start == std::string::npos) {
        return nullptr;
    }
    std::size_t end = start;
    while (end < text_.size() && !isWhite(text_[end])) {
        ++end;
    }
    lastValue_ = text_.substr(start, end - start);
    return &lastValue_;
}

std::string ParamParser::nodePrefix(int32_t node) {
    return "Node" + std::to_string(node) + "::";
}

int ParamParser::lookup(const std::string& name, int32_t node, std::string& out, int flags) {
    if ((flags & PARAM_NODE_INDEPENDENT) && (flags & PARAM_NODE_DEPENDENT)) {
        return PARAM_INVALID_SPEC;
    }
    const std::string* v = nullptr;
    if (node == -1) {
        v = findValue(name);
        if (nodeCount() > 0 && (flags & PARAM_NODE_DEPENDENT)) {
            return v ? PARAM_CANT_BE_NODE_INDEPENDENT : PARAM_NOT_APPLICABLE;
        }
    } else {
        v = findValue(nodePrefix(node) + name);
        if (v && (flags & PARAM_NODE_INDEPENDENT)) {
            return PARAM_CANT_BE_PREFIXED;
        }
        if (!v) {
            v = findValue(name);  // a node without its own entry takes the common one
        }
    }
    if (!v) {
        return PARAM_NOT_FOUND;
    }
    out = *v;
    return PARAM_OK;
}

// Values end at white space, so a space inside a string is written "&nbsp;".
bool toString(const std::string& value, std::string& out) {
    std::string result = value;
    for (std::size_t p = result.find(kNbsp); p != std::string::npos;
         p = result.find(kNbsp, p + 1)) {
        result.replace(p, sizeof(kNbsp) - 1, " ");
    }
    out = result;
    return true;
}

// A number out of range saturates rather than wrapping into a plausible
// value; errno is left as the caller had it.
bool toInt(const std::string& value, int32_t& out) {
    parseClamped(value, 0, out);
    return true;
}

bool toBool(const std::string& value, bool& out) {
    if (value == "true") {
        out = true;
        return true;
    }
    if (value == "false") {
        out = false;
        return true;
    }
    return false;
}

// strtod rather than atof: the same result, but an overflow is defined (HUGE_VAL).
bool toFloat(const std::string& value, double& out) {
    int savedErrno = errno;
    out = std::strtod(value.c_str(), nullptr);
    errno = savedErrno;
    return true;
}

namespace {

template <typename T>
int readTyped(ParamParser& parser, const std::string& name, int32_t node, T& out, int flags,
              bool (*convert)(const std::string&, T&)) {
    std::string text;
    int code = parser.lookup(name, node, text, flags);
    if (code != PARAM_OK) {
        return code;
    }
    T value{};
    if (!convert(text, value)) {
        return PARAM_ILLEGAL_VALUE;
    }
    out = value;
    return PARAM_OK;
}

bool report(int code, const std::string& name, bool optional, std::string& errorText) {
    if (code == PARAM_OK || code == PARAM_NOT_APPLICABLE || (code == PARAM_NOT_FOUND && optional)) {
        return true;
    }
    errorText = paramErrorText(code, name);
    return false;
}

const char* reasonText(int code) {
    switch (code) {
        case PARAM_NOT_FOUND:
            return "is not found";
        case PARAM_ILLEGAL_VALUE:
            return "has illegal value";
        case PARAM_CANT_BE_PREFIXED:
            return "can't be prefixed";
        case PARAM_CANT_BE_NODE_INDEPENDENT:
            return "can't be node independent";
        case PARAM_INVALID_SPEC:
            return "has invalid internal specification";
        default:
            return "has unknown error";
    }
}

}  // namespace

int readString(ParamParser& parser, const std::string& name, int32_t node, std::string& out,
               int flags) {
    return readTyped(parser, name, node, out, flags, toString);
}

int readInt(ParamParser& parser, const std::string& name, int32_t node, int32_t& out, int flags) {
    return readTyped(parser, name, node, out, flags, toInt);
}

int readBool(ParamParser& parser, const std::string& name, int32_t node, bool& out, int flags) {
    return readTyped(parser, name, node, out, flags, toBool);
}

bool getParamString(ParamParser& parser, const std::string& name, int32_t node, std::string& out,
                    int flags, bool optional, std::string& errorText) {
    return report(readString(parser, name, node, out, flags), name, optional, errorText);
}

bool getParamInt(ParamParser& parser, const std::string& name, int32_t node, int32_t& out,
                 int flags, bool optional, std::string& errorText) {
    return report(readInt(parser, name, node, out, flags), name, optional, errorText);
}

bool getParamBool(ParamParser& parser, const std::string& name, int32_t node, bool& out, int flags,
                  bool optional, std::string& errorText) {
    return report(readBool(parser, name, node, out, flags), name, optional, errorText);
}

std::string paramErrorText(int code, const std::string& name) {
    return "Parser: parameter '" + name + "' " + reasonText(code);
}

}  // namespace xtok
