// What lies where on a page that others were laid on: by the boxes of words and by points of the picture.
#include "programs/production/page_layers.h"

#include "programs/base/error.h"
#include "programs/reader/document.h"
#include "tests/support/pdf_maker.h"
#include "tests/support/raw_pdf.h"

#include <gmock/gmock.h>

#include <map>
#include <sstream>

namespace Production {
namespace {

using Reader::PdfMaker;
using testing::ElementsAre;
using testing::HasSubstr;
using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* ON_A4 = "/MediaBox [0 0 595 842]";

std::string word(int x, int y, std::string const& text) {
    return "BT /F 10 Tf " + std::to_string(x) + ' ' + std::to_string(y) + " Td (" + text + ") Tj ET ";
}

std::string box(std::string const& colour, int x, int y, int width, int height) {
    std::ostringstream content;
    content << "q " << colour << " rg " << x << ' ' << y << ' ' << width << ' ' << height << " re f Q ";
    return content.str();
}

std::string pageOf(std::string const& content, std::string const& keys = ON_A4) {
    return PdfMaker().page(content, keys).bytes();
}

LaidPage laidPage(std::string const& pdf) { return {pdf, "the letterhead"}; }

std::string under(LaidPage const& letterhead, std::string const& content, int quarterTurns = 0) {
    return changedPage(content, {{{&letterhead}}, {}, quarterTurns}, "page 1");
}

std::string over(LaidPage const& letterhead, std::string const& content) {
    return changedPage(content, {{}, {{&letterhead}}}, "page 1");
}

/// Left and top edges of the words, in 1/100 mm.
std::map<std::string, std::pair<int, int>> wordsOn(std::string const& pdf) {
    std::map<std::string, std::pair<int, int>> words;
    Reader::Document document = Reader::openDocument(pdf, "made.pdf");
    for (Reader::Word const& word : document.page(1).words)
        words[word.text] = {word.box.left, word.box.top};
    return words;
}

/// The colour at a place in points from the upper left, such as "f00".
std::string colourAt(std::string const& pdf, int x, int y) {
    Reader::Document document = Reader::openDocument(pdf, "made.pdf");
    Reader::Picture const picture = document.drawPage(1, 72).value();
    auto const place =
        static_cast<std::size_t>(y) * static_cast<std::size_t>(picture.width) + static_cast<std::size_t>(x);
    std::string colour;
    for (std::size_t at = 3 * place; at < 3 * place + 3; ++at)
        colour += "0123456789abcdef"[static_cast<unsigned char>(picture.points.at(at)) >> 4];
    return colour;
}

void expectSamePlaces(std::map<std::string, std::pair<int, int>> const& places,
                      std::map<std::string, std::pair<int, int>> const& expected) {
    ASSERT_EQ(places.size(), expected.size());
    for (auto const& [text, place] : expected) {
        ASSERT_TRUE(places.contains(text)) << text;
        EXPECT_NEAR(places.at(text).first, place.first, 1) << text;
        EXPECT_NEAR(places.at(text).second, place.second, 1) << text;
    }
}

TEST(LaidPages, KeepTheirPlacesAndThoseOfTheContent) {
    std::string const head = pageOf(word(72, 800, "Head") + word(500, 20, "Foot"));
    std::string const content = pageOf(word(100, 600, "Dear"));
    auto expected = wordsOn(head);
    expected.merge(wordsOn(content));
    expectSamePlaces(wordsOn(under(laidPage(head), content)), expected);
    expectSamePlaces(wordsOn(over(laidPage(head), content)), expected);
}

TEST(LaidPages, AreNotScaledWhereSizesDiffer) {
    std::string const content = pageOf(word(100, 600, "Dear"));
    std::string const head = pageOf(word(72, 805, "Head"), "/MediaBox [0 0 600 847]");
    auto expected = wordsOn(head);
    expected.merge(wordsOn(content));
    expectSamePlaces(wordsOn(under(laidPage(head), content)), expected);
    expectSamePlaces(wordsOn(under(laidPage(content), head)), expected);
}

TEST(LaidPages, AreNotScaledByUnitsEither) {
    std::string const head = pageOf(word(72, 800, "Head"), std::string(ON_A4) + " /UserUnit 2");
    std::string const content = pageOf(word(100, 600, "Dear"));
    auto expected = wordsOn(head);
    expected.merge(wordsOn(content));
    expectSamePlaces(wordsOn(under(laidPage(head), content)), expected);
    expectSamePlaces(wordsOn(under(laidPage(content), head)), expected);
}

TEST(LaidPages, LieInTheOrderInWhichTheyAreGiven) {
    LaidPage const red = laidPage(pageOf(box("1 0 0", 100, 742, 200, 50)));
    LaidPage const green = laidPage(pageOf(box("0 1 0", 150, 742, 200, 50)));
    std::string const blue = pageOf(box("0 0 1", 200, 742, 200, 50));
    std::string const below = changedPage(blue, {{{&red}, {&green}}, {}}, "page 1");
    EXPECT_EQ(colourAt(below, 125, 75), "f00");
    EXPECT_EQ(colourAt(below, 175, 75), "0f0");
    EXPECT_EQ(colourAt(below, 275, 75), "00f");
    std::string const swapped = changedPage(blue, {{{&green}, {&red}}, {}}, "page 1");
    EXPECT_EQ(colourAt(swapped, 175, 75), "f00");
    EXPECT_EQ(colourAt(swapped, 275, 75), "00f");
    std::string const around = changedPage(blue, {{{&red}}, {{&green}}}, "page 1");
    EXPECT_EQ(colourAt(around, 275, 75), "0f0");
    EXPECT_EQ(colourAt(around, 375, 75), "00f");
    EXPECT_EQ(colourAt(around, 125, 75), "f00");
    std::string const above = changedPage(blue, {{}, {{&green}, {&red}}}, "page 1");
    EXPECT_EQ(colourAt(above, 275, 75), "f00");
}

/// "Mark" near the upper left corner of the page as it is shown, where a page is turned by that.
std::string turnedHead(int degrees, std::string const& boxes = "/MediaBox [0 0 595 842]") {
    std::map<int, std::string> const places{
        {0, "1 0 0 1 72 770"}, {90, "0 1 -1 0 72 72"}, {180, "-1 0 0 -1 523 72"}, {270, "0 -1 1 0 523 770"}};
    return pageOf("BT /F 10 Tf " + places.at(degrees) + " Tm (Mark) Tj ET",
                  boxes + " /Rotate " + std::to_string(degrees));
}

TEST(LaidPages, LieAsTheyAreShownHoweverTheyAndTheContentAreTurned) {
    for (int const head : {0, 90, 180, 270})
        for (int const content : {0, 90, 180, 270}) {
            bool const areAlike = head % 180 == content % 180;
            std::string const letterhead =
                turnedHead(head, areAlike ? "/MediaBox [0 0 595 842]" : "/MediaBox [-247 0 595 842]");
            std::string const page = pageOf("", "/MediaBox [0 0 595 842] /Rotate " + std::to_string(content));
            std::string const made = under(laidPage(letterhead), page);
            auto const places = wordsOn(made);
            ASSERT_TRUE(places.contains("Mark")) << head << ' ' << content;
            expectSamePlaces(places, wordsOn(letterhead));
        }
}

TEST(LaidPages, LieInWhatIsShownOfAPage) {
    std::string const head = pageOf(word(72, 800, "Head"));
    std::string const content =
        pageOf(word(-28, 100, "Dear"), "/MediaBox [-200 -300 600 700] /CropBox [-100 -200 495 642]");
    auto expected = wordsOn(head);
    expected.merge(wordsOn(content));
    expectSamePlaces(wordsOn(under(laidPage(head), content)), expected);
    expectSamePlaces(wordsOn(under(laidPage(content), head)), expected);
}

TEST(LaidPages, ShowNothingOfWhatWasCutOffThem) {
    std::string const head =
        pageOf(box("1 0 0", 0, 0, 900, 900), "/MediaBox [0 0 800 900] /CropBox [100 100 300 300]");
    std::string const made = under(laidPage(head), pageOf(""));
    EXPECT_EQ(colourAt(made, 100, 100), "f00");
    EXPECT_EQ(colourAt(made, 300, 100), "fff");
    EXPECT_EQ(colourAt(made, 100, 300), "fff");
}

TEST(LaidPages, StayWhereTheyAreWhateverTheContentLeavesBehind) {
    LaidPage const head = laidPage(pageOf(box("1 0 0", 100, 742, 50, 50)));
    for (char const* const content :
         {"2 0 0 2 0 0 cm 0 1 0 RG", "q q 0.5 0 0 0.5 9 9 cm", "Q Q Q 3 0 0 3 0 0 cm", "0 0 10 10 re W n",
          "BT /F 10 Tf 5 Tr", "/Tx BMC q", "(unfinished", "<< /A", "BI /W 9 /H 9 ID xx"}) {
        EXPECT_EQ(colourAt(over(head, pageOf(content)), 125, 75), "f00") << content;
        EXPECT_EQ(colourAt(under(head, pageOf(content)), 125, 75), "f00") << content;
    }
}

TEST(LaidPages, LeaveTheContentAsItLooked) {
    LaidPage const empty = laidPage(pageOf(""));
    for (std::string const& content :
         {word(72, 700, "Dear"), std::string("Q Q 2 0 0 2 0 0 cm ") + word(72, 300, "Twice"),
          std::string("q 2 0 0 2 0 0 cm ") + word(72, 300, "Open"), box("1 0 0", 0, 0, 595, 842)}) {
        std::string const page = pageOf(content);
        auto const picture = [](std::string const& pdf) {
            return Reader::openDocument(pdf, "a.pdf").renderPage(1, 72);
        };
        EXPECT_EQ(picture(over(empty, page)), picture(page)) << content;
        EXPECT_EQ(picture(under(empty, page)), picture(page)) << content;
    }
}

/// Both pages call different fonts and forms by the same names.
RawPdf namesake(std::string const& font, std::string const& colour) {
    RawPdf pdf = onePage(word(72, 700, "Name") + "/X6 Do", "/XObject << /X6 6 0 R >>");
    pdf.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /" + font + " /Encoding /WinAnsiEncoding >>");
    pdf.stream(6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", box(colour, 100, 100, 50, 50));
    return pdf;
}

TEST(LaidPages, HaveTheirOwnFontsAndFormsByWhateverNames) {
    LaidPage const red = laidPage(namesake("Courier", "1 0 0").bytes());
    std::string green = namesake("Helvetica", "0 1 0").bytes();
    EXPECT_EQ(colourAt(under(red, green), 125, 717), "0f0");
    EXPECT_EQ(colourAt(over(red, green), 125, 717), "f00");
    Reader::Document made = Reader::openDocument(over(red, green), "a.pdf");
    std::vector<std::string> fonts;
    for (Reader::Word const& shown : made.page(1).words)
        fonts.push_back(made.page(1).fonts.at(shown.font).name);
    EXPECT_THAT(fonts, testing::UnorderedElementsAre("Courier", "Helvetica"));
}

/// A layer of that colour, which is hidden or shown.
RawPdf layered(std::string const& colour, std::string const& configuration) {
    RawPdf pdf = onePage("/OC /L BDC " + box(colour, 100, 742, 50, 50) + "EMC", "/Properties << /L 6 0 R >>",
                         "", "/OCProperties << /OCGs [6 0 R] /D << " + configuration + " >> >>");
    return pdf.object(6, "<< /Type /OCG /Name (Layer) >>");
}

TEST(LaidPages, KeepTheirHiddenLayersHidden) {
    std::string const red = layered("1 0 0", "/OFF [6 0 R]").bytes();
    std::string const off = layered("1 0 0", "/BaseState /OFF").bytes();
    std::string const green = layered("0 1 0", "").bytes();
    std::string const on = layered("0 1 0", "/BaseState /OFF /ON [6 0 R]").bytes();
    for (std::string const& hidden : {red, off})
        for (std::string const& shown : {green, on}) {
            EXPECT_EQ(colourAt(over(laidPage(hidden), shown), 125, 75), "0f0");
            EXPECT_EQ(colourAt(over(laidPage(shown), hidden), 125, 75), "0f0");
        }
    EXPECT_EQ(colourAt(over(laidPage(red), pageOf("")), 125, 75), "fff");
}

/// A stamp with an appearance of that colour.
RawPdf annotated(std::string const& colour, std::string const& flags = "4") {
    RawPdf pdf = onePage("", "", "/Annots [7 0 R]");
    pdf.object(7, "<< /Type /Annot /Subtype /Stamp /F " + flags +
                      " /Rect [100 742 150 792] /AP << /N 8 0 R >> >>");
    return pdf.stream(8, "/Type /XObject /Subtype /Form /BBox [0 0 50 50]", box(colour, 0, 0, 50, 50));
}

TEST(LaidPages, TakeAnnotationsForContent) {
    LaidPage const green = laidPage(pageOf(box("0 1 0", 100, 742, 50, 50)));
    std::string const red = annotated("1 0 0").bytes();
    EXPECT_EQ(colourAt(red, 125, 75), "f00");
    EXPECT_EQ(colourAt(over(green, red), 125, 75), "0f0");
    EXPECT_EQ(colourAt(under(green, red), 125, 75), "f00");
    EXPECT_EQ(colourAt(under(laidPage(red), pageOf("")), 125, 75), "f00");
    EXPECT_EQ(colourAt(over(laidPage(red), pageOf(box("0 0 1", 100, 742, 50, 50))), 125, 75), "f00");
}

TEST(LaidPages, LeaveAnnotationsOutThatNoPrintHas) {
    LaidPage const white = laidPage(pageOf(""));
    for (char const* const flags : {"0", "2", "6", "32"}) {
        std::string const red = annotated("1 0 0", flags).bytes();
        EXPECT_EQ(colourAt(over(white, red), 125, 75), "fff") << flags;
        EXPECT_EQ(colourAt(over(laidPage(red), pageOf("")), 125, 75), "fff") << flags;
    }
    EXPECT_EQ(colourAt(over(white, annotated("1 0 0", "36").bytes()), 125, 75), "f00") << "not on a screen";
}

TEST(LaidPages, DoNotTakeWhatMeansNothingInAContentForAForm) {
    RawPdf pdf = onePage("");
    pdf.stream(5, "/Matrix [2 0 0 2 0 0] /BBox [0 0 1 1] /OC 9 0 R", box("1 0 0", 100, 742, 50, 50));
    EXPECT_EQ(colourAt(over(laidPage(pdf.bytes()), pageOf("")), 125, 75), "f00");
    EXPECT_EQ(colourAt(under(laidPage(pageOf("")), pdf.bytes()), 125, 75), "f00");
}

TEST(ChangedPages, AreTurnedClockwise) {
    std::string const page = turnedHead(0);
    auto const place = wordsOn(page).at("Mark");
    Reader::Document turned = Reader::openDocument(changedPage(page, {{}, {}, 1}, "page 1"), "a.pdf");
    EXPECT_EQ(turned.page(1).width, 29704);
    EXPECT_EQ(turned.page(1).height, 20990);
    Reader::Word const& mark = turned.page(1).words.at(0);
    EXPECT_EQ(mark.turn, Reader::Turn::Down);
    EXPECT_NEAR(mark.box.right, 29704 - place.second, 1);
    EXPECT_NEAR(mark.box.top, place.first, 1);
    Reader::Document back = Reader::openDocument(
        changedPage(changedPage(page, {{}, {}, 1}, "page 1"), {{}, {}, 3}, "page 1"), "a.pdf");
    EXPECT_EQ(back.page(1).words.at(0).turn, Reader::Turn::Upright);
}

TEST(ChangedPages, HaveUponThemWhatFitsThePrintedSheetOrIsTurnedAlong) {
    LaidPage const across = laidPage(pageOf(word(72, 500, "Head"), "/MediaBox [0 0 842 595]"));
    LaidPage const upright = laidPage(pageOf(word(72, 770, "Head")));
    std::string const page = pageOf(word(100, 600, "Dear"));
    Reader::Document printed =
        Reader::openDocument(changedPage(page, {{{&across, false}}, {}, 1}, "page 1"), "a.pdf");
    Reader::Document along =
        Reader::openDocument(changedPage(page, {{{&upright, true}}, {}, 1}, "page 1"), "a.pdf");
    std::map<std::string, Reader::Turn> turns;
    for (Reader::Word const& shown : printed.page(1).words)
        turns["printed " + shown.text] = shown.turn;
    for (Reader::Word const& shown : along.page(1).words)
        turns["along " + shown.text] = shown.turn;
    EXPECT_THAT(turns, ElementsAre(std::pair("along Dear", Reader::Turn::Down),
                                   std::pair("along Head", Reader::Turn::Down),
                                   std::pair("printed Dear", Reader::Turn::Down),
                                   std::pair("printed Head", Reader::Turn::Upright)));
}

TEST(ChangedPages, AreTheSameBytesForTheSameInput) {
    std::string const head = namesake("Courier", "1 0 0").bytes();
    std::string const page = namesake("Helvetica", "0 1 0").bytes();
    LaidPage const letterhead = laidPage(head);
    std::string const once = over(letterhead, page);
    EXPECT_EQ(over(letterhead, page), once);
    EXPECT_EQ(over(laidPage(head), page), once);
    EXPECT_NE(under(letterhead, page), once);
}

TEST(ChangedPages, CarryALetterheadOnceHoweverOftenItLiesOnThem) {
    std::string noise;
    for (unsigned state = 1; noise.size() < 60'000; state = state * 1664525 + 1013904223)
        noise += static_cast<char>('!' + (state >> 24) % 90);
    LaidPage const head = laidPage(pageOf("% " + noise));
    std::string const page = pageOf("");
    std::size_t const once = under(head, page).size();
    EXPECT_LT(changedPage(page, {{{&head}}, {{&head}}}, "page 1").size(), once + 1000);
}

TEST(ChangedPages, FailInOneLine) {
    auto const failureOf = [](auto const& operation) {
        try {
            operation();
        } catch (Base::Error const& failure) {
            return std::string(failure.what());
        }
        return std::string("none");
    };
    EXPECT_EQ(failureOf([] { laidPage("%PDF-1.7 nothing"); }),
              "the letterhead: cannot be made ready, it is damaged; print it to a new PDF");
    LaidPage const head = laidPage(pageOf(""));
    EXPECT_EQ(failureOf([&] { under(head, "%PDF-1.7 nothing"); }),
              "page 1: cannot be made ready, it is damaged; print it to a new PDF");
    std::string const two = PdfMaker().page("").page("").bytes();
    EXPECT_THAT(failureOf([&] { under(head, two); }), HasSubstr("damaged"));
}

} // namespace
} // namespace Production
