#include "programs/vlmail/explain/zone_change.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace VlMail {
namespace {

using Reader::Box;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr Box ZONE{5000, 5000, 10000, 10000};

struct Growth {
    char const* name;
    Box box;
    Box after;
    char const* where;
    char const* advice;
};

Growth const GROWTHS[]{
    {"Below",
     {6000, 10200, 8000, 10620},
     {5000, 5000, 10000, 10700},
     "7 mm below the zone",
     "move its bottom from 100 mm to 107 mm or more"},
    {"Above",
     {6000, 4120, 8000, 4500},
     {5000, 4100, 10000, 10000},
     "9 mm above the zone",
     "move its top from 50 mm to 41 mm or less"},
    {"Left",
     {4850, 6000, 8000, 6400},
     {4800, 5000, 10000, 10000},
     "2 mm to the left of the zone",
     "move its left from 50 mm to 48 mm or less"},
    {"Right",
     {6000, 6000, 10001, 6400},
     {5000, 5000, 10100, 10000},
     "1 mm to the right of the zone",
     "move its right from 100 mm to 101 mm or more"},
    {"Corner",
     {9000, 9900, 12000, 10300},
     {5000, 5000, 12000, 10300},
     "3 mm below and 20 mm to the right of the zone",
     "move its bottom from 100 mm to 103 mm or more and its right from 100 mm to 120 mm or more"},
    {"BeyondThePage",
     {6000, -150, 8000, 100},
     {5000, -200, 10000, 10000},
     "52 mm above the zone",
     "move its top from 50 mm to -2 mm or less"},
};

TEST(ZoneChange, GrowsToWholeMillimetres) {
    for (Growth const& growth : GROWTHS) {
        SCOPED_TRACE(growth.name);
        ZoneChange const change = grownToHold(ZONE, growth.box);
        EXPECT_EQ(change.after, growth.after);
        EXPECT_EQ(change.where("the zone"), growth.where);
        EXPECT_EQ(change.advice(), growth.advice);
    }
}

TEST(ZoneChange, IsNoneForWhatTheZoneHolds) {
    EXPECT_EQ(grownToHold(ZONE, {5000, 6000, 10000, 10000}).distance(), 0);
}

TEST(ZoneChange, TellsShrinkingAndShifting) {
    ZoneChange const shrunk{ZoneChange::Kind::Shrink, ZONE, {5000, 5000, 8000, 10000}};
    EXPECT_EQ(shrunk.where("the zone"), "with the zone 20 mm smaller at its right");
    EXPECT_EQ(shrunk.advice(), "move its right from 100 mm to 80 mm or less");
    ZoneChange const lower{ZoneChange::Kind::Shift, ZONE, {5000, 5700, 10000, 10700}};
    EXPECT_EQ(lower.distance(), 700);
    EXPECT_EQ(lower.where("the zone"), "with the zone 7 mm lower");
    EXPECT_EQ(lower.advice(), "move its bottom from 100 mm to 107 mm and its top from 50 mm to 57 mm");
    ZoneChange const higher{ZoneChange::Kind::Shift, ZONE, {5000, 4300, 10000, 9300}};
    EXPECT_EQ(higher.where("the zone"), "with the zone 7 mm higher");
    ZoneChange const right{ZoneChange::Kind::Shift, ZONE, {5700, 5000, 10700, 10000}};
    EXPECT_EQ(right.where("the zone"), "with the zone 7 mm further right");
    ZoneChange const left{ZoneChange::Kind::Shift, ZONE, {4300, 5000, 9300, 10000}};
    EXPECT_EQ(left.where("the zone"), "with the zone 7 mm further left");
}

Reader::Layout layoutOf(std::vector<Box> const& boxes) {
    Reader::Layout layout;
    for (Box const& box : boxes) {
        Reader::Block block;
        block.box = box;
        layout.blocks.push_back(block);
    }
    return layout;
}

std::vector<std::string> told(std::vector<ZoneChange> const& changes) {
    std::vector<std::string> words;
    for (ZoneChange const& change : changes)
        words.push_back(change.where("it"));
    return words;
}

TEST(ChangesByBlocks, ReachForABlockNearTheZone) {
    // Up to its bottom the zone holds it, up to its top it lies just in front of it.
    auto const words = told(changesByBlocks(ZONE, layoutOf({{6000, 10500, 8000, 11500}}), 2000));
    EXPECT_THAT(words, testing::Contains("15 mm below it"));
    EXPECT_THAT(words, testing::Contains("with it 15 mm lower"));
}

TEST(ChangesByBlocks, LeaveOutABlockInTheZoneHoweverLarge) {
    Box const wide{2000, 5000, 20000, 10000};
    auto const words = told(changesByBlocks(wide, layoutOf({{13000, 6000, 18000, 9000}}), 2000));
    EXPECT_THAT(words, testing::Contains("with it 70 mm smaller at its right"));
}

TEST(ChangesByBlocks, DoNotReachFar) {
    for (ZoneChange const& change : changesByBlocks(ZONE, layoutOf({{6000, 12500, 8000, 13500}}), 2000))
        EXPECT_NE(change.kind, ZoneChange::Kind::Grow);
}

TEST(ChangesByBlocks, CutNoBlock) {
    // Beside the near block stands one that reaches further down.
    auto const changes =
        changesByBlocks(ZONE, layoutOf({{6000, 10500, 7000, 11500}, {7500, 10500, 9000, 14000}}), 2000);
    for (ZoneChange const& change : changes)
        EXPECT_FALSE(change.kind == ZoneChange::Kind::Grow && change.after.bottom == 11500)
            << change.after.bottom;
}

TEST(ChangesByBlocks, PutWhatLosesTheBeginningLast) {
    Box const wide{2000, 5000, 20000, 10000};
    auto const changes =
        changesByBlocks(wide, layoutOf({{2500, 6000, 5000, 9000}, {13000, 6000, 18000, 9000}}), 0);
    EXPECT_THAT(told(changes), testing::Each(testing::StartsWith("with it ")));
    bool hasLost = false;
    for (ZoneChange const& change : changes) {
        EXPECT_FALSE(hasLost && !change.losesBeginning());
        hasLost = hasLost || change.losesBeginning();
    }
    EXPECT_TRUE(hasLost);
}

TEST(ChangesByBlocks, TakeZonesFromOutsideAsTheyAre) {
    constexpr int LEAST = std::numeric_limits<int>::min();
    constexpr int MOST = std::numeric_limits<int>::max();
    Reader::Layout const layout = layoutOf({{100, 100, 500, 500}});
    for (Box const& zone : {Box{LEAST, LEAST, MOST, MOST}, Box{MOST, MOST, LEAST, LEAST}, Box{0, 0, 0, 0}})
        for (ZoneChange const& change : changesByBlocks(zone, layout, 2000))
            EXPECT_FALSE(change.where("it").empty() || change.advice().empty());
}

} // namespace
} // namespace VlMail
