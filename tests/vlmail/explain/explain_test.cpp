// The explanation as programs and people get it.
#include "tests/vlmail/explain/explain_fixture.h"

#include "tests/support/json_literal.h"

namespace VlMail {
namespace {

using testing::HasSubstr;
using testing::Not;
using namespace VLServiceTest;

constexpr char const* SETTINGS = R"text({"extract_presets": [
    {"match": "terms", "pack_preset": "P"},
    {"match": "let(", "pack_preset": "P", "order": 9},
    {"match": "letter.*", "pack_preset": "P", "name": "Letters", "order": -1, "zones": [
        {"name": "Text", "location": {"left": 2000, "top": 900, "right": 15000, "bottom": 6000}, "fields": [
            {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true},
            {"name": "date", "value_extract": "(?<VAL>\\d+/\\d+/\\d+)", "value_type": 3},
            {"name": "total", "value_extract": "^Total: (?<VAL>.*)$", "value_type": 2, "value_max": 10},
            {"name": "wide", "value_extract": "^Wide: (?<VAL>.*)$", "width": 1000},
            {"name": "ref", "value_extract": "^Ref: (?<VAL>\\d+)$", "obligatory": true},
            {"name": "currency", "value_extract": "", "default_value": "EUR"}]},
        {"name": "Point", "most_probable_point": {"x": 1000, "y": 20000}, "fields": []}]}],
    "pack_presets": [{"name": "P"}]})text";

constexpr char const* LETTER = "To: Anna\nof 5/3/2021\nTotal: 12.30\nWide: 1234567890\nRef: x\n";

class ExplanationTest : public ExplainTest {
protected:
    json::Object trace(std::string const& document = LETTER) {
        return explainedText(document, SETTINGS).get("trace").toObject();
    }
    json::Object field(char const* name) { return fieldOf(explainedText(LETTER, SETTINGS), name); }
};

TEST_F(ExplanationTest, IsThereOnlyWhenItIsAskedFor) {
    write("letter.txt", LETTER);
    write("settings.json", SETTINGS);
    std::string const file = (folder_ / "letter.txt").string();
    std::string const settings = (folder_ / "settings.json").string();
    vlmail({"letter", "--json", "--settings", settings, file});
    EXPECT_FALSE(parsed().get("trace"));
    vlmail({"letter", "--settings", settings, file});
    EXPECT_THAT(out_, Not(HasSubstr("how it was read")));
}

TEST_F(ExplanationTest, LeavesTheAnswerAsItIs) {
    json::Object const with = explainedText(LETTER, SETTINGS);
    vlmail({"letter", "--json", "--settings", (folder_ / "settings.json").string(),
            (folder_ / "letter.txt").string()});
    json::Object const without = parsed();
    for (auto const& [key, value] : without)
        EXPECT_EQ(text(value), text(with.get(key))) << key;
    EXPECT_EQ(with.size(), without.size() + 1);
}

TEST_F(ExplanationTest, TellsItsVersionAndTheNumberOfPages) {
    json::Object const explanation = trace("one\n\ftwo\n");
    EXPECT_EQ(explanation.get("version").toInt(), 1);
    EXPECT_EQ(explanation.get("page_count").toInt(), 2);
    EXPECT_EQ(explanation.get("pages").toArray().size(), 1U);
}

TEST_F(ExplanationTest, TellsThePresetsUpToTheOneThatFits) {
    write("settings.json", R"({"extract_presets": [
        {"match": "terms.*", "pack_preset": "Q", "order": 1, "name": "Terms"},
        {"match": "letter", "pack_preset": "P", "order": 2},
        {"match": "l.*", "pack_preset": "P", "order": 3},
        {"match": ".*", "pack_preset": "P", "order": 4}], "pack_presets": [{"name": "P"}]})");
    write("letter.txt", "x\n");
    json::Object const reading = explained(folder_ / "letter.txt", folder_ / "settings.json");
    EXPECT_EQ(text(reading.get("trace").toObject().get("presets")), text(R"([
        {"match": "terms.*", "name": "Terms", "pack_preset": "Q", "inherited": false, "answer": "no",
         "why": "the name does not begin with \"terms\""},
        {"match": "letter", "name": "", "pack_preset": "P", "inherited": false, "answer": "no",
         "why": "it must fit the whole name, and ends before \".txt\""},
        {"match": "l.*", "name": "", "pack_preset": "P", "inherited": false, "answer": "yes",
         "why": "fits the whole name"}])"_json));
}

TEST_F(ExplanationTest, TellsThePresetThatEndsTheSearchWithAnError) {
    write("other.txt", "x\n");
    write("settings.json", SETTINGS);
    EXPECT_EQ(vlmail({"letter", "--explain", "--json", "--settings", (folder_ / "settings.json").string(),
                      (folder_ / "other.txt").string()}),
              FAILED);
    json::Object const reading = parsed();
    EXPECT_TRUE(reading.get("error"));
    json::Array const& presets = reading.get("trace").toObject().get("presets").toArray();
    json::Object const& last = presets.at(presets.size() - 1).toObject();
    EXPECT_EQ(last.get("answer").textOrEmpty(), "failed");
    EXPECT_THAT(last.get("why").textOrEmpty(), testing::StartsWith("cannot be tried: "));
    EXPECT_FALSE(reading.get("trace").toObject().get("pages"));
}

TEST_F(ExplanationTest, SaysThatANameFitsInAnotherUnicodeForm) {
    write("u\u0308ber.txt", "x\n");
    write("settings.json", R"({"extract_presets": [{"match": "\u00FCber.*", "pack_preset": "P"}]})");
    json::Object const reading = explained(folder_ / "u\u0308ber.txt", folder_ / "settings.json");
    EXPECT_EQ(
        reading.get("trace").toObject().get("presets").toArray().at(0).toObject().get("why").textOrEmpty(),
        "would fit after Unicode normalisation: letters are composed in one and decomposed in the other");
}

TEST_F(ExplanationTest, TellsPagesAndZonesWithTheirPlaces) {
    json::Object const page = trace().get("pages").toArray().at(0).toObject();
    EXPECT_EQ(page.get("page").toInt(), 1);
    EXPECT_EQ(page.get("width").toInt(), 21000);
    EXPECT_EQ(page.get("height").toInt(), 29700);
    EXPECT_TRUE(page.get("begins_letter").toBool());
    json::Object const zone = page.get("zones").toArray().at(0).toObject();
    EXPECT_EQ(zone.get("name").textOrEmpty(), "Text");
    EXPECT_EQ(text(zone.get("location")), R"({"left":2000,"top":900,"right":15000,"bottom":6000})");
    EXPECT_FALSE(zone.get("point"));
    EXPECT_EQ(zone.get("text").textOrEmpty(),
              "To: Anna\nof 5/3/2021\nTotal: 12.30\nWide: 1234567890\nRef: x");
    EXPECT_EQ(text(zone.get("box")), R"({"left":2500,"top":1000,"right":5887,"bottom":3046})");
    EXPECT_EQ(text(zone.get("blocks")), "[" + text(zone.get("box")) + "]");
    json::Object const point = page.get("zones").toArray().at(1).toObject();
    EXPECT_EQ(text(point.get("point")), R"({"x":1000,"y":20000})");
    EXPECT_FALSE(point.get("location"));
}

TEST_F(ExplanationTest, OfAZoneWithoutTextHasNoBox) {
    json::Object const zone =
        trace("\n").get("pages").toArray().at(0).toObject().get("zones").toArray().at(0).toObject();
    EXPECT_EQ(zone.get("text").textOrEmpty(), "");
    EXPECT_FALSE(zone.get("box"));
    EXPECT_EQ(zone.get("blocks").toArray().size(), 0U);
}

TEST_F(ExplanationTest, OfAFoundFieldTellsMatchCutAndValue) {
    EXPECT_EQ(text(field("date")), text(R"text({"name": "date", "outcome": "found",
        "pattern": "(?<VAL>\\d+/\\d+/\\d+)", "type": "date", "priority": 0, "obligatory": false,
        "match": {"text": "5/3/2021", "box": {"left": 3135, "top": 1423, "right": 4828, "bottom": 1776}, "width": 1693},
        "cut": "of 5/3/2021", "raw": "5/3/2021", "default": false, "value": 1614902400,
        "shown": "2021/03/05 00:00:00", "passed_over": false})text"_json));
}

constexpr char const* APART = R"text({"name": "total", "value_type": 2,
    "value_extract": "^Total:\\h*(?<VAL>[\\d.]+)"}, {"name": "date", "value_extract": "^Date:\\h*(?<VAL>.+)$"})text";

TEST_F(ExplanationTest, OfAFieldInJoinedLinesTellsWhichAndWhere) {
    json::Object const reading = explainedFields("Date:\ntoday\n\n\nTotal:         12.00 EUR\n", APART);
    EXPECT_EQ(text(fieldOf(reading, "total").get("joined")), text(R"({"joint": "right", "parts": [
        {"left": 2500, "top": 2693, "right": 3770, "bottom": 3046},
        {"left": 5675, "top": 2693, "right": 6733, "bottom": 3046}]})"_json));
    EXPECT_EQ(text(fieldOf(reading, "total").get("match")), text(R"({"text": "Total: 12.00",
        "box": {"left": 2500, "top": 2693, "right": 6733, "bottom": 3046}, "width": 1270})"_json));
    EXPECT_EQ(text(fieldOf(reading, "date").get("joined").toObject().get("joint")), "\"below\"");
    EXPECT_FALSE(fieldOf(reading, "date").get("near_misses"));
}

TEST_F(ExplanationTest, ForPeopleSaysWhichLinesWereJoined) {
    explainedFields("Date:\ntoday\n\n\nTotal:         12.00 EUR\n", APART);
    vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
            (folder_ / "letter.txt").string()});
    EXPECT_THAT(out_,
                HasSubstr("            matches \"Total: 12.00\", joined with the line to the right, at left "
                          "25 mm, top 26.93 mm, right 67.33 mm, bottom 30.46 mm\n"));
    EXPECT_THAT(out_, HasSubstr("            matches \"Date: today\", joined with the line below, at "));
}

constexpr char const* MARKED =
    R"text({"name": "number", "mark": 1, "value_extract": "^Invoice (?<VAL>\\d+)$"},
    {"name": "to", "priority": 1, "send_to_server": true, "value_extract": "^To: (?<VAL>.+)$"})text";

TEST_F(ExplanationTest, TellsThatAPageMayBeginALetterAndWhere) {
    json::Object const reading = explainedFields("Invoice 17\nTo: Ada\n\fINVOICE 18\nTo: Lena\n", MARKED);
    json::Array const pages = reading.get("trace").toObject().get("pages").toArray();
    EXPECT_FALSE(pages.at(0).toObject().get("may_begin_letter"));
    EXPECT_EQ(text(pages.at(1).toObject().get("may_begin_letter")), text(R"({
        "says": "\"INVOICE 18\" nearly is the mark \"number\", with another letter case",
        "box": {"left": 2500, "top": 1000, "right": 4617, "bottom": 1353}})"_json));
}

TEST_F(ExplanationTest, ForPeopleSaysThatAPageMayBeginALetter) {
    explainedFields("Invoice 17\nTo: Ada\n\fINVOICE 18\nTo: Lena\n", MARKED);
    vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
            (folder_ / "letter.txt").string()});
    EXPECT_THAT(out_, HasSubstr("      it may begin a letter all the same: \"INVOICE 18\" nearly is the mark "
                                "\"number\", with another letter case, at left 25 mm, top 10 mm, "));
}

constexpr char const* PLACED =
    R"text({"extract_presets": [{"match": "letter.*", "pack_preset": "P", "zones": [
    {"name": "Total", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 900}, "fields": [
        {"name": "total", "value_extract": "^Total: (?<VAL>\\d+)$"}]},
    {"name": "Nowhere", "fields": []}]}],
    "pack_presets": [{"name": "P", "reading": {"zones": {"Total": {"page": "last", "anchor": "^Sum", "column": true},
                                                        "Nowhere": {"page": 3}}}}]})text";

TEST_F(ExplanationTest, TellsWhereReadingPutsAZone) {
    json::Object const reading = explainedText("one\n\f\n\nSum\nTotal: 17\n", PLACED);
    json::Array const zones =
        reading.get("trace").toObject().get("pages").toArray().at(0).toObject().get("zones").toArray();
    json::Object const total = zones.at(0).toObject();
    EXPECT_EQ(total.get("page").toInt(), 2);
    EXPECT_EQ(text(total.get("anchor")),
              text(R"({"left": 2500, "top": 1847, "right": 3135, "bottom": 2200})"_json));
    EXPECT_EQ(text(total.get("place")),
              text(R"({"left": 2500, "top": 1847, "right": 11500, "bottom": 2747})"_json));
    EXPECT_EQ(text(total.get("location")),
              text(R"({"left": 0, "top": 0, "right": 9000, "bottom": 900})"_json));
    EXPECT_TRUE(total.get("column").isTrue());
    EXPECT_FALSE(total.get("nowhere"));
    json::Object const nowhere = zones.at(1).toObject();
    EXPECT_EQ(text(nowhere.get("nowhere")), "\"the letter has no page 3\"");
    EXPECT_FALSE(nowhere.get("page"));
}

TEST_F(ExplanationTest, ForPeopleSaysWhereReadingPutsAZone) {
    explainedText("one\n\f\n\nSum\nTotal: 17\n", PLACED);
    vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
            (folder_ / "letter.txt").string()});
    EXPECT_THAT(
        out_,
        HasSubstr(
            "      zone \"Total\", on page 2, column by column, told from the anchor at left 25 mm, top "
            "18.47 mm: left 25 mm, top 18.47 mm, right 115 mm, bottom 27.47 mm\n"));
    EXPECT_THAT(out_, HasSubstr("      zone \"Nowhere\", the block nearest to the point 45 mm, 62 mm\n"
                                "        the letter has no page 3\n"));
}

TEST_F(ExplanationTest, OfAnInvalidFieldTellsWhatValidationSaid) {
    json::Object const total = field("total");
    EXPECT_EQ(total.get("outcome").textOrEmpty(), "invalid");
    EXPECT_EQ(total.get("says").textOrEmpty(), "12.30 is above the maximum 10");
    EXPECT_EQ(total.get("value").textOrEmpty(), "12.30");
}

TEST_F(ExplanationTest, OfATooWideFieldTellsTheWidth) {
    json::Object const wide = field("wide");
    EXPECT_EQ(wide.get("outcome").textOrEmpty(), "too_wide");
    EXPECT_EQ(wide.get("says").textOrEmpty(), "wider than 10 mm: 33.87 mm");
    EXPECT_FALSE(wide.get("cut"));
    EXPECT_FALSE(wide.get("value"));
}

TEST_F(ExplanationTest, OfAMissingFieldHasNearMissesWithTheirPlaces) {
    json::Object const ref = field("ref");
    EXPECT_EQ(ref.get("outcome").textOrEmpty(), "not_found");
    EXPECT_TRUE(ref.get("obligatory").toBool());
    EXPECT_EQ(text(ref.get("near_misses")), text(R"text([{"kind": "rest",
        "says": "\"Ref: \" fits \"^Ref: \", but \"x\" behind it does not fit \"(?<VAL>\\d+)$\"",
        "text": "Ref: x", "page": 1, "box": {"left": 2500, "top": 2693, "right": 3770, "bottom": 3046}}])text"_json));
}

TEST_F(ExplanationTest, OfAFieldWithoutAPatternTellsTheDefault) {
    json::Object const currency = field("currency");
    EXPECT_EQ(currency.get("outcome").textOrEmpty(), "not_searched");
    EXPECT_TRUE(currency.get("default").toBool());
    EXPECT_EQ(currency.get("shown").textOrEmpty(), "EUR");
}

TEST_F(ExplanationTest, MarksValuesThatAnEarlierOneOfTheSameNameStandsFor) {
    json::Object const reading = explainedFields(
        "A: 1\nB: 2\n", R"text({"name": "n", "value_extract": "^C: (?<VAL>.*)$", "default_value": "0"},
                           {"name": "n", "value_extract": "^A: (?<VAL>.*)$"},
                           {"name": "n", "value_extract": "^B: (?<VAL>.*)$"})text");
    json::Array const fields = fieldsOfFirstZone(reading);
    EXPECT_TRUE(fields.at(0).toObject().get("passed_over").toBool());
    EXPECT_FALSE(fields.at(1).toObject().get("passed_over").toBool());
    EXPECT_TRUE(fields.at(2).toObject().get("passed_over").toBool());
}

TEST_F(ExplanationTest, OfAnAttachmentEndsWithThePresets) {
    json::Object const reading =
        explainedText("terms\n", R"({"extract_presets": [{"match": "l.*", "pack_preset": "P", "type": 1}],
                                 "pack_presets": [{"name": "P"}]})");
    EXPECT_TRUE(reading.get("trace").toObject().get("presets"));
    EXPECT_FALSE(reading.get("trace").toObject().get("pages"));
}

TEST_F(ExplanationTest, ForPeopleHasTheAnswerFirstAndThenTheEvidence) {
    write("letter.txt", LETTER);
    write("settings.json", SETTINGS);
    EXPECT_EQ(vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
                      (folder_ / "letter.txt").string()}),
              INCOMPLETE);
    EXPECT_EQ(out_, R"text(letter.txt
  read by the preset for  letter.*
  sent by the pack preset P
  letter 1 of 1, page 1: cannot go out: Field name: "total"
    field     value                state    address
    postal    Anna                 ok       recipient, this one counts
    date      2021/03/05 00:00:00  date
    total     12.30                INVALID
    currency  EUR                  ok
    missing, although obligatory: ref
  how it was read
    presets, in the order in which they are tried:
      1. "letter.*" (Letters): yes, fits the whole name
    page 1 of 1, 210 mm by 297 mm: a letter begins here
      zone "Text", left 20 mm, top 9 mm, right 150 mm, bottom 60 mm
        its text, left 25 mm, top 10 mm, right 58.87 mm, bottom 30.46 mm:
        | To: Anna
        | of 5/3/2021
        | Total: 12.30
        | Wide: 1234567890
        | Ref: x
        found        postal: Anna
            pattern "^To: (?<VAL>.*)$"
            matches "To: Anna" at left 25 mm, top 10 mm, right 41.93 mm, bottom 13.53 mm
        found        date: 2021/03/05 00:00:00
            pattern "(?<VAL>\d+/\d+/\d+)"
            matches "5/3/2021" at left 31.35 mm, top 14.23 mm, right 48.28 mm, bottom 17.76 mm
            takes "of 5/3/2021" out of the zone's text
        INVALID      total: 12.30; 12.30 is above the maximum 10
            1. 12.30 is above the maximum 10: raise "value_max", or correct the letter
            pattern "^Total: (?<VAL>.*)$"
            matches "Total: 12.30" at left 25 mm, top 18.47 mm, right 50.4 mm, bottom 22 mm
        TOO WIDE     wide; wider than 10 mm: 33.87 mm
            1. the match is 33.87 mm wide and the field allows 10 mm: raise "width" to 3387 or more, or let the pattern or the zone take less text
            pattern "^Wide: (?<VAL>.*)$"
            matches "Wide: 1234567890" at left 25 mm, top 22.7 mm, right 58.87 mm, bottom 26.23 mm
        MISSING      ref, which is obligatory
            1. "Ref: " fits "^Ref: ", but "x" behind it does not fit "(?<VAL>\d+)$"
            pattern "^Ref: (?<VAL>\d+)$"
        not searched currency: EUR, by default
      zone "Point", the block nearest to the point 10 mm, 200 mm
        its text, left 25 mm, top 10 mm, right 58.87 mm, bottom 30.46 mm:
        | To: Anna
        | of 5/3/2021
        | Total: 12.30
        | Wide: 1234567890
        | Ref: x

)text");
}

TEST_F(ExplanationTest, ForPeopleIsShort) {
    std::string document;
    for (int line = 0; line < 40; ++line)
        document += std::string(120, 'x') + "\n";
    std::string presets;
    for (int i = 0; i < 40; ++i)
        presets += R"({"match": "no)" + std::to_string(i) + R"(", "pack_preset": "P"}, )";
    write("letter.txt", document);
    write("settings.json",
          R"({"extract_presets": [)" + presets + R"({"match": "l.*", "pack_preset": "P", "zones": [
        {"name": "Page", "location": {"left": 0, "top": 0, "right": 90000, "bottom": 29700}, "fields": []}]}],
        "pack_presets": [{"name": "P"}]})");
    vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
            (folder_ / "letter.txt").string()});
    EXPECT_THAT(out_, HasSubstr("\n      10. \"no9\": no, the name does not begin with \"no9\"\n"
                                "      ... 21 more that do not fit ...\n      32. \"no31\": "));
    EXPECT_THAT(out_, HasSubstr("\n        | " + std::string(100, 'x') + "\u2026\n"));
    EXPECT_THAT(out_, HasSubstr("\n        | ...\n"));
    EXPECT_LT(std::count(out_.begin(), out_.end(), '\n'), 60);
}

TEST_F(ExplanationTest, OfADamagedDocumentHasThePresetsAtLeast) {
    write("letter.pdf", "%PDF-1.4\nnothing\n");
    write("settings.json", SETTINGS);
    EXPECT_EQ(vlmail({"letter", "--explain", "--settings", (folder_ / "settings.json").string(),
                      (folder_ / "letter.pdf").string()}),
              FAILED);
    EXPECT_THAT(
        out_, HasSubstr("letter.pdf\n  how it was read\n    presets, in the order in which they are tried:\n"
                        "      1. \"letter.*\" (Letters): yes, fits the whole name\n"));
    EXPECT_THAT(err_, testing::StartsWith("vlmail: "));
}

TEST_F(ExplanationTest, IsTheSameOnAnyNumberOfProcesses) {
    write("letter.txt", LETTER);
    write("letter2.txt", "To: Berta\n");
    write("settings.json", SETTINGS);
    std::string told;
    for (char const* const jobs : {"1", "2"}) {
        vlmail({"letter", "--explain", "--jobs", jobs, "--settings", (folder_ / "settings.json").string(),
                (folder_ / "letter.txt").string(), (folder_ / "letter2.txt").string()});
        EXPECT_TRUE(told.empty() || told == out_);
        told = out_;
    }
}

} // namespace
} // namespace VlMail
