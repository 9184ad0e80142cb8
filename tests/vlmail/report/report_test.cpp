// The page out of the report's model: what stands where, and that nothing from outside becomes HTML.
#include "programs/vlmail/report/html.h"
#include "programs/vlmail/report/report.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <regex>
#include <set>

namespace {

using namespace VlMail;
using Report::Field;
using Report::page;
using Report::section;
using Report::Zone;
using testing::HasSubstr;
using testing::Not;

constexpr char const* HOSTILE = "</title><script>alert(1)</script>\" onload='x' & \x01 \xFF";

Zone addressWindow() {
    return {"Window", {2000, 4500, 11000, 9000}, true, false, {{"postal", "Ann\nRoad 1"}}};
}

Report::Letter letterWith(std::vector<Zone> zones) {
    Report::Letter letter{"page 1", {}, {{1, 20000, 30000, "png"}}};
    letter.zones = std::move(zones);
    return letter;
}

Report::Document documentWith(std::vector<Report::Letter> letters) {
    return {"a.pdf", "", ".*", "Letters", false, std::move(letters)};
}

std::string sectionWith(Zone const& zone) { return section(documentWith({letterWith({zone})}), 1); }

std::string sectionWith(Field const& field) {
    Zone zone = addressWindow();
    zone.fields = {field};
    return sectionWith(zone);
}

/// A document in whose texts everything is hostile.
Report::Document hostileDocument() {
    Field field{HOSTILE, HOSTILE, Field::State::Invalid, HOSTILE, {Reader::Box{0, 0, 10, 10}}};
    Report::Letter letter = letterWith({{HOSTILE, {0, 0, 100, 100}, true, true, {field}}});
    letter.zones.push_back({HOSTILE, {}, false, false, {}, 0, HOSTILE});
    letter.pages = letter.whyNot = letter.sheets[0].whyNoPicture = HOSTILE;
    letter.sheets[0].png.clear();
    letter.faults.push_back({HOSTILE, true, HOSTILE, HOSTILE, HOSTILE, {0}, {0, 0, 100, 100}});
    return {HOSTILE, "", HOSTILE, HOSTILE, false, {letter}};
}

std::string wholePage(std::vector<Report::Document> const& documents) {
    std::vector<Report::Entry> entries;
    for (Report::Document const& document : documents)
        entries.push_back({document.name, "1 letter", false, section(document, entries.size() + 1)});
    return page("1 document", entries);
}

std::vector<std::string> matchesOf(std::string const& html, std::string const& expression) {
    std::regex const regex(expression);
    std::vector<std::string> all;
    for (std::sregex_iterator at(html.begin(), html.end(), regex), end; at != end; ++at)
        all.push_back(at->str(1));
    return all;
}

TEST(ReportEscaping, ReplacesWhatHtmlReads) {
    EXPECT_EQ(Report::escaped("<a href=\"x\">'&'</a>"),
              "&lt;a href=&quot;x&quot;&gt;&#39;&amp;&#39;&lt;/a&gt;");
}

TEST(ReportEscaping, KeepsLineFeedsAndShowsOtherControlsAndBadBytes) {
    EXPECT_EQ(Report::escaped("a\nb\tc\x01"
                              "d\x7F"
                              "e\xFF"),
              "a\nb c\\u0001d\\u007fe\uFFFD");
}

TEST(ReportEscaping, LetsNoTextFromOutsideBecomeHtml) {
    std::string const html = page(HOSTILE, {{HOSTILE, HOSTILE, true, section(hostileDocument(), 1)}});
    EXPECT_THAT(html, Not(HasSubstr("<script")));
    EXPECT_THAT(html, Not(HasSubstr("onload='")));
    EXPECT_THAT(html, Not(HasSubstr("\" onload")));
    EXPECT_THAT(html, Not(HasSubstr("\x01")));
    EXPECT_EQ(matchesOf(html, "(</title>)").size(), 1U);
}

TEST(ReportEscaping, EscapesTheErrorOfADocument) {
    EXPECT_THAT(section({"a.pdf", HOSTILE}, 1), Not(HasSubstr("<script")));
}

TEST(ReportPercent, HasAPointAndAtMostTwoDecimals) {
    EXPECT_EQ(Report::percent(1, 8), "12.5%");
    EXPECT_EQ(Report::percent(1, 3), "33.33%");
    EXPECT_EQ(Report::percent(21000, 21000), "100%");
    EXPECT_EQ(Report::percent(0, 21000), "0%");
}

TEST(ReportPicture, IsInThePage) {
    EXPECT_THAT(sectionWith(addressWindow()), HasSubstr("src=\"data:image/png;base64,cG5n\""));
}

TEST(ReportPicture, IsReplacedByTheReasonThatThereIsNone) {
    Report::Letter letter = letterWith({});
    letter.sheets[0].png.clear();
    letter.sheets[0].whyNoPicture = "too large";
    std::string const html = section(documentWith({letter}), 1);
    EXPECT_THAT(html, HasSubstr("too large"));
    EXPECT_THAT(html, Not(HasSubstr("<img")));
}

TEST(ReportOverlay, PutsZonesWhereTheyAreOnThePage) {
    EXPECT_THAT(
        sectionWith(addressWindow()),
        HasSubstr("<a class=\"zone window\" id=\"d1l1z1\" href=\"#d1l1z1r\" "
                  "style=\"left:10%;top:15%;width:45%;height:15%\" aria-label=\"address window Window\">"));
}

TEST(ReportOverlay, TellsOrdinaryZonesAndThoseFoundByTheirPoint) {
    EXPECT_THAT(sectionWith(Zone{"Info", {0, 3000, 2000, 6000}}),
                HasSubstr("<a class=\"zone\" id=\"d1l1z1\" href=\"#d1l1z1r\" "
                          "style=\"left:0%;top:10%;width:10%;height:10%\" aria-label=\"zone Info\">"));
    EXPECT_THAT(sectionWith(Zone{"Near", {0, 3000, 2000, 6000}, false, true}),
                HasSubstr("<a class=\"zone point\" "));
}

TEST(ReportOverlay, PutsMatchesWhereTheyAreWithTheirNames) {
    std::string const html =
        sectionWith(Field{"total", "5", Field::State::Found, "", {Reader::Box{5000, 6000, 7000, 6300}}});
    EXPECT_THAT(html,
                HasSubstr("id=\"d1l1z1f1\" href=\"#d1l1z1f1r\" "
                          "style=\"left:25%;top:20%;width:10%;height:1%\" "
                          "aria-label=\"field total: \u2713 found\"><span class=\"tag\"><bdi>total</bdi>"));
}

TEST(ReportOverlay, PutsEachOfJoinedLinesWhereItIs) {
    std::string const html =
        sectionWith(Field{"a<b",
                          "5",
                          Field::State::Found,
                          "",
                          {Reader::Box{5000, 6000, 7000, 6300}, Reader::Box{10000, 6000, 12000, 6300}}});
    EXPECT_THAT(html, HasSubstr("<a class=\"match \" id=\"d1l1z1f1\" href=\"#d1l1z1f1r\" "
                                "style=\"left:25%;top:20%;width:10%;height:1%\""));
    EXPECT_THAT(html, HasSubstr("<a class=\"match \" href=\"#d1l1z1f1r\" "
                                "style=\"left:50%;top:20%;width:10%;height:1%\" "
                                "aria-label=\"field a&lt;b, joined line\"></a>"));
}

TEST(ReportOverlay, EndsAtThePagesEdgesWhateverTheSettingsSay) {
    constexpr int FAR = 2000000000;
    EXPECT_THAT(sectionWith(Zone{"Far", {-FAR, -FAR, FAR, FAR}}),
                HasSubstr("style=\"left:0%;top:0%;width:100%;height:100%\""));
    EXPECT_THAT(sectionWith(Zone{"Off", {FAR, FAR, -FAR, -FAR}}),
                HasSubstr("style=\"left:100%;top:100%;width:0%;height:0%\""));
}

TEST(ReportOverlay, DrawsLargeZonesUnderSmallOnes) {
    Zone const small{"Small", {0, 0, 100, 100}};
    Zone const large{"Large", {0, 0, 20000, 30000}};
    std::string const html = section(documentWith({letterWith({small, large})}), 1);
    EXPECT_LT(html.find("aria-label=\"zone Large\""), html.find("aria-label=\"zone Small\""));
}

TEST(ReportOverlay, IsLeftOutForAPageWithoutSize) {
    Report::Letter letter = letterWith({addressWindow()});
    letter.sheets[0].width = 0;
    EXPECT_THAT(section(documentWith({letter}), 1), Not(HasSubstr("aria-label=\"address window")));
}

struct StateCase {
    Field::State state;
    char const* row;
    char const* words;
    char const* match;
};

class ReportState : public testing::TestWithParam<StateCase> {};

TEST_P(ReportState, IsToldInWordsAndByTheLookOfRowAndMatch) {
    StateCase const& expected = GetParam();
    std::string const html =
        sectionWith(Field{"total", "5", expected.state, "", {Reader::Box{5000, 6000, 7000, 6300}}});
    EXPECT_THAT(html, HasSubstr(std::string("<tr id=\"d1l1z1f1r\" class=\"") + expected.row + "\">"));
    EXPECT_THAT(html, HasSubstr(std::string("\">") + expected.words + "</span>"));
    EXPECT_THAT(html, HasSubstr(std::string("<a class=\"") + expected.match + "\""));
}

INSTANTIATE_TEST_SUITE_P(
    All, ReportState,
    testing::Values(StateCase{Field::State::Found, "", "\u2713 found", "match "},
                    StateCase{Field::State::Default, "quiet", "= default", "match quiet"},
                    StateCase{Field::State::Unused, "quiet", "\u2013 not used", "match quiet"},
                    StateCase{Field::State::NotFound, "quiet", "\u2013 not found", "match quiet"},
                    StateCase{Field::State::Invalid, "bad", "\u2717 invalid", "match bad"},
                    StateCase{Field::State::Missing, "bad", "\u2717 missing", "match bad"}));

TEST(ReportMatch, HasACrossInItsTagWhenItIsInvalid) {
    EXPECT_THAT(sectionWith(Field{"total", "x", Field::State::Invalid, "", {Reader::Box{0, 0, 10, 10}}}),
                HasSubstr("<span class=\"tag\"><bdi>\u2717 total</bdi></span>"));
}

TEST(ReportMatch, HasItsTagWhereThereIsRoom) {
    Field field{"total", "5", Field::State::Found, "", {Reader::Box{15000, 0, 19000, 300}}};
    EXPECT_THAT(sectionWith(field), HasSubstr("<a class=\"match \""));
    field.tag = Field::Tag::InFront;
    EXPECT_THAT(sectionWith(field), HasSubstr("<a class=\"match  front\""));
    field.tag = Field::Tag::Above;
    EXPECT_THAT(sectionWith(field), HasSubstr("<a class=\"match  above\""));
}

TEST(ReportRow, OfAFieldWithoutAMatchLinksToNothing) {
    EXPECT_THAT(sectionWith(Field{"total", "", Field::State::Missing}),
                HasSubstr("<th scope=\"row\"><bdi>total</bdi></th>"));
}

TEST(ReportRow, HasTheNote) {
    EXPECT_THAT(sectionWith(Field{"total", "5", Field::State::Found, "recipient"}),
                HasSubstr("<small><bdi>recipient</bdi></small>"));
}

TEST(ReportLetter, SaysWhyItCannotGoOut) {
    Report::Letter letter = letterWith({});
    letter.whyNot = "no address to go to";
    EXPECT_THAT(section(documentWith({letter}), 1),
                HasSubstr("\u2717 cannot go out: <bdi>no address to go to</bdi>"));
    EXPECT_THAT(section(documentWith({letterWith({})}), 1), HasSubstr("\u2713 ready"));
}

TEST(ReportDocument, WithoutLettersSaysWhy) {
    Report::Document attachment = documentWith({});
    attachment.isAttachment = true;
    EXPECT_THAT(section(attachment, 1), HasSubstr("An attachment: it holds no letters."));
    EXPECT_THAT(section({"a.pdf", "cannot read it"}, 1), HasSubstr("\u2717 <bdi>cannot read it</bdi>"));
}

TEST(ReportPage, HasAPictureForEachLetter) {
    Report::Letter const letter = letterWith({addressWindow()});
    std::string const html = wholePage({documentWith({letter, letter}), documentWith({letter})});
    EXPECT_EQ(matchesOf(html, "(<article)").size(), 3U);
    EXPECT_EQ(matchesOf(html, "(<img)").size(), 3U);
}

TEST(ReportLetter, HasAPictureOfEachPageOnWhichZonesLie) {
    Zone total{"Total",
               {5000, 6000, 7000, 9000},
               false,
               false,
               {{"total", "5", Field::State::Found, "", {Reader::Box{5000, 6000, 7000, 6300}}}}};
    total.sheet = 1;
    Report::Letter letter = letterWith({addressWindow(), total});
    letter.sheets.push_back({3, 10000, 30000, "png"});
    std::string const html = section(documentWith({letter}), 1);
    std::size_t const second = html.find("<figcaption>Page 1,");
    ASSERT_NE(second, html.npos);
    std::string const first = html.substr(0, second);
    std::string const rest = html.substr(second);
    EXPECT_THAT(first, HasSubstr("id=\"d1l1z1\""));
    EXPECT_THAT(first, Not(HasSubstr("id=\"d1l1z2")));
    EXPECT_THAT(rest,
                HasSubstr("id=\"d1l1z2\" href=\"#d1l1z2r\" style=\"left:50%;top:20%;width:20%;height:10%\""));
    EXPECT_THAT(rest, HasSubstr("id=\"d1l1z2f1\""));
    EXPECT_THAT(rest, HasSubstr("<figcaption>Page 3, on which"));
    EXPECT_THAT(rest, HasSubstr(", page 3</small>"));
    EXPECT_THAT(first, HasSubstr("<div class=\"beside\">\n<div>\n<figure>"));
}

TEST(ReportLetter, SaysWhyAZoneLiesNowhere) {
    Zone zone = addressWindow();
    zone.whyNowhere = "the letter has no page 3";
    std::string const html = sectionWith(zone);
    EXPECT_THAT(
        html,
        HasSubstr(
            "colspan=\"3\">address window <bdi>Window</bdi> <small><bdi>the letter has no page 3</bdi>"));
    EXPECT_THAT(html, Not(HasSubstr("href=\"#d1l1z1\"")));
}

TEST(ReportPage, RefersToNothingOutside) {
    std::string const html = wholePage({documentWith({letterWith({addressWindow()})}), hostileDocument()});
    for (std::string const& source : matchesOf(html, "src=\"(.{0,5})"))
        EXPECT_EQ(source, "data:");
    for (std::string const& target : matchesOf(html, "href=\"(.)"))
        EXPECT_EQ(target, "#");
    for (char const* outside : {"http:", "https:", "url(", "@import", "<link", "<script", "<iframe"})
        EXPECT_THAT(html, Not(HasSubstr(outside)));
    EXPECT_THAT(
        html, HasSubstr("<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; "
                        "img-src data:; style-src 'unsafe-inline'; base-uri 'none'; form-action 'none'\">"));
}

TEST(ReportPage, LinksToAnchorsThatAreThereOnce) {
    Zone zone = addressWindow();
    zone.fields = {{"total", "5", Field::State::Found, "", {Reader::Box{5000, 6000, 7000, 6300}}},
                   {"none", "", Field::State::NotFound}};
    Report::Letter const letter = letterWith({zone, addressWindow()});
    std::string const html = wholePage({documentWith({letter, letter}), documentWith({letter})});
    std::vector<std::string> const anchors = matchesOf(html, " id=\"([^\"]*)\"");
    std::set<std::string> const known(anchors.begin(), anchors.end());
    EXPECT_EQ(known.size(), anchors.size());
    for (std::string const& target : matchesOf(html, "href=\"#([^\"]*)\""))
        EXPECT_TRUE(known.count(target)) << target;
}

TEST(ReportPage, LetsTheKeyboardSkipToTheFirstTrouble) {
    EXPECT_THAT(page("", {{"a", "", false}, {"b", "", true}, {"c", "", true}}),
                HasSubstr("<a class=\"skip\" href=\"#d2\">Skip to the first document with trouble</a>"));
    EXPECT_THAT(page("", {{"a", "", false}}), Not(HasSubstr("with trouble")));
}

TEST(ReportPage, KnowsTheDarkPaperAndTheKeyboard) {
    std::string const html = page("", {});
    for (char const* rule : {"@media (prefers-color-scheme: dark)", "@media print", ":focus-visible"})
        EXPECT_THAT(html, HasSubstr(rule));
}

TEST(FaultsOnPaper, AreDrawnOnEachOfTheirSheetsAndToldInATable) {
    Report::Letter letter = letterWith({});
    letter.sheets.push_back({2, 20000, 30000, "png"});
    letter.faults.push_back(
        {"clear-zone", true, "pages 1-2", "it stands there", "move it 5 mm up", {0, 1}, {0, 0, 5000, 3000}});
    letter.faults.push_back({"embedded-file-lost", false, "document", "it is lost", "send it", {}, {}});
    std::string const html = section(documentWith({letter}), 1);
    EXPECT_THAT(html, HasSubstr("<a class=\"fault\" id=\"d1l1p1\" href=\"#d1l1p1r\" style=\"left:0%;top:"));
    EXPECT_THAT(html, HasSubstr("<a class=\"fault\" id=\"d1l1p1s2\" href=\"#d1l1p1r\""));
    EXPECT_THAT(html, HasSubstr("<tr id=\"d1l1p1r\" class=\"bad\"><th scope=\"row\"><a "
                                "href=\"#d1l1p1\">clear-zone</a></th>"));
    EXPECT_THAT(html, HasSubstr("<small>pages 1-2</small>"));
    EXPECT_THAT(html, HasSubstr("<th scope=\"row\">embedded-file-lost</th>"));
    EXPECT_THAT(html, HasSubstr("Page 2, on which something is wrong."));
    EXPECT_THAT(html, Not(HasSubstr("d1l1p2\"")));
}

TEST(FaultsOnPaper, HaveTheirNamesOnTheSheet) {
    auto const lookOf = [](Reader::Box const& box, bool isError) {
        Report::Letter letter = letterWith({});
        letter.faults.push_back({"clear-zone", isError, "page 1", "a", "b", {0}, box});
        std::string const html = section(documentWith({letter}), 1);
        std::size_t const begin = html.find("<a class=\"fault") + 10;
        return html.substr(begin, html.find('"', begin) - begin);
    };
    EXPECT_EQ(lookOf({0, 0, 100, 100}, true), "fault");
    EXPECT_EQ(lookOf({19000, 0, 20000, 100}, false), "fault slight front");
    EXPECT_EQ(lookOf({0, 29000, 100, 30000}, true), "fault above");
}

} // namespace
