#include "tools/describe.h"

#include <zlib.h>

#include <iomanip>
#include <ostream>

#include "tools/plugin_description.h"

namespace xtok::tools {

namespace {

const std::string kStart = "<<ICOM_XML_START>>";
const std::string kSizeKey = "compressedXML=";
const std::string kEnd = "<<ICOM_XML_END>>";
// Far beyond any real description; a limit keeps a damaged or hostile file
// from filling memory.
constexpr std::size_t kMaxXml = 16u << 20;
constexpr std::size_t kMaxHeader = 4096;

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

/// "prop_list" of "prop_string" reads "list of string".
std::string typeText(const ParameterInfo& parameter) {
    auto plain = [](std::string type) {
        return type.rfind("prop_", 0) == 0 ? type.substr(5) : type;
    };
    std::string type = plain(parameter.type);
    return parameter.listType.empty() ? type : type + " of " + plain(parameter.listType);
}

std::string choicesText(const std::vector<std::string>& choices) {
    if (choices.empty()) {
        return "";
    }
    std::string text = choices.size() <= 4 ? "" : std::to_string(choices.size()) + " choices: ";
    text += choices.front();
    for (std::size_t i = 1; i < choices.size() && i < 4; ++i) {
        text += ", " + choices[i];
    }
    return "  " + text + (choices.size() > 4 ? " ... " + choices.back() : "");
}

void printParameters(const std::vector<ParameterInfo>& parameters, std::ostream& out) {
    out << "\nParameters (" << parameters.size() << "):\n";
    for (const ParameterInfo& p : parameters) {
        out << "  " << std::left << std::setw(18) << p.key << std::setw(18) << typeText(p)
            << std::setw(16) << (p.defaultValue.empty() ? "-" : "default " + p.defaultValue)
            << (p.mandatory ? "mandatory" : "optional") << choicesText(p.choices) << "\n";
    }
}

}  // namespace

void printMemoryTypes(const std::vector<MemoryTypeInfo>& memoryTypes, std::ostream& out) {
    out << "\nMemory types (" << memoryTypes.size() << "):\n";
    for (const MemoryTypeInfo& m : memoryTypes) {
        out << "  " << std::left << std::setw(19) << m.name << std::setw(13) << m.naturalType
            << std::setw(12) << m.access << m.display << "\n";
    }
}

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
    // The last chunk may end the stream past the limit.
    if (result == Z_STREAM_END && xml.size() <= kMaxXml) {
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
    PluginDescription description;
    if (!parseDescription(block, xml, description, error)) {
        return false;
    }
    for (const auto& [key, value] : description.header) {
        out << std::left << std::setw(10) << key << " " << value << "\n";
    }
    out << "XML        " << xml.size() << " bytes (" << block.compressed.size() << " compressed)\n";
    printParameters(description.parameters, out);
    printMemoryTypes(description.memoryTypes, out);
    return true;
}

int runDescribe(const std::string& path, bool wholeXml, std::ostream& out, std::ostream& err) {
    std::string error;
    DescriptionBlock block;
    std::string xml;
    bool ok = readDescriptionXml(path, block, xml, error);
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
