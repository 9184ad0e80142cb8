#include "programs/reader/zone_place.h"

#include "programs/base/error.h"
#include "programs/reader/letters.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <limits>
#include <string>
#include <utility>
#include <vector>

namespace Reader {
namespace {

using namespace VLServiceTest;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

/// A zone "Top" over the first page's two top lines with a name and the mark "ref", and "Sum" with "total".
class PlacedZones : public testing::Test {
protected:
    Cfg::ExtractPreset preset_{R"_({"zones": [
        {"name": "Sum", "location": {"right": 21000, "bottom": 29700},
         "fields": [{"name": "total", "value_extract": "^Total:\\h*(?<VAL>[\\d.]+)$", "obligatory": true}]},
        {"name": "Top", "location": {"right": 21000, "bottom": 1900},
         "fields": [{"name": "name", "value_extract": "^Name: (?<VAL>.*)$"}]}]})_"_json.toObject()};
    ReadingRules rules_;
    Trace trace_;

    ZoneRules& rule() { return rules_.zones["Sum"]; }

    std::vector<Letter> lettersOf(std::string const& document) {
        Document opened = openDocument(document, "a.txt");
        trace_ = {};
        return readLetters(opened, preset_, &trace_, rules_);
    }

    /// "name value" of each field of the only letter.
    std::vector<std::string> valuesOf(std::string const& document) {
        std::vector<std::string> values;
        Letter const letter = lettersOf(document).at(0);
        for (auto const& [priority, field] : letter.fields)
            values.push_back(field.name() + ' ' + field.valueToStr());
        return values;
    }

    ZonePlace const& placeOfSum() const { return trace_.pages.at(0).zones.at(0).place; }
};

constexpr char const* THREE_PAGES = "Name: Ann\fmore\nTotal: 2\fTotal: 3";

TEST_F(PlacedZones, LieOnTheFirstPageWithoutARule) {
    EXPECT_THAT(valuesOf(THREE_PAGES), ElementsAre("name Ann"));
    EXPECT_EQ(placeOfSum().page, 1);
    EXPECT_THAT(lettersOf(THREE_PAGES).at(0).missing, ElementsAre("total"));
}

TEST_F(PlacedZones, LieOnThePageOfThatNumber) {
    rule().page = 2;
    EXPECT_THAT(valuesOf(THREE_PAGES), ElementsAre("total 2", "name Ann"));
    EXPECT_EQ(placeOfSum().page, 2);
    EXPECT_EQ(trace_.pages.at(0).zones.at(0).text, "more\nTotal: 2");
    EXPECT_EQ(trace_.pages.at(0).zones.at(1).definition->name(), "Top");
}

TEST_F(PlacedZones, LieOnTheLastPage) {
    rule().pages = ZoneRules::Pages::Last;
    EXPECT_THAT(valuesOf(THREE_PAGES), ElementsAre("total 3", "name Ann"));
    EXPECT_THAT(valuesOf("Total: 1"), ElementsAre("total 1"));
}

TEST_F(PlacedZones, LieOnTheFirstPageThatHasAFieldOfThem) {
    rule().pages = ZoneRules::Pages::Any;
    EXPECT_THAT(valuesOf(THREE_PAGES), ElementsAre("total 2", "name Ann"));
    EXPECT_EQ(placeOfSum().page, 2);
    EXPECT_THAT(valuesOf("Name: Ann\fTotal:         2\fTotal: 3"), ElementsAre("total 3", "name Ann"));
    EXPECT_THAT(valuesOf("Name: Ann\fTotal:         2\fTotal:        3"), ElementsAre("total 2", "name Ann"));
    EXPECT_EQ(placeOfSum().page, 2);
    EXPECT_THAT(valuesOf("Name: Ann\fmore"), ElementsAre("name Ann"));
    EXPECT_EQ(placeOfSum().page, 1);
}

TEST_F(PlacedZones, OfAPageThatTheLetterHasNotAreEmpty) {
    rule().page = 4;
    EXPECT_THAT(valuesOf(THREE_PAGES), ElementsAre("name Ann"));
    EXPECT_EQ(placeOfSum().page, 0);
    EXPECT_EQ(placeOfSum().whyNowhere, "the letter has no page 4");
    EXPECT_THAT(lettersOf(THREE_PAGES).at(0).missing, ElementsAre("total"));
}

TEST_F(PlacedZones, CountThePagesOfTheirLetter) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [
        {"name": "Top", "location": {"right": 21000, "bottom": 29700},
         "fields": [{"name": "ref", "mark": 1, "value_extract": "^Ref: (?<VAL>.*)$"}]},
        {"name": "Sum", "location": {"right": 21000, "bottom": 29700},
         "fields": [{"name": "total", "value_extract": "^Total: (?<VAL>.*)$"}]}]})_"_json.toObject());
    rule().pages = ZoneRules::Pages::Last;
    auto const letters = lettersOf("Ref: a\fTotal: 1\fRef: b\fTotal: 2\fTotal: 3\fRef: c\nTotal: 4");
    ASSERT_THAT(letters, SizeIs(3));
    std::vector<std::string> totals;
    for (Letter const& letter : letters)
        for (auto const& [priority, field] : letter.fields)
            if (field.name() == "total")
                totals.push_back(field.valueToStr());
    EXPECT_THAT(totals, ElementsAre("1", "3", "4"));
    ASSERT_THAT(trace_.pages, SizeIs(6));
    EXPECT_THAT(trace_.pages[2].zones, SizeIs(2));
    EXPECT_THAT(trace_.pages[1].zones, SizeIs(1));
    EXPECT_FALSE(trace_.pages[1].beginsLetter);
}

TEST_F(PlacedZones, OnOtherPagesTellNoLettersApart) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum", "location": {"right": 21000, "bottom": 29700},
        "fields": [{"name": "ref", "mark": 1, "value_extract": "^Ref: (?<VAL>.*)$"}]}]})_"_json.toObject());
    EXPECT_THAT(lettersOf("Ref: a\fRef: b"), SizeIs(2));
    rule().page = 2;
    EXPECT_THAT(lettersOf("Ref: a\fRef: b"), SizeIs(1));
    EXPECT_THAT(valuesOf("Ref: a\fRef: b"), ElementsAre("ref b"));
}

/// 10 rows of 4.2333 mm in front of the anchor's, which is the 11th, 10 columns of 2.1167 mm before it.
std::string const ANCHORED =
    "Total: 1\n\n\n\n\n\n\n\n\n\n          Sum of all\n          Total: 2\n\n\n\nTotal: 3";

TEST_F(PlacedZones, AreToldFromTheTopLeftOfTheAnchorsMatch) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum",
        "location": {"left": -100, "top": 300, "right": 4000, "bottom": 1000},
        "fields": [{"name": "total", "value_extract": "^Total: (?<VAL>.*)$"}]}]})_"_json.toObject());
    rule().anchor = "Sum of \\w+$";
    EXPECT_THAT(valuesOf(ANCHORED), ElementsAre("total 2"));
    EXPECT_EQ(placeOfSum().anchor, (Box{4617, 5233, 6733, 5586}));
    EXPECT_EQ(placeOfSum().location, (Box{4517, 5533, 8617, 6233}));
    EXPECT_EQ(placeOfSum().origin(), Point(4617, 5233));
}

TEST_F(PlacedZones, AreToldFromTheMatchAndNotFromItsLine) {
    rule().anchor = "of";
    lettersOf(ANCHORED);
    EXPECT_EQ(placeOfSum().anchor->left, 5463);
}

TEST_F(PlacedZones, WithAPointAreToldFromTheAnchorToo) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum", "most_probable_point": {"x": 0, "y": 2000},
        "fields": [{"name": "total", "value_extract": "^Total: (?<VAL>.*)$"}]}]})_"_json.toObject());
    rule().anchor = "^Sum";
    EXPECT_THAT(valuesOf(ANCHORED), ElementsAre("total 3"));
    EXPECT_EQ(placeOfSum().point, Point(4617, 7233));
}

TEST_F(PlacedZones, HaveTheirAnchorOnTheirPage) {
    rule().anchor = "^Sum";
    rule().pages = ZoneRules::Pages::Any;
    EXPECT_THAT(valuesOf("Name: Ann\f" + ANCHORED), ElementsAre("total 2", "name Ann"));
    EXPECT_EQ(placeOfSum().page, 2);
    ASSERT_TRUE(placeOfSum().anchor);
}

TEST_F(PlacedZones, AreEmptyWhereTheAnchorMatchesNothing) {
    rule().anchor = "^Summe \"x\"";
    EXPECT_THAT(valuesOf(ANCHORED), IsEmpty());
    EXPECT_EQ(placeOfSum().whyNowhere, "its anchor \"^Summe \"x\"\" matches nothing on page 1");
    EXPECT_FALSE(placeOfSum().anchor);
    EXPECT_EQ(trace_.pages.at(0).zones.at(0).text, "");
    // A match without letters has no place.
    rule().anchor = "^";
    EXPECT_THAT(valuesOf(ANCHORED), IsEmpty());
}

TEST_F(PlacedZones, AreEmptyWhereTheAnchorRunsAwayAndItIsSaid) {
    rule().anchor = "(x*)*(x*)*y";
    auto const letters = lettersOf(std::string(400, 'x'));
    EXPECT_THAT(
        letters.at(0).warnings,
        ElementsAre(
            "zone \"Sum\": its anchor \"(x*)*(x*)*y\" was given up on page 1, since it looks at too much "
            "text; \"vlmail presets lint\" tells what makes it slow"));
    EXPECT_THAT(letters.at(0).missing, ElementsAre("total"));
}

TEST_F(PlacedZones, MayReachAsFarAsNumbersGo) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum",
        "location": {"left": -2147483648, "top": -2147483648, "right": 2147483647, "bottom": 2147483647},
        "fields": [{"name": "all", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}]}]})_"_json.toObject());
    EXPECT_THAT(valuesOf("Ann\n\nMill Lane 7"), ElementsAre("all Ann\nMill Lane 7"));
    // Turned inside out it holds nothing.
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum",
        "location": {"left": 2147483647, "top": 2147483647, "right": -2147483648, "bottom": -2147483648},
        "fields": [{"name": "all", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}]}]})_"_json.toObject());
    EXPECT_THAT(valuesOf("Ann\n\nMill Lane 7"), ElementsAre("all "));
}

TEST_F(PlacedZones, AreMovedNoFartherThanNumbersGo) {
    constexpr int LAST = std::numeric_limits<int>::max();
    EXPECT_EQ((Box{-5, LAST, LAST, -LAST}).movedBy({10, 10}), (Box{5, LAST, LAST, -LAST + 10}));
    EXPECT_EQ((Box{-LAST, 0, 0, 0}).movedBy({-10, 0}).left, std::numeric_limits<int>::min());
}

TEST_F(PlacedZones, MayBeReadByColumns) {
    preset_ = Cfg::ExtractPreset(R"_({"zones": [{"name": "Sum", "location": {"right": 21000, "bottom": 29700},
        "fields": [{"name": "all", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}]}]})_"_json.toObject());
    std::string const document = "Ann             Total\n\n\nMill Lane 7     12.00";
    EXPECT_THAT(valuesOf(document), ElementsAre("all Ann\nTotal\nMill Lane 7\n12.00"));
    rule().byColumn = true;
    EXPECT_THAT(valuesOf(document), ElementsAre("all Ann\nMill Lane 7\nTotal\n12.00"));
    EXPECT_EQ(placeOfSum().order, ReadingOrder::Columns);
}

} // namespace
} // namespace Reader
