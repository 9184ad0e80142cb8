#include "programs/base/error.h"
#include "programs/reader/letters.h"

#include "tests/support/json_literal.h"
#include "vlservice/platform/log.h"

#include <gmock/gmock.h>

#include <chrono>
#include <vector>

namespace Reader {
namespace {

using namespace VLServiceTest;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::SizeIs;

/// A preset with one zone over the whole page.
Cfg::ExtractPreset presetWith(char const* fields) {
    std::string const all = R"({"match": ".*", "zones": [{"name": "All",
        "location": {"right": 100000, "bottom": 100000}, "fields": )" +
                            std::string(fields) + "}]}";
    return Cfg::ExtractPreset(json::strToObject(all.data(), all.size()));
}

std::vector<Letter> lettersOf(std::string const& document, Cfg::ExtractPreset const& preset,
                              Trace* trace = nullptr) {
    Document opened = openDocument(document, "a.txt");
    return readLetters(opened, preset, trace);
}

/// Names and values of the fields of a letter, in their order.
std::vector<std::pair<std::string, std::string>> valuesOf(Letter const& letter) {
    std::vector<std::pair<std::string, std::string>> values;
    for (auto const& [priority, field] : letter.fields)
        values.emplace_back(field.name(), text(field.rawValue()));
    return values;
}

std::vector<std::vector<int>> pagesOf(std::vector<Letter> const& letters) {
    std::vector<std::vector<int>> pages;
    for (Letter const& letter : letters)
        pages.push_back(letter.pages);
    return pages;
}

constexpr char const* REF_MARKS = R"([{"name": "ref", "mark": 1, "value_extract": "^Ref: (?<VAL>.*)$"}])";

TEST(Letters, WithoutAMarkTheDocumentIsOne) {
    auto const letters =
        lettersOf("Ref: a\fRef: b", presetWith(R"([{"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$"}])"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2)));
    EXPECT_THAT(valuesOf(letters[0]), ElementsAre(Pair("ref", "\"a\"")));
}

TEST(Letters, BeginWhereAMarkedFieldIsFound) {
    auto const letters = lettersOf("Ref: a\fmore\fRef: b\fRef: c\fmore", presetWith(REF_MARKS));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2), ElementsAre(3), ElementsAre(4, 5)));
    EXPECT_THAT(valuesOf(letters[1]), ElementsAre(Pair("ref", "\"b\"")));
}

TEST(Letters, EveryMarkButTheSingleLetterOneSeparates) {
    for (int mark : {1, 3, -1, 17}) {
        std::string const fields = R"([{"name": "ref", "mark": )" + std::to_string(mark) +
                                   R"(, "value_extract": "^Ref: (?<VAL>.*)$"}])";
        EXPECT_THAT(lettersOf("Ref: a\fRef: b", presetWith(fields.c_str())), SizeIs(2)) << mark;
    }
}

TEST(Letters, PagesInFrontOfTheFirstMarkAreOneToo) {
    auto const letters = lettersOf("cover\fcover\fRef: b", presetWith(REF_MARKS));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2), ElementsAre(3)));
    EXPECT_THAT(letters[0].missing, ElementsAre("ref"));
    EXPECT_THAT(letters[1].missing, IsEmpty());
}

TEST(Letters, AFieldMarkedAsSingleLetterKeepsTheDocumentWhole) {
    auto const letters = lettersOf("Ref: a\fRef: b", presetWith(R"([
        {"name": "ref", "mark": 1, "value_extract": "^Ref: (?<VAL>.*)$"},
        {"name": "Single", "mark": 2, "default_value": 0}])"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2)));
    EXPECT_THAT(valuesOf(letters[0]), ElementsAre(Pair("ref", "\"a\""), Pair("Single", "0")));
}

TEST(Letters, ADefaultValueBeginsNone) {
    auto const letters = lettersOf("Ref: a\fmore", presetWith(R"([{"name": "ref", "mark": 1,
        "value_extract": "^Ref: (?<VAL>.*)$", "default_value": "none"}])"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2)));
}

TEST(Letters, AnInvalidValueBeginsOneAllTheSame) {
    auto const letters = lettersOf("No 1\fNo x", presetWith(R"([{"name": "no", "mark": 1, "value_type": 1,
        "value_extract": "^No (?<VAL>.*)$"}])"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1), ElementsAre(2)));
    EXPECT_EQ(letters[1].fields.begin()->second.valueType(), Cfg::ExtractedField::ValueType::Invalid);
}

TEST(Letters, FurtherPagesYieldNothing) {
    auto const letters = lettersOf("Herrn\fTotal 5", presetWith(R"([{"name": "total", "obligatory": true,
        "value_extract": "^Total (?<VAL>.*)$"}])"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2)));
    EXPECT_THAT(valuesOf(letters[0]), IsEmpty());
    EXPECT_THAT(letters[0].missing, ElementsAre("total"));
}

TEST(Letters, ACoverSheetThatIsSkippedBelongsToNone) {
    Cfg::ExtractPreset preset = presetWith(REF_MARKS);
    preset.setSkipFirstPage(true);
    EXPECT_THAT(pagesOf(lettersOf("Ref: a\fRef: b\fmore", preset)), ElementsAre(ElementsAre(2, 3)));
    EXPECT_THAT(lettersOf("Ref: a", preset), IsEmpty());
}

TEST(Letters, WithoutZonesHaveNoFields) {
    auto const letters = lettersOf("a\fb", Cfg::ExtractPreset());
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2)));
    EXPECT_THAT(valuesOf(letters[0]), IsEmpty());
}

constexpr char const* EMAIL_AND_ADDRESS = R"([
    {"name": "email", "priority": 2, "value_extract": "^(?i:email):+\\h*(?<VAL>.*)$"},
    {"name": "postal", "priority": 1, "width": 14000,
     "value_extract": "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z"}])";

TEST(Fields, TakeTheirLinesOutOfTheZone) {
    for (char const* document :
         {"Email: a@b.example\nLena Brandt\nWhitstable", "Lena Brandt\nEmail: a@b.example\nWhitstable",
          "Lena Brandt\nWhitstable\nEmail: a@b.example"})
        EXPECT_THAT(
            valuesOf(lettersOf(document, presetWith(EMAIL_AND_ADDRESS)).at(0)),
            ElementsAre(Pair("email", "\"a@b.example\""), Pair("postal", "\"Lena Brandt\nWhitstable\"")))
            << document;
}

TEST(Fields, TakeTheWholeLineWhereTheyMatchPartOfIt) {
    auto const letters = lettersOf("write to a@b.example\nLena Brandt\nWhitstable", presetWith(R"([
        {"name": "email", "value_extract": "(?<VAL>\\S+@\\S+)$"},
        {"name": "rest", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}])"));
    EXPECT_THAT(valuesOf(letters.at(0)),
                ElementsAre(Pair("email", "\"a@b.example\""), Pair("rest", "\"Lena Brandt\nWhitstable\"")));
}

TEST(Fields, ThatAreTooWideLeaveTheTextAlone) {
    // 15 columns of 2.1167 mm.
    char const* const fields = R"([
        {"name": "narrow", "width": 3174, "value_extract": "^(?<VAL>.*)$"},
        {"name": "just", "width": 3175, "value_extract": "^(?<VAL>.*)$"}])";
    EXPECT_THAT(valuesOf(lettersOf("3 Orchard Close", presetWith(fields)).at(0)),
                ElementsAre(Pair("just", "\"3 Orchard Close\"")));
}

TEST(Fields, AreAsWideAsTheirWidestLine) {
    std::string const wide(67, 'x');
    EXPECT_THAT(valuesOf(lettersOf("Lena\n" + wide + "\nLeeds", presetWith(EMAIL_AND_ADDRESS)).at(0)),
                IsEmpty());
    EXPECT_THAT(
        valuesOf(lettersOf("Lena\n" + wide.substr(1) + "\nLeeds", presetWith(EMAIL_AND_ADDRESS)).at(0)),
        SizeIs(1));
}

TEST(Fields, OfOneNameYieldOneValue) {
    auto const letters = lettersOf("Tel 1\nPhone 2", presetWith(R"([
        {"name": "phone", "value_extract": "^Fon (?<VAL>.*)$", "default_value": "none"},
        {"name": "phone", "value_extract": "^Tel (?<VAL>.*)$"},
        {"name": "phone", "value_extract": "^Phone (?<VAL>.*)$"}])"));
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("phone", "\"1\"")));
}

TEST(Fields, ThatAreObligatoryAndNotThereAreNamed) {
    auto const letters = lettersOf("x", presetWith(R"([
        {"name": "a", "obligatory": true, "value_extract": "^A(?<VAL>.*)$"},
        {"name": "b", "obligatory": true, "value_extract": "^B(?<VAL>.*)$", "default_value": "1"},
        {"name": "c", "value_extract": "^C(?<VAL>.*)$"}])"));
    EXPECT_THAT(letters.at(0).missing, ElementsAre("a"));
}

TEST(Fields, AreValidated) {
    auto const letters = lettersOf("No 1,234\nSum x", presetWith(R"([
        {"name": "no", "value_type": 1, "value_extract": "^No (?<VAL>.*)$"},
        {"name": "sum", "value_type": 2, "value_extract": "^Sum (?<VAL>.*)$"}])"));
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("no", "1234"), Pair("sum", "\"x\"")));
    std::string message;
    EXPECT_FALSE(letters[0].fields.isProductionReady(message));
    EXPECT_EQ(message, "Field name: \"sum\"");
}

TEST(Fields, WithABadValidationPatternStopTheDocument) {
    Cfg::ExtractPreset const preset =
        presetWith(R"([{"name": "no", "value_match": "(", "value_extract": "^No (?<VAL>.*)$"}])");
    try {
        lettersOf("No 1", preset);
        FAIL();
    } catch (Base::Error const& error) {
        EXPECT_THAT(error.what(),
                    testing::StartsWith("a.txt: the value of field \"no\" cannot be validated ("));
        EXPECT_THAT(error.what(), testing::EndsWith("); correct the field's value_match"));
    }
}

TEST(Fields, WithABadExtractionPatternFindNothing) {
    std::vector<std::string> lines;
    Log::Sink const before =
        Log::setSink([&](LogPriority, std::string const& line) { lines.push_back(line); });
    auto const letters = lettersOf("x", presetWith(R"([{"name": "no", "value_extract": "("}])"));
    Log::setSink(before);
    EXPECT_THAT(valuesOf(letters.at(0)), IsEmpty());
    EXPECT_THAT(lines, ElementsAre(testing::StartsWith("Extract field failed with ")));
}

constexpr char const* TOTAL = R"_([{"name": "total", "value_extract": "^Total:\\h*(?<VAL>[\\d.]+)"}])_";

TEST(ApartFields, AreFoundBesideTheirLabel) {
    EXPECT_THAT(valuesOf(lettersOf("Total:               12.00", presetWith(TOTAL)).at(0)),
                ElementsAre(Pair("total", "\"12.00\"")));
}

TEST(ApartFields, AreFoundBelowTheirLabel) {
    EXPECT_THAT(valuesOf(lettersOf("Date:      Total:\ntoday      12.00", presetWith(TOTAL)).at(0)),
                ElementsAre(Pair("total", "\"12.00\"")));
}

TEST(ApartFields, AreFoundBehindTheCurrencyBetween) {
    auto const fields = R"_([{"name": "total", "value_extract": "^Total: EUR\\h*(?<VAL>[\\d.]+)$"}])_";
    EXPECT_THAT(valuesOf(lettersOf("Total:        EUR          12.00", presetWith(fields)).at(0)),
                ElementsAre(Pair("total", "\"12.00\"")));
}

TEST(ApartFields, AreThoseThatAreFoundInNoOtherWay) {
    EXPECT_THAT(valuesOf(lettersOf("Total:       12.00\n\nTotal: 13.00", presetWith(TOTAL)).at(0)),
                ElementsAre(Pair("total", "\"13.00\"")));
    // The second field has its line, though the first could be read with it.
    auto const fields = R"_([{"name": "total", "value_extract": "^Total:\\h*(?<VAL>[\\d.]+)"},
                             {"name": "sum", "value_extract": "^(?<VAL>12.*)$"}])_";
    EXPECT_THAT(valuesOf(lettersOf("Total:       12.00", presetWith(fields)).at(0)),
                ElementsAre(Pair("sum", "\"12.00\"")));
}

TEST(ApartFields, GiveWayToAValueOfTheirNameInAnotherZone) {
    Cfg::ExtractPreset const preset(R"_({"zones": [
        {"name": "Top", "location": {"right": 21000, "bottom": 2000},
         "fields": [{"name": "total", "value_extract": "^Total:\\h*(?<VAL>.+)$"}]},
        {"name": "Rest", "location": {"top": 2000, "right": 21000, "bottom": 29700},
         "fields": [{"name": "total", "value_extract": "^Sum:\\h*(?<VAL>.+)$"}]}]})_"_json.toObject());
    EXPECT_THAT(valuesOf(lettersOf("Total:       12.00\n\n\n\nSum: 13.00", preset).at(0)),
                ElementsAre(Pair("total", "\"13.00\"")));
    EXPECT_THAT(valuesOf(lettersOf("Total:       12.00\n\n\n\nSum 13.00", preset).at(0)),
                ElementsAre(Pair("total", "\"12.00\"")));
}

TEST(ApartFields, ComeBeforeADefaultAndAreThere) {
    auto const letters = lettersOf("Total:       12.00\n\nDate 1", presetWith(R"_([
        {"name": "total", "value_extract": "^Total:\\h*(?<VAL>.+)$", "default_value": "0", "obligatory": true},
        {"name": "sum", "value_extract": "^Sum:\\h*(?<VAL>.+)$", "obligatory": true}])_"));
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("total", "\"12.00\"")));
    EXPECT_THAT(letters.at(0).missing, ElementsAre("sum"));
}

TEST(ApartFields, BeginALetterWhereTheyAreMarks) {
    auto const letters = lettersOf("Ref:          a\fmore\fRef:         b", presetWith(R"_([
        {"name": "ref", "mark": 1, "value_extract": "^Ref:\\h*(?<VAL>.+)$"}])_"));
    EXPECT_THAT(pagesOf(letters), ElementsAre(ElementsAre(1, 2), ElementsAre(3)));
}

TEST(ApartFields, AreNoAddresses) {
    auto const fields = R"_([{"name": "email", "priority": 2, "value_extract": "^Email:\\h*(?<VAL>\\S+)"}])_";
    EXPECT_THAT(valuesOf(lettersOf("Email:           a@b.example", presetWith(fields)).at(0)), IsEmpty());
}

TEST(ApartFields, PreferTheNearestValueThatIsValid) {
    auto const fields = R"_([{"name": "no", "value_type": 1, "value_extract": "^No\\h*(?<VAL>\\S+)"}])_";
    // The label's row is tried first, then its column.
    EXPECT_THAT(valuesOf(lettersOf("No        Date\n17        today", presetWith(fields)).at(0)),
                ElementsAre(Pair("no", "17")));
    EXPECT_THAT(valuesOf(lettersOf("No        Date\nx         today", presetWith(fields)).at(0)),
                ElementsAre(Pair("no", "\"Date\"")));
}

TEST(ApartFields, AreNotTheLabelsOfOtherFields) {
    auto const fields = R"_([{"name": "no", "value_extract": "^No\\h*(?<VAL>.+)$"},
                             {"name": "date", "value_extract": "^Date\\h*(?<VAL>\\d.*)$"},
                             {"name": "total", "value_extract": "^Total\\h*(?<VAL>\\d.*)$"}])_";
    EXPECT_THAT(
        valuesOf(lettersOf("No        Date       Total\n17        18         5", presetWith(fields)).at(0)),
        ElementsAre(Pair("no", "\"17\""), Pair("date", "\"18\""), Pair("total", "\"5\"")));
    // A value may begin with what is a label elsewhere, and nothing is better than a label.
    EXPECT_THAT(valuesOf(lettersOf("No        Date of issue", presetWith(fields)).at(0)),
                ElementsAre(Pair("no", "\"Date of issue\"")));
    EXPECT_THAT(valuesOf(lettersOf("No        Date", presetWith(fields)).at(0)), IsEmpty());
}

TEST(ApartFields, TakeTheirLinesOutOfTheZone) {
    auto const fields = R"_([{"name": "one", "value_extract": "^No\\h*(?<VAL>\\d+)"},
                             {"name": "two", "value_extract": "^No\\h*(?<VAL>\\d+)"}])_";
    EXPECT_THAT(valuesOf(lettersOf("No        1\n\n\nNo        2", presetWith(fields)).at(0)),
                ElementsAre(Pair("one", "\"1\""), Pair("two", "\"2\"")));
}

TEST(ApartFields, HaveSomethingOfEachLine) {
    // The pattern fits behind a blank, which no line of its own has in front of it.
    auto const fields = R"_([{"name": "no", "value_extract": "(?<= )(?<VAL>\\d+)$"}])_";
    EXPECT_THAT(valuesOf(lettersOf("No          17", presetWith(fields)).at(0)), IsEmpty());
}

TEST(ApartFields, AreNotSoughtByPatternsForAWholeText) {
    for (std::string const pattern : {R"(\\ATotal:\\h*(?<VAL>.+))", R"(^Total:\\h*(?<VAL>.+)\\Z)"}) {
        std::string const fields = R"([{"name": "total", "value_extract": ")" + pattern + "\"}]";
        EXPECT_THAT(valuesOf(lettersOf("Total:          12.00", presetWith(fields.c_str())).at(0)), IsEmpty())
            << pattern;
    }
}

TEST(ApartFields, AreAsWideAsTheWidestPart) {
    auto const fields = [](int width) {
        return R"_([{"name": "total", "value_extract": "^Total:\\h*(?<VAL>.+)$", "width": )_" +
               std::to_string(width) + "}]";
    };
    // Six columns of 2.1167 mm.
    std::string const document = "Total:          12.00";
    EXPECT_THAT(valuesOf(lettersOf(document, presetWith(fields(1270).c_str())).at(0)), SizeIs(1));
    EXPECT_THAT(valuesOf(lettersOf(document, presetWith(fields(1269).c_str())).at(0)), IsEmpty());
}

TEST(Zones, WithoutALocationHoldTheBlockNearestToTheirPoint) {
    // The default point is at 45, 62 mm: the 13th row.
    std::string const document = "Sender\n\n\n\n\n\n\n\n\n\n\nLena Brandt\nWhitstable\n\n\nDear Lena";
    auto const letters = lettersOf(document, Cfg::ExtractPreset(R"({"zones": [{"name": "_Address", "fields": [
        {"name": "postal", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}]}]})"_json.toObject()));
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("postal", "\"Lena Brandt\nWhitstable\"")));
}

TEST(Zones, EachHaveATextOfTheirOwn) {
    auto const letters = lettersOf("Ref: a", Cfg::ExtractPreset(R"({"zones": [
        {"name": "A", "fields": [{"name": "a", "value_extract": "^Ref: (?<VAL>.*)$"}]},
        {"name": "B", "fields": [{"name": "b", "value_extract": "^Ref: (?<VAL>.*)$"}]}]})"_json.toObject()));
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("a", "\"a\""), Pair("b", "\"a\"")));
}

TEST(Presets, SayHowFarApartWordsAndLinesMayBe) {
    Cfg::ExtractPreset preset = presetWith(R"_([{"name": "all", "value_extract": "\\A(?<VAL>.*)\\Z"}])_");
    std::string const document = "Date:          today";
    EXPECT_THAT(valuesOf(lettersOf(document, preset).at(0)), IsEmpty());
    preset.setMaxSpacesBetweenFrags(10.0);
    EXPECT_THAT(valuesOf(lettersOf(document, preset).at(0)), ElementsAre(Pair("all", "\"Date: today\"")));
    preset.setMaxLineDistance(2.5);
    preset.setSpaceAdjustPerc(20);
    EXPECT_EQ(rulesOf(preset).maxLineDistance, 2.5);
    EXPECT_EQ(rulesOf(preset).spaceAdjustPerc, 20);
}

TEST(Traces, TellWhatWasSeenAndWhatCameOfIt) {
    Cfg::ExtractPreset const preset = presetWith(R"([
        {"name": "first", "mark": 1, "value_type": 1, "value_extract": "^Page (?<VAL>1) of \\d+$"},
        {"name": "name", "width": 1000, "value_extract": "^(?<VAL>Lena .*)$"},
        {"name": "country", "value_extract": "^to (?<VAL>.*)$", "default_value": "UK"},
        {"name": "phone", "value_extract": "^Tel (?<VAL>.*)$"}])");
    Trace trace;
    std::string const document = "Page 1 of 2\nLena Brandt\fPage 2 of 2";
    EXPECT_EQ(valuesOf(lettersOf(document, preset, &trace).at(0)),
              valuesOf(lettersOf(document, preset).at(0)));

    ASSERT_THAT(trace.pages, SizeIs(2));
    EXPECT_EQ(trace.pages[0].page, 1);
    EXPECT_TRUE(trace.pages[0].beginsLetter);
    EXPECT_EQ(trace.pages[1].page, 2);
    EXPECT_FALSE(trace.pages[1].beginsLetter);

    ASSERT_THAT(trace.pages[0].zones, SizeIs(1));
    ZoneTrace const& zone = trace.pages[0].zones[0];
    EXPECT_EQ(zone.definition, &preset.zones()[0]);
    EXPECT_EQ(zone.text, "Page 1 of 2\nLena Brandt");
    EXPECT_EQ(zone.box, (Box{2500, 1000, 4828, 1776}));
    EXPECT_THAT(zone.blocks, ElementsAre(zone.box));

    ASSERT_THAT(zone.fields, SizeIs(4));
    FieldTrace const& first = zone.fields[0];
    EXPECT_EQ(first.definition, &preset.zones()[0].fields()[0]);
    ASSERT_TRUE(first.match);
    EXPECT_EQ(first.match->text, "Page 1 of 2");
    EXPECT_EQ(first.match->box, (Box{2500, 1000, 4828, 1353}));
    EXPECT_EQ(first.match->width, 2328);
    EXPECT_EQ(first.cut, "Page 1 of 2");
    EXPECT_EQ(first.rawText, "1");
    EXPECT_EQ(text(first.value->rawValue()), "1");
    EXPECT_FALSE(first.isTooWide);

    FieldTrace const& name = zone.fields[1];
    ASSERT_TRUE(name.match);
    EXPECT_TRUE(name.isTooWide);
    EXPECT_EQ(name.match->width, 2328);
    EXPECT_EQ(name.cut, "");
    EXPECT_EQ(name.rawText, std::nullopt);
    EXPECT_EQ(name.value, nullptr);

    FieldTrace const& country = zone.fields[2];
    EXPECT_FALSE(country.match);
    EXPECT_EQ(country.rawText, std::nullopt);
    EXPECT_EQ(text(country.value->rawValue()), "\"UK\"");

    EXPECT_FALSE(zone.fields[3].match);
    EXPECT_EQ(zone.fields[3].value, nullptr);
}

TEST(Traces, TellWhichLinesWereJoined) {
    Cfg::ExtractPreset const preset = presetWith(R"_([
        {"name": "total", "value_type": 2, "value_extract": "^Total:\\h*(?<VAL>[\\d.]+)"},
        {"name": "date", "value_extract": "^Date:\\h*(?<VAL>.+)$"},
        {"name": "none", "value_extract": "^None:\\h*(?<VAL>.+)$"}])_");
    Trace trace;
    lettersOf("Date:\ntoday\n\n\nTotal:         12.00 EUR", preset, &trace);
    std::vector<FieldTrace> const& fields = trace.pages.at(0).zones.at(0).fields;

    FieldTrace const& total = fields.at(0);
    ASSERT_TRUE(total.joined && total.match);
    EXPECT_EQ(total.joined->joint, Joint::Right);
    EXPECT_THAT(total.joined->parts, ElementsAre(Box{2500, 2693, 3770, 3046}, Box{5675, 2693, 6733, 3046}));
    EXPECT_EQ(total.match->text, "Total: 12.00");
    EXPECT_EQ(total.match->box, (Box{2500, 2693, 6733, 3046}));
    EXPECT_EQ(total.match->width, 1270);
    EXPECT_EQ(total.cut, "Total:\n12.00 EUR");
    EXPECT_EQ(total.rawText, "12.00");
    EXPECT_EQ(text(total.value->rawValue()), "12");
    EXPECT_TRUE(total.counts);

    ASSERT_TRUE(fields.at(1).joined);
    EXPECT_EQ(fields.at(1).joined->joint, Joint::Below);
    EXPECT_EQ(fields.at(1).match->text, "Date: today");
    EXPECT_FALSE(fields.at(2).joined);
    EXPECT_FALSE(fields.at(2).match);
}

TEST(Traces, SayWhichFieldOfANameCounts) {
    Cfg::ExtractPreset const preset = presetWith(R"([
        {"name": "phone", "value_extract": "^Fon (?<VAL>.*)$", "default_value": "none"},
        {"name": "phone", "value_extract": "^Tel (?<VAL>.*)$"},
        {"name": "phone", "value_extract": "^Phone (?<VAL>.*)$"},
        {"name": "land", "value_extract": "^In (?<VAL>.*)$", "default_value": "UK"},
        {"name": "land", "value_extract": "^To (?<VAL>.*)$", "default_value": "NZ"},
        {"name": "fax", "value_extract": "^Fax (?<VAL>.*)$"}])");
    Trace trace;
    lettersOf("Tel 1\nPhone 2", preset, &trace);
    PageTrace const& page = trace.pages.at(0);
    std::vector<FieldTrace> const& fields = page.zones.at(0).fields;
    std::vector<bool> counts;
    for (FieldTrace const& field : fields)
        counts.push_back(field.counts);
    EXPECT_THAT(counts, ElementsAre(false, true, false, true, false, false));
    EXPECT_EQ(page.counting("phone"), &fields[1]);
    EXPECT_EQ(page.counting("land"), &fields[3]);
    EXPECT_EQ(page.counting("fax"), nullptr);
}

TEST(Traces, OfOneLetterHoldItsFirstPageOnly) {
    Trace trace;
    lettersOf("a\fb\fc", presetWith("[]"), &trace);
    EXPECT_THAT(trace.pages, SizeIs(1));
}

/// What fields find in a text that is given for their zone.
Letter letterOfGiven(std::string const& given, Cfg::ExtractPreset const& preset, PageTrace* trace = nullptr) {
    return readGivenTexts("a", std::vector{GivenText{&preset.zones()[0], given}}, trace);
}

TEST(GivenTexts, AreSearchedAsThoseOfAPageAre) {
    Cfg::ExtractPreset const preset = presetWith(R"([
        {"name": "email", "value_extract": "(?<VAL>\\S+@\\S+)$"},
        {"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$", "obligatory": true},
        {"name": "none", "value_extract": "(?<VAL>)^"},
        {"name": "rest", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}])");
    for (std::string const document :
         {"write to a@b.example\nLena Brandt\nLeeds", "Lena Brandt\nwrite to a@b.example\nLeeds",
          "Lena Brandt\nLeeds\nwrite to a@b.example"}) {
        Letter const given = letterOfGiven(document, preset);
        EXPECT_EQ(valuesOf(given), valuesOf(lettersOf(document, preset).at(0))) << document;
        EXPECT_THAT(valuesOf(given), testing::Contains(Pair("rest", "\"Lena Brandt\nLeeds\"")));
        EXPECT_THAT(given.missing, ElementsAre("ref"));
        EXPECT_THAT(given.pages, IsEmpty());
    }
}

TEST(GivenTexts, KeepTheirEmptyLinesUntilALineIsTaken) {
    Cfg::ExtractPreset const preset = presetWith(R"([
        {"name": "name", "value_extract": "^(?<VAL>Lena .*)$"},
        {"name": "rest", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}])");
    EXPECT_THAT(valuesOf(letterOfGiven("\n\nLena Brandt\n\nLeeds\n", preset)),
                ElementsAre(Pair("name", "\"Lena Brandt\""), Pair("rest", "\"\n\n\nLeeds\n\"")));
    EXPECT_THAT(valuesOf(letterOfGiven("", preset)), ElementsAre(Pair("rest", "\"\"")));
}

TEST(GivenTexts, HaveNoWidthAndTheirLinesAreCut) {
    Cfg::ExtractPreset const preset =
        presetWith(R"([{"name": "all", "width": 1, "value_extract": "^(?<VAL>.*)$"}])");
    PageTrace trace;
    letterOfGiven(std::string(1001, 'x'), preset, &trace);
    FieldTrace const& all = trace.zones.at(0).fields.at(0);
    EXPECT_EQ(all.rawText, std::string(MAX_LINE_LENGTH, 'x'));
    EXPECT_FALSE(all.isTooWide);
    EXPECT_TRUE(all.counts);
}

constexpr char const* RUNAWAY_FIELDS = R"_([
    {"name": "a", "value_extract": "(?<VAL>.*.*.*.*.*:)"},
    {"name": "b", "value_extract": "(?<VAL>.*.*.*.*.*:)"},
    {"name": "c", "value_extract": "(?<VAL>x)"}])_";

/// So long that a pattern tries more ways than there is time for.
std::string longText() { return std::string(900, 'x'); }

TEST(PatternTimes, EndAFieldAndGoOn) {
    Cfg::ExtractPreset const preset = presetWith(RUNAWAY_FIELDS);
    Document document = openDocument(longText(), "a.txt");
    using std::chrono_literals::operator""ms;
    auto const letters = readLetters(document, preset, nullptr, {}, {50ms, 60'000ms});
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("c", "\"x\"")));
    EXPECT_THAT(
        letters.at(0).warnings,
        ElementsAre("a: its pattern was given up, since it took longer than 0.050 s; \"vlmail presets lint\" "
                    "tells what makes it slow",
                    "b: its pattern was given up, since it took longer than 0.050 s; \"vlmail presets lint\" "
                    "tells what makes it slow"));
}

TEST(PatternTimes, HoldForJoinedLinesToo) {
    // Soon told of each line by itself, which is no "x " and more, and slowly of both.
    Cfg::ExtractPreset const preset = presetWith(R"_([
        {"name": "a", "value_extract": "(?<VAL>^x .*.*.*.*.*:)"}, {"name": "b", "value_extract": "(?<VAL>y)"}])_");
    Document document = openDocument("x          " + longText().substr(100) + "\ny", "a.txt");
    using std::chrono_literals::operator""ms;
    auto const letters = readLetters(document, preset, nullptr, {}, {50ms, 60'000ms});
    EXPECT_THAT(valuesOf(letters.at(0)), ElementsAre(Pair("b", "\"y\"")));
    EXPECT_THAT(
        letters.at(0).warnings,
        ElementsAre("a: its pattern was given up, since it took longer than 0.050 s; \"vlmail presets lint\" "
                    "tells what makes it slow"));
}

TEST(PatternTimes, EndADocumentInOneLine) {
    Cfg::ExtractPreset const preset = presetWith(RUNAWAY_FIELDS);
    Document document = openDocument(longText(), "a.txt");
    using std::chrono_literals::operator""ms;
    try {
        readLetters(document, preset, nullptr, {}, {60'000ms, 50ms});
        FAIL() << "no failure";
    } catch (Base::Error const& error) {
        EXPECT_STREQ(error.what(), "a.txt: its patterns took longer than 0.050 s, that of the field \"a\" "
                                   "last; run \"vlmail presets "
                                   "lint\" on the settings and correct the slow ones");
    }
}

TEST(PatternTimes, EndADocumentWithTwentyHardFieldsInItsLine) {
    std::string fields;
    for (int i = 1; i <= 20; ++i)
        fields += (i == 1 ? R"_([{"name": "hard )_" : R"_(, {"name": "hard )_") + std::to_string(i) +
                  R"_(", "value_extract": "(?<VAL>.*.*.*.*.*:)"})_";
    Cfg::ExtractPreset const preset = presetWith((fields + ']').c_str());
    Document document = openDocument(longText(), "a.txt");
    using std::chrono_literals::operator""ms;
    try {
        readLetters(document, preset, nullptr, {}, {30ms, 200ms});
        FAIL() << "no failure";
    } catch (Base::Error const& error) {
        EXPECT_THAT(error.what(),
                    testing::MatchesRegex("a\\.txt: its patterns took longer than 0\\.200 s, that of the "
                                          "field \"hard [0-9]+\" last; run \"vlmail presets lint\" on the "
                                          "settings and correct the slow ones"));
    }
}

TEST(PatternTimes, AreNotGivenBackByAClockThatIsSetBack) {
    using std::chrono_literals::operator""s;
    static PatternTime::Clock::time_point now;
    PatternTime time({2s, 20s}, [] { return now; });
    auto const pass = [&](PatternTime::Clock::duration duration) {
        PatternTime::Turn const turn(time);
        now += duration;
        return turn.spent();
    };
    EXPECT_EQ(pass(5s), 5s);
    EXPECT_EQ(time.left(), 15s);
    EXPECT_EQ(pass(-60s), 0s);
    EXPECT_EQ(time.left(), 15s);
    EXPECT_FALSE(time.isUp());
    pass(15s);
    EXPECT_TRUE(time.isUp());
}

} // namespace
} // namespace Reader
