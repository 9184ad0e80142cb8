#include "programs/production/page_ink.h"
#include "tests/production/paper.h"
#include "tests/support/raw_pdf.h"

#include <gmock/gmock.h>

#include <map>

namespace {

using namespace VLServiceTest;
using Production::Finding;
using Production::Severity;
using Reader::Box;
using testing::ElementsAre;
using testing::IsEmpty;

/// Well inside everything.
Box const MIDDLE{8000, 14000, 9000, 15000};
constexpr char const* OUTSIDE = "content-outside-print-area";

Finding only(std::vector<Finding> const& findings) {
    EXPECT_EQ(findings.size(), 1U);
    return findings.empty() ? Finding{} : findings.front();
}

/// Text of these tests is in a font that their documents do not carry.
std::vector<Finding> withoutFonts(std::vector<Finding> findings) {
    std::erase_if(findings,
                  [](Finding const& finding) { return finding.code == Production::Code::FontNotEmbedded; });
    return findings;
}

TEST(SizesOfPages, AreThoseOfTheSheetWithinTheTolerance) {
    json::Value const letter = R"({"sheet": {"width": 21590, "height": 27940}})"_json;
    std::map<std::string, std::vector<std::string>> const table{
        {"[0 0 595.276 841.89]", {}},
        {"[0 0 594.96 841.92]", {}},
        {"[0 0 612 792]", {}},
        {"[0 0 841.89 1190.55]", {"page-size"}},
        {"[0 0 419.53 595.28]", {"page-size"}},
        {"[0 0 841.89 595.276]", {"page-orientation"}},
        {"[0 0 792 612]", {"page-orientation"}},
        {"[0 0 595.276 841.89] /Rotate 90", {"page-orientation"}},
        {"[0 0 841.89 595.276] /Rotate 270", {}},
    };
    for (auto const& [media, codes] : table)
        EXPECT_EQ(codesOf(findingsIn(a4Page("", "/MediaBox " + media), printRules({}))), codes) << media;
    EXPECT_THAT(codesOf(findingsIn(a4Page(box(MIDDLE)), printRules(letter))), ElementsAre("page-size"));
    EXPECT_THAT(findingsIn(a4Page(box(MIDDLE), "/MediaBox [0 0 612 792]"), printRules(letter)), IsEmpty());
}

TEST(SizesOfPages, MayDifferByTheToleranceAndByNoMore) {
    auto const codes = [](double width, double height) {
        return codesOf(
            findingsIn(a4Page(box(MIDDLE), "/MediaBox [0 0 " + inPoints(width) + inPoints(height) + "]"),
                       printRules(R"({"tolerance": 50})"_json)));
    };
    for (double const by : {-49.0, 49.0}) {
        EXPECT_THAT(codes(21000 + by, 29700), IsEmpty()) << by;
        EXPECT_THAT(codes(21000, 29700 + by), IsEmpty()) << by;
    }
    for (double const by : {-51.0, 51.0}) {
        EXPECT_THAT(codes(21000 + by, 29700), ElementsAre("page-size")) << by;
        EXPECT_THAT(codes(21000, 29700 + by), ElementsAre("page-size")) << by;
    }
}

TEST(SizesOfPages, AreSaidInMillimetresWithTheSheetToExportFor) {
    Finding const found = only(findingsIn(a4Page("", "/MediaBox [0 0 841.8898 1190.5512]"), printRules({})));
    EXPECT_EQ(found.says, "the page is 297 by 420 mm, the sheet 210 by 297 mm (A4)");
    EXPECT_EQ(found.fix, "export the document for a sheet of 210 by 297 mm (A4)");
    EXPECT_EQ(found.box, (Box{0, 0, 29700, 42000}));
    EXPECT_THAT(found.pages, ElementsAre(1));
    EXPECT_EQ(found.severity, Severity::Error);
}

TEST(EmptyPages, AreAWarningWhereACarrierHasRules) {
    std::string const pdf =
        Reader::PdfMaker().page("", A4_PAGE).page(box(MIDDLE), A4_PAGE).page("", A4_PAGE).bytes();
    Finding const found = only(findingsIn(pdf, printRules("{}"_json)));
    EXPECT_STREQ(nameOf(found.code), "page-empty");
    EXPECT_EQ(found.severity, Severity::Warning);
    EXPECT_THAT(found.pages, ElementsAre(1, 3));
    EXPECT_THAT(findingsIn(pdf, printRules({})), IsEmpty());
}

TEST(UnreadablePages, AreNamedAndTheOthersLookedAt) {
    std::string const pdf = Reader::PdfMaker().page(box({0, 0, 21000, 29700}), A4_PAGE).losePage().bytes();
    std::vector<Finding> const found = findingsIn(pdf, printRules({}));
    EXPECT_THAT(codesOf(found), ElementsAre(OUTSIDE, OUTSIDE, OUTSIDE, OUTSIDE, "page-unreadable"));
    EXPECT_EQ(found.back().says, "a.pdf: page 2 is damaged");
    EXPECT_EQ(found.back().fix, "export the document again");
    EXPECT_THAT(found.back().pages, ElementsAre(2));
}

TEST(PrintAreas, TakeWhatIsInsideThemByAHundredthOfAMillimetreAndNothingBeyond) {
    // The print area is 300, 300, 20700, 29300; the tolerance 100.
    std::pair<Box, Box> const edges[] = {
        {{201, 14000, 9000, 15000}, {199, 14000, 9000, 15000}},
        {{8000, 201, 9000, 15000}, {8000, 199, 9000, 15000}},
        {{8000, 14000, 20799, 15000}, {8000, 14000, 20801, 15000}},
        {{8000, 14000, 9000, 29399}, {8000, 14000, 9000, 29401}},
    };
    for (auto const& [inside, outside] : edges) {
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(inside)), printRules({}))), IsEmpty()) << inside.left;
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(outside)), printRules({}))), ElementsAre(OUTSIDE))
            << outside.left;
    }
}

TEST(PrintAreas, AreThoseOfTheNodeWithTheToleranceOfTheCarrier) {
    json::Value const app =
        R"({"print_area": {"left": 1000, "top": 2000, "right": 20000, "bottom": 28000}})"_json;
    Production::PrintRules const strict = printRules(R"({"tolerance": 0})"_json, app);
    for (Box const& place : {Box{1001, 14000, 9000, 15000}, Box{8000, 2001, 9000, 15000},
                             Box{8000, 14000, 19999, 15000}, Box{8000, 14000, 9000, 27999}})
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(place)), strict)), IsEmpty()) << place.left;
    for (Box const& place : {Box{999, 14000, 9000, 15000}, Box{8000, 1999, 9000, 15000},
                             Box{8000, 14000, 20001, 15000}, Box{8000, 14000, 9000, 28001}})
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(place)), strict)), ElementsAre(OUTSIDE)) << place.left;
}

TEST(PrintAreas, KeepTheirDistanceFromTheEdgesOfLetterPaperUntilANodeSaysAnother) {
    auto const codes = [](Box const& place) {
        std::string const content = inPoints(place.left) + inPoints(27940 - place.bottom) +
                                    inPoints(place.width()) + inPoints(place.height()) + "re f";
        return codesOf(findingsIn(a4Page(content, "/MediaBox [0 0 612 792]"), printRules({})));
    };
    EXPECT_THAT(codes({1000, 1000, 21389, 27639}), IsEmpty());
    EXPECT_THAT(codes({1000, 1000, 21391, 27639}), ElementsAre(OUTSIDE));
    EXPECT_THAT(codes({1000, 1000, 21389, 27641}), ElementsAre(OUTSIDE));
}

TEST(PrintAreas, AreLeftByTextAndSayWhichAndWhereItShouldGo) {
    Finding const found =
        only(findingsIn(a4Page(text(50, 15000, "Balance carried forward")), printRules({})));
    EXPECT_EQ(found.says.substr(0, found.says.find(" reaches")), "\"Balance\"");
    EXPECT_THAT(found.says, testing::EndsWith(" beyond the print area on the left"));
    EXPECT_THAT(found.fix, testing::MatchesRegex("move it [0-9.]+ mm right"));
}

TEST(PrintAreas, WantWhatIsTooLargeSmaller) {
    std::vector<Finding> const found = findingsIn(a4Page(box({100, 14000, 20900, 15000})), printRules({}));
    EXPECT_THAT(codesOf(found), ElementsAre(OUTSIDE, OUTSIDE));
    EXPECT_THAT(found[0].fix, testing::MatchesRegex("make it [0-9.]+ mm narrower"));
}

TEST(PrintAreas, AreNotLeftByInvisibleTextAndFaintTints) {
    std::string const invisible = "3 Tr " + text(50, 15000, "Hidden");
    std::string const white = "1 1 1 rg " + text(50, 15000, "White") + "0.97 g " + box({0, 0, 21000, 29700});
    EXPECT_THAT(findingsIn(a4Page(invisible), printRules({})), IsEmpty());
    EXPECT_THAT(findingsIn(a4Page(white), printRules({})), IsEmpty());
}

TEST(PrintAreas, AreLeftByHairlinesAndDots) {
    for (std::string const& content :
         {"0.01 w " + inPoints(100) + "400 m " + inPoints(100) + "500 l S", box({100, 14000, 140, 14040})})
        EXPECT_THAT(codesOf(findingsIn(a4Page(content), printRules({}))), ElementsAre(OUTSIDE)) << content;
}

TEST(PrintAreas, AreLeftByPicturesOverTheWholePage) {
    std::string const scan = "q 595.27559 0 0 841.88976 0 0 cm BI /W 2 /H 2 /CS /G /BPC 8 ID "
                             "\x80\x80\x80\x80 EI Q";
    EXPECT_THAT(codesOf(findingsIn(a4Page(scan), printRules({}))),
                ElementsAre(OUTSIDE, OUTSIDE, OUTSIDE, OUTSIDE));
}

TEST(PrintAreas, AreForgivenWhereDeviationsAre) {
    auto const found = findingsIn(a4Page(box({100, 14000, 9000, 15000})),
                                  printRules({}, R"({"loose_letter_deviation": true})"_json));
    EXPECT_EQ(only(found).severity, Severity::Warning);
}

TEST(PrintAreas, WithoutAnAreaAreRefusedInOneLine) {
    Finding const found = only(findingsIn(
        a4Page(box(MIDDLE)),
        printRules({}, R"({"print_area": {"left": 500, "top": 0, "right": 100, "bottom": 100}})"_json)));
    EXPECT_STREQ(nameOf(found.code), "production-refused");
    EXPECT_EQ(found.says, "\"print_area\" of the part \"app\" in \"node.json\" has no area");
    EXPECT_EQ(found.fix, "write \"left\" less than \"right\", and \"top\" less than \"bottom\"");
}

TEST(TypedPages, HaveTheirWordsForInk) {
    Reader::Document fine = Reader::openDocument(std::string("Dear Sir,\n\nall is well."), "a.txt");
    EXPECT_THAT(findingsIn(fine, printRules("{}"_json)), IsEmpty());
    Reader::Document zone = Reader::openDocument(std::string("Dear Sir,"), "a.txt");
    EXPECT_THAT(codesOf(findingsIn(zone, printRules(R"({"clear_zones": [
        {"left": 0, "top": 0, "right": 21000, "bottom": 5000}]})"_json))),
                ElementsAre("clear-zone"));
}

json::Value oneZone() {
    return R"({"clear_zones": [{"left": 5000, "top": 5000, "right": 9000, "bottom": 6000}]})"_json;
}

TEST(ClearZones, TakeWhatReachesIntoThemByTheToleranceAndNothingMore) {
    std::pair<Box, Box> const edges[] = {
        {{4000, 5400, 5099, 5600}, {4000, 5400, 5101, 5600}},
        {{6000, 4000, 7000, 5099}, {6000, 4000, 7000, 5101}},
        {{8901, 5400, 9900, 5600}, {8899, 5400, 9900, 5600}},
        {{6000, 5901, 7000, 7000}, {6000, 5899, 7000, 7000}},
    };
    Production::PrintRules const rules = printRules(oneZone());
    for (auto const& [outside, inside] : edges) {
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(outside)), rules)), IsEmpty()) << outside.left;
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(inside)), rules)), ElementsAre("clear-zone"))
            << inside.left;
    }
}

TEST(ClearZones, MayBeNarrowerThanWhatIsDrawnCoarsely) {
    json::Value const narrow =
        R"({"tolerance": 0, "clear_zones": [{"left": 5000, "top": 5000, "right": 5200, "bottom": 20000}]})"_json;
    for (Box const& outside : {Box{4000, 9000, 4999, 9500}, Box{5201, 9000, 6000, 9500}})
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(outside)), printRules(narrow))), IsEmpty()) << outside.left;
    for (Box const& inside : {Box{4000, 9000, 5001, 9500}, Box{5199, 9000, 6000, 9500},
                              Box{5080, 9000, 5120, 9500}, Box{4000, 9000, 6000, 9500}})
        EXPECT_THAT(codesOf(findingsIn(a4Page(box(inside)), printRules(narrow))), ElementsAre("clear-zone"))
            << inside.left;
}

TEST(ClearZones, AreOnTheFirstPageOrOnAll) {
    std::string const content = box({5500, 5400, 6500, 5600});
    std::string const pdf = Reader::PdfMaker().page(content, A4_PAGE).page(content, A4_PAGE).bytes();
    auto const pages = [&](char const* word) {
        json::Object zone{{"left", 5000}, {"top", 5000}, {"right", 9000}, {"bottom", 6000}};
        if (word)
            zone.set("pages", word);
        json::Array zones;
        zones.append(zone);
        return only(findingsIn(pdf, printRules(json::Object{{"clear_zones", zones}}))).pages;
    };
    EXPECT_THAT(pages(nullptr), ElementsAre(1));
    EXPECT_THAT(pages("first"), ElementsAre(1));
    EXPECT_THAT(pages("all"), ElementsAre(1, 2));
}

TEST(ClearZones, AreLeftOnAWayThatStaysOnThePage) {
    json::Value const bottom =
        R"({"clear_zones": [{"left": 0, "top": 28000, "right": 21000, "bottom": 29700}]})"_json;
    Finding const found = only(findingsIn(a4Page(box({5000, 29000, 6000, 29200})), printRules(bottom)));
    EXPECT_THAT(found.fix, testing::MatchesRegex("move it 1[0-9.]+ mm up"));
}

TEST(ClearZones, SayWhatStandsInThemAndTheShortestWayOut) {
    Finding const found =
        only(withoutFonts(findingsIn(a4Page(text(5500, 5900, "Total")), printRules(oneZone()))));
    EXPECT_EQ(found.says, "\"Total\" stands where nothing may, 50 to 90 mm across and 50 to 60 mm down");
    EXPECT_THAT(found.fix, testing::MatchesRegex("move it [0-9.]+ mm down"));
}

/// A letter with an address whose place is told as the reader tells it.
struct Addressed {
    explicit Addressed(std::string const& further = {})
        : document(Reader::openDocument(a4Page(text(2500, 5500, "Lena Brandt") +
                                               text(2500, 6000, "Lange Str. 12") +
                                               text(2500, 6500, "04109 Leipzig") + further),
                                        "a.pdf")) {
        for (Reader::Word const& word : document.page(1).words)
            if (word.box.left < 6000 && word.box.top > 5000 && word.box.bottom < 6700)
                address.parts.push_back(word.box);
        address.page = 1;
    }

    std::vector<Finding> findings(Box const& window) {
        json::Object const rect{
            {"left", window.left}, {"top", window.top}, {"right", window.right}, {"bottom", window.bottom}};
        return withoutFonts(
            findingsIn(document, printRules(json::Object{{"window", rect}, {"tolerance", 100}}), address));
    }

    Reader::Document document;
    Production::PlacedAddress address{"Lena Brandt\nLange Str. 12\n04109 Leipzig"};
};

TEST(Windows, TakeAnAddressThatReachesBeyondThemByTheToleranceAndNoFurther) {
    Addressed letter;
    Box const all = letter.address.box();
    auto const shrunk = [&](int left, int top, int right, int bottom) {
        return codesOf(
            letter.findings({all.left + left, all.top + top, all.right - right, all.bottom - bottom}));
    };
    EXPECT_THAT(shrunk(99, 99, 99, 99), IsEmpty());
    EXPECT_THAT(shrunk(101, 0, 0, 0), ElementsAre("address-outside-window"));
    EXPECT_THAT(shrunk(0, 101, 0, 0), ElementsAre("address-outside-window"));
    EXPECT_THAT(shrunk(0, 0, 101, 0), ElementsAre("address-outside-window"));
    EXPECT_THAT(shrunk(0, 0, 0, 101), ElementsAre("address-outside-window"));
}

TEST(Windows, SayByHowManyMillimetresAnAddressIsToMove) {
    Addressed letter;
    Box const all = letter.address.box();
    Finding const found =
        only(letter.findings({all.left + 1200, all.top - 2000, all.right + 3000, all.bottom - 350}));
    EXPECT_EQ(found.fix, "move it 12 mm right and 3.5 mm up");
    EXPECT_THAT(found.pages, ElementsAre(1));
    EXPECT_EQ(found.box, all);
    Finding const tooLarge = only(letter.findings({all.left, all.top, all.right - 500, all.bottom}));
    EXPECT_EQ(tooLarge.fix, "make it 5 mm narrower");
}

TEST(Windows, ShowNothingBesideTheAddressAndTheSendersLine) {
    Box const window{2000, 4500, 10500, 9000};
    EXPECT_THAT(Addressed().findings(window), IsEmpty());
    EXPECT_THAT(Addressed(text(2500, 4950, "Acme GmbH, Am Markt 1, 01067 Dresden", 7)).findings(window),
                IsEmpty());
    Finding const found = only(Addressed(text(2500, 7500, "CONFIDENTIAL diagnosis")).findings(window));
    EXPECT_STREQ(nameOf(found.code), "text-in-window");
    EXPECT_EQ(found.says, "\"CONFIDENTIAL diagnosis\" shows through the window");
    EXPECT_THAT(found.fix, testing::MatchesRegex("move it [0-9.]+ mm down"));
    EXPECT_THAT(codesOf(Addressed(text(2500, 4950, "HIV clinic, 10 points")).findings(window)),
                ElementsAre("text-in-window"));
    EXPECT_THAT(codesOf(Addressed(box({9000, 7000, 10000, 8000})).findings(window)),
                ElementsAre("text-in-window"));
}

TEST(Windows, TakeWhatReachesIntoThemByTheToleranceAndNothingMore) {
    Box const window{2000, 4500, 10500, 9000};
    std::pair<Box, Box> const edges[] = {
        {{1000, 7000, 2099, 8000}, {1000, 7000, 2101, 8000}},
        {{8000, 4000, 9000, 4599}, {8000, 4000, 9000, 4601}},
        {{10401, 7000, 12000, 8000}, {10399, 7000, 12000, 8000}},
        {{5000, 8901, 6000, 9500}, {5000, 8899, 6000, 9500}},
    };
    for (auto const& [outside, inside] : edges) {
        EXPECT_THAT(codesOf(Addressed(box(outside)).findings(window)), IsEmpty()) << outside.left;
        EXPECT_THAT(codesOf(Addressed(box(inside)).findings(window)), ElementsAre("text-in-window"))
            << inside.left;
    }
}

TEST(Windows, ShowOnlyTheFirstPage) {
    std::string const pdf =
        Reader::PdfMaker().page(box(MIDDLE), A4_PAGE).page(box({3000, 6000, 4000, 7000}), A4_PAGE).bytes();
    Production::PrintRules const rules =
        printRules(R"({"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}})"_json);
    EXPECT_THAT(findingsIn(pdf, rules, Production::PlacedAddress{"a\nb", 1, {{3000, 5000, 4000, 6000}}}),
                IsEmpty());
    Finding const found =
        only(findingsIn(pdf, rules, Production::PlacedAddress{"a\nb", 2, {{3000, 6000, 4000, 7000}}}));
    EXPECT_STREQ(nameOf(found.code), "address-outside-window");
    EXPECT_EQ(found.says, "the address does not stand on the letter's first page, which the window shows");
    EXPECT_EQ(found.fix, "move it to 20 to 105 mm across and 45 to 90 mm down of the first page");
    EXPECT_THAT(found.pages, ElementsAre(2));
}

TEST(Windows, ShowEachBlockOfOtherTextAsAFindingOfItsOwn) {
    auto const found = Addressed(text(2500, 7500, "Diagnosis") + text(7500, 7900, "CONFIDENTIAL") +
                                 box({3000, 8200, 3500, 8500}))
                           .findings({2000, 4500, 10500, 9000});
    ASSERT_EQ(found.size(), 3U);
    EXPECT_EQ(found[0].says, "\"Diagnosis\" shows through the window");
    EXPECT_EQ(found[1].says, "\"CONFIDENTIAL\" shows through the window");
    EXPECT_EQ(found[2].says, "something shows through the window");
}

TEST(Windows, MayHaveTheSendersLineFarAboveTheAddressAndNoOtherSmallPrint) {
    std::string const line = text(2500, 4800, "Acme GmbH, Am Markt 1, 01067 Dresden", 6);
    EXPECT_THAT(Addressed(line).findings({2000, 4000, 10500, 9000}), IsEmpty());
    EXPECT_THAT(Addressed(line + box({2500, 4900, 7000, 4920})).findings({2000, 4000, 10500, 9000}),
                IsEmpty());
    EXPECT_EQ(
        only(Addressed(line + text(2500, 4400, "HIV clinic", 6)).findings({2000, 4000, 10500, 9000})).says,
        "\"HIV clinic\" shows through the window");
}

TEST(Deviations, AreForgivenInPlacesAndNotInAddressesAndSizes) {
    Production::PrintRules const rules = printRules(R"({
        "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
        "clear_zones": [{"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}],
        "address_lines": {"min": 3}})"_json,
                                                    R"({"loose_letter_deviation": true})"_json);
    std::string const pdf = Reader::PdfMaker()
                                .page(box({100, 6000, 9000, 7000}), A4_PAGE)
                                .page("", "/MediaBox [0 0 842 595]")
                                .bytes();
    std::map<std::string, Severity> severities;
    for (Finding const& finding :
         findingsIn(pdf, rules, Production::PlacedAddress{"Bob", 1, {{12000, 6000, 13000, 7000}}}))
        severities.emplace(nameOf(finding.code), finding.severity);
    EXPECT_EQ(severities, (std::map<std::string, Severity>{{"address-outside-window", Severity::Warning},
                                                           {"address-too-few-lines", Severity::Error},
                                                           {"clear-zone", Severity::Warning},
                                                           {OUTSIDE, Severity::Warning},
                                                           {"page-orientation", Severity::Error},
                                                           {"text-in-window", Severity::Warning}}));
}

std::vector<Finding> findingsOfAddress(std::string const& address, json::Value const& production) {
    return findingsIn(a4Page(box(MIDDLE)), printRules(production), Production::PlacedAddress{address});
}

TEST(LinesOfAddresses, HaveALeastAndAMostNumber) {
    json::Value const rules = R"({"address_lines": {"min": 3, "max": 5}})"_json;
    std::map<std::string, std::vector<std::string>> const table{
        {"a\nb", {"address-too-few-lines"}},
        {"a\n \nb\n", {"address-too-few-lines"}},
        {"a\nb\nc", {}},
        {"a\nb\nc\nd\ne", {}},
        {"a\nb\nc\nd\ne\nf", {"address-too-many-lines"}},
    };
    for (auto const& [address, codes] : table)
        EXPECT_EQ(codesOf(findingsOfAddress(address, rules)), codes) << address;
    EXPECT_EQ(only(findingsOfAddress("a", rules)).says, "the address has 1 line, 3 are the least");
    EXPECT_EQ(only(findingsOfAddress("a\nb\nc\nd\ne\nf", rules)).says,
              "the address has 6 lines, 5 are the most");
}

TEST(PostcodesOfAddresses, AreSearchedByTheCarriersPattern) {
    json::Value const rules = R"({"postcode": "^\\d{5} "})"_json;
    EXPECT_THAT(findingsOfAddress("Lena Brandt\n04109 Leipzig", rules), IsEmpty());
    Finding const found = only(findingsOfAddress("Lena Brandt\nLeipzig", rules));
    EXPECT_STREQ(nameOf(found.code), "address-no-postcode");
    EXPECT_EQ(found.says, "nothing in the address fits the postcode \"^\\d{5} \"");
}

TEST(PostcodesOfAddresses, WithARunawayPatternAreGivenUpInOneLine) {
    Finding const found = only(findingsOfAddress(std::string(60, 'a'), R"({"postcode": "^(a+)+$b"})"_json));
    EXPECT_STREQ(nameOf(found.code), "production-refused");
    EXPECT_EQ(found.says, "the postcode's pattern \"^(a+)+$b\" takes too long on this address");
    EXPECT_TRUE(found.isError());
}

TEST(Fonts, ThatTheDocumentLacksAreToldWithTheirPages) {
    std::string const content = text(5000, 15000, "Hello");
    std::string const pdf = Reader::PdfMaker().page(content, A4_PAGE).page(content, A4_PAGE).bytes();
    Finding const found = only(findingsIn(pdf, printRules("{}"_json)));
    EXPECT_STREQ(nameOf(found.code), "font-not-embedded");
    EXPECT_EQ(found.severity, Severity::Warning);
    EXPECT_EQ(found.says, "the font \"Courier\" is not in the document: another one may be printed");
    EXPECT_THAT(found.pages, ElementsAre(1, 2));
    EXPECT_THAT(findingsIn(pdf, printRules({})), IsEmpty());
}

std::string annotated(std::string const& keys) {
    return onePage(box(MIDDLE), "", "/Annots [6 0 R]")
        .object(4, "<< /Type /Font /Subtype /Type3 /FontBBox [0 0 1 1] /FontMatrix [1 0 0 1 0 0] /CharProcs "
                   "<< >> /Encoding << >> /FirstChar 0 /LastChar 0 /Widths [0] >>")
        .object(6, "<< /Type /Annot /Rect [100 700 200 742] " + keys + " >>")
        .bytes();
}

TEST(Annotations, ThatNoPrintHasAreToldWithTheirPlace) {
    Finding const found = only(findingsIn(annotated("/Subtype /Text /F 4"), printRules("{}"_json)));
    EXPECT_STREQ(nameOf(found.code), "annotation-lost");
    EXPECT_EQ(found.severity, Severity::Warning);
    EXPECT_EQ(found.says, "a note on the page is not printed");
    EXPECT_EQ(found.box, (Box{3528, 3528, 7056, 5009}));
}

TEST(Annotations, AreFineWhenTheyArePrintedOrNotMeantToBe) {
    std::map<std::string, std::vector<std::string>> const table{
        {"/Subtype /FreeText", {"annotation-lost"}},
        {"/Subtype /FreeText /F 4", {}},
        {"/Subtype /FreeText /F 2", {}},
        {"/Subtype /Widget /FT /Tx", {"annotation-lost"}},
        {"/Subtype /Widget /FT /Tx /F 4", {}},
        {"/Subtype /Widget /FT /Btn /Ff 65536", {}},
        {"/Subtype /Link", {}},
        {"/Subtype /Popup", {}},
        {"/Subtype /Screen /F 4", {"annotation-lost"}},
        {"/Subtype 5", {}},
    };
    for (auto const& [keys, codes] : table)
        EXPECT_EQ(codesOf(findingsIn(annotated(keys), printRules("{}"_json))), codes) << keys;
}

/// An annotation that shows a black box, on a page that shows nothing else. A place of no area is none.
std::string boxOnTop(Box const& place, std::string const& keys) {
    std::string const width = inPoints(place.width());
    std::string const height = inPoints(place.height());
    return onePage("", "", std::string(A4_PAGE) + " /Annots [6 0 R]", "/AcroForm << /Fields [6 0 R] >>")
        .object(6, "<< /Type /Annot /Rect [" + inPoints(place.left) + inPoints(29700 - place.bottom) +
                       inPoints(place.right) + inPoints(29700 - place.top) +
                       "] /T (box) /AP << /N 7 0 R >> " + keys + " >>")
        .stream(7, "/Type /XObject /Subtype /Form /BBox [0 0 " + width + height + "]",
                "0 g 0 0 " + width + height + "re f")
        .bytes();
}

/// The kinds that a print has, as fields of forms and people's stamps are meant.
constexpr char const* PRINTED[] = {"/Subtype /Widget /FT /Tx /F 4", "/Subtype /Widget /FT /Btn /F 4",
                                   "/Subtype /Stamp /F 4", "/Subtype /FreeText /F 4",
                                   "/Subtype /Stamp /F 36"};

std::vector<std::string> codesOnTop(Box const& place, std::string const& keys,
                                    std::optional<Production::PlacedAddress> const& address = {}) {
    json::Value const production = R"({"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
        "clear_zones": [{"left": 0, "top": 20000, "right": 2000, "bottom": 22000}]})"_json;
    return codesOf(findingsIn(boxOnTop(place, keys), printRules(production), address));
}

TEST(WhatAPrintHasOnTop, IsContentForEachCheck) {
    Production::PlacedAddress const address{"Ada\nLondon", 1, {{2100, 4600, 6000, 5500}}};
    for (char const* const keys : PRINTED) {
        EXPECT_THAT(codesOnTop(MIDDLE, keys), IsEmpty()) << keys;
        EXPECT_THAT(codesOnTop({100, 14000, 9000, 15000}, keys), ElementsAre(OUTSIDE)) << keys;
        EXPECT_THAT(codesOnTop({500, 20500, 1500, 21500}, keys), ElementsAre("clear-zone")) << keys;
        EXPECT_THAT(codesOnTop({8000, 7000, 9000, 8000}, keys, address), ElementsAre("text-in-window"))
            << keys;
    }
}

TEST(WhatAPrintHasOnTop, CountsFromAHundredthOfAMillimetre) {
    for (char const* const keys : PRINTED) {
        EXPECT_THAT(codesOnTop({201, 14000, 9000, 15000}, keys), IsEmpty()) << keys;
        EXPECT_THAT(codesOnTop({199, 14000, 9000, 15000}, keys), ElementsAre(OUTSIDE)) << keys;
        EXPECT_THAT(codesOnTop({1901, 20500, 3000, 21500}, keys), IsEmpty()) << keys;
        EXPECT_THAT(codesOnTop({1899, 20500, 3000, 21500}, keys), ElementsAre("clear-zone")) << keys;
    }
}

TEST(WhatAPrintHasNotOnTop, IsNoContentAndLeavesThePageEmpty) {
    std::map<std::string, std::vector<std::string>> const table{
        {"/Subtype /Stamp", {"page-empty", "annotation-lost"}},
        {"/Subtype /Widget /FT /Tx", {"page-empty", "annotation-lost"}},
        {"/Subtype /Text /F 4", {"page-empty", "annotation-lost"}},
        {"/Subtype /Stamp /F 2", {"page-empty"}},
        {"/Subtype /Stamp /F 6", {"page-empty"}},
        {"/Subtype /Stamp /F 32", {"page-empty"}},
        {"/Subtype /Link /Border [0 0 9]", {"page-empty"}},
    };
    for (auto const& [keys, codes] : table)
        EXPECT_EQ(codesOnTop({100, 20500, 9000, 21500}, keys), codes) << keys;
}

TEST(WhatAPrintHasOnTop, IsSaidWithTheWordsOfAFieldAndNotWithThoseOfANote) {
    auto const findings = [](std::string const& flags) {
        std::string const pdf =
            onePage("", "", std::string(A4_PAGE) + " /Annots [6 0 R]", "/AcroForm << /Fields [6 0 R] >>")
                .object(6, "<< /Type /Annot /Subtype /Widget /FT /Tx /T (name) /Rect [0 400 200 420] " +
                               flags + " /AP << /N 7 0 R >> >>")
                .object(8, "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica >>")
                .stream(
                    7,
                    "/Type /XObject /Subtype /Form /BBox [0 0 200 20] /Resources << /Font << /F 8 0 R >> >>",
                    "BT /F 10 Tf 2 5 Td (Ada) Tj ET")
                .bytes();
        return withoutFonts(findingsIn(pdf, printRules("{}"_json)));
    };
    EXPECT_THAT(only(findings("/F 4")).says, testing::StartsWith("\"Ada\" reaches "));
    EXPECT_THAT(codesOf(findings("/F 0")), ElementsAre("page-empty", "annotation-lost"));
}

TEST(EmbeddedFiles, AreToldOfTheDocument) {
    auto const found = [](std::string const& name) {
        RawPdf pdf = onePage("", "", "", "/Names << /EmbeddedFiles << /Names [(" + name + ") 6 0 R] >> >>");
        pdf.object(6, "<< /Type /Filespec /F (" + name + ") /UF (" + name + ") /EF << /F 7 0 R >> >>");
        pdf.stream(7, "/Type /EmbeddedFile", "<a/>");
        std::vector<Finding> const all = findingsIn(pdf.bytes(), printRules("{}"_json));
        for (Finding const& one : all)
            if (one.code == Production::Code::EmbeddedFileLost)
                return one;
        return Finding{};
    };
    EXPECT_EQ(found("sums.csv").says, "the file \"sums.csv\" inside the document is not printed");
    EXPECT_EQ(found("bill.XML").says,
              "the file \"bill.XML\" inside the document is not printed; it may be an electronic invoice");
    EXPECT_THAT(found("bill.xml").pages, IsEmpty());
    EXPECT_EQ(found("bill.xml").severity, Severity::Warning);
}

TEST(UnusableRules, AreOneFindingOfTheLetterInOneLine) {
    Finding const found = only(findingsIn(
        a4Page(box(MIDDLE)),
        printRules(R"({"clear_zones": [{"left": 5000, "top": 0, "right": 3000, "bottom": 100}]})"_json)));
    EXPECT_STREQ(nameOf(found.code), "production-refused");
    EXPECT_EQ(found.says,
              "\"production/clear_zones/0\" of the pack preset \"Bills\" has no area: it goes from "
              "50 to 30 mm across and from 0 to 1 mm down");
    EXPECT_EQ(found.fix, "write \"left\" less than \"right\", and \"top\" less than \"bottom\"");
    EXPECT_TRUE(found.isError());
}

TEST(PostalAddresses, AreThoseThatCountAndAreNoEMailAddressesAndNumbers) {
    auto const addressOf = [](std::vector<std::pair<int, std::string>> const& values) {
        Cfg::ExtractedFields fields;
        for (auto const& [priority, value] : values)
            fields.emplace(
                priority,
                Cfg::ExtractedField(json::Object{
                    {"name", "to"}, {"value", value}, {"priority", priority}, {"send_to_server", true}}));
        auto const address = Production::postalAddressOf(fields, nullptr);
        return address ? address->text : std::string();
    };
    EXPECT_EQ(addressOf({{1, "Lena Brandt\n04109 Leipzig"}}), "Lena Brandt\n04109 Leipzig");
    EXPECT_EQ(addressOf({{1, "Lena Brandt"}}), "Lena Brandt");
    EXPECT_EQ(addressOf({{2, "lena@example.org"}, {1, "Lena Brandt\n04109 Leipzig"}}), "");
    EXPECT_EQ(addressOf({{3, "+49 341 4711"}, {1, "Lena Brandt"}}), "");
    EXPECT_EQ(addressOf({{0, "Lena Brandt\n04109 Leipzig"}}), "");
}

/// Specks that lie one after another at every place among the bytes that are looked at together.
TEST(Ink, IsFoundOfEverySpeckWhereverItLies) {
    for (int i = 0; i < 24; ++i) {
        Box const speck{8000 + 70 * i, 14000, 8000 + 70 * i + 80, 14080};
        Reader::Document document = Reader::openDocument(a4Page(box(speck)), "a.pdf");
        std::optional<Box> const bounds = Production::PageInk(document, 1).bounds();
        ASSERT_TRUE(bounds) << i;
        EXPECT_TRUE(bounds->contains(speck.centre())) << i;
        EXPECT_LT(bounds->width(), 300) << i;
    }
}

TEST(Ink, IsFoundInEachCornerOfAPageAndNotOnAnEmptyOne) {
    Reader::Document empty = Reader::openDocument(a4Page(""), "a.pdf");
    EXPECT_TRUE(Production::PageInk(empty, 1).isEmpty());
    for (int const left : {0, 20900})
        for (int const top : {0, 29600}) {
            Reader::Document document =
                Reader::openDocument(a4Page(box({left, top, left + 100, top + 100})), "a.pdf");
            std::optional<Box> const bounds = Production::PageInk(document, 1).bounds();
            ASSERT_TRUE(bounds) << left << ", " << top;
            EXPECT_TRUE(bounds->contains({left + 50, top + 50})) << left << ", " << top;
        }
}

} // namespace
