#include <gtest/gtest.h>

#include <cfloat>
#include <climits>
#include <sstream>

#include "toolkit/CueStatement.h"

namespace {

std::vector<std::string> tokens(const std::string& line) {
    return CueTokenList(line).Tokens();
}

using V = std::vector<std::string>;

TEST(CueTokenList, SplitsAtBlanksAndTabsAndGroupsQuotes) {
    EXPECT_EQ(tokens("key jaw 12 jaw.sgi"), (V{"key", "jaw", "12", "jaw.sgi"}));
    EXPECT_EQ(tokens("  \tkey\t\t jaw  "), (V{"key", "jaw"}));
    EXPECT_EQ(tokens("key \"open jaw\" 12"), (V{"key", "open jaw", "12"}));
    EXPECT_EQ(tokens("key \"tab\there\""), (V{"key", "tab\there"}));
    EXPECT_EQ(tokens("a\"b c\"d e"), (V{"ab cd", "e"})) << "touching stretches form one token";
    EXPECT_EQ(tokens("name \"\" x"), (V{"name", "", "x"})) << "an empty quoted token stays";
    EXPECT_EQ(tokens(""), V{});
    EXPECT_EQ(tokens(" \t "), V{});
    EXPECT_EQ(tokens("end\r"), V{"end"}) << "CRLF files read like LF files";
}

TEST(CueTokenList, UnterminatedQuoteRunsToTheEndOfTheLine) {
    EXPECT_EQ(tokens("key \"open jaw 12"), (V{"key", "open jaw 12"}));
    EXPECT_EQ(tokens("\""), V{""});
    EXPECT_EQ(tokens("mark 4\t\"\"\""), (V{"mark", "4", ""})) << "the label written for a quote";
}

TEST(CueTokenList, KeepsNulAndControlBytes) {
    const std::string line("a\0b c\x01", 6);
    const V t = tokens(line);
    ASSERT_EQ(t.size(), 2u);
    EXPECT_EQ(t[0], std::string("a\0b", 3));
    EXPECT_EQ(t[1], "c\x01");
}

TEST(CueTokenList, MatchesIsExactAndCaseSensitive) {
    const CueTokenList s("begin keyset mouth");
    EXPECT_TRUE(s.Matches("begin"));
    EXPECT_TRUE(s.Matches("keyset", 1));
    EXPECT_FALSE(s.Matches("Begin"));
    EXPECT_FALSE(s.Matches("beg"));
    EXPECT_FALSE(s.Matches("mouth", 3));
    EXPECT_FALSE(s.Matches("mouth", -1));
    EXPECT_FALSE(s.Matches(nullptr));
    EXPECT_EQ(s.Count(), 3);
    EXPECT_STREQ(s.ArgText(2), "mouth");
    EXPECT_EQ(s.ArgText(3), nullptr);
}

TEST(CueTokenList, NumbersReadLikeTheCLibraryButNeverOverflow) {
    const CueTokenList s("12 -7 3.5x abc 99999999999 -99999999999 1e39 nan inf 0x10 -1e39");
    EXPECT_EQ(s.ArgInt(0), 12);
    EXPECT_EQ(s.ArgInt(1), -7);
    EXPECT_EQ(s.ArgInt(2), 3) << "leading digits only";
    EXPECT_EQ(s.ArgInt(3), 0);
    EXPECT_EQ(s.ArgInt(4), INT_MAX);
    EXPECT_EQ(s.ArgInt(5), INT_MIN);
    EXPECT_EQ(s.ArgInt(42), 0) << "missing token";
    EXPECT_FLOAT_EQ(s.ArgFloat(2), 3.5f);
    EXPECT_EQ(s.ArgFloat(3), 0.0f);
    EXPECT_EQ(s.ArgFloat(6), FLT_MAX) << "beyond the float range saturates";
    EXPECT_EQ(s.ArgFloat(10), -FLT_MAX);
    EXPECT_EQ(s.ArgFloat(7), 0.0f) << "NaN is not a number here";
    EXPECT_EQ(s.ArgFloat(8), 0.0f);
    EXPECT_EQ(s.ArgFloat(42), 0.0f);
}

TEST(CueStatement, ReadsLineByLineAndCountsLines) {
    std::istringstream in("wire face.glb 0\n\nbegin keyset mouth\nend");
    CueStatement s;
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Count(), 3);
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Count(), 0) << "blank line";
    ASSERT_TRUE(s.Read(in));
    EXPECT_TRUE(s.Matches("keyset", 1));
    ASSERT_TRUE(s.Read(in)) << "a last line without an end of line still counts";
    EXPECT_TRUE(s.Matches("end"));
    EXPECT_EQ(s.LineNumber(), 4);
    EXPECT_FALSE(s.Read(in));
    EXPECT_EQ(s.Count(), 0);
    EXPECT_FALSE(s.Read(in)) << "stays at the end";
}

TEST(CueStatement, HugeLinesAreCutNotGrown) {
    std::string big(3 * CueStatement::kMaxLine, 'x');
    std::istringstream in("key " + big + "\nend\n");
    CueStatement s;
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Line().size(), CueStatement::kMaxLine);
    EXPECT_EQ(s.Count(), 2);
    ASSERT_TRUE(s.Read(in)) << "the rest of the long line is dropped, the next line read";
    EXPECT_TRUE(s.Matches("end"));
}

TEST(KLEatBeginEndBlock, SkipsToTheMatchingEndAcrossNestedBlocks) {
    std::istringstream in("  key a 1\n begin inner\n end\n key b 2\nend\nafter\n");
    KLEatBeginEndBlock(in);
    CueStatement s;
    ASSERT_TRUE(s.Read(in));
    EXPECT_TRUE(s.Matches("after"));

    std::istringstream unterminated("key a 1\nkey b 2\n");
    KLEatBeginEndBlock(unterminated);
    EXPECT_FALSE(s.Read(unterminated)) << "a block without an end eats the rest, no more";
}

}  // namespace
