#include "programs/reader/joined_lines.h"

#include "programs/reader/layout.h"
#include "programs/reader/zone_text.h"

#include "tests/support/typesetter.h"

#include <gmock/gmock.h>

#include <limits>
#include <string>
#include <vector>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr Box PAGE{0, 0, 21000, 29700};

/// The joins of a page's lines, such as "Total: > 12.00" beside each other and "Date v today" below.
std::vector<std::string> joinsOn(Typesetter const& set) {
    ZoneText const zone = ZoneText::inside(set.page, layOut(set.page), PAGE);
    std::vector<PlacedLine> const lines = zone.placedLines();
    std::vector<std::string> joins;
    for (LineJoin const& join : joinsOf(lines)) {
        std::string& told = joins.emplace_back();
        for (std::size_t const line : join.lines)
            told += (told.empty()                 ? ""
                     : join.joint == Joint::Right ? " > "
                                                  : " v ") +
                    zone.text().substr(lines[line].offset, lines[line].length);
    }
    return joins;
}

TEST(JoinedLines, StandBesideEachOtherAtOneHeight) {
    Typesetter set;
    set.line(2000, 5000, "Total:");
    set.line(9000, 5040, "12.00");
    EXPECT_THAT(joinsOn(set), ElementsAre("Total: > 12.00"));
}

TEST(JoinedLines, OfDifferentSizesOverlapByHalfOfTheSmaller) {
    Typesetter set;
    set.line(2000, 5000, "Total:", 200);
    set.line(9000, 5060, "12.00", 600);
    EXPECT_THAT(joinsOn(set), ElementsAre("Total: > 12.00"));
    Typesetter shifted;
    shifted.line(2000, 5000, "Total:", 200);
    shifted.line(9000, 5560, "12.00", 600);
    EXPECT_THAT(joinsOn(shifted), IsEmpty());
}

TEST(JoinedLines, BesideEachOtherAreTheNearestFirstAndThenRowsOfMore) {
    Typesetter set;
    set.line(2000, 5000, "Net");
    set.line(9000, 5000, "EUR");
    set.line(15000, 5000, "10.00");
    set.line(2000, 9000, "Total");
    set.line(5000, 9000, "12.00");
    EXPECT_THAT(joinsOn(set), ElementsAre("Total > 12.00", "EUR > 10.00", "Net > EUR", "Net > EUR > 10.00"));
}

TEST(JoinedLines, OfARowAreFourAtMost) {
    Typesetter set;
    for (int column = 0; column < 6; ++column)
        set.line(1000 + 3000 * column, 5000, std::string(1, static_cast<char>('a' + column)));
    EXPECT_THAT(joinsOn(set), SizeIs(5 + 4 + 3));
}

TEST(JoinedLines, StandAboveEachOtherInOneColumn) {
    Typesetter set;
    set.line(2000, 5000, "Date");
    set.line(9000, 5000, "Customer");
    set.line(2000, 5600, "today");
    set.line(9200, 5600, "4711");
    EXPECT_THAT(joinsOn(set),
                ElementsAre("Date > Customer", "today > 4711", "Date v today", "Customer v 4711"));
}

TEST(JoinedLines, OfOneColumnMayEndAtTheSameRightEdge) {
    Typesetter set;
    int const right = set.line(9000, 5000, "Amount");
    set.line(right - 5 * Typesetter::LETTER, 5600, "12.00");
    EXPECT_THAT(joinsOn(set), ElementsAre("Amount v 12.00"));
    Typesetter beside;
    beside.line(9000, 5000, "Amount");
    beside.line(10100, 5600, "12.00");
    EXPECT_THAT(joinsOn(beside), IsEmpty());
}

TEST(JoinedLines, OfOneColumnLeaveRoomForNoMoreThanAnEmptyLine) {
    // Two font sizes lie between the bottom of one and the top of the other.
    Typesetter set;
    set.line(2000, 5000, "Date");
    set.line(2000, 5000 + 80 + 800 + 400, "today");
    EXPECT_THAT(joinsOn(set), ElementsAre("Date v today"));
    Typesetter farther;
    farther.line(2000, 5000, "Date");
    farther.line(2000, 5000 + 80 + 801 + 400, "today");
    EXPECT_THAT(joinsOn(farther), IsEmpty());
}

TEST(JoinedLines, TakeTheNearestLineBelowOnly) {
    Typesetter set;
    set.line(2000, 5000, "Date");
    set.line(2000, 5500, "today");
    set.line(2000, 6000, "soon");
    EXPECT_THAT(joinsOn(set), ElementsAre("Date v today", "today v soon"));
}

TEST(JoinedLines, RunTheSameWay) {
    Typesetter set;
    set.line(2000, 5000, "Total:");
    set.line(9000, 5000, "12.00");
    set.page.words.back().turn = Turn::UpsideDown;
    EXPECT_THAT(joinsOn(set), IsEmpty());
    set.page.words.front().turn = Turn::UpsideDown;
    EXPECT_THAT(joinsOn(set), ElementsAre("12.00 > Total:"));
}

TEST(JoinedLines, AreNotSoughtInATextThatStandsOnNoPage) {
    EXPECT_THAT(ZoneText::given("Total:\n12.00").placedLines(), IsEmpty());
}

TEST(JoinedLines, OfManyLinesInOnePlaceAreFewForEachLine) {
    std::vector<PlacedLine> lines(20'000, PlacedLine{0, 1, {1000, 1000, 2000, 1400}, 400, Turn::Upright});
    EXPECT_THAT(joinsOf(lines), IsEmpty());
    for (std::size_t i = 0; i < lines.size(); ++i) {
        int const left = static_cast<int>(i) * 3000;
        lines[i].box = {left, 1000, left + 1000, 1400};
    }
    EXPECT_THAT(joinsOf(lines), SizeIs(3 * 20'000 - 6));
}

TEST(JoinedLines, OfSizesThatNoLetterHasAreNone) {
    constexpr int FAR_AWAY = std::numeric_limits<int>::max() / 4;
    std::vector<PlacedLine> const lines{{0, 1, {0, -FAR_AWAY, 1000, FAR_AWAY}, 400, Turn::Upright},
                                        {2, 1, {2000, 0, 3000, 400}, FAR_AWAY, Turn::Upright},
                                        {4, 1, {4000, 0, 5000, 400}, 400, Turn::Upright}};
    EXPECT_THAT(joinsOf(lines), IsEmpty());
}

} // namespace
} // namespace Reader
