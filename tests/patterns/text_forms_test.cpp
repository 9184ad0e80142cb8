#include "programs/patterns/parts.h"
#include "programs/patterns/text_forms.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Patterns {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(TextForms, ComposesLetters) {
    EXPECT_EQ(composed("Gebu\u0308hr"), "Geb\u00FChr");
    EXPECT_EQ(composed("plain"), "plain");
}

TEST(TextForms, TakesBadBytesForReplacementCharacters) { EXPECT_EQ(composed("a\xFF"), "a\uFFFD"); }

TEST(TextForms, MakesMarksOfTypographyPlain) {
    struct {
        char const* mark;
        char const* plain;
    } const MARKS[]{
        {"\u2010", "-"},  {"\u2011", "-"},  {"\u2013", "-"},  {"\u2014", "-"},  {"\u2212", "-"},
        {"\u2043", "-"},  {"\u2018", "'"},  {"\u2019", "'"},  {"\u201A", "'"},  {"\u2032", "'"},
        {"\u02BC", "'"},  {"\u00B4", "'"},  {"\u201C", "\""}, {"\u201D", "\""}, {"\u201E", "\""},
        {"\u00AB", "\""}, {"\u00BB", "\""}, {"\u2033", "\""}, {"\u00A0", " "},  {"\u2009", " "},
        {"\u202F", " "},  {"\u00B7", "."},  {"\u2024", "."},  {"\uFF1A", ":"},  {"\u2236", ":"},
        {"\u2044", "/"},  {"\u2215", "/"},
    };
    for (auto const& [mark, plain] : MARKS) {
        EXPECT_EQ(withPlainMarks(mark), plain) << codePointOf(mark);
        EXPECT_EQ(firstUnplainMark(std::string("a-b ") + mark), mark);
    }
    EXPECT_EQ(withPlainMarks("a-b \u00FC\n'\""), "a-b \u00FC\n'\"");
    EXPECT_FALSE(firstUnplainMark("a-b \u00FC\n'\""));
}

TEST(TextForms, NamesCodePoints) {
    EXPECT_EQ(codePointOf("\u2011"), "U+2011");
    EXPECT_EQ(codePointOf("-"), "U+002D");
    EXPECT_EQ(codePointOf("\U0001F600"), "U+1F600");
}

TEST(TextForms, FindsTheLikestPieceOfALine) {
    struct {
        char const* line;
        char const* wanted;
        char const* piece;
        std::size_t distance;
    } const CASES[]{
        {"our Kundennr.: 4711", "Kunden-Nr.:", "Kundennr.:", 1},
        {"TOTAL: 5", "Total:", "TOTAL:", 0},
        {"Stra\u00DFe 5", "Strase", "Stra\u00DFe", 1},
        {"abc", "", "", 0},
        {"", "abc", "", 3},
        {"xxabxx", "ab", "ab", 0},
    };
    for (auto const& [line, wanted, piece, distance] : CASES) {
        Likeness const likeness = likestPiece(line, wanted);
        EXPECT_EQ(likeness.piece, piece) << line;
        EXPECT_EQ(likeness.distance, distance) << line;
    }
}

TEST(PatternParts, FindsTheLiteralsThatATextMustHave) {
    struct {
        char const* pattern;
        std::vector<std::string> literals;
    } const CASES[]{
        {R"(^(?i:ref):+\h*(?<VAL>\S.*)$)", {"ref:"}},
        {R"(^Kunden-Nr\.:\h*(?<VAL>\d+) of$)", {"Kunden-Nr.:", "of"}},
        {R"(^Total: (?<VAL>[\d.]+) EUR$)", {"Total:", "EUR"}},
        {R"(a|b)", {}},
        {R"((?:Total|Sum): x)", {": x"}},
        {R"((?:Sum)?: \d+)", {":"}},
        {R"((?:No )+17)", {"No", "17"}},
        {R"(\A(?<VAL>(.{1,72}\n){0,8}.{1,72})\Z)", {}},
        {R"(  )", {}},
    };
    for (auto const& [pattern, literals] : CASES)
        EXPECT_EQ(literalsOf(pattern), literals) << pattern;
}

TEST(PatternParts, CutsAPatternBetweenItsSteps) {
    std::vector<std::string> cuts;
    for (Cut const& cut : cutsOf(R"(^Ref:\h*(?<VAL>\d+)$)"))
        cuts.push_back(cut.front + "|" + cut.rest);
    EXPECT_THAT(cuts, ElementsAre(R"(^Ref:\h*(?<VAL>\d+)|$)", R"(^Ref:\h*|(?<VAL>\d+)$)",
                                  R"(^Ref:|\h*(?<VAL>\d+)$)", R"(^|Ref:\h*(?<VAL>\d+)$)"));
    EXPECT_THAT(cutsOf("a|b"), IsEmpty());
    EXPECT_THAT(cutsOf(""), IsEmpty());
}

TEST(PatternParts, TakesAnchorsOff) {
    struct {
        char const* pattern;
        char const* front;
        char const* core;
        char const* end;
    } const CASES[]{{"^a$", "^", "a", "$"},   {"^a", "^", "a", ""}, {"a$", "", "a", "$"},
                    {"a\\$", "", "a\\$", ""}, {"a", "", "a", ""},   {"^a|b$", "", "^a|b$", ""},
                    {"$", "", "", "$"},       {"", "", "", ""}};
    for (auto const& [pattern, front, core, end] : CASES) {
        Anchors const anchors = anchorsOf(pattern);
        EXPECT_EQ(anchors.front, front) << pattern;
        EXPECT_EQ(anchors.core, core) << pattern;
        EXPECT_EQ(anchors.end, end) << pattern;
    }
}

TEST(PatternParts, TakeAnyBlanksInThePlaceOfBlanks) {
    EXPECT_EQ(withAnyBlanks("a  b c"), "a\\h*b\\h*c");
    EXPECT_EQ(withAnyBlanks("a\\hb"), "a\\hb");
    EXPECT_EQ(withAnyBlanks(" a "), "\\h*a\\h*");
}

TEST(PatternParts, FindTheLabelInFrontOfTheValue) {
    EXPECT_EQ(labelIn(R"(^Total:\h*(?<VAL>.+)$)"), R"(^Total:\h*)");
    EXPECT_EQ(labelIn(R"(^No (?'VAL'\d+))"), "^No ");
    EXPECT_EQ(labelIn(R"((?<VAL>.+))"), "");
    EXPECT_EQ(labelIn(R"(^(?:a(?<VAL>.+)))"), "");
    EXPECT_EQ(labelIn(R"(a(?<VAL>.)|b)"), "");
}

TEST(PatternParts, MakesTheWholeMatchTheValue) {
    EXPECT_EQ(withWholeAsValue("a(?<VAL>b)(?'VAL'c)"), "(?<VAL>a(?:b)(?:c))");
    EXPECT_TRUE(hasValueGroup("a(?<VAL>b)"));
    EXPECT_TRUE(hasValueGroup("a(?'VAL'b)"));
    EXPECT_FALSE(hasValueGroup("a(b)(?<VALUE>c)"));
}

} // namespace
} // namespace Patterns
