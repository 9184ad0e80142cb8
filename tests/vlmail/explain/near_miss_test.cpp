// The kinds of near misses that need no PDF, and which of them are told.
#include "programs/patterns/why_not.h"
#include "programs/vlmail/explain/explain.h"
#include "programs/vlmail/explain/near_miss.h"
#include "programs/vlmail/explain/preset_walk.h"
#include "tests/vlmail/explain/explain_fixture.h"

namespace VlMail {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;

using testing::StartsWith;

class NearMissTest : public ExplainTest {
protected:
    /// Of the field "f" with that pattern, in a text document.
    std::vector<std::string> missesOf(std::string const& document, std::string const& pattern,
                                      std::string const& more = {}) {
        return nearMisses(explainedFields(document, field(pattern, more)), "f");
    }

    /// For one zone over the whole page with these fields, however long it takes: of what the engine gives up
    /// by itself.
    static json::Object explainedInAnyTime(std::string const& text, std::string const& fields) {
        Reader::PatternLimits const limits{std::chrono::hours(1), std::chrono::hours(1)};
        std::string const settings =
            R"({"zones": [{"name": "Page", "location": {"right": 21000, "bottom": 29700}, "fields": [)" +
            fields + "]}]}";
        Cfg::ExtractPreset const preset(json::strToObject(settings.data(), settings.size()));
        Reader::Document document = Reader::openDocument(text, "letter.txt");
        Reader::Trace trace;
        Reader::readLetters(document, preset, &trace);
        json::Object explanation;
        explainPages(explanation, document, preset, {}, trace, limits);
        return json::Object{{"trace", explanation}};
    }

    static std::string field(std::string const& pattern, std::string const& more = {}) {
        json::Object object{{"name", "f"}, {"value_extract", pattern}};
        std::ostringstream text;
        text << object;
        std::string result = text.str();
        result.insert(result.size() - 1, more);
        return result;
    }
};

TEST_F(NearMissTest, OfADocumentWithoutTextIsThatItHasNone) {
    EXPECT_THAT(missesOf("\n\n", "^Ref: (?<VAL>.*)$"),
                ElementsAre("no_text: page 1 has no text at all, only pictures of it: let a program for "
                            "character recognition make the document searchable"));
}

TEST_F(NearMissTest, OfAValueGroupThatTakesNoPartIsToldAsSuch) {
    EXPECT_THAT(
        missesOf("Ref: none\n", "^Ref: (none|(?<VAL>\\d+))$"),
        ElementsAre("value_group: the pattern matches \"Ref: none\", but its group (?<VAL>...) takes no "
                    "part in the match: put it where a value always is"));
}

TEST_F(NearMissTest, OfOtherBlanksNamesThem) {
    EXPECT_THAT(missesOf("Our  ref:   17\n", "^Our  ref:  (?<VAL>\\d+)$"),
                ElementsAre("blanks: would match \"Our ref: 17\" with other blanks: the words of a line are "
                            "joined by one blank each; write \\h* in the pattern where it has blanks"));
    EXPECT_THAT(missesOf("Ref:17\n", "^Ref: (?<VAL>\\d+)$"), ElementsAre(StartsWith("blanks: ")));
}

TEST_F(NearMissTest, OfTypographyInThePatternNamesTheCharacterThere) {
    EXPECT_THAT(
        missesOf("Customer's no: 17\n", "^Customer\u2019s no: (?<VAL>\\d+)$"),
        ElementsAre("look_alike: would match \"Customer's no: 17\" if characters that look alike were "
                    "the same: the pattern has \"\u2019\" (U+2019) where the letter has \"'\": correct "
                    "the pattern"));
}

TEST_F(NearMissTest, OfAWordBrokenOverTwoLinesJoinsThemWithoutABlank) {
    EXPECT_THAT(missesOf("Ref: 17\n04\nend\n", "^Ref: (?<VAL>\\d{4})$"),
                ElementsAre("joined_lines: would match with the lines \"Ref: 17\" and \"04\" joined: let the "
                            "pattern take a line break there, \\s in the place of a blank or \\h"));
}

TEST_F(NearMissTest, OfALineInTwoColumnsThatWereReadAsOneIsASmallerGap) {
    EXPECT_THAT(
        missesOf("Ref: 17   Page 1\n", "^Ref: (?<VAL>\\d+)$"),
        ElementsAre("gaps: would match \"Ref: 17\" with \"max_spaces_between_fragments\" at 2.5 or less "
                    "instead of 3",
                    StartsWith("anchor: ")));
}

TEST_F(NearMissTest, OfARuleOfThePresetThatOtherFieldsNeedSaysWhatItLosesAndStandsBehind) {
    json::Object const reading = explainedFields("Ref: 17   Page 1\nTotal:   12\n",
                                                 R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>\\d+)$"},
                                                     {"name": "total", "priority": -1, "value_extract": "^Total: (?<VAL>\\d+)$"})_");
    EXPECT_THAT(
        nearMissesIn(fieldOf(reading, "ref")),
        ElementsAre(StartsWith("anchor: "),
                    "gaps: would match \"Ref: 17\" with \"max_spaces_between_fragments\" at 2.5 or less "
                    "instead of 3, but would lose \"total\""));
}

TEST_F(NearMissTest, OfAPlaceReadsItsLinesJoinedToo) {
    json::Object const reading =
        explainedText("Address\n\n\nTotal:            12\n", R"_({"extract_presets": [
        {"match": "letter.*", "pack_preset": "P", "zones": [
            {"name": "Top", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 2000}, "fields": [
                {"name": "total", "value_extract": "^Total:\\h*(?<VAL>\\d+)$"}]}]}],
        "pack_presets": [{"name": "P"}]})_");
    EXPECT_THAT(
        nearMissesIn(fieldOf(reading, "total")),
        ElementsAre(
            "zone: would match 7 mm below the zone \"Top\": move its bottom from 20 mm to 27 mm or more"));
}

TEST_F(NearMissTest, OfTextBesideItInItsLineIsTheAnchor) {
    EXPECT_THAT(
        missesOf("Our Ref: 17\n", "^Ref: (?<VAL>\\d+)$"),
        ElementsAre("anchor: would match \"Ref: 17\" without ^ at its front: other text stands before it "
                    "in its line"));
    EXPECT_THAT(
        missesOf("Ref: 17 of\n", "^Ref: (?<VAL>\\d+)$"),
        ElementsAre("anchor: would match \"Ref: 17\" without $ at its end: other text stands behind it "
                    "in its line"));
    EXPECT_THAT(
        missesOf("Our Ref: 17 of\n", "^Ref: (?<VAL>\\d+)$"),
        ElementsAre("anchor: would match \"Ref: 17\" without ^ and $: other text stands before it and "
                    "behind it in its line"));
}

TEST_F(NearMissTest, OfAPatternWithoutLiteralsIsNoAnchor) {
    EXPECT_THAT(missesOf("Mill Lane 17\n", "^(?<VAL>\\d+)$"), IsEmpty());
}

TEST_F(NearMissTest, OfLiteralsThatStandInAnotherContextSaysWhere) {
    EXPECT_THAT(
        missesOf("The ref: is\nmissing\n", "^(?i:REF):+\\h*(?<VAL>\\d+)$"),
        ElementsAre("rest: \"REF:\" of the pattern stands in \"The ref: is\" on page 1, but the rest of "
                    "the pattern does not fit there"));
}

TEST_F(NearMissTest, OfALineInAnotherBlockIsAZoneOfItsOwn) {
    std::string const settings = R"({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "_Address", "fields": [{"name": "f", "value_extract": "^Fax: (?<VAL>.*)$"}]}]}],
        "pack_presets": [{"name": "P"}]})";
    std::string const document = std::string(13, '\n') + "Anna Arnold\n\n\n\n\nFax: 17\n";
    EXPECT_THAT(nearMisses(explainedText(document, settings), "f"),
                ElementsAre("block: would match in the text block 25 mm away from the point of the zone "
                            "\"_Address\": give the field a zone of its own with the point (32 mm, 88 mm)"));
}

TEST_F(NearMissTest, OfAZoneAtAPointIsTheDistanceOfLines) {
    std::string const settings = R"({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "_Address", "fields": [{"name": "f", "value_extract": "\\A(?<VAL>.*\\n.*)\\Z"}]}]}],
        "pack_presets": [{"name": "P"}]})";
    std::string const address = std::string(13, '\n') + "Anna Arnold\n\nRiverton\n";
    EXPECT_THAT(
        nearMisses(explainedText(address, settings), "f"),
        ElementsAre("line_distance: would match \"Anna Arnold / Riverton\" with \"max_line_distance\" at "
                    "2.5 or more instead of 1.8"));
}

TEST_F(NearMissTest, OfARefusedPatternIsThePattern) {
    EXPECT_THAT(
        missesOf("Ref: A-17\n", "^Ref: (?<VAL>.+)$", R"(, "value_match": "\\d+")"),
        ElementsAre("validation_pattern: \"A-17\" does not match the validation pattern \"\\d+\": let "
                    "\"value_extract\" take another part of the text, or \"value_match\" accept this "
                    "one"));
}

TEST_F(NearMissTest, OfAMinimumSaysWhatToLower) {
    EXPECT_THAT(missesOf("Sum: 1\n", "^Sum: (?<VAL>.+)$", R"(, "value_type": 1, "value_min": 5)"),
                ElementsAre("limit: 1 is below the minimum 5: lower \"value_min\", or correct the letter"));
}

TEST_F(NearMissTest, OnAPageThatIsSkippedSaysSo) {
    json::Object const reading = explainedFields("Ref: 17\n\fpage two\n", field("^Ref: (?<VAL>\\d+)$"),
                                                 R"("skip_first_page": true, )");
    EXPECT_THAT(
        nearMisses(reading, "f"),
        ElementsAre("other_page: would match \"Ref: 17\" on page 1 in the zone \"Page\"; the preset skips "
                    "the first page: leave \"skip_first_page\" out"));
}

TEST_F(NearMissTest, OnAThirdPageOffersNoCoverSheet) {
    EXPECT_THAT(missesOf("one\n\ftwo\n\fRef: 17\n", "^Ref: (?<VAL>\\d+)$"),
                ElementsAre("other_page: would match \"Ref: 17\" on page 3 in the zone \"Page\"; fields are "
                            "searched on the first page of a letter: set the zone's \"page\" in \"reading\" "
                            "to 3, or move the text"));
}

constexpr char const* ELSEWHERE_PLACED =
    R"_({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
    {"name": "Top", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 600}, "fields": [
        {"name": "total", "value_extract": "^Total: (?<VAL>\\d+)$"}]}]}],
    "pack_presets": [{"name": "P", "reading": {"zones": {"Top": {"page": 2, "anchor": "^Sum"}}}}]})_";

TEST_F(NearMissTest, OfAnAnchoredZoneOfAnotherPageIsToldFromTheAnchor) {
    json::Object const reading = explainedText("one\n\f\n\nSum\n\n\nTotal: 17\n", ELSEWHERE_PLACED);
    EXPECT_THAT(nearMissesIn(fieldOf(reading, "total")),
                ElementsAre("zone: would match 10.53 mm below the zone \"Top\": move its bottom from 6 mm to "
                            "16.53 mm or more"));
}

TEST_F(NearMissTest, OfAZoneOfAnotherPageIsTheLettersOtherPages) {
    EXPECT_THAT(
        nearMissesIn(fieldOf(explainedText("Sum\nTotal: 17\n\fSum\n", ELSEWHERE_PLACED), "total")),
        ElementsAre(
            "other_page: would match \"Total: 17\" on page 1 in the zone \"Top\"; the zone lies on page 2: "
            "set the zone's \"page\" in \"reading\" to 1, or move the text"));
}

TEST_F(NearMissTest, OfAnAnchoredZoneIsSoughtAtTheAnchorOfEachPage) {
    EXPECT_THAT(
        nearMissesIn(fieldOf(explainedText("\n\n\nSum\nTotal: 17\n\fSum\n", ELSEWHERE_PLACED), "total")),
        ElementsAre(
            "other_page: would match \"Total: 17\" on page 1 in the zone \"Top\"; the zone lies on page 2: "
            "set the zone's \"page\" in \"reading\" to 1, or move the text"));
}

TEST_F(NearMissTest, OfAZoneOnAnyPageIsAPlaceOnThem) {
    json::Object const reading =
        explainedText("Sum\n\fSum" + std::string(15, '\n') + "Total: 17\n",
                      R"_({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "Top", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 600}, "fields": [
            {"name": "total", "value_extract": "^Total: (?<VAL>\\d+)$"}]}]}],
        "pack_presets": [{"name": "P", "reading": {"zones": {"Top": {"page": "any", "anchor": "^Sum"}}}}]})_");
    EXPECT_THAT(
        nearMissesIn(fieldOf(reading, "total")),
        ElementsAre("other_page: would match \"Total: 17\" on page 2 outside the zone \"Top\"; the zone "
                    "lies on any page: move it, or give the field a zone of its own"));
}

TEST_F(NearMissTest, ReadsValuesAsReadingSays) {
    std::string const settings =
        R"_({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "Top", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "total", "value_type": 2, "value_extract": "^Total: (?<VAL>\\S+)$"}]}]}],
        "pack_presets": [{"name": "P", "reading": {"decimal": ",", "grouping": "."}}]})_";
    EXPECT_THAT(nearMissesIn(fieldOf(explainedText("TOTAL: 1.234,56\n", settings), "total")),
                ElementsAre(StartsWith("letter_case: ")));
}

TEST_F(NearMissTest, LooksIntoOtherZonesWhereReadingPutsThem) {
    auto const missesWith = [&](std::string const& other) {
        return nearMissesIn(fieldOf(
            explainedText("Top\n\n\n\n\n\n\n\n\n\n\n\n\n\nSum\nTotal: 17\n",
                          R"_({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "Top", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 1500}, "fields": [
            {"name": "total", "value_extract": "^Total: (?<VAL>\\d+)$"}]},
        {"name": "Sum", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 900}, "fields": []}]}],
        "pack_presets": [{"name": "P", "reading": {"zones": {"Sum": )_" +
                              other + "}}}]}"),
            "total"));
    };
    EXPECT_THAT(
        missesWith(R"({"anchor": "^Sum"})"),
        testing::Contains("other_zone: would match \"Total: 17\" in the zone \"Sum\": move the field there"));
    EXPECT_THAT(missesWith(R"({"anchor": "^Sum", "page": 2})"), testing::Each(StartsWith("elsewhere: ")));
}

TEST_F(NearMissTest, IsNotSoughtForAZoneThatLiesNowhere) {
    EXPECT_THAT(nearMissesIn(fieldOf(explainedText("Sum\nTotal: 17\n", ELSEWHERE_PLACED), "total")),
                IsEmpty());
    EXPECT_THAT(nearMissesIn(fieldOf(explainedText("one\n\fTotal: 17\n", ELSEWHERE_PLACED), "total")),
                IsEmpty());
}

TEST_F(NearMissTest, OfTextFarFromTheZoneSaysHowFar) {
    std::string const settings = R"({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
        {"name": "Top", "location": {"left": 2000, "top": 0, "right": 9000, "bottom": 3000}, "fields": [
            {"name": "f", "value_extract": "^Ref: (?<VAL>\\d+)$"}]}]}], "pack_presets": [{"name": "P"}]})";
    std::string const document = "Hello\n" + std::string(39, '\n') + std::string(60, ' ') + "Ref: 17\n";
    EXPECT_THAT(
        nearMisses(explainedText(document, settings), "f"),
        ElementsAre("elsewhere: would match \"Ref: 17\" 153 mm below and 77 mm to the right of the zone "
                    "\"Top\": move the zone there, or give the field a zone of its own"));
}

TEST_F(NearMissTest, OfALiteralThatNothingIsLikeNamesItAlone) {
    EXPECT_THAT(missesOf("Hello\n", "^(?i:ref):+\\h*(?<VAL>\\S.*)$"),
                ElementsAre("literal: \"ref:\" of the pattern occurs nowhere in the letter"));
}

TEST_F(NearMissTest, OfALiteralSaysWhenNotAllPagesWereLookedAt) {
    std::string document;
    for (int page = 1; page <= 30; ++page)
        document += "Hello\n\f";
    EXPECT_THAT(
        missesOf(document, "^Ref: (?<VAL>.*)$"),
        ElementsAre("literal: \"Ref:\" of the pattern occurs nowhere on the first 21 pages of the letter"));
}

TEST_F(NearMissTest, OfAPatternThatBeginsAnywhereIsTheLiteralAndNotHowFarItFits) {
    EXPECT_THAT(missesOf("Hello world\n", "^.*Ref: (?<VAL>\\d+)$"),
                ElementsAre(StartsWith("literal: \"Ref:\"")));
}

TEST_F(NearMissTest, OfAnEndOfLineSaysThatItEnds) {
    EXPECT_THAT(
        missesOf("Ref: 17\n", "^Ref: (?<VAL>\\d+) of$"),
        ElementsAre("rest: \"Ref: 17\" fits \"^Ref: (?<VAL>\\d+)\", but the end of the line behind it does "
                    "not fit \" of$\"",
                    "literal: \"of\" of the pattern occurs nowhere in the letter"));
}

TEST_F(NearMissTest, ThatGivesAnInvalidValueStandsBehindOthers) {
    // On the first page the value is in capitals and too small; the second page has it right.
    std::vector<std::string> const told =
        missesOf("REF: 17\n\fRef: 99\n", "^Ref: (?<VAL>\\d+)$", R"(, "value_type": 1, "value_min": 50)");
    EXPECT_THAT(told, ElementsAre(StartsWith("other_page: "), StartsWith("letter_case: ")));
}

TEST_F(NearMissTest, ListHasNoMoreThanThree) {
    std::string const document = "REF: 17\nRef:\n17\n\fRef: 17\n\fRef: 17\n";
    EXPECT_THAT(
        missesOf(document, "^Ref:\\h+(?<VAL>\\d+)$", R"(, "priority": -1)"),
        ElementsAre(StartsWith("letter_case: "), StartsWith("joined_lines: "), StartsWith("other_page: ")));
}

TEST_F(NearMissTest, IsNotSoughtForAFieldThatWasFoundInAnotherZone) {
    std::string const fields = field("^REF: (?<VAL>\\d+)$") +
                               R"(]}, {"name": "Again", "location": )"
                               R"({"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [)" +
                               field("^Ref: (?<VAL>\\d+)$");
    EXPECT_THAT(nearMisses(explainedFields("Ref: 17\n", fields), "f"), IsEmpty());
}

TEST_F(NearMissTest, IsNotSoughtWithoutAPattern) { EXPECT_THAT(missesOf("Ref: 17\n", ""), IsEmpty()); }

TEST_F(NearMissTest, IsSoughtWithinTheLetterOnly) {
    std::string const mark = R"({"name": "mark", "value_extract": "^Dear (?<VAL>.*)$", "mark": 1}, )";
    json::Object const reading =
        explainedFields("Dear A\n\fRef: 1\n\fDear B\nRef: 2\n", mark + field("^Ref: (?<VAL>\\d+)$"));
    EXPECT_THAT(nearMisses(reading, "f"),
                ElementsAre(HasSubstr("would match \"Ref: 1\" on page 2 in the zone \"Page\"")));
    json::Value const second = reading.get("trace").toObject().get("pages").toArray().at(1);
    EXPECT_FALSE(second.toObject().get("begins_letter").toBool());
}

TEST_F(NearMissTest, OfAPatternThatTheEngineGivesUpIsThat) {
    std::string const runaway = "^((a ?)*)*(?<VAL>b)$";
    std::string line;
    for (int i = 0; i < 40; ++i)
        line += "a ";
    std::string const fields = field(runaway) + ", " + field(runaway) + ", " + field(runaway);
    json::Object const reading = explainedInAnyTime(line + "\n", fields);
    std::string const words = " cannot be searched in this text: .+; let it repeat fewer "
                              "things inside each other";
    json::Array const told = fieldsOfFirstZone(reading);
    EXPECT_THAT(nearMissesIn(told.at(0).toObject()),
                ElementsAre(MatchesRegex("failure: the pattern" + words)));
    EXPECT_THAT(nearMissesIn(told.at(1).toObject()),
                ElementsAre(MatchesRegex("failure: the pattern" + words)));
    EXPECT_THAT(nearMissesIn(told.at(2).toObject()),
                ElementsAre(MatchesRegex("failure: patterns of the fields before it" + words)));
}

TEST(NearMissKinds, StandInTheDescriptionInTheirOrder) {
    std::ifstream in(VLSERVICE_DOCS "/explain.md");
    std::vector<std::string> described;
    for (std::string line; std::getline(in, line);)
        if (line.starts_with("| `") &&
            (line.find("` | not found |") != line.npos || line.find("` | refused |") != line.npos ||
             line.find("` | both |") != line.npos))
            described.push_back(line.substr(3, line.find('`', 3) - 3));
    std::vector<std::string> known;
    for (int kind = 0; kind <= static_cast<int>(NearMissKind::Literal); ++kind)
        known.push_back(nameOf(static_cast<NearMissKind>(kind)));
    EXPECT_EQ(described, known);
}

TEST_F(NearMissTest, HaveATimeForEachDocumentAndSayWhenItIsUp) {
    using std::chrono_literals::operator""ms;
    std::string const settings =
        R"_({"zones": [{"name": "All", "location": {"right": 100000, "bottom": 100000},
        "fields": [{"name": "a", "value_extract": "^Ref (?<VAL>x+)$", "value_match": ".*.*.*.*.*:"},
                   {"name": "b", "value_extract": "^Our (?<VAL>\\d+)$"}]}]})_";
    Cfg::ExtractPreset const preset(json::strToObject(settings.data(), settings.size()));
    Reader::Document document = Reader::openDocument("REF " + std::string(900, 'x'), "a.txt");
    Reader::Trace trace;
    Reader::readLetters(document, preset, &trace);
    json::Object explanation;
    explainPages(explanation, document, preset, {}, trace, {30ms, 30ms});
    json::Object const reading{{"trace", explanation}};
    EXPECT_THAT(nearMisses(reading, "a"), testing::Contains(StartsWith("letter_case: ")));
    EXPECT_THAT(nearMisses(reading, "b"),
                ElementsAre("failure: nothing was tried for this field, since that took 0.030 s for the "
                            "fields before it; \"vlmail presets lint\" tells which patterns are slow"));
}

TEST(PresetWalks, EndInTimeWithTheOneThatCannotBeTriedAnyMore) {
    using std::chrono_literals::operator""ms;
    json::Array presets;
    for (int i = 0; i < 500; ++i)
        presets.append(json::Object{{"match", ".*.*.*:" + std::to_string(i)}, {"pack_preset", "P"}});
    Cfg::Presets const settings(json::Object{{"extract_presets", presets}}, false, false);
    std::vector<PresetStep> const steps = walkPresets(settings, std::string(190, 'x'), 50ms);
    EXPECT_EQ(steps.back().answer, PresetStep::Answer::Failed);
    EXPECT_EQ(steps.back().why, "cannot be tried: The time for matching the regular expression is up.");
    EXPECT_LT(steps.size(), 500U);
}

TEST(PresetWalks, SayWhenItTakesTooLongToTellWhereANameDoesNotFit) {
    using std::chrono_literals::operator""ms;
    EXPECT_EQ(Patterns::whyNot(".*.*.*:7", std::string(190, 'x'), 0ms).words,
              "it does not fit, and it takes too long to tell where");
}

} // namespace
} // namespace VlMail
