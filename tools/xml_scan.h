// Just enough XML reading for a protocol description: start tags with their
// attributes and the text right after them. No validation beyond what keeps
// the scan inside the text.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace xtok::tools {

struct XmlElement {
    std::string name;
    std::string parent;  // "" for the root
    std::map<std::string, std::string> attributes;
    std::string text;  // up to the next tag, entities decoded, blanks trimmed
};

/// The elements of `xml` in document order. False with `error` set when a
/// tag or an attribute is cut off or misshapen.
bool scanXml(const std::string& xml, std::vector<XmlElement>& elements, std::string& error);

}  // namespace xtok::tools
