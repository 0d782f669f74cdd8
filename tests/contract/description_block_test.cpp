// The description block as a configuration tool finds it: by scanning the
// library file for its marker, then inflating the stream with zlib.
#include <gtest/gtest.h>
#include <zlib.h>

#include <map>
#include <regex>
#include <string>
#include <vector>

#include "tests/support/plugin_library.h"

namespace xtok::test {
namespace {

const std::string kHeader =
    "<<ICOM_XML_START>>Name=XTOK?FullName=Xtokline?Version=106?Platform=PX40_WCE6";
const std::string kEnd = "<<ICOM_XML_END>>";

struct Block {
    std::string header, sizeLine, stream, end;
};

bool findBlock(const std::string& file, Block& block) {
    std::size_t at = file.find("<<ICOM_XML_START>>");
    if (at == std::string::npos || file.find("<<ICOM_XML_START>>", at + 1) != std::string::npos) {
        return false;  // none, or a second copy a scanner could pick up instead
    }
    block.header = file.c_str() + at;
    std::size_t sizeAt = at + block.header.size() + 1;
    block.sizeLine = file.c_str() + sizeAt;
    std::size_t streamAt = sizeAt + block.sizeLine.size() + 1;
    std::size_t endAt = file.find(kEnd, streamAt);
    if (endAt == std::string::npos) {
        return false;
    }
    block.stream = file.substr(streamAt, endAt - streamAt);
    block.end = file.substr(endAt, kEnd.size() + 1);
    return true;
}

std::string inflateAll(const std::string& stream) {
    z_stream z{};
    inflateInit(&z);
    z.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(stream.data()));
    z.avail_in = static_cast<uInt>(stream.size());
    std::string out;
    char chunk[4096];
    int rc = Z_OK;
    while (rc == Z_OK) {
        z.next_out = reinterpret_cast<Bytef*>(chunk);
        z.avail_out = sizeof chunk;
        rc = inflate(&z, Z_NO_FLUSH);
        out.append(chunk, sizeof chunk - z.avail_out);
    }
    bool whole = rc == Z_STREAM_END && z.avail_in == 0;
    inflateEnd(&z);
    return whole ? out : std::string();
}

using Attributes = std::map<std::string, std::string>;
struct Element {
    std::string text;
    Attributes attributes;
};

// Elements <tag attrs>text... of one kind, in document order.
std::vector<Element> elements(const std::string& xml, const std::string& tag) {
    std::vector<Element> found;
    std::regex element("<" + tag + "(?: ([^>]*))?>([^<]*)");
    std::regex attribute("(\\w+)=\"([^\"]*)\"");
    for (std::sregex_iterator it(xml.begin(), xml.end(), element), end; it != end; ++it) {
        Element e{(*it)[2], {}};
        std::string attrs = (*it)[1];
        for (std::sregex_iterator a(attrs.begin(), attrs.end(), attribute); a != end; ++a) {
            e.attributes[(*a)[1]] = (*a)[2];
        }
        found.push_back(e);
    }
    return found;
}

class DescriptionBlock : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(findBlock(readWholeFile(XTOK_PLUGIN_PATH), block));
        xml = inflateAll(block.stream);
        ASSERT_FALSE(xml.empty());
    }
    Block block;
    std::string xml;
};

TEST_F(DescriptionBlock, LayoutIsHeaderSizeStreamEnd) {
    EXPECT_EQ(block.header, kHeader);
    EXPECT_EQ(block.sizeLine, "compressedXML=" + std::to_string(block.stream.size()));
    EXPECT_EQ(block.end, kEnd + std::string(1, '\0'));
    ASSERT_GE(block.stream.size(), 2u);
    EXPECT_EQ(static_cast<unsigned char>(block.stream[0]), 0x78);
    EXPECT_EQ(static_cast<unsigned char>(block.stream[1]), 0x9C);
}

TEST_F(DescriptionBlock, DocumentIsWholeUtf8XmlWithLineFeeds) {
    EXPECT_EQ(xml.rfind("<?xml version=", 0), 0u);
    EXPECT_EQ(xml.substr(xml.size() - 16), "</protocol_cfg>\n");
    EXPECT_EQ(xml.find('\r'), std::string::npos);
}

TEST_F(DescriptionBlock, CapabilitiesAndIdentity) {
    const std::vector<std::pair<std::string, std::string>> fields = {
        {"usesUart", "true"},
        {"usesEthernet", "false"},
        {"usesNetwork", "false"},
        {"usesDatagram", "false"},
        {"canWriteDatagram", "false"},
        {"canMultipleRead", "false"},
        {"canMultipleWrite", "false"},
        {"usesTags", "false"},
        {"isReentrant", "true"},
        {"isConverted", "false"},
        {"isProtgen", "true"},
        {"usesTask", "true"},
        {"usesSemaphore", "true"},
        {"usesDoCommand", "true"},
        {"usesExtend", "true"},
        {"inheritsProtgen", "false"},
        {"usesOfflineOpt", "false"},
        {"name", "XTOK"},
        {"display", "Xtokline"},
        {"compatibilityCode", ""},
        {"displayDlgTitle", "Xtokline"},
        {"protGenVer", "213"},
        {"code", "471"},
        {"maxDisplayRows", "14"},
        {"defaultOrt", "30000"},
        {"minimumOrt", "1000"},
        {"defaultRpt", "3"}};
    std::size_t at = 0;
    for (const auto& [name, value] : fields) {
        std::string element = "\t<" + name + ">" + value + "</" + name + ">\n";
        std::size_t next = xml.find(element, at);
        ASSERT_NE(next, std::string::npos) << element;
        at = next;  // and in this order
    }
}

TEST_F(DescriptionBlock, Parameters) {
    struct Expected {
        const char *key, *display, *type, *listType, *def;
        bool mandatory, node;
        const char* group;
        int choices;
    };
    const Expected expected[] = {
        {"CfgVer", "none", "prop_integer", "", "1", true, false, "none", 0},
        {"model", "Model", "prop_modelRef", "", "1", true, true, "none", 0},
        {"port", "Port", "prop_list", "prop_string", "com1", true, false, "communications", 16},
        {"baudrate", "Baudrate", "prop_list", "prop_integer", "9600", true, false, "communications",
         11},
        {"parity", "Parity", "prop_list", "prop_string", "even", true, false, "communications", 3},
        {"bits", "Data bits", "prop_list", "prop_integer", "8", true, false, "communications", 2},
        {"stopbits", "Stop bits", "prop_list", "prop_integer", "1", true, false, "communications",
         2},
        {"mode", "Mode", "prop_list", "prop_string", "RS-232", true, false, "communications", 3},
        {"rx_prefix", "Rx Token Prefix", "prop_string", "", "", false, false, "none", 0},
        {"rx_suffix", "Rx Token Suffix", "prop_string", "", "", false, false, "none", 0},
        {"gap", "Token Gap", "prop_integer", "", "0", false, false, "none", 0},
        {"tx_prefix", "Tx Token Prefix", "prop_string", "", "", false, false, "none", 0},
        {"tx_suffix", "Tx Token Suffix", "prop_string", "", "", false, false, "none", 0},
        {"hex_tokens", "Hexadecimal Tokens", "prop_bool", "", "false", false, false, "none", 0},
        {"token_queue_size", "Token Queue Size", "prop_integer", "", "100", false, false, "none",
         0},
        {"autoConnect", "ConnectAtPowerUp", "prop_bool", "", "true", false, false, "none", 0},
    };
    std::vector<Element> params = elements(xml, "parameter");
    ASSERT_EQ(params.size(), std::size(expected));
    std::vector<Element> entries = elements(xml, "list_entry");
    std::size_t entry = 0;
    for (std::size_t i = 0; i < params.size(); ++i) {
        const Expected& e = expected[i];
        Attributes& a = params[i].attributes;
        SCOPED_TRACE(e.key);
        EXPECT_EQ(params[i].text.substr(0, params[i].text.find('\n')), e.key);
        EXPECT_EQ(a["display"], e.display);
        EXPECT_EQ(a["type"], e.type);
        EXPECT_EQ(a.count("listType") ? a["listType"] : "", e.listType);
        EXPECT_EQ(a["default"], e.def);
        EXPECT_EQ(a.count("defaultValue") == 1, !e.mandatory);
        EXPECT_EQ(a["isMandatory"], e.mandatory ? "true" : "false");
        EXPECT_EQ(a["isNodeProperty"], e.node ? "true" : "false");
        EXPECT_EQ(a["group"], e.group);
        EXPECT_EQ(a["isDistinct"], "false");
        EXPECT_EQ(a.count("spin") == 1, std::string(e.key) == "token_queue_size");
        entry += e.choices;
    }
    EXPECT_EQ(entries.size(), entry);
    EXPECT_EQ(entries.front().text, "com1");
    EXPECT_EQ(entries[15].text, "com16");
    EXPECT_EQ(entries[26].text, "115200");
    EXPECT_EQ(params[14].attributes["min"], "1");
    EXPECT_EQ(params[14].attributes["max"], "10000");
    EXPECT_EQ(params[14].attributes["spin"], "0");
}

TEST_F(DescriptionBlock, MemoryTypes) {
    struct Expected {
        const char *name, *display, *natural, *icom, *max, *blockRead, *blockWrite;
        bool readOnly, writeOnly;
    };
    const Expected expected[] = {
        {"tx_token", "Token To Send", "byte", "0x200", "999999999", "999999999", "999999999", false,
         true},
        {"rx_token", "Token Received", "byte", "0x200", "999999999", "999999999", "0", true, false},
        {"rx_token_len", "Length of Token Received", "unsignedInt", "0x40", "999999999",
         "999999999", "0", true, false},
        {"tokens_available", "Tokens Available", "unsignedInt", "0x40", "1", "0", "0", true, false},
        {"token_ack", "Token Acknowledge", "boolean", "0x1", "1", "0", "0", false, true},
        {"connect", "Connect", "boolean", "0x1", "1", "0", "0", false, false},
        {"SP_Baud", "Serial Baudrate", "unsignedInt", "0x40", "1", "0", "0", false, false},
        {"SP_Bits", "Serial Bits", "unsignedByte", "0x10", "1", "0", "0", false, false},
        {"SP_Stop", "Serial Stop Bits", "unsignedByte", "0x10", "1", "0", "0", false, false},
        {"SP_Par", "Serial Parity", "unsignedByte", "0x10", "1", "0", "0", false, false},
        {"SP_Mode", "Serial Mode", "unsignedByte", "0x10", "1", "0", "0", false, false},
        {"SP_RxPrefix", "Rx Token Prefix", "byte", "0x200", "9999", "9999", "9999", false, false},
        {"SP_RxSuffix", "Rx Token Suffix", "byte", "0x200", "9999", "9999", "9999", false, false},
        {"SP_Gap", "Token Gap", "unsignedInt", "0x40", "1", "0", "0", false, false},
        {"SP_TxPrefix", "Tx Token Prefix", "byte", "0x200", "9999", "9999", "9999", false, false},
        {"SP_TxSuffix", "Tx Token Suffix", "byte", "0x200", "9999", "9999", "9999", false, false},
        {"SP_HexTokens", "Hexadecimal Tokens", "boolean", "0x1", "1", "0", "0", false, false},
        {"SP_TokenQueueSize", "Token Queue Size", "unsignedInt", "0x40", "1", "0", "0", false,
         false},
        {"SP_Done", "Serial Done", "boolean", "0x1", "1", "0", "0", false, false},
    };
    std::vector<Element> types = elements(xml, "memtype");
    ASSERT_EQ(types.size(), std::size(expected));
    for (std::size_t i = 0; i < types.size(); ++i) {
        const Expected& e = expected[i];
        Attributes& a = types[i].attributes;
        SCOPED_TRACE(e.name);
        EXPECT_EQ(types[i].text, e.name);
        EXPECT_EQ(a["display"], e.display);
        EXPECT_EQ(a["naturalType"], e.natural);
        EXPECT_EQ(a["icomTypes"], e.icom);
        EXPECT_EQ(a["min"], "0");
        EXPECT_EQ(a["max"], e.max);
        EXPECT_EQ(a["blockReadCount"], e.blockRead);
        EXPECT_EQ(a["blockWriteCount"], e.blockWrite);
        EXPECT_EQ(a["isReadOnly"], e.readOnly ? "true" : "false");
        EXPECT_EQ(a["isWriteOnly"], e.writeOnly ? "true" : "false");
        for (const char* flag : {"canBitWrite", "isSwap2", "isSwap4", "isSwap8", "mustBitRead",
                                 "hasInternalConversion", "useInDatagram", "canBitArrayWrite"}) {
            EXPECT_EQ(a[flag], "false") << flag;
        }
        EXPECT_EQ(a.size(), 17u);
    }
}

TEST_F(DescriptionBlock, TagFieldsModelAndConversions) {
    std::vector<Element> fields = elements(xml, "tag_field");
    ASSERT_EQ(fields.size(), 3u);
    const char* names[] = {"node", "memorytype", "datatype"};
    const char* types[] = {"prop_nodeRef", "prop_memRef", "prop_icomType"};
    const char* defaults[] = {"", "", "boolean"};
    const char* mandatory[] = {"false", "true", "true"};
    const char* sub[] = {"false", "false", "true"};
    for (int i = 0; i < 3; ++i) {
        Attributes& a = fields[i].attributes;
        EXPECT_EQ(fields[i].text, names[i]);
        EXPECT_EQ(a["type"], types[i]);
        EXPECT_EQ(a["default"], defaults[i]);
        EXPECT_EQ(a["isMandatory"], mandatory[i]);
        EXPECT_EQ(a["sub"], sub[i]);
        EXPECT_EQ(a["arrayType"], "false");
        EXPECT_EQ(a["readonly"], "true");
        EXPECT_EQ(a["group"], "field");
        EXPECT_EQ(a["conversion"], "true");
        EXPECT_EQ(a["ExcludeOnlyIf"], "false");
    }
    EXPECT_EQ(fields[0].attributes.count("defaultValue"), 1u);

    std::vector<Element> models = elements(xml, "model");
    ASSERT_EQ(models.size(), 1u);
    EXPECT_EQ(models[0].text.substr(0, 1), "1");
    EXPECT_EQ(models[0].attributes["display"], "default");
    EXPECT_EQ(models[0].attributes["datagramCount"], "0");
    EXPECT_EQ(models[0].attributes["datagramLength"], "0");

    const std::vector<std::pair<std::string, std::string>> refs = {
        {"tx_token", "999999999"}, {"rx_token", "999999999"},  {"rx_token_len", "1"},
        {"tokens_available", "1"}, {"token_ack", "1"},         {"SP_Baud", "1"},
        {"SP_Bits", "1"},          {"SP_Stop", "1"},           {"SP_Par", "1"},
        {"SP_Mode", "1"},          {"SP_RxPrefix", "9999"},    {"SP_RxSuffix", "9999"},
        {"SP_Gap", "1"},           {"SP_TxPrefix", "9999"},    {"SP_TxSuffix", "9999"},
        {"SP_HexTokens", "1"},     {"SP_TokenQueueSize", "1"}, {"SP_Done", "1"},
        {"connect", "1"}};
    std::vector<Element> found = elements(xml, "memtype_ref");
    ASSERT_EQ(found.size(), refs.size());
    for (std::size_t i = 0; i < refs.size(); ++i) {
        EXPECT_EQ(found[i].text, refs[i].first);
        EXPECT_EQ(found[i].attributes["min"], "0");
        EXPECT_EQ(found[i].attributes["max"], refs[i].second) << refs[i].first;
    }
    EXPECT_NE(xml.find("<conversions display=\"Conversions\"></conversions>\n</protocol_cfg>"),
              std::string::npos);
}

}  // namespace
}  // namespace xtok::test
