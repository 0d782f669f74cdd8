#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "params/text.h"

namespace xtok {
namespace {

TEST(Trimmed, RemovesOnlyBlanksAndTabsAtTheEnds) {
    const std::pair<const char*, const char*> cases[] = {
        {"", ""},           {" \t \t", ""},    {"  a b  ", "a b"}, {"\t a\t ", "a"},     {"x", "x"},
        {"\na\n", "\na\n"}, {" \r a", "\r a"}, {" a \n", "a \n"},  {"a\t\tb", "a\t\tb"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(trimmed(c.first), c.second) << '"' << c.first << '"';
    }
}

struct SplitCase {
    const char* text;
    char delimiter;
    std::vector<std::string> pieces;
};

class SplitTrimmed : public ::testing::TestWithParam<SplitCase> {};

TEST_P(SplitTrimmed, AlwaysAppendsTheLastPiece) {
    const SplitCase& c = GetParam();
    std::vector<std::string> pieces;
    splitTrimmed(c.text, c.delimiter, pieces);
    EXPECT_EQ(pieces, c.pieces);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, SplitTrimmed,
    ::testing::Values(SplitCase{"a, ,b", ',', {"a", "", "b"}}, SplitCase{"", ',', {""}},
                      SplitCase{"x,", ',', {"x", ""}}, SplitCase{",", ',', {"", ""}},
                      SplitCase{",,a", ',', {"", "", "a"}}, SplitCase{"a;b", ',', {"a;b"}},
                      SplitCase{" a | b\t", '|', {"a", "b"}},
                      SplitCase{"\"a,b\",c", ',', {"\"a", "b\"", "c"}},  // no quoting
                      SplitCase{"a\tb", '\t', {"a", "b"}}));

TEST(SplitTrimmed, AppendsToWhatTheListHolds) {
    std::vector<std::string> pieces = {"kept"};
    splitTrimmed("a,b", ',', pieces);
    EXPECT_EQ(pieces, (std::vector<std::string>{"kept", "a", "b"}));
}

}  // namespace
}  // namespace xtok
