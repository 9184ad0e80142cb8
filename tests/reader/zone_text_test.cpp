#include "programs/reader/zone_text.h"

#include "tests/support/typesetter.h"

#include <gmock/gmock.h>

#include <limits>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// An address with an e-mail line above it.
struct Address : testing::Test {
    Address() {
        set.line(2500, 6000, "Email: a@b.example");
        set.line(2500, 6480, "Lena Brandt");
        set.line(2500, 6960, "3 Orchard Close");
        layout = layOut(set.page);
    }

    ZoneText zone() const { return ZoneText::nearest(set.page, layout, {2500, 6000}); }

    Typesetter set;
    Layout layout;
};

TEST_F(Address, LinesAreJoinedByLineFeeds) {
    EXPECT_EQ(zone().text(), "Email: a@b.example\nLena Brandt\n3 Orchard Close");
    EXPECT_THAT(zone().blocks(), ElementsAre(zone().box()));
    EXPECT_EQ(zone().box(), (Box{2500, 5600, 6000, 7040}));
}

TEST(ZoneLocations, KeepTextOutsideFromChangingTheOrderInside) {
    Typesetter alone;
    alone.line(2500, 6000, "Lena Brandt");
    alone.line(2500, 6480, "3 Orchard Close");
    alone.line(2500, 6960, "Whitstable");
    Typesetter crowded = alone;
    // A heading that reaches down from above, and a column that begins higher and stands close.
    crowded.line(2500, 5520, "To whom it may concern, at the place of the customer");
    crowded.line(6200, 6100, "Date: today");
    crowded.line(6200, 6580, "No: 5");
    Box const location{2000, 5600, 6100, 7200};
    auto const text = [&](Typesetter const& set) {
        return ZoneText::inside(set.page, layOut(set.page), location).text();
    };
    EXPECT_EQ(text(alone), "Lena Brandt\n3 Orchard Close\nWhitstable");
    EXPECT_EQ(text(crowded), text(alone));
}

TEST_F(Address, AStretchIsAsWideAsItsWidestLine) {
    Stretch const all = zone().stretch(0, zone().text().size());
    EXPECT_EQ(all.width, 17 * Typesetter::LETTER + 100);
    EXPECT_EQ(all.box, zone().box());
    EXPECT_EQ(all.text, zone().text());
}

TEST_F(Address, AStretchOfPartOfALineIsMeasuredByItsLetters) {
    // "Brandt", then "andt\n3 Orc".
    EXPECT_EQ(zone().stretch(24, 6).width, 6 * Typesetter::LETTER);
    EXPECT_EQ(zone().stretch(24, 6).box, (Box{3400, 6080, 4600, 6560}));
    Stretch const across = zone().stretch(26, 10);
    EXPECT_EQ(across.text, "andt\n3 Orc");
    EXPECT_EQ(across.width, 4 * Typesetter::LETTER + 100);
    EXPECT_EQ(across.box, (Box{2500, 6080, 4600, 7040}));
}

TEST_F(Address, AnEmptyStretchHasNoWidth) {
    EXPECT_EQ(zone().stretch(3, 0).width, 0);
    EXPECT_EQ(zone().stretch(18, 1).width, 0);
    EXPECT_EQ(zone().stretch(1000, 5).width, 0);
}

TEST_F(Address, CutLinesLeaveNoEmptyLine) {
    ZoneText first = zone();
    EXPECT_EQ(first.cutLines(7, 3), "Email: a@b.example");
    EXPECT_EQ(first.text(), "Lena Brandt\n3 Orchard Close");

    ZoneText middle = zone();
    EXPECT_EQ(middle.cutLines(19, 11), "Lena Brandt");
    EXPECT_EQ(middle.text(), "Email: a@b.example\n3 Orchard Close");

    ZoneText last = zone();
    EXPECT_EQ(last.cutLines(31, 15), "3 Orchard Close");
    EXPECT_EQ(last.text(), "Email: a@b.example\nLena Brandt");

    ZoneText all = zone();
    EXPECT_EQ(all.cutLines(0, 46), zone().text());
    EXPECT_EQ(all.text(), "");
}

TEST_F(Address, LineBreaksAtTheEndsOfAMatchCutNoFurtherLine) {
    ZoneText text = zone();
    EXPECT_EQ(text.cutLines(18, 13), "Lena Brandt");
    EXPECT_EQ(text.cutLines(18, 1), "");
    EXPECT_EQ(text.text(), "Email: a@b.example\n3 Orchard Close");
}

TEST_F(Address, WhatIsLeftAfterACutIsMeasuredWhereItStands) {
    ZoneText text = zone();
    text.cutLines(0, 5);
    EXPECT_EQ(text.stretch(0, 11).box, (Box{2500, 6080, 4600, 6560}));
    EXPECT_EQ(text.box(), zone().box());
}

TEST(ZoneByLocation, TakesTheWordsWhoseCentreLiesInside) {
    Typesetter set;
    set.line(2500, 6000, "aaaa bbbb cccc");
    set.line(2500, 6480, "dddd eeee ffff");
    set.line(12500, 6000, "Datum");
    Layout const layout = layOut(set.page);
    // "bbbb" is 3400 to 4200 wide, its centre at 3800.
    EXPECT_EQ(ZoneText::inside(set.page, layout, {0, 0, 3800, 20000}).text(), "aaaa bbbb\ndddd eeee");
    EXPECT_EQ(ZoneText::inside(set.page, layout, {0, 0, 3799, 20000}).text(), "aaaa\ndddd");
    EXPECT_EQ(ZoneText::inside(set.page, layout, {3800, 6100, 21000, 20000}).text(), "eeee ffff");
    EXPECT_EQ(ZoneText::inside(set.page, layout, {0, 0, 21000, 29700}).blocks().size(), 2U);
    ZoneText const none = ZoneText::inside(set.page, layout, {0, 20000, 21000, 29700});
    EXPECT_EQ(none.text(), "");
    EXPECT_THAT(none.blocks(), IsEmpty());
}

TEST(ZoneText, WordsThatTouchEachOtherStayOne) {
    Typesetter set;
    int const right = set.word(2500, 6000, "Łu");
    set.page.words.back().blankBehind = false;
    set.word(right, 6000, "cja");
    ZoneText const zone = ZoneText::nearest(set.page, layOut(set.page), {0, 0});
    EXPECT_EQ(zone.text(), "Łucja");
    // The first letter has two bytes.
    EXPECT_EQ(zone.stretch(0, 2).width, set.page.words.front().box.width() / 2);
}

TEST(ZoneText, LinesAreCutAtAThousandCharacters) {
    Typesetter set;
    int left = 0;
    for (int i = 0; i < 300; ++i)
        left = set.word(left, 6000, "äöüß") + 100;
    ZoneText const zone = ZoneText::nearest(set.page, layOut(set.page), {0, 0});
    EXPECT_EQ(zone.text().size(), 800U * 2 + 199U);

    Typesetter single;
    single.word(0, 6000, std::string(5000, 'x'));
    EXPECT_EQ(ZoneText::nearest(single.page, layOut(single.page), {0, 0}).text(), std::string(1000, 'x'));
}

TEST(ZoneText, AnEmptyPageGivesTheEmptyText) {
    Page const page{1, 21000, 29700, {}, {}};
    EXPECT_EQ(ZoneText::nearest(page, layOut(page), {4500, 6200}).text(), "");
}

TEST(ZoneText, UprightLinesComeBeforeThoseOnTheMargin) {
    Typesetter set;
    set.page.words.push_back({"Rand", {1000, 1000, 1200, 1800}, 200, 0, Turn::Up, true});
    set.line(2500, 6000, "Dear resident,");
    ZoneText const zone = ZoneText::inside(set.page, layOut(set.page), {0, 0, 21000, 29700});
    EXPECT_EQ(zone.text(), "Dear resident,\nRand");
    EXPECT_EQ(zone.stretch(15, 4).width, 800);
    EXPECT_EQ(zone.stretch(15, 2).box, (Box{1000, 1400, 1200, 1800}));
}

TEST(Boxes, HaveAnExtentAndACentreWhereverTheirEdgesAre) {
    constexpr int LEAST = std::numeric_limits<int>::min(), MOST = std::numeric_limits<int>::max();
    Box const everywhere{LEAST, LEAST, MOST, MOST};
    EXPECT_EQ(everywhere.width(), MOST);
    EXPECT_EQ(everywhere.height(), MOST);
    EXPECT_EQ(everywhere.centre(), Point(-1, -1));
    Box const inverted{MOST, MOST, LEAST, LEAST};
    EXPECT_EQ(inverted.width(), -MOST);
    EXPECT_EQ((Box{1, 2, 4, 9}.centre()), Point(2, 5));
}

} // namespace
} // namespace Reader
