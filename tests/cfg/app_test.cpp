#include "vlservice/cfg/app.h"

#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace VLServiceTest;
using Cfg::App;
using Cfg::AppFieldIdxs;
using Cfg::ShowCtrls;

constexpr char const* GLOBAL_DEFAULTS =
    R"({"show_ctrls":{"inh":true,"v":[-1,16383]},"priority_delivery":{"inh":true,"v":0},)"
    R"("db_name":{"inh":true,"v":""},"db_host":{"inh":true,"v":""},)"
    R"("print_area":{"inh":true,"v":{"left":300,"top":300,"right":20700,"bottom":29300}},)"
    R"("descr":{"inh":true,"v":""},"dep_alias":{"inh":true,"v":""},"auto_save_preset":{"inh":true,"v":true},)"
    R"("max_letter_sheets":{"inh":true,"v":999},"enfoce_dep":{"inh":true,"v":false},)"
    R"("enforce_po":{"inh":true,"v":false},"enforce_profile":{"inh":true,"v":false},)"
    R"("loose_letter_deviation":{"inh":true,"v":false},"debug_view":{"inh":true,"v":0},"m":{"inh":true,"v":0}})";

TEST(AppPart, HasItsName) { EXPECT_EQ(App::PART_NAME, "app"); }

TEST(AppPart, BuiltByDefaultHasAnOwnZeroForM) {
    EXPECT_EQ(text(App().serialize()), R"({"m":0})");
    EXPECT_FALSE(App().global());
}

TEST(AppPart, BuiltFromNothingIsEntirelyInherited) {
    EXPECT_EQ(text(App(json::Value(), false, false).serialize()), "#absent#");
}

TEST(AppPart, BuiltFromNothingForTheRootWritesAllFifteenKeysAsWrappersWithTheDefaults) {
    EXPECT_EQ(text(App(json::Value(), true, false).serialize()), GLOBAL_DEFAULTS);
    EXPECT_EQ(text(App(App(json::Value(), true, false).serialize(), true, false).serialize()),
              GLOBAL_DEFAULTS);
}

TEST(AppPart, OfTheRootKeepsItsOwnValuesAndWritesThemPlain) {
    App const app(R"({"max_letter_sheets": 50})"_json, true, false);
    EXPECT_EQ(app.value<AppFieldIdxs::MaxLetterSheets>(), 50);
    EXPECT_EQ(text(app.serialize().toObject().get("max_letter_sheets")), "50");
    EXPECT_TRUE(app.value<AppFieldIdxs::AutoSavePreset>());
}

TEST(AppPart, OfTheRootReplacesWrappedValuesByTheDefaults) {
    App const app(
        R"({"max_letter_sheets": {"inh": true, "v": 50}, "debug_view": {"inh": true, "v": 3}})"_json, true,
        false);
    EXPECT_EQ(app.value<AppFieldIdxs::MaxLetterSheets>(), 999);
    EXPECT_TRUE(app.isInherited<AppFieldIdxs::MaxLetterSheets>());
    EXPECT_EQ(app.value<AppFieldIdxs::DebugView>(), 3);
}

TEST(AppPart, BelowTheRootKeepsWrappedValues) {
    App const app(R"({"max_letter_sheets": {"inh": true, "v": 50}})"_json, false, false);
    EXPECT_EQ(app.value<AppFieldIdxs::MaxLetterSheets>(), 50);
}

TEST(AppPart, CutsIntegersToThirtyTwoBits) {
    App const app(R"({"max_letter_sheets": 4294967297, "priority_delivery": 2147483648})"_json, false, false);
    EXPECT_EQ(app.value<AppFieldIdxs::MaxLetterSheets>(), 1);
    EXPECT_EQ(static_cast<long long>(app.value<AppFieldIdxs::PriorityDelivery>()), -2147483648LL);
    EXPECT_EQ(text(app.serialize()), R"({"priority_delivery":-2147483648,"max_letter_sheets":1})");
}

TEST(AppPart, KeepsAnyPriorityDelivery) {
    App const app(R"({"priority_delivery": 77})"_json, false, false);
    EXPECT_EQ(text(app.serialize()), R"({"priority_delivery":77})");
    EXPECT_EQ(static_cast<int>(Cfg::PriorityDelivery::Default), 0);
}

TEST(AppPart, DropsKeysThatItDoesNotKnow) {
    EXPECT_EQ(text(App(R"({"enforce_dep": true, "debug_view": 1})"_json, false, false).serialize()),
              R"({"debug_view":1})");
}

TEST(AppDescription, IsOnlyTheOwnOne) {
    App own(R"({"descr": "Acme"})"_json, false, false);
    EXPECT_EQ(own.getDescription(), "Acme");
    App wrapped(R"({"descr": {"inh": true, "v": "Acme"}})"_json, false, false);
    EXPECT_EQ(wrapped.getDescription(), "");
    EXPECT_EQ(wrapped.value<AppFieldIdxs::Descr>(), "Acme");
    App inherited(json::Value(), false, false);
    inherited.combineParent(own);
    EXPECT_EQ(inherited.getDescription(), "");
    EXPECT_EQ(inherited.value<AppFieldIdxs::Descr>(), "Acme");
    inherited.setOwn<AppFieldIdxs::Descr>("Here");
    EXPECT_EQ(inherited.getDescription(), "Here");
}

TEST(AppPart, IsAPlainValue) {
    App const app(R"({"db_name": "letters", "show_ctrls": [5]})"_json, true, false);
    App copy = app;
    EXPECT_EQ(copy.serialize(), app.serialize());
    copy = App();
    EXPECT_EQ(text(copy.serialize()), R"({"m":0})");
}

struct CtrlsCase {
    char const* array;
    char const* written;
};

TEST(ShowCtrlsForm, GivesSixtyFourBitsToAnInteger) {
    CtrlsCase const cases[] = {
        {"[]", "[0,0]"},          {"[1]", "[1,0]"},
        {"[-1]", "[-1,0]"},       {"[-1,16383]", "[-1,16383]"},
        {"[0,1]", "[0,1]"},       {"[0,-1]", "[0,16383]"},
        {"[0,16384]", "[0,0]"},   {"[3,-1,-1]", "[3,16383]"},
        {"[0,0,9,9,9]", "[0,0]"}, {"[-9223372036854775808]", "[-9223372036854775808,0]"},
    };
    for (CtrlsCase const& c : cases) {
        json::Value const array = operator""_json(c.array, std::string(c.array).size());
        EXPECT_EQ(text(ShowCtrls(array).serialize()), c.written) << c.array;
    }
}

TEST(ShowCtrlsForm, TakesTheLowestBitFirst) {
    ShowCtrls const ctrls("[5,4]"_json);
    EXPECT_TRUE(ctrls.bits().test(0));
    EXPECT_FALSE(ctrls.bits().test(1));
    EXPECT_TRUE(ctrls.bits().test(2));
    EXPECT_TRUE(ctrls.bits().test(66));
    EXPECT_EQ(ctrls.bits().count(), 3u);
    EXPECT_EQ(ctrls.bits().size(), 78u);
}

TEST(ShowCtrlsForm, ReadsBackEachBit) {
    for (std::size_t bit = 0; bit < ShowCtrls::COUNT; ++bit) {
        ShowCtrls ctrls;
        ctrls.bits().set(bit);
        EXPECT_EQ(ShowCtrls(ctrls.serialize()), ctrls) << bit;
        EXPECT_NE(ctrls, ShowCtrls()) << bit;
    }
}

TEST(ShowCtrlsForm, WantsAnArrayOfIntegers) {
    EXPECT_EQ(messageOf([] { ShowCtrls("1"_json); }),
              "JSON error: Wrong type: integer. Expected type: array");
    EXPECT_EQ(messageOf([] { ShowCtrls(R"([1, "2"])"_json); }),
              "JSON error: Wrong type: string. Expected type: integer");
    EXPECT_EQ(messageOf([] { ShowCtrls("[1, 2, 3, 1.5]"_json); }),
              "JSON error: Wrong type: float. Expected type: integer");
    EXPECT_EQ(messageOf([] { App(R"({"show_ctrls": [true]})"_json, false, false); }),
              "JSON error: Wrong type: boolean. Expected type: integer");
}

TEST(ShowCtrlsForm, OfTheEmptyHandleHasNoBitSet) { EXPECT_TRUE(ShowCtrls(json::Value()).bits().none()); }

} // namespace
