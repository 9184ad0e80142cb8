#include "vlservice/cfg/geometry.h"

#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <type_traits>

namespace {

using namespace VLServiceTest;
using Cfg::Point;
using Cfg::Rect;

static_assert(std::is_same_v<decltype(Point::x), std::int32_t> &&
              std::is_same_v<decltype(Rect::left), std::int32_t>);
static_assert(std::is_same_v<decltype(Point().serialize()), json::Object>);
static_assert(std::is_same_v<decltype(Rect().serialize()), json::Object>);

TEST(PointAndRect, AreZeroByDefault) {
    EXPECT_TRUE(Point().isZeroes());
    EXPECT_TRUE(Rect().isZeroes());
    EXPECT_EQ(Point(), Point(0, 0));
    EXPECT_EQ(Rect(), Rect(0, 0, 0, 0));
}

TEST(PointAndRect, AreNotZeroWithAnyCoordinate) {
    EXPECT_FALSE(Point(1, 0).isZeroes());
    EXPECT_FALSE(Point(0, 1).isZeroes());
    EXPECT_FALSE(Rect(1, 0, 0, 0).isZeroes());
    EXPECT_FALSE(Rect(0, 1, 0, 0).isZeroes());
    EXPECT_FALSE(Rect(0, 0, 1, 0).isZeroes());
    EXPECT_FALSE(Rect(0, 0, 0, 1).isZeroes());
}

TEST(PointAndRect, CompareEveryCoordinate) {
    EXPECT_NE(Point(1, 2), Point(1, 3));
    EXPECT_NE(Point(1, 2), Point(0, 2));
    EXPECT_NE(Rect(1, 2, 3, 4), Rect(0, 2, 3, 4));
    EXPECT_NE(Rect(1, 2, 3, 4), Rect(1, 0, 3, 4));
    EXPECT_NE(Rect(1, 2, 3, 4), Rect(1, 2, 0, 4));
    EXPECT_NE(Rect(1, 2, 3, 4), Rect(1, 2, 3, 0));
}

TEST(PointAndRectReading, TakesEveryKey) {
    EXPECT_EQ(Point(R"({"x": 1, "y": -2})"_json), Point(1, -2));
    EXPECT_EQ(Rect(R"({"left": 1, "top": 2, "right": 3, "bottom": 4})"_json), Rect(1, 2, 3, 4));
}

TEST(PointAndRectReading, TakesWhatIsMissingOrNoIntegerForZero) {
    EXPECT_EQ(Point(R"({"x": "7", "y": 5})"_json), Point(0, 5));
    EXPECT_EQ(Rect(R"({"left": 1.5, "top": null, "right": true, "bottom": 9})"_json), Rect(0, 0, 0, 9));
    EXPECT_EQ(Rect("{}"_json), Rect());
}

TEST(PointAndRectReading, OfTheEmptyHandleGivesZeroes) {
    EXPECT_TRUE(Point(json::Value()).isZeroes());
    EXPECT_TRUE(Rect(json::Value()).isZeroes());
}

TEST(PointAndRectReading, CutsToThirtyTwoBits) {
    EXPECT_EQ(Point(R"({"x": 4294967297, "y": 2147483648})"_json), Point(1, INT32_MIN));
}

TEST(PointAndRectReading, WantsAnObject) {
    EXPECT_EQ(messageOf([] { Point("[]"_json); }), "JSON error: Wrong type: array. Expected type: object");
    EXPECT_EQ(messageOf([] { Rect("null"_json); }), "JSON error: Wrong type: null. Expected type: object");
}

TEST(PointAndRectWriting, GivesAllKeysOrNone) {
    EXPECT_EQ(text(Point().serialize()), "{}");
    EXPECT_EQ(text(Point(0, 3).serialize()), R"({"x":0,"y":3})");
    EXPECT_EQ(text(Rect().serialize()), "{}");
    EXPECT_EQ(text(Rect(0, 0, 7, 0).serialize()), R"({"left":0,"top":0,"right":7,"bottom":0})");
}

TEST(PointAndRectWriting, IsReadBack) {
    for (Rect const& rect : {Rect(), Rect(1, -2, 3, -4), Rect(INT32_MIN, INT32_MAX, 0, 0)})
        EXPECT_EQ(Rect(rect.serialize()), rect);
    for (Point const& point : {Point(), Point(1, -2), Point(INT32_MIN, INT32_MAX)})
        EXPECT_EQ(Point(point.serialize()), point);
}

} // namespace
