#include "tools/describe.h"

#include <sys/stat.h>
#include <zlib.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <iomanip>
#include <ostream>
#include <sstream>

#include "tools/xml_scan.h"

namespace xtok::tools {

namespace {

const std::string kStart = "<<ICOM_XML_START>>";
const std::string kSizeKey = "compressedXML=";
const std::string kEnd = "<<ICOM_XML_END>>";
// Far beyond any real description; a limit keeps a damaged or hostile file
// from filling memory.
constexpr std::size_t kMaxXml = 16u << 20;
constexpr std::size_t kMaxHeader = 4096;
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

/// The text from `at` to the next zero byte, at most `limit` long; false
/// when no zero byte comes in time.
bool zeroTerminated(const std::string& file, std::size_t at, std::size_t limit, std::string& text) {
    std::size_t zero = file.find('\0', at);
    if (zero == std::string::npos || zero - at > limit) {
        return false;
    }
    text = file.substr(at, zero - at);
    return true;
}

void splitHeader(const std::string& text, DescriptionBlock& block) {
    std::size_t at = 0;
    while (at <= text.size()) {
        std::size_t end = std::min(text.find('?', at), text.size());
        std::string field = text.substr(at, end - at);
        std::size_t equals = field.find('=');
        if (!field.empty()) {
            block.header.emplace_back(field.substr(0, equals),
                                      equals == std::string::npos ? "" : field.substr(equals + 1));
        }
        at = end + 1;
    }
}

bool parseSize(const std::string& digits, std::size_t& size) {
    if (digits.empty() || digits.size() > 9 ||
        digits.find_first_not_of("0123456789") != std::string::npos) {
        return false;
    }
    size = std::stoul(digits);
    return true;
}

std::string attribute(const XmlElement& element, const char* name) {
    auto found = element.attributes.find(name);
    return found == element.attributes.end() ? "" : found->second;
}

/// "prop_list" of "prop_string" reads "list of string".
std::string typeText(const XmlElement& parameter) {
    auto plain = [](std::string type) {
        return type.rfind("prop_", 0) == 0 ? type.substr(5) : type;
    };
    std::string type = plain(attribute(parameter, "type"));
    std::string listType = attribute(parameter, "listType");
    return listType.empty() ? type : type + " of " + plain(listType);
}

std::string accessText(const XmlElement& memtype) {
    if (attribute(memtype, "isReadOnly") == "true") {
        return "read-only";
    }
    return attribute(memtype, "isWriteOnly") == "true" ? "write-only" : "read/write";
}

struct Parameter {
    const XmlElement* element;
    std::vector<std::string> choices;
};

void printParameters(const std::vector<Parameter>& parameters, std::ostream& out) {
    out << "\nParameters (" << parameters.size() << "):\n";
    for (const Parameter& p : parameters) {
        const XmlElement& e = *p.element;
        std::string choices;
        if (!p.choices.empty()) {
            choices = p.choices.size() <= 4 ? "" : std::to_string(p.choices.size()) + " choices: ";
            choices += p.choices.front();
            for (std::size_t i = 1; i < p.choices.size() && i < 4; ++i) {
                choices += ", " + p.choices[i];
            }
            choices += p.choices.size() > 4 ? " ... " + p.choices.back() : "";
        }
        std::string fallback = attribute(e, "default");
        out << "  " << std::left << std::setw(18) << e.text << std::setw(18) << typeText(e)
            << std::setw(16) << (fallback.empty() ? "-" : "default " + fallback)
            << (attribute(e, "isMandatory") == "true" ? "mandatory" : "optional");
        out << (choices.empty() ? "" : "  " + choices) << "\n";
    }
}

void printMemoryTypes(const std::vector<const XmlElement*>& memtypes, std::ostream& out) {
    out << "\nMemory types (" << memtypes.size() << "):\n";
    for (const XmlElement* m : memtypes) {
        out << "  " << std::left << std::setw(19) << m->text << std::setw(13)
            << attribute(*m, "naturalType") << std::setw(12) << accessText(*m)
            << attribute(*m, "display") << "\n";
    }
}

}  // namespace

bool findDescription(const std::string& file, DescriptionBlock& block, std::string& error) {
    std::size_t start = file.find(kStart);
    if (start == std::string::npos) {
        error = "no description block (no " + kStart + " marker)";
        return false;
    }
    std::string header;
    std::string sizeLine;
    if (!zeroTerminated(file, start + kStart.size(), kMaxHeader, header)) {
        error = "damaged description block: the header line does not end";
        return false;
    }
    std::size_t sizeAt = start + kStart.size() + header.size() + 1;
    std::size_t size = 0;
    if (!zeroTerminated(file, sizeAt, 64, sizeLine) || sizeLine.rfind(kSizeKey, 0) != 0 ||
        !parseSize(sizeLine.substr(kSizeKey.size()), size)) {
        error = "damaged description block: no " + kSizeKey + "N line after the header";
        return false;
    }
    std::size_t dataAt = sizeAt + sizeLine.size() + 1;
    if (size > file.size() - dataAt ||
        file.compare(dataAt + size, kEnd.size() + 1, kEnd + '\0') != 0) {
        error = "damaged description block: no " + kEnd + " marker after the " +
                std::to_string(size) + " compressed bytes";
        return false;
    }
    splitHeader(header, block);
    block.compressed = file.substr(dataAt, size);
    return true;
}

bool inflateDescription(const std::string& compressed, std::string& xml, std::string& error) {
    z_stream stream{};
    if (inflateInit(&stream) != Z_OK) {
        error = "zlib cannot start inflating";
        return false;
    }
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(compressed.data()));
    stream.avail_in = static_cast<uInt>(compressed.size());
    xml.clear();
    int result = Z_OK;
    char chunk[16384];
    while (result == Z_OK && xml.size() <= kMaxXml) {
        stream.next_out = reinterpret_cast<Bytef*>(chunk);
        stream.avail_out = sizeof chunk;
        result = inflate(&stream, Z_NO_FLUSH);
        xml.append(chunk, sizeof chunk - stream.avail_out);
        if (result == Z_BUF_ERROR ||
            (result == Z_OK && stream.avail_in == 0 && stream.avail_out != 0)) {
            result = Z_BUF_ERROR;  // input used up before the stream's end
        }
    }
    std::string why = stream.msg ? stream.msg : "";
    inflateEnd(&stream);
    if (result == Z_STREAM_END) {
        return true;
    }
    error = xml.size() > kMaxXml ? "the description inflates to more than 16 MiB"
            : result == Z_BUF_ERROR
                ? "the compressed description is cut short"
                : "the compressed description is damaged" + (why.empty() ? "" : " (" + why + ")");
    return false;
}

bool summarizeDescription(const DescriptionBlock& block, const std::string& xml, std::ostream& out,
                          std::string& error) {
    std::vector<XmlElement> elements;
    if (!scanXml(xml, elements, error)) {
        error = "the description is no XML document: " + error;
        return false;
    }
    for (const auto& [key, value] : block.header) {
        out << std::left << std::setw(10) << key << " " << value << "\n";
    }
    out << "XML        " << xml.size() << " bytes (" << block.compressed.size() << " compressed)\n";
    std::vector<Parameter> parameters;
    std::vector<const XmlElement*> memtypes;
    for (const XmlElement& e : elements) {
        if (e.name == "parameter" && e.parent == "parameters") {
            parameters.push_back({&e, {}});
        } else if (e.name == "list_entry" && e.parent == "parameter" && !parameters.empty()) {
            parameters.back().choices.push_back(e.text);
        } else if (e.name == "memtype" && e.parent == "memtypes") {
            memtypes.push_back(&e);
        }
    }
    printParameters(parameters, out);
    printMemoryTypes(memtypes, out);
    return true;
}

int runDescribe(const std::string& path, bool wholeXml, std::ostream& out, std::ostream& err) {
    std::string file;
    std::string error;
    DescriptionBlock block;
    std::string xml;
    bool ok = readFile(path, file, error) && findDescription(file, block, error) &&
              inflateDescription(block.compressed, xml, error);
    if (ok && wholeXml) {
        out << xml;
    } else if (ok) {
        ok = summarizeDescription(block, xml, out, error);
    }
    if (!ok) {
        err << "xtok-host: " << path << ": " << error << std::endl;
        return 1;
    }
    return 0;
}

}  // namespace xtok::tools
