#include <cfloat>
#include <climits>
#include <sstream>

#include "toolkit/CuePrefs.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"
#include "toolkit_test_util.h"

namespace {

TEST(KLString, QuotesOnlyWhatWouldSplitAndFormatsBeyondAnyBuffer) {
    EXPECT_EQ(KLQuote("tab\tname"), "\"tab\tname\"");
    EXPECT_EQ(KLQuote(""), "\"\"") << "an empty name must stay a token";
    EXPECT_EQ(KLQuote(nullptr), "\"\"");
    EXPECT_EQ(KLFmt("%s", std::string(5000, 'a').c_str()).size(), 5000u);
}

TEST(KLFilePath, TrimHeadRemovesOnlyAWholeDirectory) {
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pix/mouth.sgi", "/proj/pix/"), "mouth.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pixels/a.sgi", "/proj/pix"), "/proj/pixels/a.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/a.sgi", "/"), "a.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pix", "/proj/pix"), "");
    EXPECT_EQ(KLFilePath::Directory("a.kset"), ".");
    EXPECT_EQ(KLFilePath::Directory("/a.kset"), "/");
}

// The data, scene and picture folders hang off the project; without one, names stay relative.
TEST(CuePrefs, FoldersFollowTheProjectAndTheDataFolderVariable) {
    ::setenv("TESSEL_MISC_DIR", "data", 1);
    CuePrefs::SetProject("/proj//");
    EXPECT_STREQ(CuePrefs::Project(), "/proj");
    EXPECT_STREQ(CuePrefs::MiscDir(), "/proj/data");
    EXPECT_STREQ(CuePrefs::PixDir(), "/proj/pix");
    ::setenv("TESSEL_MISC_DIR", "", 1);
    CuePrefs::Refresh();
    EXPECT_STREQ(CuePrefs::MiscDir(), "/proj/misc_data") << "an empty variable counts as unset";
    CuePrefs::SetProject("");
    EXPECT_EQ(CuePrefs::Project(), nullptr);
    EXPECT_EQ(CuePrefs::PixDir(), nullptr);
    EXPECT_NE(CuePrefs::Location(), nullptr);
    ::unsetenv("TESSEL_MISC_DIR");
    CuePrefs::Refresh();
}

TEST(CueTokenList, SplitsAtBlanksAndTabsAndGroupsQuotes) {
    const std::pair<std::string, std::vector<std::string>> cases[] = {
        {"  \tkey\t\t jaw  ", {"key", "jaw"}},
        {"key \"open jaw\" 12", {"key", "open jaw", "12"}},
        {"a\"b c\"d e", {"ab cd", "e"}},  // touching stretches form one token
        {"name \"\" x", {"name", "", "x"}},
        {"end\r", {"end"}},                             // CRLF files read like LF files
        {"key \"open jaw 12", {"key", "open jaw 12"}},  // unterminated: to the end of the line
        {"mark 4\t\"\"\"", {"mark", "4", ""}},          // the label written for a quote
        {std::string("a\0b c\x01", 6), {std::string("a\0b", 3), "c\x01"}},
    };
    for (const auto& [line, want] : cases)
        EXPECT_EQ(CueTokenList(line).Tokens(), want) << line;
}

TEST(CueTokenList, MatchesExactlyAndNumbersReadLikeTheCLibraryButNeverOverflow) {
    const CueTokenList s("begin 3.5x abc 99999999999 -99999999999 1e39 nan inf -1e39");
    EXPECT_FALSE(s.Matches("Begin") || s.Matches("beg") || s.Matches("begin", -1));
    EXPECT_TRUE(s.Matches("-1e39", 8));
    EXPECT_FALSE(s.Matches("-1e39", 9) || s.Matches(nullptr));
    EXPECT_EQ(s.ArgText(9), nullptr);
    EXPECT_EQ(s.ArgInt(1), 3) << "leading digits only";
    EXPECT_EQ(s.ArgInt(2), 0);
    EXPECT_EQ(s.ArgInt(3), INT_MAX);
    EXPECT_EQ(s.ArgInt(4), INT_MIN);
    EXPECT_FLOAT_EQ(s.ArgFloat(1), 3.5f);
    EXPECT_EQ(s.ArgFloat(5), FLT_MAX) << "beyond the float range saturates";
    EXPECT_EQ(s.ArgFloat(6), 0.0f) << "NaN is not a number here";
}

TEST(CueStatement, ReadsLineByLineAndCutsHugeLines) {
    const std::string big(3 * CueStatement::kMaxLine, 'x');
    std::istringstream in("wire face.glb 0\n\nkey " + big + "\nend");
    CueStatement s;
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Count(), 3);
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Count(), 0) << "blank line";
    ASSERT_TRUE(s.Read(in));
    EXPECT_EQ(s.Line().size(), CueStatement::kMaxLine);
    EXPECT_EQ(s.Count(), 2);
    ASSERT_TRUE(s.Read(in)) << "the rest of the long line is dropped; a last line without an "
                               "end of line still counts";
    EXPECT_TRUE(s.Matches("end"));
    EXPECT_EQ(s.LineNumber(), 4);
    EXPECT_FALSE(s.Read(in));
    EXPECT_EQ(s.Count(), 0);
    EXPECT_FALSE(s.Read(in)) << "stays at the end";
}

TEST(KLEatBeginEndBlock, SkipsToTheMatchingEndAcrossNestedBlocks) {
    std::istringstream in("  key a 1\n begin inner\n end\n key b 2\nend\nafter\nkey c\n");
    KLEatBeginEndBlock(in);
    CueStatement s;
    ASSERT_TRUE(s.Read(in));
    EXPECT_TRUE(s.Matches("after"));
    KLEatBeginEndBlock(in);  // a block without an end eats the rest, no more
    EXPECT_FALSE(s.Read(in));
}

}  // namespace
