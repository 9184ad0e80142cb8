// Pages that are made of the same objects need not be drawn to be held against each other.
#include "programs/reader/document.h"
#include "programs/reader/page_objects.h"
#include "programs/reader/page_source.h"

#include "tests/support/pdf_maker.h"
#include "tests/support/raw_pdf.h"

#include <gmock/gmock.h>

#include <memory>
#include <string>
#include <utility>

namespace Reader {
namespace {

using VLServiceTest::deflated;
using VLServiceTest::formTree;
using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* HELLO = "BT /F 10 Tf 72 700 Td (Hello) Tj ET";
constexpr char const* LAYERED = "/OC /L BDC BT /F 10 Tf 72 700 Td (Notes) Tj ET EMC";

bool haveSameObjects(std::string const& document, std::string const& single, int number = 1) {
    return PageObjects(document).areSame(number, single);
}

bool keepsItsObjects(std::string const& pdf, int number = 1) {
    return haveSameObjects(pdf, openDocument(pdf, "a.pdf").singlePagePdf(number), number);
}

RawPdf layered(std::string const& hidden) {
    RawPdf pdf = onePage(LAYERED, "/Properties << /L 6 0 R >>", "",
                         "/OCProperties << /OCGs [6 0 R 7 0 R] /D << /OFF [" + hidden + " 0 R] >> >>");
    return pdf.object(6, "<< /Type /OCG /Name (N) >>").object(7, "<< /Type /OCG /Name (N) >>");
}

RawPdf withField(std::string const& fieldKeys, std::string const& formKeys) {
    RawPdf pdf = onePage(HELLO, "", "/Annots [7 0 R]", "/AcroForm << /Fields [10 0 R] " + formKeys + " >>");
    pdf.object(7, "<< /Type /Annot /Subtype /Widget /Parent 10 0 R /P 3 0 R /Rect [72 640 272 660] " +
                      fieldKeys + " >>");
    pdf.stream(8, "/Subtype /Form /BBox [0 0 200 20] /Resources << /Font << /F 4 0 R >> >>",
               "BT /F 10 Tf (Lena) Tj ET");
    return pdf.object(10, "<< /FT /Tx /T (name) /V (Lena) /Kids [7 0 R] >>");
}

TEST(PageObjects, AreKeptByPagesThatAreWritten) {
    RawPdf parts = onePage(HELLO);
    parts.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents [5 0 R 6 0 R 5 0 R] "
                    "/Resources 11 0 R /Rotate 90 /Group << /S /Transparency /CS /DeviceRGB >> >>");
    parts.stream(6, "/Filter /FlateDecode", deflated(HELLO)).object(11, "<< /Font << /F 4 0 R >> >>");
    for (std::string const& pdf :
         {onePage(HELLO).bytes(), parts.bytes(), layered("6").bytes(), formTree(5, 2),
          withField("/AP << /N 8 0 R >>", "/DA (/F 10 Tf) /DR << /Font << /F 4 0 R >> >>").bytes(),
          PdfMaker().page(HELLO).encrypted(""), PdfMaker().page(HELLO).linearized()})
        EXPECT_TRUE(keepsItsObjects(pdf)) << pdf;
}

TEST(PageObjects, AreKeptWhereAttributesAreInherited) {
    PdfMaker pdf;
    pdf.page("1 0 0 rg", "").page(HELLO, "").sayOfAllPages("/MediaBox", "[0 0 595 842]");
    pdf.sayOfAllPages("/Rotate", "180");
    for (int const number : {1, 2})
        EXPECT_TRUE(keepsItsObjects(pdf.bytes(), number));
    Document document = openDocument(pdf.bytes(), "a.pdf");
    EXPECT_FALSE(haveSameObjects(pdf.bytes(), document.singlePagePdf(1), 2));
    EXPECT_FALSE(haveSameObjects(pdf.bytes(), document.singlePagePdf(1), 3));
}

TEST(PageObjects, AreSeenToDiffer) {
    std::string const page = onePage(HELLO).bytes();
    std::string const layers = layered("6").bytes();
    std::string changed = page;
    changed.replace(changed.find("Hello"), 5, "Hallo");
    RawPdf withoutFont = onePage(HELLO);
    withoutFont.object(
        3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << >> >>");
    RawPdf otherFont = onePage(HELLO);
    otherFont.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica /Encoding /WinAnsiEncoding >>");
    std::string const field = withField("/AP << /N 8 0 R >>", "").bytes();
    std::pair<std::string, std::string> const pairs[]{
        {page, changed},
        {page, withoutFont.bytes()},
        {withoutFont.bytes(), page},
        {page, otherFont.bytes()},
        {page, onePage(HELLO, "", "/Rotate 90").bytes()},
        {page, onePage(HELLO, "", "/CropBox [0 0 100 100]").bytes()},
        {page, onePage(HELLO, "", "/UserUnit 2").bytes()},
        {page, onePage(HELLO, "/ExtGState << /G << /CA 0 >> >>").bytes()},
        {layers,
         onePage(LAYERED, "/Properties << /L 6 0 R >>").object(6, "<< /Type /OCG /Name (N) >>").bytes()},
        // The very same texts, and another layer is hidden.
        {layers, layered("7").bytes()},
        {field, withField("/AP << /N 8 0 R >> /F 2", "").bytes()},
        {field,
         withField("/AP << /N 8 0 R >>", "").object(10, "<< /FT /Tx /V (Lars) /Kids [7 0 R] >>").bytes()},
        {field, withField("/AP << /N 8 0 R >>", "/DA (/F 9 Tf)").bytes()},
        {field, page},
        {page, ""},
        {page, "%PDF-1.4 nothing"},
        {"%PDF-1.4 nothing", page},
        {page, PdfMaker().page(HELLO).page(HELLO).bytes()}};
    for (auto const& [document, single] : pairs)
        EXPECT_FALSE(haveSameObjects(document, single)) << document << single;
}

TEST(PageObjects, MayBeFewerWhereNoContentNamesTheOthers) {
    std::string const fonts = "/Font << /F 4 0 R /G 4 0 R >>";
    auto const listing = [&](std::string const& content) {
        RawPdf pdf = onePage(content);
        return pdf
            .object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << " +
                           fonts + " >> >>")
            .bytes();
    };
    auto const isSame = [&](std::string const& content) {
        return haveSameObjects(listing(content), onePage(content).bytes());
    };
    EXPECT_TRUE(isSame(HELLO));
    EXPECT_TRUE(isSame("BT /Gx 10 Tf (G) Tj ET"));
    EXPECT_FALSE(isSame("BT /G 10 Tf (Hello) Tj ET"));
    EXPECT_FALSE(isSame("BT/G<48>Tj ET"));
    EXPECT_FALSE(isSame("BT /#47 10 Tf (Hello) Tj ET"));
    EXPECT_TRUE(keepsItsObjects(listing(HELLO)));
}

TEST(PageObjects, OfFormsMayNameThePagesOwn) {
    RawPdf pdf = onePage("/X Do", "/XObject << /X 6 0 R >>");
    pdf.stream(6, "/Subtype /Form /BBox [0 0 595 842]", HELLO);
    RawPdf without = pdf;
    without.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << "
                      "/Font << >> /XObject << /X 6 0 R >> >> >>");
    EXPECT_FALSE(haveSameObjects(pdf.bytes(), without.bytes()));
}

TEST(PageObjects, AreNotLookedIntoWhereReadersMaySeeOthers) {
    std::string const page = onePage(HELLO).bytes();
    RawPdf update;
    update.stream(9, "", "nothing that is used");
    EXPECT_FALSE(keepsItsObjects(update.behind(page)));
    std::string damaged = page;
    damaged.replace(damaged.rfind("startxref"), 9, "startyref");
    EXPECT_FALSE(keepsItsObjects(damaged));
    EXPECT_FALSE(keepsItsObjects(withField("/AP << /N 8 0 R >>", "/NeedAppearances true").bytes()));
    EXPECT_FALSE(keepsItsObjects(withField("", "").bytes()));
}

TEST(PageObjects, InCirclesAndSharedTreesAreLookedAtOnce) {
    RawPdf circle = onePage("/X Do", "/XObject << /X 6 0 R >>");
    circle.stream(6, "/Subtype /Form /BBox [0 0 9 9] /Resources << /XObject << /X 6 0 R >> >>", "/X Do");
    EXPECT_TRUE(keepsItsObjects(circle.bytes()));
    std::string const tree = formTree(500, 3);
    EXPECT_TRUE(haveSameObjects(tree, tree));
}

TEST(PageObjects, BeyondABoundAreLeftToBeDrawn) {
    std::string many;
    for (int i = 0; i < 250'000; ++i)
        many += " 1";
    std::string const wide = onePage(HELLO, "/ColorSpace << /C [" + many + " ] >>").bytes();
    EXPECT_FALSE(haveSameObjects(wide, wide));
    std::string const bomb(100 << 20, ' ');
    RawPdf packed = onePage("");
    packed.stream(5, "/Filter /FlateDecode", deflated(bomb));
    RawPdf twice = onePage("");
    twice.stream(5, "/Filter [/FlateDecode /FlateDecode]", deflated(deflated(bomb)));
    EXPECT_TRUE(haveSameObjects(packed.bytes(), packed.bytes()));
    EXPECT_FALSE(haveSameObjects(packed.bytes(), twice.bytes()));
}

/// A PDF whose pages are counted as they are drawn.
class CountedSource : public PageSource {
public:
    CountedSource(std::string const& pdf, int& drawn) : source_(openPdf(pdf, "a.pdf")), drawn_(drawn) {}

    int pageCount() const override { return source_->pageCount(); }
    Page readPage(int number) override { return source_->readPage(number); }
    PageSize pageSize(int number) override { return source_->pageSize(number); }
    std::string singlePagePdf(int number) override { return source_->singlePagePdf(number); }
    std::string renderPage(int number, double dots) override { return source_->renderPage(number, dots); }
    bool hasSameObjects(int number, std::string_view pdf) override {
        return source_->hasSameObjects(number, pdf);
    }
    std::optional<Picture> drawPage(int number, double dots) override {
        ++drawn_;
        return source_->drawPage(number, dots);
    }

private:
    std::unique_ptr<PageSource> source_;
    int& drawn_;
};

struct Checked {
    bool showsTheSame;
    int drawn;
};

Checked checked(std::string const& pdf, std::string const& single) {
    int drawn = 0;
    Document document("a.pdf", std::make_unique<CountedSource>(pdf, drawn));
    bool const showsTheSame = document.showsTheSame(1, single.empty() ? document.singlePagePdf(1) : single);
    return {showsTheSame, drawn};
}

TEST(PageChecks, DrawNoPageThatIsMadeOfTheSameObjects) {
    for (std::string const& pdf : {onePage(HELLO).bytes(), layered("6").bytes()}) {
        auto const [showsTheSame, drawn] = checked(pdf, "");
        EXPECT_TRUE(showsTheSame);
        EXPECT_EQ(drawn, 0);
    }
}

TEST(PageChecks, DrawPagesWhosePartsDiffer) {
    std::string const page = onePage(HELLO).bytes();
    auto const [stillTheSame, drawnForAComment] =
        checked(page, onePage(HELLO + std::string(" % said")).bytes());
    EXPECT_TRUE(stillTheSame);
    EXPECT_EQ(drawnForAComment, 1);
    RawPdf withoutFont = onePage(HELLO);
    withoutFont.object(4, "null");
    RawPdf const withoutLayers =
        onePage(LAYERED, "/Properties << /L 6 0 R >>").object(6, "<< /Type /OCG /Name (N) >>");
    for (auto const& [pdf, single] : {std::pair(page, withoutFont.bytes()),
                                      std::pair(page, onePage("BT /F 10 Tf 72 700 Td (Hallo) Tj ET").bytes()),
                                      std::pair(layered("6").bytes(), withoutLayers.bytes())}) {
        auto const [showsTheSame, drawn] = checked(pdf, single);
        EXPECT_FALSE(showsTheSame) << single;
        EXPECT_EQ(drawn, 1) << single;
    }
}

TEST(Overviews, AreKeptOfTheFirstPagesThatAreAskedForAndOfTheLast) {
    PdfMaker maker;
    for (int page = 0; page < 18; ++page)
        maker.page("");
    int drawn = 0;
    Document document("a.pdf", std::make_unique<CountedSource>(maker.bytes(), drawn));
    for (int const page : {1, 1, 2, 1})
        EXPECT_EQ(document.overview(page)->width, 298) << page;
    EXPECT_EQ(drawn, 2);
    for (int page = 3; page <= 18; ++page)
        document.overview(page);
    EXPECT_EQ(drawn, 18);
    for (int const page : {16, 18, 1})
        document.overview(page);
    EXPECT_EQ(drawn, 18);
    document.overview(17);
    EXPECT_EQ(drawn, 19);
    EXPECT_THROW(document.overview(19), std::out_of_range);
}

} // namespace
} // namespace Reader
