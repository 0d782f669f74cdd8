#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include "params/param_parser.h"

namespace xtok {
namespace {

const int kNone = 0;
const int kIndep = PARAM_NODE_INDEPENDENT;
const int kDep = PARAM_NODE_DEPENDENT;
const int kBoth = PARAM_NODE_INDEPENDENT | PARAM_NODE_DEPENDENT;

// ---- Marker and section -------------------------------------------------

struct SectionCase {
    const char* text;
    bool known;
    const char* section;
};

class ParamSection : public ::testing::TestWithParam<SectionCase> {};

TEST_P(ParamSection, CutsTheFirstVersionOneSection) {
    const SectionCase& c = GetParam();
    ParamParser parser(c.text);
    EXPECT_EQ(parser.formatKnown(), c.known);
    EXPECT_EQ(parser.text(), c.section);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, ParamSection,
    ::testing::Values(SectionCase{"CfgVer=1 port=com2 CfgVer=2 port=com3", true, " port=com2 "},
                      SectionCase{"port=com2 CfgVer=1 baudrate=9600", true, " baudrate=9600"},
                      SectionCase{"CfgVer=12 a=1", true, "2 a=1"},
                      SectionCase{"CfgVer=2 a=1 CfgVer=1 b=2", true, " b=2"},
                      SectionCase{"CfgVer=1CfgVer=1 a=1", true, ""},
                      SectionCase{"CfgVer=1", true, ""}, SectionCase{"xCfgVer=1a=1", true, "a=1"},
                      SectionCase{"", false, ""},
                      SectionCase{"cfgver=1 a=1", false, "cfgver=1 a=1"},
                      SectionCase{"CfgVer=2 a=1", false, "CfgVer=2 a=1"},
                      SectionCase{"CfgVer= 1 a=1", false, "CfgVer= 1 a=1"}));

TEST(ParamSection, EntriesOutsideTheSectionAreInvisible) {
    ParamParser parser("port=com1 CfgVer=1 baudrate=9600 CfgVer=2 port=com3 bits=7");
    EXPECT_EQ(parser.findValue("port"), nullptr);
    EXPECT_EQ(parser.findValue("bits"), nullptr);
    ASSERT_NE(parser.findValue("baudrate"), nullptr);
    EXPECT_EQ(*parser.findValue("baudrate"), "9600");
}

TEST(ParamSection, UnknownFormatScansNoNodes) {
    ParamParser parser("Node3::model=1 model=2");
    EXPECT_FALSE(parser.formatKnown());
    EXPECT_EQ(parser.nodeCount(), 0);
}

// ---- Node scan ------------------------------------------------------------

struct NodeCase {
    const char* section;
    std::vector<int32_t> nodes;
};

class ParamNodes : public ::testing::TestWithParam<NodeCase> {};

TEST_P(ParamNodes, ListsDistinctNodesInOrderOfFirstAppearance) {
    const NodeCase& c = GetParam();
    ParamParser parser(std::string("CfgVer=1 ") + c.section);
    std::vector<int32_t> nodes;
    for (int32_t i = 0; i < parser.nodeCount(); ++i) {
        nodes.push_back(parser.nodeAt(i));
    }
    EXPECT_EQ(nodes, c.nodes);
}

const int32_t kMaxNode = std::numeric_limits<int32_t>::max();

INSTANTIATE_TEST_SUITE_P(
    Texts, ParamNodes,
    ::testing::Values(NodeCase{"model=1 Node2::model=5 Node7::model=3 Node2::x=0", {2, 7}},
                      NodeCase{"NodeA::x=1 Node4::y=2", {4}}, NodeCase{"Node::x=1", {0}},
                      NodeCase{"NodeNode3::x=1", {3}}, NodeCase{"Node3Node4::x=1", {4}},
                      NodeCase{"x=Node5::y", {5}}, NodeCase{"Node1::Node2::a=1", {1, 2}},
                      NodeCase{"Node12 a=1 Node::", {0}}, NodeCase{"Node007::a=1 Node7::b=2", {7}},
                      NodeCase{"Node3:x=1 Node4", {}}, NodeCase{"Node-1::a=1 Node 3::a=1", {}},
                      NodeCase{"node3::a=1", {}}, NodeCase{"Node2147483647::a=1", {kMaxNode}},
                      NodeCase{"Node99999999999999999999::a=1 Node2147483648::b=1", {kMaxNode}}));

TEST(ParamNodes, NodesBeforeTheMarkerAreNotCounted) {
    ParamParser parser("Node1::a=1 CfgVer=1 Node2::a=1 CfgVer=2 Node3::a=1");
    ASSERT_EQ(parser.nodeCount(), 1);
    EXPECT_EQ(parser.nodeAt(0), 2);
}

TEST(ParamNodes, IndexOutsideTheListGivesZero) {
    ParamParser parser("CfgVer=1 Node5::a=1");
    EXPECT_EQ(parser.nodeAt(0), 5);
    EXPECT_EQ(parser.nodeAt(1), 0);
    EXPECT_EQ(parser.nodeAt(-1), 0);
    EXPECT_EQ(parser.nodeAt(std::numeric_limits<int32_t>::max()), 0);
}

// ---- Raw lookup -----------------------------------------------------------

struct FindCase {
    const char* section;
    const char* name;
    const char* value;  // null: no entry
};

class ParamFind : public ::testing::TestWithParam<FindCase> {};

TEST_P(ParamFind, FindsEntriesOnlyWhereAnEntryCanStart) {
    const FindCase& c = GetParam();
    ParamParser parser(std::string("CfgVer=1") + c.section);
    const std::string* value = parser.findValue(c.name);
    if (c.value == nullptr) {
        EXPECT_EQ(value, nullptr);
    } else {
        ASSERT_NE(value, nullptr);
        EXPECT_EQ(*value, c.value);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Texts, ParamFind,
    ::testing::Values(
        FindCase{"a=1", "a", "1"},  // right at the start of the section
        FindCase{" xport=1", "port", nullptr}, FindCase{" Node3::port=1", "port", nullptr},
        FindCase{" Node3::port=1", "Node3::port", "1"}, FindCase{" port=1 port=2", "port", "1"},
        FindCase{" xport=1 port=2", "port", "2"}, FindCase{" b=a=1", "a", nullptr},
        FindCase{" a=x=y", "a", "x=y"}, FindCase{" port1=5 port=6", "port", "6"},
        FindCase{" A=1", "a", nullptr}, FindCase{" a=abc", "a", "abc"}, FindCase{" a=", "a", ""},
        FindCase{" a= b=2", "a", ""}, FindCase{"\ta=1\tb=2", "b", "2"},
        FindCase{"\na=1\nb=2", "a", "1"}, FindCase{"\ra=1\r", "a", "1"},
        FindCase{"\va=1\vb=2", "b", "2"}, FindCase{"\fa=1\fb=2", "a", "1"},
        FindCase{" \xA0"
                 "a=1",
                 "a", nullptr},
        FindCase{" a=x\xA0y z", "a", "x\xA0y"}, FindCase{" a", "a", nullptr}));

TEST(ParamFind, NodeValueTakesThePrefixedEntryThenTheCommonOne) {
    ParamParser parser("CfgVer=1 a=1 Node2::a=2 Node-1::b=3");
    ASSERT_NE(parser.findNodeValue("a", 2), nullptr);
    EXPECT_EQ(*parser.findNodeValue("a", 2), "2");
    EXPECT_EQ(*parser.findNodeValue("a", 5), "1");
    EXPECT_EQ(*parser.findNodeValue("a", -1), "1");
    EXPECT_EQ(parser.findNodeValue("b", -1), nullptr);  // -1 means no node, not "Node-1::"
    EXPECT_EQ(parser.findNodeValue("c", 2), nullptr);
    EXPECT_EQ(ParamParser::nodePrefix(-1), "Node-1::");
}

// ---- Rule-checking lookup -------------------------------------------------

const char kNoNodes[] = "CfgVer=1 port=com1 model=1";
const char kNodes[] = "CfgVer=1 model=1 Node2::model=5 Node7::model=3 Node2::x=0";
const char kPrefixedOnly[] = "CfgVer=1 Node2::port=1";

struct LookupCase {
    const char* text;
    const char* name;
    int32_t node;
    int flags;
    int code;
    const char* out;  // "unset" when the output must be left alone
};

class ParamLookup : public ::testing::TestWithParam<LookupCase> {};

TEST_P(ParamLookup, AppliesThePrefixRules) {
    const LookupCase& c = GetParam();
    ParamParser parser(c.text);
    std::string out = "unset";
    EXPECT_EQ(parser.lookup(c.name, c.node, out, c.flags), c.code);
    EXPECT_EQ(out, c.out);
}

INSTANTIATE_TEST_SUITE_P(
    WithoutNodes, ParamLookup,
    ::testing::Values(LookupCase{kNoNodes, "port", -1, kNone, PARAM_OK, "com1"},
                      LookupCase{kNoNodes, "port", -1, kIndep, PARAM_OK, "com1"},
                      LookupCase{kNoNodes, "port", -1, kDep, PARAM_OK, "com1"},
                      LookupCase{kNoNodes, "port", 3, kIndep, PARAM_OK, "com1"},
                      LookupCase{kNoNodes, "gap", -1, kNone, PARAM_NOT_FOUND, "unset"},
                      LookupCase{kNoNodes, "gap", 3, kDep, PARAM_NOT_FOUND, "unset"}));

INSTANTIATE_TEST_SUITE_P(
    WithNodes, ParamLookup,
    ::testing::Values(LookupCase{kNodes, "model", -1, kNone, PARAM_OK, "1"},
                      LookupCase{kNodes, "model", 2, kNone, PARAM_OK, "5"},
                      LookupCase{kNodes, "model", 9, kNone, PARAM_OK, "1"},
                      LookupCase{kNodes, "model", -1, kDep, PARAM_CANT_BE_NODE_INDEPENDENT,
                                 "unset"},
                      LookupCase{kNodes, "gap", -1, kDep, PARAM_NOT_APPLICABLE, "unset"},
                      LookupCase{kNodes, "model", 2, kDep, PARAM_OK, "5"},
                      LookupCase{kNodes, "model", 9, kDep, PARAM_OK, "1"},
                      LookupCase{kNodes, "model", 2, kIndep, PARAM_CANT_BE_PREFIXED, "unset"},
                      LookupCase{kNodes, "model", 9, kIndep, PARAM_OK, "1"},
                      LookupCase{kNodes, "model", -1, kIndep, PARAM_OK, "1"},
                      LookupCase{kNodes, "x", 7, kNone, PARAM_NOT_FOUND, "unset"}));

INSTANTIATE_TEST_SUITE_P(
    PrefixedOnly, ParamLookup,
    ::testing::Values(LookupCase{kPrefixedOnly, "port", -1, kIndep, PARAM_NOT_FOUND, "unset"},
                      LookupCase{kPrefixedOnly, "port", 2, kIndep, PARAM_CANT_BE_PREFIXED, "unset"},
                      LookupCase{kPrefixedOnly, "port", 2, kNone, PARAM_OK, "1"},
                      LookupCase{kPrefixedOnly, "port", 2, kDep, PARAM_OK, "1"},
                      LookupCase{kPrefixedOnly, "port", 5, kDep, PARAM_NOT_FOUND, "unset"},
                      LookupCase{kPrefixedOnly, "port", -1, kDep, PARAM_NOT_APPLICABLE, "unset"}));

INSTANTIATE_TEST_SUITE_P(
    BothFlags, ParamLookup,
    ::testing::Values(LookupCase{kNoNodes, "port", -1, kBoth, PARAM_INVALID_SPEC, "unset"},
                      LookupCase{kNodes, "model", 2, kBoth, PARAM_INVALID_SPEC, "unset"},
                      LookupCase{"", "port", -1, kBoth, PARAM_INVALID_SPEC, "unset"}));

// ---- Hostile input ----------------------------------------------------------

// Texts stitched from the pieces the scanner reacts to must neither hang nor
// read outside the text.
TEST(ParamRobustness, StitchedTextsAreHandled) {
    const char* pieces[] = {"Node",        "::", ":",  "CfgVer=1", "CfgVer=", "=",    "7",
                            "99999999999", " ",  "\t", "a",        "&nbsp;",  "\xFF", "0x"};
    const int count = sizeof(pieces) / sizeof(pieces[0]);
    uint32_t seed = 12345;
    for (int round = 0; round < 2000; ++round) {
        std::string text;
        for (int i = 0; i < 12; ++i) {
            seed = seed * 1103515245u + 12345u;
            text += pieces[(seed >> 16) % count];
        }
        ParamParser parser(text);
        for (int32_t i = 0; i <= parser.nodeCount(); ++i) {
            std::string out;
            parser.lookup("a", parser.nodeAt(i), out, kNone);
            parser.lookup("", -1, out, kDep);
        }
        int32_t n = 0;
        EXPECT_EQ(readInt(parser, "a", -1, n, kNone) == PARAM_OK, parser.findValue("a") != nullptr)
            << text;
    }
}

}  // namespace
}  // namespace xtok
