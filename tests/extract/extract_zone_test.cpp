#include "vlservice/extract/extract_zones.h"

#include "support.h"

#include <gmock/gmock.h>

#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace Cfg {
namespace {

using testing::StrEq;
using testing::ThrowsMessage;

ExtractField field(std::string const& name, int priority = 0) {
    return ExtractField(json::Object{{"name", name}, {"priority", priority}});
}

ExtractField named(std::string const& name, std::string const& pattern) {
    return ExtractField(json::Object{{"name", name}, {"value_extract", pattern}});
}

std::vector<std::string> namesOf(ExtractZone const& zone) {
    std::vector<std::string> names;
    for (auto const& each : zone.fields())
        names.push_back(each.name());
    return names;
}

std::vector<ExtractField> fieldsNamed(std::vector<std::string> const& names) {
    std::vector<ExtractField> fields;
    for (auto const& name : names)
        fields.push_back(field(name));
    return fields;
}

ExtractZones zonesOf(std::vector<std::vector<std::string>> const& zones) {
    ExtractZones list;
    for (auto const& names : zones)
        list.emplace_back("zone", fieldsNamed(names));
    return list;
}

std::string const SINGLE = ExtractZones::SINGLE_LTR_FLD_NAME;

TEST(ExtractZoneConstants, AreThoseOfTheClient) {
    EXPECT_EQ(ExtractZone::DEF_ZONE_NAME, "_Address");
    EXPECT_EQ(ExtractZone::DEF_MOST_PROBABLE_POINT, Point(4500, 6200));
    EXPECT_EQ(ExtractZones::SINGLE_LTR_FLD_NAME, "Single Letter Documents (Automatic)");
    EXPECT_EQ(static_cast<int>(CombineBlocksMethod::Default), 0);
    EXPECT_EQ(static_cast<int>(RestrictZoneLocation::Default), 0);
    static_assert(std::is_same_v<std::underlying_type_t<CombineBlocksMethod>, std::int32_t>);
    static_assert(std::is_same_v<std::underlying_type_t<RestrictZoneLocation>, std::int32_t>);
}

TEST(ZoneConstruction, LeavesOutWhatIsNotGiven) {
    ExtractZone const none;
    EXPECT_EQ(print(none.serialize()), R"({"name":"","fields":[]})");

    ExtractZone const named("Z", fieldsNamed({"a"}));
    EXPECT_EQ(print(named.serialize()), R"({"name":"Z","fields":[{"name":"a"}]})");

    ExtractZone const placed("Z", {}, Rect(1, 2, 3, 4), CombineBlocksMethod(5), RestrictZoneLocation(6));
    EXPECT_EQ(placed.location(), Rect(1, 2, 3, 4));
    EXPECT_EQ(placed.mostProbablePoint(), ExtractZone::DEF_MOST_PROBABLE_POINT);
    EXPECT_EQ(static_cast<int>(placed.combineBlocks()), 5);
    EXPECT_EQ(static_cast<int>(placed.restrictToLocation()), 6);
}

TEST(ZoneReading, NeedsANameAndFields) {
    struct {
        char const* zone;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {R"({"fields":[]})", "empty", "string"},
        {R"({"name":5,"fields":[]})", "integer", "string"},
        {R"({"name":"Z"})", "empty", "array"},
        {R"({"name":"Z","fields":{}})", "object", "array"},
        {R"({"name":"Z","fields":null})", "null", "array"},
        {R"({"name":"Z","fields":[{"name":"a"},"b"]})", "string", "object"},
        {R"({"name":"Z","fields":[{"priority":1}]})", "empty", "string"},
        {R"({"name":"Z","fields":[],"location":[1,2,3,4]})", "array", "object"},
        {R"({"name":"Z","fields":[],"most_probable_point":7})", "integer", "object"},
    };
    for (auto const& row : rows)
        expectWrongType([&] { ExtractZone zone(parse(row.zone)); }, row.actual, row.wanted);
}

TEST(ZoneReading, TakesANameAndNoFieldsAndWritesThemBack) {
    ExtractZone const zone(parse(R"({"name":"Z","fields":[]})"));
    EXPECT_FALSE(zone.hasLocation());
    EXPECT_EQ(zone.mostProbablePoint(), Point(4500, 6200));
    EXPECT_EQ(print(zone.serialize()), R"({"name":"Z","fields":[]})");
}

TEST(ZoneReading, TakesEveryKeyAndWritesThemInOrder) {
    std::string const all =
        R"({"name":"Z","fields":[{"name":"b"},{"name":"a","priority":1}],)"
        R"("location":{"left":1,"top":2,"right":3,"bottom":4},"most_probable_point":{"x":5,"y":6},)"
        R"("combine_blocks":7,"restrict_to_location":-8})";
    ExtractZone const zone(parse(all));
    EXPECT_EQ(zone.name(), "Z");
    EXPECT_EQ(namesOf(zone), (std::vector<std::string>{"b", "a"}));
    EXPECT_EQ(zone.location(), Rect(1, 2, 3, 4));
    EXPECT_EQ(zone.mostProbablePoint(), Point(5, 6));
    EXPECT_EQ(static_cast<int>(zone.combineBlocks()), 7);
    EXPECT_EQ(static_cast<int>(zone.restrictToLocation()), -8);
    EXPECT_EQ(print(zone.serialize()), all);
}

TEST(ZoneReading, TakesMethodsOfAnotherJsonTypeAsMissing) {
    ExtractZone const zone(
        parse(R"({"name":"Z","fields":[],"combine_blocks":"1","restrict_to_location":1.5})"));
    EXPECT_EQ(print(zone.serialize()), R"({"name":"Z","fields":[]})");
}

TEST(ZoneLocation, IsAnyCoordinateThatIsNotZero) {
    for (Rect const& rect : {Rect(1, 0, 0, 0), Rect(0, -1, 0, 0), Rect(0, 0, 1, 0), Rect(0, 0, 0, 1)}) {
        ExtractZone zone;
        zone.setLocation(rect);
        EXPECT_TRUE(zone.hasLocation());
        EXPECT_TRUE(zone.serialize().get("location"));
    }
    EXPECT_FALSE(ExtractZone().hasLocation());
}

TEST(ZoneLocation, KeepsThePointButGivesWayToOne) {
    ExtractZone zone;
    zone.setMostProbablePoint({5, 6});
    zone.setLocation({1, 2, 3, 4});
    EXPECT_EQ(zone.mostProbablePoint(), Point(5, 6));
    EXPECT_TRUE(zone.hasLocation());
    zone.setMostProbablePoint({7, 8});
    EXPECT_FALSE(zone.hasLocation());
    EXPECT_EQ(zone.mostProbablePoint(), Point(7, 8));
}

TEST(ZoneLocation, GivesWayToThePointZeroWhichIsTheDefault) {
    ExtractZone zone;
    zone.setLocation({1, 2, 3, 4});
    zone.setMostProbablePoint({0, 0});
    EXPECT_FALSE(zone.hasLocation());
    EXPECT_EQ(zone.mostProbablePoint(), ExtractZone::DEF_MOST_PROBABLE_POINT);
}

TEST(ZonePoint, WithOneCoordinateIsAPoint) {
    ExtractZone zone;
    zone.setMostProbablePoint({0, 6});
    EXPECT_EQ(zone.mostProbablePoint(), Point(0, 6));
    EXPECT_TRUE(zone.serialize().get("most_probable_point"));
}

TEST(ZoneAccess, StoresWhatIsSet) {
    ExtractZone zone;
    zone.setName("Z");
    zone.setCombineBlocks(CombineBlocksMethod(3));
    zone.setRestrictToLocation(RestrictZoneLocation(4));
    zone.fields().push_back(field("a"));
    EXPECT_EQ(print(zone.serialize()),
              R"({"name":"Z","fields":[{"name":"a"}],"combine_blocks":3,"restrict_to_location":4})");
}

TEST(ZoneAddress, IsAFieldOfPositivePriority) {
    EXPECT_FALSE(ExtractZone().hasAddress());
    EXPECT_FALSE(ExtractZone("Z", {field("a"), field("b", -1)}).hasAddress());
    EXPECT_TRUE(ExtractZone("Z", {field("a"), field("b", 1)}).hasAddress());
}

TEST(ZoneEquality, ComparesEverything) {
    void (*const changes[])(ExtractZone&) = {
        [](ExtractZone& z) { z.setName("Y"); },
        [](ExtractZone& z) {
            z.setLocation({1, 0, 0, 0});
        },
        [](ExtractZone& z) {
            z.setMostProbablePoint({1, 0});
        },
        [](ExtractZone& z) { z.setCombineBlocks(CombineBlocksMethod(1)); },
        [](ExtractZone& z) { z.setRestrictToLocation(RestrictZoneLocation(1)); },
        [](ExtractZone& z) { z.fields().pop_back(); },
        [](ExtractZone& z) { std::swap(z.fields()[0], z.fields()[1]); },
        [](ExtractZone& z) { z.fields()[1].setWidth(1); },
    };
    ExtractZone const zone("Z", fieldsNamed({"a", "b"}));
    EXPECT_TRUE(zone == ExtractZone("Z", fieldsNamed({"a", "b"})));
    EXPECT_FALSE(zone != ExtractZone("Z", fieldsNamed({"a", "b"})));
    for (auto const change : changes) {
        ExtractZone other = zone;
        change(other);
        EXPECT_TRUE(zone != other) << print(other.serialize());
        EXPECT_FALSE(zone == other) << print(other.serialize());
    }
}

TEST(ZoneEquality, ComparesTheStoredPointNotTheDefault) {
    ExtractZone stored;
    stored.setMostProbablePoint(ExtractZone::DEF_MOST_PROBABLE_POINT);
    EXPECT_EQ(stored.mostProbablePoint(), ExtractZone().mostProbablePoint());
    EXPECT_NE(stored, ExtractZone());
}

TEST(ZoneList, IsAVectorOfZones) {
    static_assert(std::is_base_of_v<std::vector<ExtractZone>, ExtractZones>);
    ExtractZones list;
    list.push_back(ExtractZone("a", {}));
    list.insert(list.begin(), ExtractZone("b", {}));
    ExtractZones const copy = list;
    list.erase(list.begin());
    EXPECT_EQ(list.size(), 1u);
    EXPECT_EQ(copy.size(), 2u);
    list.resize(3);
    EXPECT_EQ(list[2].name(), "");
    list = copy;
    ExtractZones const moved = std::move(list);
    EXPECT_EQ(moved, copy);
}

TEST(ZoneSearch, FindsTheFirstFieldOfExactlyTheName) {
    ExtractZones list = zonesOf({{"a"}, {"b", "c", "c"}, {"a", "c"}});
    EXPECT_EQ(list.findField("a"), &list[0].fields()[0]);
    EXPECT_EQ(list.findField("c"), &list[1].fields()[1]);
    EXPECT_EQ(&list.field("c"), &list[1].fields()[1]);
    EXPECT_EQ(list.findField("C"), nullptr);
    EXPECT_EQ(ExtractZones().findField(""), nullptr);
}

TEST(ZoneSearch, SaysWhichFieldIsMissing) {
    EXPECT_THAT([] { zonesOf({{"a"}}).field("Total"); },
                ThrowsMessage<std::runtime_error>(StrEq("Failed to fine field Total in any zone")));
}

TEST(SingleLetterField, IsAnIntegerThatBeginsNoLetter) {
    ExtractZones list;
    list.setSingleLetterField(true);
    ASSERT_EQ(list.size(), 1u);
    EXPECT_EQ(print(list.front().serialize()),
              R"x({"name":"","fields":[{"name":"Single Letter Documents (Automatic)","mark":2,)x"
              R"x("value_type":1,"default_value":0}]})x");
    EXPECT_FALSE(list.front().fields().front().mustHave());
}

TEST(SingleLetterField, YieldsZeroForAnyText) {
    ExtractZones list;
    list.setSingleLetterField(true);
    std::string text = "any";
    auto const value = list.field(SINGLE).extractField(text);
    ASSERT_TRUE(value);
    EXPECT_EQ(value->name(), SINGLE);
    EXPECT_EQ(typed(*value), plain(0));
}

TEST(SingleLetterField, IsAddedOnceBehindTheOthersOfTheFirstZone) {
    ExtractZones list = zonesOf({{"a", "b"}, {"c"}});
    EXPECT_FALSE(list.hasSinlgeLetterField());
    list.setSingleLetterField(true);
    list.setSingleLetterField(true);
    EXPECT_TRUE(list.hasSinlgeLetterField());
    EXPECT_EQ(namesOf(list[0]), (std::vector<std::string>{"a", "b", SINGLE}));
    EXPECT_EQ(namesOf(list[1]), (std::vector<std::string>{"c"}));
}

TEST(SingleLetterField, IsLookedForInTheFirstZoneAlone) {
    ExtractZones list = zonesOf({{"a"}, {SINGLE}});
    EXPECT_FALSE(list.hasSinlgeLetterField());
    list.setSingleLetterField(false);
    EXPECT_EQ(namesOf(list[1]), (std::vector<std::string>{SINGLE}));
    list.setSingleLetterField(true);
    EXPECT_EQ(namesOf(list[0]), (std::vector<std::string>{"a", SINGLE}));
    EXPECT_EQ(list.findField(SINGLE), &list[0].fields()[1]);
}

TEST(SingleLetterField, IsTakenOutOfTheFirstZoneOnce) {
    ExtractZones list = zonesOf({{"a", SINGLE, "b", SINGLE}, {SINGLE}});
    list.setSingleLetterField(false);
    EXPECT_EQ(namesOf(list[0]), (std::vector<std::string>{"a", "b", SINGLE}));
    EXPECT_EQ(namesOf(list[1]), (std::vector<std::string>{SINGLE}));
    list.setSingleLetterField(false);
    list.setSingleLetterField(false);
    EXPECT_EQ(namesOf(list[0]), (std::vector<std::string>{"a", "b"}));
}

TEST(SingleLetterField, IsNotTakenOutOfNothing) {
    ExtractZones list;
    list.setSingleLetterField(false);
    EXPECT_TRUE(list.empty());
}

TEST(SingleLetterField, LeavesTheOthersTheirPatternsWhenItIsTakenOut) {
    ExtractZones list;
    list.emplace_back("Z", std::vector{named("a", "(?<VAL>A)"), named(SINGLE, "(?<VAL>S)"),
                                       named("b", "(?<VAL>B)"), named("c", "(?<VAL>C)")});
    auto const valueOfEach = [&list] {
        std::vector<std::string> values;
        for (auto const& each : list.front().fields()) {
            std::string text = "ABCS";
            values.push_back(each.extractField(text)->strVal());
        }
        return values;
    };
    EXPECT_EQ(valueOfEach(), (std::vector<std::string>{"A", "S", "B", "C"}));
    list.setSingleLetterField(false);
    EXPECT_EQ(valueOfEach(), (std::vector<std::string>{"A", "B", "C"}));
}

} // namespace
} // namespace Cfg
