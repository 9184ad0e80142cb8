#include "programs/reader/reading_order.h"

#include "programs/reader/zone_text.h"

#include "tests/support/typesetter.h"

#include <gmock/gmock.h>

#include <string>

namespace Reader {
namespace {

constexpr Box PAGE{0, 0, 29700, 29700};

std::string textOf(Typesetter const& set, ReadingOrder order) {
    return ZoneText::inside(set.page, layOut(set.page), PAGE, order).text();
}

/// Two columns of two blocks each, of which the right one begins higher.
Typesetter twoColumns() {
    Typesetter set;
    set.line(2000, 5000, "left one");
    set.line(2000, 7000, "left two");
    set.line(11000, 4500, "right one");
    set.line(11200, 6000, "right two");
    return set;
}

TEST(ReadingOrder, OfRowsIsFromTheTopWhateverTheColumn) {
    EXPECT_EQ(textOf(twoColumns(), ReadingOrder::Rows), "right one\nleft one\nright two\nleft two");
}

TEST(ReadingOrder, OfColumnsIsFromTheLeftAndThenFromTheTop) {
    EXPECT_EQ(textOf(twoColumns(), ReadingOrder::Columns), "left one\nleft two\nright one\nright two");
}

TEST(ReadingOrder, OfColumnsReadsAHeadingOverAllOfThemInItsPlace) {
    Typesetter set = twoColumns();
    set.line(2000, 2000, "A heading that is as wide as all of the columns are together", 400, 200);
    set.line(2000, 9000, "Another one that is as wide as all of the columns are together", 400, 200);
    set.line(11000, 11000, "right three");
    set.line(2000, 11500, "left three");
    EXPECT_EQ(textOf(set, ReadingOrder::Columns),
              "A heading that is as wide as all of the columns are together\nleft one\nleft two\nright "
              "one\nright two\n"
              "Another one that is as wide as all of the columns are together\nleft three\nright three");
}

TEST(ReadingOrder, OfColumnsGoesAcrossTurnedTextToo) {
    Typesetter set = twoColumns();
    for (Word& word : set.page.words) {
        // A quarter turn clockwise about the page's middle.
        word.box = {29700 - word.box.bottom, word.box.left, 29700 - word.box.top, word.box.right};
        word.turn = Turn::Down;
    }
    EXPECT_EQ(textOf(set, ReadingOrder::Columns), "left one\nleft two\nright one\nright two");
}

TEST(ReadingOrder, OfColumnsKeepsTextOnTheMarginBehind) {
    Typesetter set = twoColumns();
    set.word(500, 5000, "up");
    set.page.words.back().turn = Turn::Up;
    EXPECT_EQ(textOf(set, ReadingOrder::Columns), "left one\nleft two\nright one\nright two\nup");
}

TEST(ReadingOrder, OfAnEmptyPageIsEmpty) {
    EXPECT_TRUE(byColumns(Layout()).empty());
    Layout flat;
    flat.blocks = {{{1000, 1000, 1000, 1000}, 0, 0, Turn::Upright},
                   {{1000, 900, 1000, 900}, 0, 0, Turn::Upright}};
    EXPECT_EQ(byColumns(flat).front().box.top, 900);
}

} // namespace
} // namespace Reader
