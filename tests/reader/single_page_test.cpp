// Pages that stand alone look as they did in their documents.
#include "programs/reader/document.h"

#include "tests/support/raw_pdf.h"

#include <gmock/gmock.h>

#include <string>
#include <utility>
#include <vector>

namespace Reader {
namespace {

using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* FONT = "/Font << /F 4 0 R >>";
constexpr char const* BOX = "/BBox [0 0 595 842]";

std::string shown(int y, std::string const& text, std::string const& font = "F") {
    return "BT /" + font + " 10 Tf 72 " + std::to_string(y) + " Td (" + text + ") Tj ET ";
}

std::string pictureOf(std::string const& pdf) { return openDocument(pdf, "a.pdf").renderPage(1, 72); }

std::string writtenAlone(std::string const& pdf) { return openDocument(pdf, "a.pdf").singlePagePdf(1); }

/// The page shows something, and the same when it stands alone.
void expectKept(RawPdf const& pdf) {
    std::string const picture = pictureOf(pdf.bytes());
    EXPECT_NE(picture, pictureOf(onePage("").bytes()));
    EXPECT_EQ(pictureOf(writtenAlone(pdf.bytes())), picture);
}

TEST(SinglePages, HideTheLayersThatAreHidden) {
    RawPdf pdf = onePage(shown(700, "Seen") + "/OC /L BDC " + shown(600, "Hidden") + "EMC",
                         "/Properties << /L 6 0 R >>", "",
                         "/OCProperties << /OCGs [6 0 R] /D << /OFF [6 0 R] /Order [6 0 R] >> >>");
    pdf.object(6, "<< /Type /OCG /Name (Notes) >>");
    expectKept(pdf);
    EXPECT_EQ(pictureOf(pdf.bytes()), pictureOf(onePage(shown(700, "Seen")).bytes()));
}

RawPdf withField(std::string const& fieldKeys, std::string const& formKeys) {
    RawPdf pdf = onePage(shown(700, "Name:"), "", "/Annots [7 0 R]",
                         "/AcroForm << /Fields [7 0 R] /DR << /Font << /Helv 9 0 R >> >> "
                         "/DA (/Helv 0 Tf 0 g) " +
                             formKeys + " >>");
    pdf.object(7, "<< /Type /Annot /Subtype /Widget /FT /Tx /T (name) /V (Lena) /F 4 /Rect [72 640 272 660] "
                  "/DA (/Helv 10 Tf 0 g) /P 3 0 R " +
                      fieldKeys + " >>");
    pdf.object(9, "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica /Encoding /WinAnsiEncoding >>");
    return pdf;
}

TEST(SinglePages, ShowFilledFormFields) {
    RawPdf pdf = withField("/AP << /N 8 0 R >>", "");
    pdf.stream(8, "/Type /XObject /Subtype /Form /BBox [0 0 200 20] /Resources << /Font << /Helv 9 0 R >> >>",
               "/Tx BMC BT /Helv 10 Tf 2 5 Td (Lena) Tj ET EMC");
    expectKept(pdf);
    EXPECT_NE(pictureOf(pdf.bytes()), pictureOf(onePage(shown(700, "Name:")).bytes()));
}

TEST(SinglePages, ShowFormFieldsThatTheReaderHasToDraw) {
    RawPdf const pdf = withField("", "/NeedAppearances true");
    expectKept(pdf);
    EXPECT_NE(pictureOf(pdf.bytes()), pictureOf(onePage(shown(700, "Name:")).bytes()));
}

TEST(SinglePages, BringNoFieldsOfOtherPagesAlong) {
    RawPdf pdf = onePage(shown(700, "Name:"), "", "/Annots [7 0 R]", "/AcroForm << /Fields [10 0 R] >>");
    pdf.object(2, "<< /Type /Pages /Kids [3 0 R 12 0 R] /Count 2 >>");
    pdf.object(10, "<< /FT /Tx /T (name) /V (Lena) /DA (/Helv 10 Tf) /Kids [7 0 R 11 0 R] >>");
    std::string const widget =
        "<< /Type /Annot /Subtype /Widget /Parent 10 0 R /F 4 /Rect [72 640 272 660] /AP << /N ";
    pdf.object(7, widget + "8 0 R >> >>").object(11, widget + "13 0 R >> >>");
    pdf.object(12, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Annots [11 0 R] >>");
    std::string const form =
        "/Type /XObject /Subtype /Form /BBox [0 0 200 20] /Resources << " + std::string(FONT) + " >>";
    pdf.stream(8, form, "BT /F 10 Tf 2 5 Td (Lena) Tj ET");
    std::string noise;
    for (unsigned state = 1; noise.size() < 100'000; state = state * 1664525 + 1013904223)
        noise += static_cast<char>('!' + (state >> 24) % 90);
    pdf.stream(13, form, "% " + noise);
    expectKept(pdf);
    EXPECT_LT(writtenAlone(pdf.bytes()).size(), 5000U);
}

TEST(SinglePages, KeepTheFontsThatFormsTakeFromThem) {
    RawPdf pdf = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    pdf.stream(
        6, std::string("/Type /XObject /Subtype /Form ") + BOX + " /Resources << /XObject << /X7 7 0 R >> >>",
        "/X7 Do");
    pdf.stream(7, std::string("/Type /XObject /Subtype /Form ") + BOX, shown(700, "Inside"));
    expectKept(pdf);
}

/// Its glyph, which is object 7, is missing.
RawPdf onePageInATypeThreeFont() {
    RawPdf pdf = onePage("BT /T3 20 Tf 72 700 Td (aaa) Tj ET");
    pdf.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << /Font "
                  "<< /F 4 0 R /T3 6 0 R >> >> >>");
    pdf.object(6, "<< /Type /Font /Subtype /Type3 /FontBBox [0 0 10 10] /FontMatrix [0.1 0 0 0.1 0 0] "
                  "/CharProcs << /a 7 0 R >> /Encoding << /Type /Encoding /Differences [97 /a] >> "
                  "/FirstChar 97 /LastChar 97 /Widths [10] >>");
    return pdf;
}

TEST(SinglePages, KeepTheFontsThatTypeThreeFontsTakeFromThem) {
    RawPdf pdf = onePageInATypeThreeFont();
    pdf.stream(7, "", "10 0 d0 BT /F 10 Tf (Q) Tj ET");
    expectKept(pdf);
}

TEST(SinglePages, ShowTheLastOfIncrementalUpdates) {
    std::string const first = onePage(shown(700, "First")).bytes();
    RawPdf update;
    update.stream(6, "", shown(600, "Second"));
    update.object(3,
                  "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents [5 0 R 6 0 R] /Resources "
                  "<< /Font << /F 4 0 R >> >> >>");
    std::string const both = update.behind(first);
    RawPdf again;
    again.stream(5, "", shown(650, "Third"));
    std::string const all = again.behind(both);
    EXPECT_NE(pictureOf(all), pictureOf(both));
    EXPECT_EQ(pictureOf(writtenAlone(all)), pictureOf(all));
    EXPECT_EQ(pictureOf(all), pictureOf(onePage(shown(650, "Third") + shown(600, "Second")).bytes()));
}

/// Ways to write the same update.
std::vector<std::string> updatesOf(std::string const& first, RawPdf const& update) {
    return {update.behind(first), update.behindInStream(first), update.behindAsHybrid(first)};
}

void expectNewest(std::string const& updated, std::string const& expected) {
    Document document = openDocument(updated, "a.pdf");
    std::string const picture = document.renderPage(1, 72);
    EXPECT_EQ(picture, pictureOf(onePage(expected).bytes()));
    std::string const page = document.singlePagePdf(1);
    EXPECT_EQ(pictureOf(page), picture);
    EXPECT_TRUE(document.showsTheSame(1, page));
}

TEST(SinglePages, ShowTheNewestContentHoweverItWasUpdated) {
    RawPdf update;
    update.stream(5, "", shown(600, "Second"));
    for (std::string const& updated : updatesOf(onePage(shown(700, "First")).bytes(), update))
        expectNewest(updated, shown(600, "Second"));
}

TEST(SinglePages, ShowTheNewestPageHoweverItWasUpdated) {
    RawPdf update;
    update.object(2, "<< /Type /Pages /Kids [6 0 R] /Count 1 >>").stream(7, "", shown(600, "Second", "G"));
    update.object(6, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 7 0 R /Resources "
                     "<< /Font << /G 4 0 R >> >> >>");
    for (std::string const& updated : updatesOf(onePage(shown(700, "First")).bytes(), update))
        expectNewest(updated, shown(600, "Second"));
}

TEST(SinglePages, ShowTheNewestResourcesHoweverTheyWereUpdated) {
    RawPdf first = onePage(shown(700, "Text"));
    first.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica /Encoding /WinAnsiEncoding >>");
    RawPdf update;
    update.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /Courier /Encoding /WinAnsiEncoding >>");
    for (std::string const& updated : updatesOf(first.bytes(), update))
        expectNewest(updated, shown(700, "Text"));
}

RawPdf ofTwoContents(std::string const& second) {
    RawPdf pdf = onePage(shown(700, "Kept"));
    pdf.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents [5 0 R 6 0 R] /Resources "
                  "<< /Font << /F 4 0 R >> >> >>");
    return pdf.stream(6, "", second);
}

// Readers may find what was freed all the same, so that such a letter waits for a person.
TEST(SinglePages, ShowNothingOfContentsThatWereFreedAndAllTheRest) {
    std::string const freed = RawPdf().freed(6).behind(ofTwoContents(shown(600, "Freed")).bytes());
    Document document = openDocument(freed, "a.pdf");
    std::string const page = document.singlePagePdf(1);
    EXPECT_EQ(pictureOf(page), pictureOf(onePage(shown(700, "Kept")).bytes()));
    EXPECT_FALSE(document.showsTheSame(1, page));
}

/// Lines that are all different, so that damage in the middle of them leaves many whole.
std::string manyLines() {
    std::string lines;
    for (int line = 0; line < 60; ++line)
        lines += shown(780 - 12 * line, "Line " + std::to_string(line * 7919 % 1000));
    return lines;
}

std::string spoiltIn(std::string bytes, std::size_t at) { return bytes.replace(at, 40, 40, '\xFF'); }

/// A stream that cannot be unpacked whole: its keys and its bytes.
struct Damaged {
    std::string keys;
    std::string bytes;
};

std::vector<Damaged> damagedContents() {
    std::string const packed = VLServiceTest::deflated(manyLines());
    std::string const flate = "/Filter /FlateDecode";
    return {{flate, spoiltIn(packed, packed.size() / 2)},
            {flate, spoiltIn(packed, 0)},
            {flate, packed.substr(0, packed.size() / 2)},
            {flate, packed.substr(0, packed.size() - 12)},
            {flate, "no deflated bytes"},
            {flate + " /DecodeParms << /Predictor 12 /Columns 30 >>", packed.substr(0, packed.size() / 2)},
            {"/Filter [/FlateDecode /ASCIIHexDecode]", packed},
            {"/Filter [/ASCII85Decode /FlateDecode]", packed},
            {"/Filter /LZWDecode", "\xFF\xFF\xFF"},
            {"/Filter /ASCII85Decode", "zz{}"},
            {"/Filter /ASCIIHexDecode", "41 42 what 43>"},
            {"/Filter /Unknown", "what is it"},
            {"/Filter [/Unknown /FlateDecode]", packed}};
}

/// The page shows the same when it stands alone, which is told, and nothing of it is damaged then.
void expectWrittenAnew(std::string const& pdf, std::string const& what) {
    Document document = openDocument(pdf, "a.pdf");
    std::string const page = document.singlePagePdf(1);
    EXPECT_TRUE(document.isWrittenAnew(1)) << what;
    EXPECT_TRUE(pictureOf(page) == document.renderPage(1, 72)) << what;
    EXPECT_TRUE(document.showsTheSame(1, page)) << what;
    Document written = openDocument(page, "a.pdf");
    EXPECT_TRUE(written.showsTheSame(1, written.singlePagePdf(1))) << what;
    EXPECT_FALSE(written.isWrittenAnew(1)) << what;
}

TEST(SinglePages, HaveContentsWrittenAnewThatCannotBeUnpackedWhole) {
    for (Damaged const& damaged : damagedContents())
        expectWrittenAnew(ofTwoContents("").stream(6, damaged.keys, damaged.bytes).bytes(), damaged.keys);
}

TEST(SinglePages, KeepTheWordsInFrontOfDamage) {
    RawPdf pdf = onePage("");
    std::string const packed = VLServiceTest::deflated(manyLines());
    pdf.stream(5, "/Filter /FlateDecode", spoiltIn(packed, packed.size() / 2));
    std::size_t const words =
        openDocument(openDocument(pdf.bytes(), "a.pdf").singlePagePdf(1), "a.pdf").page(1).words.size();
    EXPECT_GT(words, 20U);
    EXPECT_LT(words, 120U);
}

std::string const FORM =
    "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << /Font << /F 4 0 R >> >> ";

TEST(SinglePages, HaveFormsWrittenAnewThatAreDamaged) {
    for (Damaged const& damaged : damagedContents()) {
        RawPdf pdf = onePage(shown(810, "Above") + "/X Do", "/XObject << /X 6 0 R >>");
        pdf.stream(6, FORM + "/Group << /S /Transparency >> " + damaged.keys, damaged.bytes);
        expectWrittenAnew(pdf.bytes(), damaged.keys);
    }
}

TEST(SinglePages, HaveGlyphsWrittenAnewThatAreDamaged) {
    std::string const packed = VLServiceTest::deflated("10 0 d0 BT /F 10 Tf (Q) Tj ET " + manyLines());
    RawPdf pdf = onePageInATypeThreeFont();
    pdf.stream(7, "/Filter /FlateDecode", packed.substr(0, packed.size() - 20));
    expectWrittenAnew(pdf.bytes(), "glyph");
}

TEST(SinglePages, HavePatternsAndLooksOfFieldsWrittenAnewThatAreDamaged) {
    std::string const packed = VLServiceTest::deflated(manyLines());
    std::string const broken = packed.substr(0, packed.size() / 2);
    RawPdf pattern = onePage("/Pattern cs /P scn 0 0 595 842 re f", "/Pattern << /P 6 0 R >>");
    pattern.stream(6,
                   "/PatternType 1 /PaintType 1 /TilingType 1 /BBox [0 0 300 300] /XStep 300 /YStep 300 "
                   "/Resources << /Font << /F 4 0 R >> >> /Filter /FlateDecode",
                   broken);
    expectWrittenAnew(pattern.bytes(), "pattern");
    RawPdf field = withField("/AP << /N 8 0 R >>", "");
    field.stream(8, FORM + "/Filter /FlateDecode", broken);
    expectWrittenAnew(field.bytes(), "field");
}

TEST(SinglePages, TellOfDamageOnEachPageThatShowsIt) {
    std::string const packed = VLServiceTest::deflated(manyLines());
    RawPdf pdf = onePage("/X Do", "/XObject << /X 6 0 R >>");
    pdf.object(2, "<< /Type /Pages /Kids [3 0 R 7 0 R 8 0 R] /Count 3 >>");
    std::string const page =
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Resources << /Font << /F 4 0 R "
        ">> /XObject << /X 6 0 R >> >> /Contents ";
    pdf.object(7, page + "5 0 R >>").object(8, page + "9 0 R >>").stream(9, "", shown(700, "No form"));
    pdf.stream(6, FORM + "/Filter /FlateDecode", packed.substr(0, packed.size() / 2));
    Document document = openDocument(pdf.bytes(), "a.pdf");
    for (auto const& [number, isAnew] : {std::pair(1, true), {2, true}, {3, false}}) {
        EXPECT_TRUE(document.showsTheSame(number, document.singlePagePdf(number))) << number;
        EXPECT_EQ(document.isWrittenAnew(number), isAnew) << number;
    }
}

TEST(SinglePages, TellOfDamageThatShowsWhenTheyAreReadOrDrawn) {
    std::string const packed = VLServiceTest::deflated(manyLines());
    RawPdf pdf = onePage("");
    pdf.stream(5, "/Filter /FlateDecode", packed.substr(0, packed.size() / 2));
    Document read = openDocument(pdf.bytes(), "a.pdf");
    EXPECT_FALSE(read.isWrittenAnew(1));
    read.page(1);
    EXPECT_TRUE(read.isWrittenAnew(1));
    Document drawn = openDocument(pdf.bytes(), "a.pdf");
    drawn.drawPage(1, 36);
    EXPECT_TRUE(drawn.isWrittenAnew(1));
    Document whole = openDocument(onePage(manyLines()).bytes(), "a.pdf");
    whole.page(1);
    whole.singlePagePdf(1);
    EXPECT_FALSE(whole.isWrittenAnew(1));
}

/// One whose length the document tells wrongly has an end all the same.
TEST(SinglePages, ShowContentsWhoseLengthIsToldWrongly) {
    std::string const packed = VLServiceTest::deflated(manyLines());
    for (char const* const length : {"0", "7", "100000", "99 0 R", "(long)", "4 0 R"})
        for (auto const& [filter, bytes] :
             {std::pair<std::string, std::string>("/Filter /FlateDecode", packed), {"", manyLines()}}) {
            RawPdf pdf = onePage("");
            pdf.object(5, "<< /Length " + std::string(length) + ' ' + filter + " >>\nstream\n" + bytes +
                              "\nendstream");
            Document document = openDocument(pdf.bytes(), "a.pdf");
            EXPECT_EQ(document.page(1).words.size(), 120U) << length << filter;
            std::string const page = document.singlePagePdf(1);
            EXPECT_TRUE(document.showsTheSame(1, page)) << length << filter;
            EXPECT_FALSE(document.isWrittenAnew(1)) << length << filter;
        }
}

/// As where a part of the file got lost: the next object is the end.
TEST(SinglePages, ShowContentsThatHaveNoEnd) {
    std::string pdf = onePage(manyLines()).bytes();
    std::size_t const end = pdf.find("\nendstream\nendobj\n", pdf.find("Line 7"));
    Document document = openDocument(std::string(pdf).erase(end, 11), "a.pdf");
    EXPECT_EQ(document.page(1).words.size(), 120U);
    EXPECT_TRUE(document.showsTheSame(1, document.singlePagePdf(1)));
    // Without any object behind it, it is not certain how far it goes: such a letter waits for a person.
    Document last = openDocument(std::string(pdf).erase(end, 18), "a.pdf");
    EXPECT_FALSE(last.showsTheSame(1, last.singlePagePdf(1)));
}

TEST(SinglePages, KeepDamagedPicturesByteForByte) {
    std::string const packed = VLServiceTest::deflated(manyLines());
    std::string const broken = spoiltIn(packed, packed.size() / 2);
    RawPdf pdf = onePage("100 0 0 100 100 100 cm /X Do", "/XObject << /X 6 0 R >>");
    pdf.stream(
        6,
        "/Type /XObject /Subtype /Image /Width 40 /Height 40 /BitsPerComponent 8 /ColorSpace /DeviceGray "
        "/Filter /FlateDecode",
        broken);
    Document document = openDocument(pdf.bytes(), "a.pdf");
    std::string const page = document.singlePagePdf(1);
    EXPECT_NE(page.find(broken), std::string::npos);
    EXPECT_TRUE(document.showsTheSame(1, page));
    EXPECT_FALSE(document.isWrittenAnew(1));
}

TEST(SinglePages, ShowTheNewestOfManyUpdatesOfAllKinds) {
    std::string pdf = onePage(shown(700, "First")).bytes();
    for (int round = 1; round <= 3; ++round) {
        pdf = RawPdf().stream(5, "", shown(600, "Table")).behind(pdf);
        pdf = RawPdf().stream(5, "", shown(600, "Hybrid")).behindAsHybrid(pdf);
        pdf = RawPdf().stream(5, "", shown(600, "Stream")).behindInStream(pdf);
        expectNewest(pdf, shown(600, "Stream"));
    }
}

TEST(PageChecks, TakeAPageThatShowsTheSame) {
    Document document = openDocument(onePage(shown(700, "Herrn")).bytes(), "a.pdf");
    EXPECT_TRUE(document.showsTheSame(1, document.singlePagePdf(1)));
    Document text = openDocument(std::string("Herrn\nΩmega"), "a.txt");
    EXPECT_TRUE(text.showsTheSame(1, text.singlePagePdf(1)));
}

TEST(PageChecks, NoticeWordsAndPicturesThatDiffer) {
    std::string const page = shown(700, "Herrn Olaf");
    Document document = openDocument(onePage(page).bytes(), "a.pdf");
    for (std::string const& other :
         {std::string(), shown(700, "Herrn Olav"), shown(698, "Herrn Olaf"), page + shown(600, "Copy"),
          page + "100 100 20 20 re f", page + "0 0 0 RG 72 690 m 272 690 l S"})
        EXPECT_FALSE(document.showsTheSame(1, onePage(other).bytes())) << other;
    EXPECT_FALSE(document.showsTheSame(1, "%PDF-1.4 nothing"));
}

TEST(PageChecks, OverlookWhatNobodySees) {
    std::string const page = shown(700, "Herrn Olaf");
    Document document = openDocument(onePage(page).bytes(), "a.pdf");
    EXPECT_TRUE(document.showsTheSame(1, onePage("1 g 0 0 10 10 re f 0 g " + page).bytes()));
}

} // namespace
} // namespace Reader
