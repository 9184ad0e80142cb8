#include "programs/patterns/repairs.h"

#include <gmock/gmock.h>

namespace {

using namespace Patterns;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(PatternRepairs, EscapeWhatMeansSomething) { EXPECT_EQ(escaped("a.b (c)*"), "a\\.b \\(c\\)\\*"); }

TEST(PatternRepairs, TakeLineBreaksForBlanksAndBetweenRepeatedCharacters) {
    EXPECT_THAT(withLineBreaks("^a b\\h*[ x]{2}$"),
                ElementsAre("^a\\sb\\s*[ x]{2}$", "^a b(?:\\h\\n?)*(?:[ x]\\n?){2}$",
                            "^a\\sb(?:\\s\\n?)*(?:[ x]\\n?){2}$"));
}

TEST(PatternRepairs, MakeAGroupTheValue) {
    EXPECT_THAT(withValueGroups("^a(?:b) (\\(c)[(](d)$"),
                ElementsAre("^a(?:b) (?<VAL>\\(c)[(](d)$", "^a(?:b) (\\(c)[(](?<VAL>d)$",
                            "(?<VAL>^a(?:b) (\\(c)[(](d)$)"));
    EXPECT_THAT(withValueGroups("(?<VAL>a)(b)"), IsEmpty());
}

TEST(PatternRepairs, TakeMarksThatLookAlike) {
    EXPECT_THAT(withLookAlikes("[A-Z]+-\\d+", "AB\u20131"), Contains("[A-Z]+[-\u2013]\\d+"));
}

TEST(PatternRepairs, PutAnotherLiteral) {
    EXPECT_THAT(withOtherLiteral("^No\\.: x", "No.:", "Nr.:"), ElementsAre("^Nr\\.: x"));
    EXPECT_THAT(withOtherLiteral("^N(o)", "No", "Nr"), IsEmpty());
}

TEST(PatternRepairs, TakeTheRestAsItStands) {
    EXPECT_THAT(withOtherRest({"^a", " EUR$"}, " U.S.$"), ElementsAre("^a U\\.S\\.\\$$"));
}

TEST(PatternRepairs, SurviveMalformedPatterns) {
    for (char const* const pattern :
         {"", "[", "[^", "\\", "(", "a{", "a{2", "(?", "[]", "[\\", "\xff\xfe{"}) {
        withLineBreaks(pattern);
        withValueGroups(pattern);
        withLookAlikes(pattern, "\u2013\xff");
        withOtherLiteral(pattern, "", "x");
    }
}

} // namespace
