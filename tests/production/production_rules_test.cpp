#include "programs/production/production_rules.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

namespace {

using namespace VLServiceTest;
using Production::ProductionRules;
using Reader::Box;
using Reader::RulesFault;
using testing::IsEmpty;

struct Read {
    std::vector<RulesFault> faults;
    ProductionRules rules;
};

Read read(json::Value const& production) {
    Read result;
    result.rules = ProductionRules::from(production, result.faults);
    return result;
}

/// "PATH: what; advice", a line a fault.
std::string faultsOf(json::Value const& production) {
    std::string text;
    for (RulesFault const& fault : read(production).faults)
        text += (text.empty() ? "" : "\n") + Reader::placeInWords(ProductionRules::KEY, fault) + ' ' +
                fault.what + "; " + fault.advice;
    return text;
}

TEST(CarriersRules, AreEmptyWhereAPackPresetSaysNothing) {
    auto const [faults, rules] = read({});
    EXPECT_THAT(faults, IsEmpty());
    EXPECT_FALSE(rules.isGiven);
    EXPECT_EQ(rules.sheet, Production::A4_SHEET);
    EXPECT_EQ(rules.tolerance, 100);
    EXPECT_FALSE(rules.window);
    EXPECT_TRUE(read("{}"_json).rules.isGiven);
}

TEST(CarriersRules, AreReadKeyByKey) {
    auto const [faults, rules] = read(R"({
        "sheet": {"width": 21590, "height": 27940},
        "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
        "clear_zones": [{"left": 0, "top": 27000, "right": 21590, "bottom": 27940, "pages": "all"},
                        {"left": 15000, "top": 0, "right": 21590, "bottom": 4000}],
        "tolerance": 50, "address_lines": {"min": 3, "max": 6}, "postcode": "\\d{5}",
        "repair": ["cover-page"], "fallback": ["email", "postal"]})"_json);
    EXPECT_THAT(faults, IsEmpty());
    EXPECT_EQ(rules.sheet, Production::LETTER_SHEET);
    EXPECT_EQ(rules.window, (Box{2000, 4500, 10500, 9000}));
    ASSERT_EQ(rules.clearZones.size(), 2U);
    EXPECT_TRUE(rules.clearZones[0].isOnEveryPage);
    EXPECT_EQ(rules.clearZones[1].box, (Box{15000, 0, 21590, 4000}));
    EXPECT_FALSE(rules.clearZones[1].isOnEveryPage);
    EXPECT_EQ(rules.tolerance, 50);
    EXPECT_EQ(rules.minLines, 3);
    EXPECT_EQ(rules.maxLines, 6);
    EXPECT_EQ(rules.postcode, "\\d{5}");
    EXPECT_TRUE(rules.makesCoverPage);
}

TEST(CarriersRules, AreRefusedWithPlaceAndRemedy) {
    std::string const area = "write \"left\" less than \"right\", and \"top\" less than \"bottom\"";
    std::string const integer = "write one; lengths are in 1/100 mm";
    std::string const channels = "write names of channels such as [\"email\", \"postal\"]";
    std::pair<json::Value, std::string> const table[] = {
        {json::Value("a"), R"("production" is no object; write an object such as {"window": {...}})"},
        {R"({"windows": 1})"_json,
         R"("production/windows" "windows" is no key here; write one of "sheet", "window", "clear_zones", )"
         R"("tolerance", "address_lines", "postcode", "repair", "copies", "fallback", "duplicate_days")"},
        {R"({"sheet": {"width": 21000}})"_json, "\"production/sheet/height\" is missing; " + integer},
        {R"({"sheet": {"width": 0, "height": 99999999999}})"_json,
         "\"production/sheet/width\" is no integer from 1 to 200000; " + integer +
             "\n\"production/sheet/height\" is no integer from 1 to 200000; " + integer},
        {R"({"window": {"left": 9000, "top": 0, "right": 2000, "bottom": 100}})"_json,
         "\"production/window\" has no area: it goes from 90 to 20 mm across and from 0 to 1 mm down; " +
             area},
        {R"({"window": {"left": 0, "top": 0, "right": 21001, "bottom": 100}})"_json,
         "\"production/window\" reaches beyond the sheet of 210 by 297 mm; write edges on the sheet, in "
         "1/100 "
         "mm, or another \"sheet\""},
        {R"({"window": {"left": -5, "top": 0, "right": 2100, "bottom": 100}})"_json,
         "\"production/window\" reaches beyond the sheet of 210 by 297 mm; write edges on the sheet, in "
         "1/100 "
         "mm, or another \"sheet\""},
        {R"({"window": {"left": "0", "top": 0, "right": 2100, "bottom": 100}})"_json,
         "\"production/window/left\" is no integer from -200000 to 200000; " + integer},
        {R"({"clear_zones": {}})"_json,
         "\"production/clear_zones\" is no list of at most 100 zones; write a list such as [{\"left\": 0, "
         "\"top\": 28000, \"right\": 21000, \"bottom\": 29700, \"pages\": \"all\"}]"},
        {R"({"clear_zones": [{"left": 0, "top": 0, "right": 5, "bottom": 5, "pages": "last"}]})"_json,
         "\"production/clear_zones/0/pages\" is neither \"first\" nor \"all\"; write \"first\" or \"all\""},
        {R"({"clear_zones": [7]})"_json,
         "\"production/clear_zones/0\" is no object; write an object such as {\"left\": 2000, \"top\": 4500, "
         "\"right\": 10500, \"bottom\": 9000}"},
        {R"({"tolerance": -1})"_json, "\"production/tolerance\" is no integer from 0 to 2000; " + integer},
        {R"({"tolerance": 1.5})"_json, "\"production/tolerance\" is no integer from 0 to 2000; " + integer},
        {R"({"address_lines": {"min": 0}})"_json,
         "\"production/address_lines/min\" is no integer from 1 to 100; " + integer},
        {R"({"address_lines": {"min": 5, "max": 3}})"_json,
         "\"production/address_lines\" wants at least 5 and at most 3 lines; write \"min\" not above "
         "\"max\""},
        {R"({"postcode": ""})"_json,
         R"("production/postcode" is no pattern; write a pattern such as "\\b\\d{5}\\b")"},
        {R"({"copies": 100})"_json, "\"production/copies\" is no integer from 1 to 99; " + integer},
        {R"({"duplicate_days": -1})"_json,
         "\"production/duplicate_days\" is no integer from 0 to 3650; " + integer},
        {R"({"duplicate_days": 3651})"_json,
         "\"production/duplicate_days\" is no integer from 0 to 3650; " + integer},
        {R"({"fallback": "postal"})"_json,
         "\"production/fallback\" is no list of at most 16 channels; " + channels},
        {R"({"fallback": ["email", "By Post", 7]})"_json,
         "\"production/fallback/1\" is no name of a channel; " + channels +
             "\n\"production/fallback/2\" is no name of a channel; " + channels},
        {R"({"repair": "cover-page"})"_json, R"("production/repair" is no list; write ["cover-page"])"},
        {R"({"repair": ["paint"]})"_json,
         R"("production/repair/0" is no repair that is known; write "cover-page")"},
        {R"({"repair": ["cover-page"]})"_json,
         R"("production/repair/0" has no window for the address; add "window")"},
    };
    for (auto const& [production, text] : table)
        EXPECT_EQ(faultsOf(production), text);
}

TEST(CarriersRules, RefuseABrokenPostcodeWithItsPlace) {
    EXPECT_THAT(faultsOf(R"({"postcode": "(\\d{5}"})"_json),
                testing::MatchesRegex("\"production/postcode\" is broken at character [0-9]+ \\(.*\\); "
                                      "correct the pattern"));
}

TEST(CarriersRules, CountAsNotSaidWhereTheyCannotBeUsed) {
    ProductionRules const rules = read(R"({
        "sheet": {"width": -1, "height": 1}, "window": {"left": 5}, "clear_zones": [{}, {"left": 0, "top": 0,
        "right": 10, "bottom": 10}], "tolerance": "big", "address_lines": 3, "postcode": 5, "repair":
        [5]})"_json)
                                      .rules;
    EXPECT_EQ(rules.sheet, Production::A4_SHEET);
    EXPECT_FALSE(rules.window);
    EXPECT_EQ(rules.clearZones.size(), 1U);
    EXPECT_EQ(rules.tolerance, 100);
    EXPECT_EQ(rules.minLines, 0);
    EXPECT_EQ(rules.postcode, "");
    EXPECT_FALSE(rules.makesCoverPage);
}

TEST(CarriersRules, AreTakenOutOfAPackPreset) {
    std::vector<RulesFault> faults;
    Cfg::PackPreset const preset(json::Object{{"name", "A"}, {"production", R"({"tolerance": 7})"_json}}, {});
    EXPECT_EQ(ProductionRules::of(preset, faults).tolerance, 7);
    EXPECT_FALSE(ProductionRules::of(Cfg::PackPreset(), faults).isGiven);
    EXPECT_THAT(faults, IsEmpty());
}

} // namespace
