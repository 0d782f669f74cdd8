// What xtok-host takes from a plug-in's description block: the parameters
// the project editor offers (defaults, choices, bounds), the memory types and
// the models. Options, defaults and checks of the command line are read from
// here, so a plug-in with another description gets other ones.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace xtok::tools {

struct DescriptionBlock;

/// The parameter that names the serial port: the device of a command line,
/// a path or one of the editor's port names, which the host resolves.
inline constexpr const char* kPortKey = "port";

struct ParameterInfo {
    std::string key;
    std::string display;
    std::string type;      // "prop_integer", "prop_list", ...
    std::string listType;  // of a list: "prop_integer" or "prop_string"
    std::string defaultValue;
    bool mandatory = false;
    bool perNode = false;  // may be given per node ("Node2::model=1")
    std::vector<std::string> choices;
    std::string min, max;  // "" without a bound
};

struct MemoryTypeInfo {
    std::string name;
    std::string naturalType;
    std::string access;  // "read-only", "write-only" or "read/write"
    std::string display;
};

struct PluginDescription {
    std::vector<std::pair<std::string, std::string>> header;  // in file order
    std::vector<ParameterInfo> parameters;
    std::vector<MemoryTypeInfo> memoryTypes;
    std::vector<std::string> models;
    std::size_t compressedSize = 0;
    std::size_t xmlSize = 0;

    /// The parameter of `key`, or null.
    const ParameterInfo* parameter(const std::string& key) const;
    /// A header field's value, "" when absent.
    std::string headerField(const std::string& key) const;
};

/// The block and its inflated XML from the file at `path`; false with
/// `error` set when the file cannot be read or carries no sound block.
bool readDescriptionXml(const std::string& path, DescriptionBlock& block, std::string& xml,
                        std::string& error);

/// The parameters, memory types and models of an inflated XML.
bool parseDescription(const DescriptionBlock& block, const std::string& xml,
                      PluginDescription& description, std::string& error);

/// Both steps for the file at `path`.
bool readDescription(const std::string& path, PluginDescription& description, std::string& error);

}  // namespace xtok::tools
