#include "programs/reader/clean_text.h"

#include <gtest/gtest.h>

namespace Reader {
namespace {

struct Case {
    char const* name;
    std::u16string_view from;
    char const* to;
};

class CleanText : public testing::TestWithParam<Case> {};

TEST_P(CleanText, IsWhatAPatternCanBeWrittenFor) { EXPECT_EQ(cleanText(GetParam().from), GetParam().to); }

INSTANTIATE_TEST_SUITE_P(
    Characters, CleanText,
    testing::Values(
        Case{"Plain", u"Ref:", "Ref:"}, Case{"Empty", u"", ""},
        Case{"AccentBehindItsLetter", u"Cafe\u0301", "Caf\u00E9"},
        Case{"RingBehindItsLetter", u"A\u030Arhus", "\u00C5rhus"},
        Case{"AccentedLetter", u"Caf\u00E9", "Caf\u00E9"},
        Case{"Ligatures", u"A\uFB00leck o\uFB03ce \uFB02yer", "Affleck office flyer"},
        Case{"LettersThatAreNoLigatures", u"\u0152hmke B\u0153uf K\u00E6r", "\u0152hmke B\u0153uf K\u00E6r"},
        Case{"Fraction", u"\u00BD", "\u00BD"}, Case{"Ellipsis", u"\u2026", "\u2026"},
        Case{"SoftHyphen", u"Rech\u00ADnung", "Rechnung"}, Case{"NoWidth", u"a\u200Bb\u2060c\uFEFFd", "abcd"},
        Case{"Joiner", u"\u0645\u06CC\u200C\u062E", "\u0645\u06CC\u200C\u062E"},
        Case{"NoBreakSpace", u"10\u00A0482", "10 482"},
        Case{"NarrowSpaces", u"\u202F10\u2009\u2009482\u00A0", "10 482"}, Case{"Blanks", u" \t\n", ""},
        Case{"Control", u"a\u0007b\u0085c", "ab c"}, Case{"LoneSurrogate", u"a\xD800z", "a\uFFFDz"},
        Case{"BeyondThePlane", u"\U0001F4EE", "\U0001F4EE"}),
    [](auto const& test) { return test.param.name; });

TEST(Decoding, Utf8IsTestedToItsEnd) {
    EXPECT_EQ(utf16Of("Grün"), u"Gr\u00FCn");
    EXPECT_EQ(utf16Of(""), u"");
    EXPECT_EQ(utf16Of("Gr\xFCn"), std::nullopt);
    EXPECT_EQ(utf16Of("Gr\xC3"), std::nullopt);
}

TEST(Decoding, EveryByteIsACharacterOfWindows1252) {
    EXPECT_EQ(utf16OfWindows1252("Gr\xFCn \x80 \x93"), u"Gr\u00FCn \u20AC \u201C");
    std::string all;
    for (int byte = 1; byte < 256; ++byte)
        all += static_cast<char>(byte);
    EXPECT_EQ(utf16OfWindows1252(all).size(), 255U);
}

TEST(Encoding, Windows1252HasNoCharactersBeyondItsOwn) {
    EXPECT_EQ(windows1252Of("Grün €"), "Gr\xFCn \x80");
    EXPECT_EQ(windows1252Of("Łucja"), std::nullopt);
    EXPECT_EQ(windows1252Of("\xFF"), std::nullopt);
}

} // namespace
} // namespace Reader
