#include "tools/plugin_description.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>

#include "tools/describe.h"
#include "tools/xml_scan.h"

namespace xtok::tools {

namespace {

// Far beyond any plug-in; a limit keeps a wrong path from filling memory.
constexpr std::size_t kMaxFile = 1u << 30;

bool readFile(const std::string& path, std::string& bytes, std::string& error) {
    struct stat info;
    if (stat(path.c_str(), &info) != 0) {
        error = std::strerror(errno);
        return false;
    }
    if (!S_ISREG(info.st_mode) || static_cast<std::size_t>(info.st_size) > kMaxFile) {
        error = "not a plug-in file";
        return false;
    }
    std::ifstream file(path, std::ios::binary);
    std::ostringstream content;
    if (!file || !(content << file.rdbuf())) {
        error = std::string("cannot read it: ") + std::strerror(errno);
        return false;
    }
    bytes = content.str();
    return true;
}

std::string attribute(const XmlElement& element, const char* name) {
    auto found = element.attributes.find(name);
    return found == element.attributes.end() ? "" : found->second;
}

ParameterInfo parameterOf(const XmlElement& e) {
    ParameterInfo p;
    p.key = e.text;
    p.display = attribute(e, "display");
    p.type = attribute(e, "type");
    p.listType = attribute(e, "listType");
    p.defaultValue = attribute(e, "default");
    p.mandatory = attribute(e, "isMandatory") == "true";
    p.perNode = attribute(e, "isNodeProperty") == "true";
    p.min = attribute(e, "min");
    p.max = attribute(e, "max");
    return p;
}

MemoryTypeInfo memoryTypeOf(const XmlElement& e) {
    std::string access = attribute(e, "isReadOnly") == "true"    ? "read-only"
                         : attribute(e, "isWriteOnly") == "true" ? "write-only"
                                                                 : "read/write";
    return {e.text, attribute(e, "naturalType"), access, attribute(e, "display")};
}

}  // namespace

const ParameterInfo* PluginDescription::parameter(const std::string& key) const {
    for (const ParameterInfo& p : parameters) {
        if (p.key == key) {
            return &p;
        }
    }
    return nullptr;
}

std::string PluginDescription::headerField(const std::string& key) const {
    for (const auto& [name, value] : header) {
        if (name == key) {
            return value;
        }
    }
    return "";
}

bool readDescriptionXml(const std::string& path, DescriptionBlock& block, std::string& xml,
                        std::string& error) {
    std::string file;
    return readFile(path, file, error) && findDescription(file, block, error) &&
           inflateDescription(block.compressed, xml, error);
}

bool parseDescription(const DescriptionBlock& block, const std::string& xml,
                      PluginDescription& description, std::string& error) {
    std::vector<XmlElement> elements;
    if (!scanXml(xml, elements, error)) {
        error = "the description is no XML document: " + error;
        return false;
    }
    description = PluginDescription{};
    description.header = block.header;
    description.compressedSize = block.compressed.size();
    description.xmlSize = xml.size();
    for (const XmlElement& e : elements) {
        if (e.name == "parameter" && e.parent == "parameters") {
            description.parameters.push_back(parameterOf(e));
        } else if (e.name == "list_entry" && e.parent == "parameter" &&
                   !description.parameters.empty()) {
            description.parameters.back().choices.push_back(e.text);
        } else if (e.name == "memtype" && e.parent == "memtypes") {
            description.memoryTypes.push_back(memoryTypeOf(e));
        } else if (e.name == "model" && e.parent == "models") {
            description.models.push_back(e.text);
        }
    }
    return true;
}

bool readDescription(const std::string& path, PluginDescription& description, std::string& error) {
    DescriptionBlock block;
    std::string xml;
    if (!readDescriptionXml(path, block, xml, error) ||
        !parseDescription(block, xml, description, error)) {
        error = path + ": " + error;
        return false;
    }
    return true;
}

}  // namespace xtok::tools
