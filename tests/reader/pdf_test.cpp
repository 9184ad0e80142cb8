// PDFs as they come from outside: turned, cropped, encrypted, damaged.
#include "programs/base/error.h"
#include "programs/reader/document.h"
#include "programs/reader/layout.h"

#include "tests/support/pdf_maker.h"

#include <gmock/gmock.h>

#include <fstream>
#include <functional>
#include <iterator>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

Document documentOf(PdfMaker& maker) { return openDocument(maker.bytes(), "made.pdf"); }

/// Text at a place in points from the bottom left corner.
std::string shown(int x, int y, std::string const& text) {
    return "BT /F 10 Tf 1 0 0 1 " + std::to_string(x) + " " + std::to_string(y) + " Tm (" + text +
           ") Tj ET\n";
}

std::vector<std::string> textsOf(Page const& page) {
    std::vector<std::string> texts;
    for (Layout const layout = layOut(page); Line const& line : layout.lines)
        texts.push_back(textOf(page, line));
    return texts;
}

std::string complaint(std::function<void()> const& action) {
    try {
        action();
    } catch (Base::Error const& error) {
        return error.what();
    }
    return "nothing";
}

constexpr double HUNDREDTHS = 2540.0 / 72;

TEST(PdfPages, HaveTheirOriginAtTheTopLeft) {
    Document document = documentOf(PdfMaker().page(shown(72, 770, "Herrn")));
    Page const& page = document.page(1);
    EXPECT_NEAR(page.width, 595 * HUNDREDTHS, 1);
    EXPECT_NEAR(page.height, 842 * HUNDREDTHS, 1);
    ASSERT_THAT(page.words, SizeIs(1));
    Word const& word = page.words[0];
    EXPECT_NEAR(word.box.left, 72 * HUNDREDTHS, 1);
    EXPECT_NEAR(word.box.right, (72 + 30) * HUNDREDTHS, 1);
    EXPECT_GT(word.box.bottom, 72 * HUNDREDTHS);
    EXPECT_LT(word.box.top, 72 * HUNDREDTHS);
    EXPECT_EQ(word.size, 353);
    EXPECT_EQ(word.turn, Turn::Upright);
    EXPECT_EQ(page.fonts.at(word.font).name, "Courier");
}

TEST(PdfPages, AreReadAsTheyAreCropped) {
    Document document = documentOf(PdfMaker().page(shown(172, 742, "Herrn") + shown(20, 742, "outside"),
                                                   "/MediaBox [0 0 595 842] /CropBox [100 100 500 800]"));
    Page const& page = document.page(1);
    EXPECT_NEAR(page.width, 400 * HUNDREDTHS, 1);
    EXPECT_NEAR(page.height, 700 * HUNDREDTHS, 1);
    ASSERT_THAT(textsOf(page), ElementsAre("Herrn"));
    EXPECT_NEAR(page.words[0].box.left, 72 * HUNDREDTHS, 1);
    EXPECT_LT(page.words[0].box.top, 58 * HUNDREDTHS);
    EXPECT_GT(page.words[0].box.bottom, 58 * HUNDREDTHS);
}

TEST(PdfPages, MayBeginAnywhere) {
    Document document = documentOf(PdfMaker().page(shown(-28, 842, "Herrn"), "/MediaBox [-100 100 495 942]"));
    EXPECT_NEAR(document.page(1).words.at(0).box.left, 72 * HUNDREDTHS, 1);
    EXPECT_NEAR(document.page(1).width, 595 * HUNDREDTHS, 1);
}

TEST(PdfPages, AreReadAsTheyAreTurned) {
    // Text that runs up the sheet, on a page that is shown turned to the right: it reads upright.
    std::string const upwards = "BT /F 10 Tf 0 1 -1 0 72 200 Tm (Herrn) Tj ET\n";
    Document document = documentOf(PdfMaker().page(upwards, "/MediaBox [0 0 595 842] /Rotate 90"));
    Page const& page = document.page(1);
    EXPECT_NEAR(page.width, 842 * HUNDREDTHS, 1);
    EXPECT_NEAR(page.height, 595 * HUNDREDTHS, 1);
    ASSERT_THAT(page.words, SizeIs(1));
    EXPECT_EQ(page.words[0].turn, Turn::Upright);
    EXPECT_NEAR(page.words[0].box.left, 200 * HUNDREDTHS, 1);
    EXPECT_LT(page.words[0].box.top, 72 * HUNDREDTHS);
    EXPECT_GT(page.words[0].box.bottom, 72 * HUNDREDTHS);
}

TEST(PdfPages, TellWhichWayTextRuns) {
    struct {
        int rotate;
        Turn turn;
    } const cases[] = {{0, Turn::Upright}, {90, Turn::Down}, {180, Turn::UpsideDown}, {270, Turn::Up}};
    for (auto const& [rotate, turn] : cases) {
        Document document =
            documentOf(PdfMaker().page(shown(100, 700, "Herrn Olaf") + shown(100, 688, "Leipzig"),
                                       "/MediaBox [0 0 595 842] /Rotate " + std::to_string(rotate)));
        EXPECT_EQ(document.page(1).words.at(0).turn, turn);
        EXPECT_THAT(textsOf(document.page(1)), ElementsAre("Herrn Olaf", "Leipzig"));
        EXPECT_THAT(layOut(document.page(1)).blocks, SizeIs(1));
    }
}

TEST(PdfText, ThatIsNotDrawnIsReadLikeTheTextUnderAScan) {
    Document document = documentOf(PdfMaker().page("BT 3 Tr /F 10 Tf 1 0 0 1 72 700 Tm (Herrn) Tj ET"));
    EXPECT_THAT(textsOf(document.page(1)), ElementsAre("Herrn"));
}

TEST(PdfText, DrawnTwiceToLookBoldIsReadOnce) {
    Document document = documentOf(
        PdfMaker().page(shown(72, 700, "Firma Olaf") + "1 0 0 1 0.3 0 cm " + shown(72, 700, "Firma Olaf")));
    EXPECT_THAT(textsOf(document.page(1)), ElementsAre("Firma Olaf"));
}

TEST(PdfText, HasHyphensWhereSoftOnesAreDrawn) {
    // 0xAD is the soft hyphen.
    Document document = documentOf(PdfMaker().page(shown(72, 700, "555\\25501\\25599")));
    EXPECT_THAT(textsOf(document.page(1)), ElementsAre("555-01-99"));
}

TEST(PdfText, IsAbsentOnAnEmptyPage) {
    Document document = documentOf(PdfMaker().page(""));
    EXPECT_THAT(document.page(1).words, IsEmpty());
}

TEST(SinglePages, ShowWhatThePageShows) {
    PdfMaker maker;
    maker.page(shown(72, 700, "eins"))
        .page(shown(72, 700, "zwei"), "/MediaBox [0 0 400 300] /Rotate 90")
        .page(shown(72, 700, "drei"));
    Document document = documentOf(maker);
    ASSERT_EQ(document.pageCount(), 3);
    for (int number = 1; number <= 3; ++number) {
        Document single = openDocument(document.singlePagePdf(number), "single.pdf");
        ASSERT_EQ(single.pageCount(), 1);
        EXPECT_EQ(textsOf(single.page(1)), textsOf(document.page(number)));
        EXPECT_EQ(single.page(1).width, document.page(number).width);
        EXPECT_EQ(single.page(1).height, document.page(number).height);
    }
}

TEST(SinglePages, CarryOnlyWhatThePageUses) {
    PdfMaker maker;
    maker.page(shown(72, 700, "eins")).page(shown(72, 700, "zwei"));
    std::string noise;
    for (unsigned i = 0; i < 20000; ++i)
        noise += static_cast<char>((i * 2654435761U) >> 24);
    maker.listPicture(noise);
    Document document = documentOf(maker);
    EXPECT_LT(document.singlePagePdf(1).size(), 3000U);
}

TEST(SinglePages, TakeOverWhatThePageTreeSaysOfAllPages) {
    PdfMaker maker;
    maker.page(shown(72, 700, "eins"), "");
    maker.sayOfAllPages("/MediaBox", "[0 0 400 800]");
    Document document = documentOf(maker);
    Document single = openDocument(document.singlePagePdf(1), "single.pdf");
    EXPECT_NEAR(single.page(1).width, 400 * HUNDREDTHS, 1);
    EXPECT_THAT(textsOf(single.page(1)), ElementsAre("eins"));
}

TEST(EncryptedPdfs, ThatNeedAPasswordSaySo) {
    std::string const bytes = PdfMaker().page(shown(72, 700, "Herrn")).encrypted("secret");
    EXPECT_EQ(complaint([&] { openDocument(bytes, "a.pdf"); }),
              "a.pdf: is an encrypted PDF; save it without a password");
}

TEST(EncryptedPdfs, ThatOpenWithoutAPasswordAreReadAndWritten) {
    Document document = openDocument(PdfMaker().page(shown(72, 700, "Herrn")).encrypted(""), "a.pdf");
    EXPECT_THAT(textsOf(document.page(1)), ElementsAre("Herrn"));
    Document single = openDocument(document.singlePagePdf(1), "single.pdf");
    EXPECT_THAT(textsOf(single.page(1)), ElementsAre("Herrn"));
}

TEST(EncryptedPdfs, InAnUnknownWayAreNotCalledDamaged) {
    std::string pdf = PdfMaker().page(shown(72, 770, "Herrn")).encrypted("");
    pdf.replace(pdf.find("/Filter /Standard"), 17, "/Filter /Novelty ");
    EXPECT_EQ(complaint([&] { openDocument(pdf, "a.pdf"); }),
              "a.pdf: is an encrypted PDF; save it without a password");
    EXPECT_EQ(
        complaint([&] { openDocument(std::string("%PDF-1.5\ntrailer << /Encrypt 5 0 R >>"), "a.pdf"); }),
        "a.pdf: is a PDF whose encryption is not known; save it without one");
}

TEST(DamagedPdfs, WithoutPagesSaySo) {
    PdfMaker maker;
    EXPECT_EQ(complaint([&] { documentOf(maker); }), "made.pdf: is a damaged PDF; export the document again");
}

TEST(DamagedPdfs, NameThePageThatIsLost) {
    PdfMaker maker;
    maker.page(shown(72, 700, "eins"));
    maker.losePage();
    Document document = openDocument(maker.bytes(), "a.pdf");
    ASSERT_EQ(document.pageCount(), 2);
    EXPECT_THAT(textsOf(document.page(1)), ElementsAre("eins"));
    char const* const lost = "a.pdf: page 2 is damaged; export the document again";
    EXPECT_EQ(complaint([&] { document.page(2); }), lost);
    EXPECT_EQ(complaint([&] { document.renderPage(2, 72); }), lost);
    EXPECT_EQ(complaint([&] { document.singlePagePdf(2); }), lost);
}

TEST(DamagedPdfs, WriteNothingToStandardError) {
    std::ifstream in(VLSERVICE_EXAMPLES "/letters/post-in-english/Order by fax 55.pdf", std::ios::binary);
    std::string const whole{std::istreambuf_iterator<char>(in), {}};
    ASSERT_FALSE(whole.empty());
    testing::internal::CaptureStderr();
    for (std::size_t length = 100; length < whole.size(); length += whole.size() / 40)
        complaint([&] {
            Document document = openDocument(whole.substr(0, length), "cut.pdf");
            document.page(1);
            document.singlePagePdf(1);
            document.renderPage(1, 20);
        });
    for (std::size_t at = 20; at < whole.size(); at += whole.size() / 40) {
        std::string flipped = whole;
        flipped[at] = static_cast<char>(flipped[at] ^ 0x55);
        complaint([&] {
            Document document = openDocument(flipped, "flipped.pdf");
            document.page(1);
            document.singlePagePdf(1);
        });
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

} // namespace
} // namespace Reader
