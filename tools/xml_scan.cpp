#include "tools/xml_scan.h"

#include <cctype>
#include "xtokline/text.h"

namespace xtok::tools {

namespace {

std::string decodeEntities(const std::string& text) {
    static const std::pair<const char*, char> kEntities[] = {
        {"&lt;", '<'}, {"&gt;", '>'}, {"&amp;", '&'}, {"&quot;", '"'}, {"&apos;", '\''}};
    std::string out;
    for (std::size_t i = 0; i < text.size(); ++i) {
        bool replaced = false;
        for (const auto& [entity, c] : kEntities) {
            if (text.compare(i, std::char_traits<char>::length(entity), entity) == 0) {
                out += c;
                i += std::char_traits<char>::length(entity) - 1;
                replaced = true;
                break;
            }
        }
        if (!replaced) {
            out += text[i];
        }
    }
    return out;
}

bool isSpace(char c) {
    return std::isspace(static_cast<unsigned char>(c)) != 0;
}

/// Attributes of a start tag's inside (after the name, before ">").
bool parseAttributes(const std::string& inside, std::map<std::string, std::string>& attributes) {
    std::size_t i = 0;
    for (;;) {
        while (i < inside.size() && isSpace(inside[i])) {
            ++i;
        }
        if (i >= inside.size()) {
            return true;
        }
        std::size_t equals = inside.find('=', i);
        if (equals == std::string::npos || equals + 1 >= inside.size()) {
            return false;
        }
        char quote = inside[equals + 1];
        std::size_t close = inside.find(quote, equals + 2);
        if ((quote != '"' && quote != '\'') || close == std::string::npos) {
            return false;
        }
        attributes[trimmed(inside.substr(i, equals - i), kWhiteSpace)] =
            decodeEntities(inside.substr(equals + 2, close - equals - 2));
        i = close + 1;
    }
}

}  // namespace

bool scanXml(const std::string& xml, std::vector<XmlElement>& elements, std::string& error) {
    std::vector<std::string> open;
    std::size_t at = 0;
    while ((at = xml.find('<', at)) != std::string::npos) {
        std::size_t end = xml.find('>', at);
        if (end == std::string::npos) {
            error = "a tag is cut off at byte " + std::to_string(at);
            return false;
        }
        char kind = at + 1 < xml.size() ? xml[at + 1] : '\0';
        if (kind == '?' || kind == '!') {  // declaration or comment
            std::size_t commentEnd = xml.compare(at, 4, "<!--") == 0 ? xml.find("-->", at) : end;
            at = commentEnd == std::string::npos ? xml.size() : commentEnd + 1;
            continue;
        }
        if (kind == '/') {
            if (!open.empty()) {
                open.pop_back();
            }
            at = end + 1;
            continue;
        }
        bool empty = xml[end - 1] == '/';
        std::string inside = xml.substr(at + 1, end - at - 1 - (empty ? 1 : 0));
        std::size_t nameEnd = 0;
        while (nameEnd < inside.size() && !isSpace(inside[nameEnd])) {
            ++nameEnd;
        }
        XmlElement element;
        element.name = inside.substr(0, nameEnd);
        element.parent = open.empty() ? "" : open.back();
        if (element.name.empty() || !parseAttributes(inside.substr(nameEnd), element.attributes)) {
            error = "a misshapen tag at byte " + std::to_string(at);
            return false;
        }
        std::size_t next = xml.find('<', end + 1);
        element.text = decodeEntities(trimmed(xml.substr(end + 1, next - end - 1), kWhiteSpace));
        if (!empty) {
            open.push_back(element.name);
        }
        elements.push_back(std::move(element));
        at = end + 1;
    }
    return true;
}

}  // namespace xtok::tools
