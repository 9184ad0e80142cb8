#include "programs/patterns/hard_lines.h"
#include "programs/patterns/pattern.h"
#include "programs/patterns/samples.h"
#include "programs/patterns/why_not.h"
#include "tests/support/time_limit.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using testing::ElementsAre;
using testing::IsEmpty;
using Use = Patterns::Pattern::Use;
using Answer = Patterns::Pattern::Answer;

TEST(PatternUse, DecidesCaseLineBreaksAndExtent) {
    EXPECT_EQ(Patterns::Pattern("invoice.*", Use::Name).fits("INVOICE\n1"), Answer::Yes);
    EXPECT_EQ(Patterns::Pattern("invoice.*", Use::Name).fits("my invoice"), Answer::No);
    EXPECT_EQ(Patterns::Pattern("ref.*$", Use::Extract).fits("my ref\nmore"), Answer::Yes);
    EXPECT_EQ(Patterns::Pattern("ref.*$", Use::Extract).fits("my REF"), Answer::No);
    EXPECT_EQ(Patterns::Pattern("a.*", Use::Validate).fits("a1"), Answer::Yes);
    EXPECT_EQ(Patterns::Pattern("a.*", Use::Validate).fits("a\n1"), Answer::No);
    EXPECT_EQ(Patterns::Pattern("a.*", Use::Validate).fits("ba"), Answer::No);
}

TEST(PatternUse, TakesTextThatIsNoUtf8ForOneThatDoesNotFit) {
    EXPECT_EQ(Patterns::Pattern(".*", Use::Name).fits("\xFF"), Answer::No);
    EXPECT_FALSE(Patterns::Pattern("(?<a>.*)", Use::Name).fitsWithGroup("\xFF", "a"));
}

TEST(PatternUse, SaysWhereAPatternIsBroken) {
    try {
        Patterns::Pattern("invoice(.*", Use::Name);
        FAIL() << "no failure";
    } catch (Patterns::Broken const& broken) {
        EXPECT_STREQ(broken.what(), "Unmatched marking parenthesis ( or \\(");
        EXPECT_EQ(broken.position, 10u);
    }
}

TEST(PatternUse, KnowsItsGroups) {
    EXPECT_TRUE(Patterns::Pattern("^Ref: (?<VAL>.*)$", Use::Extract).hasGroup("VAL"));
    EXPECT_TRUE(Patterns::Pattern("a|(?'VAL'b)", Use::Extract).hasGroup("VAL"));
    EXPECT_FALSE(Patterns::Pattern("^Ref: (?<val>.*)$", Use::Extract).hasGroup("VAL"));
    EXPECT_FALSE(Patterns::Pattern(R"(\(?<VAL>)", Use::Extract).hasGroup("VAL"));
    Patterns::Pattern const date(R"((?<day>\d+)(\.(?<year>\d+))?)", Use::Validate);
    EXPECT_TRUE(date.fitsWithGroup("1.2021", "year"));
    EXPECT_FALSE(date.fitsWithGroup("1", "year"));
    EXPECT_FALSE(date.fitsWithGroup("x", "day"));
}

TEST(PatternUse, TellsWhereAPatternFitsInBytes) {
    auto const place = Patterns::Pattern("\xC3\xA4+b?", Use::Extract).find("x\xC3\xB6\xC3\xA4\xC3\xA4 b");
    ASSERT_TRUE(place);
    EXPECT_EQ(place->offset, 3u);
    EXPECT_EQ(place->length, 4u);
    EXPECT_FALSE(Patterns::Pattern("b", Use::Extract).find("a"));
    EXPECT_FALSE(Patterns::Pattern("(a+)+b", Use::Extract).find(std::string(1000, 'a')));
    EXPECT_FALSE(Patterns::Pattern("a", Use::Extract).find("\xFF"));
}

TEST(PatternUse, EndsWithinItsBudget) {
    std::string const run(1000, 'a');
    EXPECT_EQ(Patterns::Pattern("(a+)+b", Use::Validate).fits(run), Answer::TooHard);
    EXPECT_EQ(Patterns::Pattern("(a+)+b", Use::Validate).cost(run, 5000), 5000u);
    EXPECT_LT(Patterns::Pattern("a+b", Use::Validate).cost(run), 5000u);
}

// Each is written wrongly, and the engine's parser would go on with it for ever.
TEST(PatternUse, RefusesACommentBehindAPossessiveRepeat) {
    TimeLimit const limit(20);
    for (char const* text : {"a?+(?#why)b", "a*+(?#why)b", "a{2}+(?#why)b", "a++(?#why)b"}) {
        for (Use const use : {Use::Name, Use::Extract, Use::Validate}) {
            try {
                Patterns::Pattern(text, use);
                FAIL() << text;
            } catch (Patterns::Broken const& broken) {
                EXPECT_STREQ(broken.what(), "A comment stands behind a possessive repeat") << text;
                EXPECT_EQ(broken.position, std::string(text).find('(')) << text;
            }
        }
    }
}

TEST(PatternSamples, FitTheirPatternSimplestFirst) {
    EXPECT_THAT(Patterns::samplesOf(Patterns::Pattern(R"(invoice\.pdf)", Use::Name), 5),
                ElementsAre("invoice.pdf"));
    EXPECT_THAT(Patterns::samplesOf(Patterns::Pattern("(a|b)c?", Use::Name), 2), ElementsAre("a", "bc"));
    EXPECT_THAT(Patterns::samplesOf(
                    Patterns::Pattern(R"((?<day>\d\d)\. (?<month>\w+) (?<year>\d{4}))", Use::Validate), 1),
                ElementsAre("05. 03 2021"));
    EXPECT_THAT(Patterns::samplesOf(Patterns::Pattern("a(?!b)b", Use::Name), 5), IsEmpty());
    Patterns::Pattern const any(R"([a-f]{2,5}[^\d]?\h*(x|\Q.*\E)+)", Use::Validate);
    std::vector<std::string> const samples = Patterns::samplesOf(any, 30);
    EXPECT_EQ(samples.size(), 30u);
    for (std::string const& sample : samples)
        EXPECT_EQ(any.fits(sample), Answer::Yes) << sample;
}

TEST(HardLines, AreAsLongAsAskedAndFindWhatRunsAway) {
    for (char const* text : {"(a+)+b", R"((\w+\s?)*:)", "(x+x+)+y", R"(Total: (\d+,?)+EUR)", "(a|a)*b"}) {
        Patterns::Pattern const pattern(text, Use::Extract);
        bool runsAway = false;
        for (std::string const& line : Patterns::hardLinesFor(pattern, 40)) {
            EXPECT_LE(line.size(), 48u) << text;
            runsAway = runsAway || pattern.fits(line) == Answer::TooHard;
        }
        EXPECT_TRUE(runsAway) << text;
    }
}

TEST(WhyNot, NamesTheFirstPartThatDoesNotFit) {
    struct {
        char const* expression;
        char const* name;
        char const* words;
        char const* failedPart;
        char const* fitted;
    } const cases[] = {
        {"", "a", "an empty expression fits no name", "", ""},
        {"reminder.*", "Invoice 17.pdf", "the name does not begin with \"reminder\"", "reminder", ""},
        {R"(invoice \d+\.pdf)", "Invoice A.pdf", R"("\d+" does not fit behind "Invoice ")", R"(\d+)",
         "Invoice "},
        {R"(invoice.*\.pdf)", "invoice 1.docx", R"("\.pdf" does not fit behind "invoice 1.docx")", R"(\.pdf)",
         "invoice 1.docx"},
        {"invoice", "Invoice 17.pdf", "it must fit the whole name, and ends before \" 17.pdf\"", "",
         "Invoice"},
        {"letter.*|invoice", "Invoice 17.pdf", "it must fit the whole name, and ends before \" 17.pdf\"", "",
         "Invoice"},
        {"(offer|bill).*", "Invoice", "the name does not begin with \"(offer|bill)\"", "(offer|bill)", ""},
        {"\xC3\xA4x", "\xC3\xA4\xC3\xB6", "the name does not begin with \"\xC3\xA4x\"", "\xC3\xA4x", ""},
        {"\xC3\xA4+x", "\xC3\xA4\xC3\xB6", "\"x\" does not fit behind \"\xC3\xA4\"", "x", "\xC3\xA4"},
    };
    for (auto const& [expression, name, words, failedPart, fitted] : cases) {
        Patterns::WhyNot const why = Patterns::whyNot(expression, name);
        EXPECT_EQ(why.words, words) << expression;
        EXPECT_EQ(why.failedPart, failedPart) << expression;
        EXPECT_EQ(why.fitted, fitted) << expression;
    }
}
