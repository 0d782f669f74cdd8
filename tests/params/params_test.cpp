// The configuration reader and the text helpers: text in, result out.
#include <gtest/gtest.h>

#include <cerrno>
#include <cmath>
#include <string>
#include <vector>

#include "params/param_parser.h"
#include "params/text.h"

namespace xtok {
namespace {

const int kInd = PARAM_NODE_INDEPENDENT;
const int kDep = PARAM_NODE_DEPENDENT;

// "[working text]nodes", "?" in front for an unknown format, "!" when an
// index past the node list answers other than 0.
std::string scan(const std::string& text) {
    ParamParser parser(text);
    std::string shown = (parser.formatKnown() ? "[" : "?[") + parser.text() + "]";
    for (int32_t i = 0; i < parser.nodeCount(); ++i) {
        shown += std::to_string(parser.nodeAt(i)) + " ";
    }
    return shown + (parser.nodeAt(-1) || parser.nodeAt(parser.nodeCount()) ? "!" : "");
}

std::string nodes(const char* section) {
    const std::string shown = scan(std::string("CfgVer=1 ") + section);
    return shown.substr(shown.find(']') + 1);
}

TEST(ParamParser, CutsTheFirstVersionOneSectionAndListsItsNodes) {
    EXPECT_EQ(scan("Node1::a=1 CfgVer=1 Node2::b=2 CfgVer=2 Node3::c=3"), "[ Node2::b=2 ]2 ");
    EXPECT_EQ(scan("CfgVer=12 a=1") + scan("CfgVer=2 a=1 CfgVer=1 b=2"), "[2 a=1][ b=2]");
    EXPECT_EQ(scan("CfgVer=1CfgVer=1 a=1") + scan("xCfgVer=1a=1"), "[][a=1]");
    EXPECT_EQ(scan("") + scan("CfgVer= 1 Node3::a=1"), "?[]?[CfgVer= 1 Node3::a=1]");
    EXPECT_EQ(nodes("Node2::a=1 Node7::b=1 Node2::c=1 NodeA::x=1 Node::z=3"), "2 7 0 ");
    EXPECT_EQ(nodes("NodeNode3::x=1 Node3Node4::y=1 x=Node5::y Node1::Node2::a=1"), "3 4 5 1 2 ");
    EXPECT_EQ(nodes("Node3:x=1 Node-1::a=1 Node 3::a=1 node3::a=1 Node4"), "");
    EXPECT_EQ(nodes("Node12 a=1 Node::") + nodes("Node005::b=2"), "0 5 ");
    EXPECT_EQ(nodes("Node2147483647::a=1 Node99999999999::b=1"), "2147483647 ");
}

std::string find(const std::string& section, const char* name, int32_t node = -2) {
    ParamParser parser("CfgVer=1" + section);
    const std::string* value =
        node == -2 ? parser.findValue(name) : parser.findNodeValue(name, node);
    return value ? "[" + *value + "]" : "-";
}

TEST(ParamParser, FindsEntriesOnlyWhereAnEntryCanStart) {
    EXPECT_EQ(find("a=1", "a") + find(" xport=1 Node3::port=2 port1=3 port=4 port=5", "port"),
              "[1][4]");
    EXPECT_EQ(find(" Node3::port=1", "Node3::port") + find(" b=a=1 a", "a"), "[1]-");
    EXPECT_EQ(find(" a=x=y", "a") + find(" a= b=2", "a"), "[x=y][]");
    // Bytes above 0x7F are not white space.
    EXPECT_EQ(find(" \xA0p=1 p=x\xA0y z", "p"), "[x\xA0y]");
    for (char white : std::string(" \t\n\v\f\r")) {  // each ends a value and starts an entry
        EXPECT_EQ(find(std::string(1, white) + "a=1" + white, "a"), "[1]") << int(white);
    }
    const std::string nodes = " a=1 Node2::a=2 Node-1::b=3";
    EXPECT_EQ(find(nodes, "a", 2) + find(nodes, "a", 5) + find(nodes, "a", -1), "[2][1][1]");
    EXPECT_EQ(find(nodes, "b", -1) + find(nodes, "c", 2), "--");  // -1 is no node
}

// "<result code> <output>" of the rule-checking lookup; "unset" when left alone.
std::string lookup(const char* text, const char* name, int32_t node, int flags) {
    ParamParser parser(text);
    std::string out = "unset";
    return std::to_string(parser.lookup(name, node, out, flags)) + " " + out + ",";
}

TEST(ParamParser, LookupAppliesThePrefixRules) {
    const char* flat = "CfgVer=1 port=com1";
    const char* nodes = "CfgVer=1 model=1 Node2::model=5 Node7::x=0";
    EXPECT_EQ(
        lookup(flat, "port", -1, kDep) + lookup(flat, "port", 3, kInd) + lookup(flat, "gap", -1, 0),
        "0 com1,0 com1,2 unset,");
    // A node without its own entry takes the common one.
    EXPECT_EQ(lookup(nodes, "model", 2, 0) + lookup(nodes, "model", 9, kDep) +
                  lookup(nodes, "model", -1, kDep) + lookup(nodes, "gap", -1, kDep),
              "0 5,0 1,5 unset,1 unset,");
    EXPECT_EQ(lookup(nodes, "model", 2, kInd) + lookup(nodes, "model", 9, kInd) +
                  lookup(nodes, "model", -1, kInd) + lookup(nodes, "x", -1, kInd),
              "4 unset,0 1,0 1,2 unset,");
    EXPECT_EQ(lookup(nodes, "x", 2, kDep) + lookup(flat, "port", -1, kInd | kDep) +
                  lookup(nodes, "model", 2, kInd | kDep),
              "2 unset,6 unset,6 unset,");
}

int32_t asInt(const char* text) {
    int32_t out = -7;
    EXPECT_TRUE(toInt(text, out));
    return out;
}

TEST(ParamConverters, ReadLikeTheCLibraryButSaturateAndKeepErrno) {
    errno = 0;
    EXPECT_EQ(asInt("0x2580") + asInt("010") + asInt("abc"), 9600 + 8);
    EXPECT_EQ(asInt("4294967297"), 2147483647);  // saturated rather than wrapped to 1
    EXPECT_EQ(asInt("-4294967297"), -2147483647 - 1);
    double real = 0;
    EXPECT_TRUE(toFloat("-2.5e3x", real) && real == -2500.0);
    EXPECT_TRUE(toFloat("1e999", real) && std::isinf(real));
    EXPECT_EQ(errno, 0);
    std::string text;
    EXPECT_TRUE(toString("a&nbsp;&nbsp;b&&nbsp;nbsp;&nbsp&NBSP;", text));
    EXPECT_EQ(text, "a  b& nbsp;&nbsp&NBSP;");
    bool flag = false;
    EXPECT_TRUE(toBool("true", flag) && flag && toBool("false", flag) && !flag);
    for (const char* refused : {"True", "FALSE", "1", "", "true "}) {
        EXPECT_FALSE(toBool(refused, flag)) << refused;
    }
}

// Reads `name` with the getter of `kind` ('i', 'b' or 's') into a preset
// output: "ok|failed <output> <error text>".
std::string get(char kind, const char* name, int32_t node, int flags, bool optional) {
    ParamParser parser("CfgVer=1 bits=010 flag=TRUE text=a&nbsp;b Node2::gap=5");
    std::string error, text = "preset";
    int32_t number = 100;
    bool flag = true;
    bool ok = kind == 'i'   ? getParamInt(parser, name, node, number, flags, optional, error)
              : kind == 'b' ? getParamBool(parser, name, node, flag, flags, optional, error)
                            : getParamString(parser, name, node, text, flags, optional, error);
    std::string out = kind == 'i'   ? std::to_string(number)
                      : kind == 'b' ? (flag ? "1" : "0")
                                    : text;
    return (ok ? "ok " : "failed ") + out + " " + error;
}

TEST(ParamGetters, SucceedOrExplainWithoutTouchingThePresetValue) {
    const std::string p = "failed 100 Parser: parameter ";
    EXPECT_EQ(get('i', "bits", -1, kInd, false) + get('i', "gone", -1, kInd, true), "ok 8 ok 100 ");
    EXPECT_EQ(get('i', "gone", -1, kInd, false), p + "'gone' is not found");
    EXPECT_EQ(get('i', "gap", -1, kDep, false), "ok 100 ");  // not applicable
    EXPECT_EQ(get('i', "bits", -1, kDep, true), p + "'bits' can't be node independent");
    EXPECT_EQ(get('i', "gap", 2, kInd, true), p + "'gap' can't be prefixed");
    EXPECT_EQ(get('i', "bits", -1, 3, true), p + "'bits' has invalid internal specification");
    EXPECT_EQ(get('b', "flag", -1, 0, true), "failed 1 Parser: parameter 'flag' has illegal value");
    EXPECT_EQ(get('s', "text", -1, 0, false) + get('s', "gone", -1, 0, true), "ok a b ok preset ");
    for (int code : {0, 1, 7, -1}) {
        EXPECT_EQ(paramErrorText(code, "x"), "Parser: parameter 'x' has unknown error");
    }
}

// The pieces joined by "|", after the one the list already held.
std::string split(const char* text) {
    std::vector<std::string> pieces = {"held"};
    splitTrimmed(text, ',', pieces);
    std::string joined;
    for (const std::string& piece : pieces) {
        joined += piece + "|";
    }
    return joined;
}

TEST(Text, TrimsBlanksAndTabsAndSplitsKeepingTheLastPiece) {
    EXPECT_EQ(trimmed(" \t \t") + trimmed("\t a b\t ") + trimmed("\n\r a \n"), "a b\n\r a \n");
    EXPECT_EQ(split("a, ,b") + split(""), "held|a||b|held||");
    EXPECT_EQ(split("x,") + split(",,a"), "held|x||held|||a|");
}

}  // namespace
}  // namespace xtok
