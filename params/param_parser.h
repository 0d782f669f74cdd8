// The reader of the configuration text a runtime hands to a protocol.
//
// The text is "name=value" entries separated by white space, after a
// "CfgVer=1" marker; "NodeN::name=value" entries belong to node N. The
// entries are indexed once by name, so that a configuration of many node
// sections, with a lookup per node, is read in time linear in its length.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace xtok {

/// Lookup rule flags.
enum ParamFlags : int {
    PARAM_NODE_INDEPENDENT = 1,  ///< a node-prefixed entry is an error
    PARAM_NODE_DEPENDENT = 2,    ///< with nodes present, an unprefixed entry is an error
};

/// Lookup result codes.
enum ParamResult : int {
    PARAM_OK = 0,
    PARAM_NOT_APPLICABLE = 1,
    PARAM_NOT_FOUND = 2,
    PARAM_ILLEGAL_VALUE = 3,
    PARAM_CANT_BE_PREFIXED = 4,
    PARAM_CANT_BE_NODE_INDEPENDENT = 5,
    PARAM_INVALID_SPEC = 6,
};

class ParamParser {
public:
    /// Copies the text, cuts out the version-1 section and finds its nodes.
    explicit ParamParser(const std::string& text);

    bool formatKnown() const { return formatKnown_; }
    int32_t nodeCount() const { return static_cast<int32_t>(nodes_.size()); }
    /// Node number at `index` in order of first appearance; 0 past the end.
    int32_t nodeAt(int32_t index) const;

    /// Raw lookup of an entry by its exact (possibly prefixed) name: the
    /// value, valid until the next raw lookup, or null when there is none.
    const std::string* findValue(const std::string& name);
    static std::string nodePrefix(int32_t node);
    /// Rule-checking lookup; writes `out` only on PARAM_OK.
    int lookup(const std::string& name, int32_t node, std::string& out, int flags);

    /// The working text (the version-1 section).
    const std::string& text() const { return text_; }

private:
    /// Where an entry starts: its name is text_[start, start + length).
    struct Entry {
        std::size_t start;
        std::size_t length;
    };

    void scanNodes();
    void indexEntries();
    /// Where the value of the first entry named `name` begins, or npos.
    std::size_t valueStart(const std::string& name) const;
    /// The same by scanning the text, for names the index cannot hold.
    std::size_t scannedValueStart(const std::string& name) const;

    std::string text_;
    std::string lastValue_;
    std::vector<int32_t> nodes_;
    /// By name, then by position: the first of equal names is the entry
    /// that counts.
    std::vector<Entry> entries_;
    bool formatKnown_ = false;
};

/// Converters from a found value; false when the value is refused.
bool toString(const std::string& value, std::string& out);
bool toInt(const std::string& value, int32_t& out);
bool toBool(const std::string& value, bool& out);
bool toFloat(const std::string& value, double& out);

/// Typed readers: lookup then the converter; the result code.
int readString(ParamParser& parser, const std::string& name, int32_t node, std::string& out,
               int flags);
int readInt(ParamParser& parser, const std::string& name, int32_t node, int32_t& out, int flags);
int readBool(ParamParser& parser, const std::string& name, int32_t node, bool& out, int flags);

/// Reporting getters: true on success (codes 0 and 1, or 2 when optional);
/// otherwise the message goes to `errorText` and the result is false. `out`
/// keeps what the caller preset unless a value was read.
bool getParamString(ParamParser& parser, const std::string& name, int32_t node, std::string& out,
                    int flags, bool optional, std::string& errorText);
bool getParamInt(ParamParser& parser, const std::string& name, int32_t node, int32_t& out,
                 int flags, bool optional, std::string& errorText);
bool getParamBool(ParamParser& parser, const std::string& name, int32_t node, bool& out, int flags,
                  bool optional, std::string& errorText);

/// "Parser: parameter '<name>' <reason of code>".
std::string paramErrorText(int code, const std::string& name);

}  // namespace xtok
