// "xtok-host describe": the description block a plug-in carries for the
// project editor, found by scanning the file as the editor does:
//   header text "<<ICOM_XML_START>>Name=...?FullName=...?..." and a zero byte,
//   "compressedXML=N" and a zero byte, N bytes of zlib stream,
//   "<<ICOM_XML_END>>" and a zero byte.
#pragma once

#include <iosfwd>
#include <string>
#include <utility>
#include <vector>

#include "tools/plugin_description.h"

namespace xtok::tools {

struct DescriptionBlock {
    std::vector<std::pair<std::string, std::string>> header;  // in file order
    std::string compressed;
};

/// Finds and checks the block in a file's bytes. False with `error` set when
/// there is none or it is damaged.
bool findDescription(const std::string& file, DescriptionBlock& block, std::string& error);

/// Inflates the zlib stream. False with `error` set when it is damaged,
/// cut short, or inflates to an implausible size.
bool inflateDescription(const std::string& compressed, std::string& xml, std::string& error);

/// The header fields, then the parameters and memory types of the XML.
bool summarizeDescription(const DescriptionBlock& block, const std::string& xml, std::ostream& out,
                          std::string& error);

/// "Memory types (N):" and one line each: name, natural type, access, display.
void printMemoryTypes(const std::vector<MemoryTypeInfo>& memoryTypes, std::ostream& out);

/// The whole command; the exit status.
int runDescribe(const std::string& path, bool wholeXml, std::ostream& out, std::ostream& err);

}  // namespace xtok::tools
