// The description block found in the real plug-in file, and damaged or
// foreign blocks refused with a reason instead of read past their end.
#include "tools/describe.h"

#include <gtest/gtest.h>
#include <zlib.h>

namespace xtok::tools {
namespace {

std::string deflated(const std::string& text) {
    uLongf size = compressBound(text.size());
    std::string out(size, '\0');
    compress(reinterpret_cast<Bytef*>(out.data()), &size,
             reinterpret_cast<const Bytef*>(text.data()), text.size());
    out.resize(size);
    return out;
}

/// A block as a plug-in carries it, inside some surrounding bytes.
std::string block(const std::string& compressed, std::size_t claimed, const std::string& end) {
    return std::string(
               "\x7F"
               "ELF...",
               7) +
           "<<ICOM_XML_START>>Name=T?Version=1" + '\0' +
           "compressedXML=" + std::to_string(claimed) + '\0' + compressed + end + '\0' + "tail";
}

TEST(Describe, RefusesDamagedBlocksWithAReason) {
    const std::string xml =
        "<?xml version=\"1.0\"?>\n<protocol_cfg><memtypes>"
        "<memtype display=\"A\">a</memtype></memtypes></protocol_cfg>\n";
    const std::string good = deflated(xml);
    std::string flipped = good;
    flipped[good.size() / 2] = static_cast<char>(flipped[good.size() / 2] ^ 0x55);
    const std::string cut = good.substr(0, good.size() - 6);
    // A small block can inflate to anything: past 16 MiB it is not read.
    const std::string bomb = deflated(std::string((16u << 20) + 1, ' '));
    const std::string end = "<<ICOM_XML_END>>";
    std::string unnumbered = block(good, 0, end);
    unnumbered.replace(unnumbered.find("compressedXML=0"), 15, "compressedXML=x");
    struct Case {
        const char* what;
        std::string file;
        const char* error;  // "" when the block reads
    } cases[] = {
        {"whole", block(good, good.size(), end), ""},
        {"no marker", "just some library bytes", "no <<ICOM_XML_START>> marker"},
        {"header never ends", "<<ICOM_XML_START>>" + std::string(5000, 'x'), "header line"},
        {"header ends too far", "<<ICOM_XML_START>>" + std::string(5000, 'x') + '\0',
         "header line"},
        {"no size line", std::string("<<ICOM_XML_START>>N=1\0oops\0", 27), "compressedXML=N"},
        {"size past the file", block(good, 999999999, end), "no <<ICOM_XML_END>> marker"},
        {"size not a number", unnumbered, "compressedXML=N"},
        {"wrong end marker", block(good, good.size(), "<<ICOM_XML_STOP>>"), "END>> marker"},
        {"size too short", block(good, good.size() - 1, end), "END>> marker"},
        {"stream damaged", block(flipped, flipped.size(), end), "damaged"},
        {"stream cut short", block(cut, cut.size(), end), "cut short"},
        {"stream inflates past 16 MiB", block(bomb, bomb.size(), end), "more than 16 MiB"},
    };
    for (const Case& c : cases) {
        DescriptionBlock found;
        std::string inflated;
        std::string error;
        bool ok = findDescription(c.file, found, error) &&
                  inflateDescription(found.compressed, inflated, error);
        EXPECT_EQ(ok, *c.error == '\0') << c.what << ": " << error;
        EXPECT_NE(error.find(c.error), std::string::npos) << c.what << ": " << error;
        if (ok) {
            EXPECT_EQ(inflated, xml) << c.what;
        }
    }
}

}  // namespace
}  // namespace xtok::tools
