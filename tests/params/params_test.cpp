// The configuration reader: text in, result out.
#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <vector>

#include "params/param_parser.h"

namespace xtok {
namespace {

const int kInd = PARAM_NODE_INDEPENDENT;
const int kDep = PARAM_NODE_DEPENDENT;

// "[working text]" and the nodes in order; "?" in front for an unknown format,
// "!" at the end when an index past the node list answers other than 0.
std::string scan(const std::string& text) {
    ParamParser parser(text);
    std::string shown = (parser.formatKnown() ? "[" : "?[") + parser.text() + "]";
    for (int32_t i = 0; i < parser.nodeCount(); ++i) {
        shown += std::to_string(parser.nodeAt(i)) + " ";
    }
    return shown + (parser.nodeAt(-1) || parser.nodeAt(parser.nodeCount()) ? "!" : "");
}

TEST(ParamParser, CutsTheFirstVersionOneSectionAndListsItsNodes) {
    EXPECT_EQ(scan("Node1:: CfgVer=1 b CfgVer=2 Node3::") + scan("CfgVer=12 a"), "[ b ][2 a]");
    EXPECT_EQ(scan("") + scan("CfgVer= 1 Node3::"), "?[]?[CfgVer= 1 Node3::]");
    // Distinct nodes in order; "Node::" is node 0; names that are no number are skipped.
    EXPECT_EQ(scan("CfgVer=1Node20::Node7::Node20::NodeA::Node::"),
              "[Node20::Node7::Node20::NodeA::Node::]20 7 0 ");
    EXPECT_EQ(scan("CfgVer=1Node3:x Node99999999999:: Node2147483648::"),
              "[Node3:x Node99999999999:: Node2147483648::]2147483647 ");
}

// "<result code> <output>," of the rule-checking lookup; "-" when left alone.
std::string lookup(const char* text, const char* name, int32_t node, int flags) {
    ParamParser parser(text);
    std::string out = "-";
    return std::to_string(parser.lookup(name, node, out, flags)) + " " + out + ",";
}

TEST(ParamParser, FindsEntriesWhereAnEntryCanStartByThePrefixRules) {
    EXPECT_EQ(lookup("CfgVer=1a=1", "a", -1, 0) +
                  lookup("CfgVer=1 xport=1 Node3::port=2 port=4 port=5", "port", -1, 0) +
                  lookup("CfgVer=1\r\nport=com1\r\n", "port", -1, 0),
              "0 1,0 4,0 com1,");  // a file written on Windows ends its lines in CR LF
    // Bytes above 0x7F are not blanks.
    EXPECT_EQ(lookup("CfgVer=1 \xA0p=1 p=x\xA0y z", "p", -1, 0), "0 x\xA0y,");
    // A name holding "=" or a blank matches across what the others see as entries.
    EXPECT_EQ(lookup("CfgVer=1 a=b=c", "a=b", -1, 0) + lookup("CfgVer=1 x=1 y=2", "x=1 y", -1, 0) +
                  lookup("CfgVer=1 ==v =w", "", -1, 0),
              "0 c,0 2,0 =v,");
    const char* flat = "CfgVer=1 port=com1";
    const char* nodes = "CfgVer=1 model=1 Node2::model=5 Node7::x=0";
    EXPECT_EQ(lookup(flat, "port", -1, kDep) + lookup(flat, "gap", -1, 0) +
                  lookup(flat, "port", -1, kInd | kDep),
              "0 com1,2 -,6 -,");
    // A node without its own entry takes the common one.
    EXPECT_EQ(lookup(nodes, "model", 2, 0) + lookup(nodes, "model", 9, kInd) +
                  lookup(nodes, "x", 2, kDep) + lookup(nodes, "model", 2, kInd),
              "0 5,0 1,2 -,4 -,");
    EXPECT_EQ(lookup(nodes, "model", -1, kDep) + lookup(nodes, "gap", -1, kDep) +
                  lookup(nodes, "model", -1, kInd),
              "5 -,1 -,0 1,");
}

// Reads an int, or a bool for "flag", over preset outputs: "ok|failed
// <int + bool> <error text>".
std::string get(const char* name, int32_t node, int flags, bool optional) {
    ParamParser parser("CfgVer=1 bits=010 flag=TRUE Node2::gap=5");
    std::string error;
    int32_t number = 100;
    bool flag = true;
    bool ok = std::string(name) == "flag"
                  ? getParamBool(parser, name, node, flag, flags, optional, error)
                  : getParamInt(parser, name, node, number, flags, optional, error);
    return (ok ? "ok " : "failed ") + std::to_string(number + flag) + " " + error;
}

TEST(ParamValues, ConvertLikeTheCLibraryAndExplainWithoutTouchingThePresetValue) {
    errno = 0;
    int32_t n[4] = {};  // out of range saturates rather than wraps
    EXPECT_TRUE(toInt("0x2580", n[0]) && toInt("010", n[1]) && toInt("4294967297", n[2]) &&
                toInt("-4294967297", n[3]) && errno == 0);
    EXPECT_EQ(std::vector<int32_t>(n, n + 4),
              (std::vector<int32_t>{9600, 8, 2147483647, -2147483647 - 1}));
    std::string text;
    EXPECT_TRUE(toString("a&nbsp;&nbsp;b&&nbsp;nbsp;&nbsp", text));
    EXPECT_EQ(text, "a  b& nbsp;&nbsp");
    bool flag = false;
    EXPECT_TRUE(toBool("true", flag) && flag && toBool("false", flag) && !flag);
    EXPECT_FALSE(toBool("True", flag) || toBool("1", flag) || toBool("false ", flag));
    const std::string p = "failed 101 Parser: parameter ";
    EXPECT_EQ(
        get("bits", -1, kInd, false) + get("gone", -1, kInd, true) + get("gap", -1, kDep, false),
        "ok 9 ok 101 ok 101 ");  // found, optional, not applicable
    EXPECT_EQ(get("gone", -1, kInd, false), p + "'gone' is not found");
    EXPECT_EQ(get("bits", -1, kDep, true), p + "'bits' can't be node independent");
    EXPECT_EQ(get("gap", 2, kInd, true), p + "'gap' can't be prefixed");
    EXPECT_EQ(get("bits", -1, 3, true), p + "'bits' has invalid internal specification");
    EXPECT_EQ(get("flag", -1, 0, true), p + "'flag' has illegal value");
}

}  // namespace
}  // namespace xtok
