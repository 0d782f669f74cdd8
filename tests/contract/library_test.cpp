// The built library as a runtime loads it and a configuration tool reads it:
// one export, a static root whose module fills the library's own service
// table, and the description block found in the file by its marker.
#include <gtest/gtest.h>
#if XTOK_TEST_ZLIB
#include <zlib.h>
#endif

#include <regex>

#include "tests/support/fake_host.h"
#include "tests/support/plugin_library.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

// dlclose runs the library's static destructors (nothing else holds it): the
// root's module gives back what one open Init took.
TEST(Library, OneExportAStaticRootAndUnloadReleasesAnOpenInit) {
    FakeHost host;
    {
        PluginLibrary lib;
        void* root = lib.root();
        void* module = lib.rootInterface("IProtModule");
        ASSERT_NE(module, nullptr) << lib.error();
        callSlot<void>(root, 1);  // Release: the root stays
        EXPECT_EQ(lib.root(), root);
        ASSERT_EQ(callSlot<int32_t>(module, 4, static_cast<IServiceProvider*>(&host)), 1);  // Init
    }
    EXPECT_EQ(host.outstanding(), 0);
}

// Every match of `pattern`, its groups from the last to the first joined by
// '=', the matches separated by spaces.
[[maybe_unused]] std::string matches(const std::string& text, const char* pattern) {
    std::string out;
    std::regex re(pattern);
    for (std::sregex_iterator it(text.begin(), text.end(), re), end; it != end; ++it) {
        for (std::size_t group = it->size() - 1; group > 0; --group) {
            out += (*it)[group].str() + (group > 1 ? "=" : " ");
        }
    }
    return out;
}

// The stream between the size line and the end marker of the one block in
// the file, or "" when the block is malformed.
std::string compressedDescription(const std::string& file) {
    const std::string header(
        "<<ICOM_XML_START>>Name=XTOK?FullName=Xtokline?Version=106?Platform=PX40_WCE6", 77);
    const std::size_t at = file.find(header);
    if (at == std::string::npos || file.find("<<ICOM_XML_START>>", at + 1) != std::string::npos) {
        return "";  // none, or more than one copy
    }
    const std::string sizeLine = file.c_str() + at + header.size();
    const std::size_t streamAt = at + header.size() + sizeLine.size() + 1;
    const std::size_t length = file.find("<<ICOM_XML_END>>", streamAt) - streamAt;
    const bool whole =
        sizeLine == "compressedXML=" + std::to_string(length) &&
        file.compare(streamAt + length, 17, std::string("<<ICOM_XML_END>>", 17)) == 0;
    return whole ? file.substr(streamAt, length) : "";
}

// Header, size line, stream and end marker, each text ending in a zero byte.
TEST(Library, DescriptionBlockInTheFile) {
    const std::string stream = compressedDescription(readWholeFile(XTOK_PLUGIN_PATH));
    ASSERT_FALSE(stream.empty());
#if XTOK_TEST_ZLIB
    std::string xml(1 << 16, '\0');
    uLongf size = xml.size();
    uLong used = stream.size();
    ASSERT_EQ(uncompress2(reinterpret_cast<Bytef*>(xml.data()), &size,
                          reinterpret_cast<const Bytef*>(stream.data()), &used),
              Z_OK);
    xml.resize(used == stream.size() ? size : 0);  // the whole stream, nothing after it
    EXPECT_EQ(xml.rfind("<?xml version=", 0), 0u);
    EXPECT_EQ(xml.rfind("</protocol_cfg>\n"), xml.size() - 16);
    EXPECT_EQ(matches(xml, ">(\\w+)</(name|code)>"), "name=XTOK code=471 ");
    EXPECT_EQ(matches(xml, "default=\"([^\"]*)\"[^>]*>(\\w+)\\s*<(?:/param|list)"),
              "CfgVer=1 model=1 port=com1 baudrate=9600 parity=even bits=8 stopbits=1 "
              "mode=RS-232 rx_prefix= rx_suffix= gap=0 tx_prefix= tx_suffix= hex_tokens=false "
              "token_queue_size=100 autoConnect=true ");
    EXPECT_EQ(matches(xml, ">(\\w+)</memtype>"),
              "tx_token rx_token rx_token_len tokens_available token_ack connect SP_Baud SP_Bits "
              "SP_Stop SP_Par SP_Mode SP_RxPrefix SP_RxSuffix SP_Gap SP_TxPrefix SP_TxSuffix "
              "SP_HexTokens SP_TokenQueueSize SP_Done ");
#else
    GTEST_SKIP() << "block found; no zlib for this target, so its XML is inflated and checked "
                    "by the Linux and Windows runs only";
#endif
}

}  // namespace
}  // namespace xtok::test
