#include "programs/production/said_colours.h"

#include "programs/production/colour.h"
#include "programs/reader/document.h"
#include "tests/support/raw_pdf.h"

#include <gtest/gtest.h>

namespace Production {
namespace {

using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* AREA = " 100 100 200 200 re f ";

bool mayHave(RawPdf const& pdf) { return maySayColour(pdf.bytes()); }

bool isDrawnInColour(RawPdf const& pdf) {
    Reader::Document document = Reader::openDocument(pdf.bytes(), "a.pdf");
    return isColoured(document.drawPage(1, LOOKED_AT_DOTS_PER_INCH).value());
}

TEST(SaidColours, AreNoneOnGreyPages) {
    RawPdf picture = onePage("200 0 0 200 100 100 cm /X6 Do", "/XObject << /X6 6 0 R >>");
    picture.stream(6,
                   "/Type /XObject /Subtype /Image /Width 1 /Height 1 /BitsPerComponent 8 /ColorSpace "
                   "/DeviceGray",
                   "x");
    RawPdf form =
        onePage("/X6 Do", "/XObject << /X6 6 0 R >> /ExtGState << /G << /CA 0.5 /SMask /None >> >>");
    form.stream(6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", std::string("0.5 g") + AREA);
    for (RawPdf const& pdf :
         {onePage("BT /F 10 Tf 72 700 Td (Dear) Tj ET"), onePage(std::string("0.3 0.3 0.3 rg") + AREA),
          onePage(std::string("0 0 0 1 k") + AREA), onePage(std::string("/DeviceGray cs 0.2 sc") + AREA),
          picture, form, onePage("")}) {
        EXPECT_FALSE(mayHave(pdf));
        EXPECT_FALSE(isDrawnInColour(pdf));
    }
}

TEST(SaidColours, AreNeverMissed) {
    RawPdf form = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    form.stream(6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", std::string("1 0 0 rg") + AREA);
    RawPdf picture = onePage("200 0 0 200 100 100 cm /X6 Do", "/XObject << /X6 6 0 R >>");
    picture.stream(6,
                   "/Type /XObject /Subtype /Image /Width 1 /Height 1 /BitsPerComponent 8 /ColorSpace "
                   "/DeviceRGB",
                   "x00");
    RawPdf nested = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    nested.stream(
        6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << /XObject << /X7 7 0 R >> >>",
        "/X7 Do");
    nested.stream(7, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", std::string("1 0 0 0 k") + AREA);
    RawPdf inherited = onePage("/X6 Do", "/XObject << /X6 6 0 R /X7 7 0 R >>");
    inherited.stream(6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", "/X7 Do");
    inherited.stream(7, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", std::string("1 0 0 rg") + AREA);
    RawPdf note = onePage("", "", "/Annots [7 0 R]");
    note.object(7, "<< /Type /Annot /Subtype /Stamp /F 4 /Rect [100 100 200 200] /AP << /N 8 0 R >> >>");
    note.stream(8, "/Type /XObject /Subtype /Form /BBox [0 0 100 100]", "1 0 0 rg 0 0 100 100 re f");
    RawPdf font = onePage("");
    font.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << /Font "
                   "<< /T3 6 0 R >> >> >>");
    font.object(6, "<< /Type /Font /Subtype /Type3 /FontBBox [0 0 10 10] /FontMatrix [0.1 0 0 0.1 0 0] "
                   "/CharProcs << /a 7 0 R >> /Encoding << /Type /Encoding /Differences [97 /a] >> "
                   "/FirstChar 97 /LastChar 97 /Widths [10] >>");
    font.stream(7, "", "10 0 d0 1 0 0 rg 0 0 10 10 re f");
    font.stream(5, "", "BT /T3 90 Tf 72 400 Td (aa) Tj ET");
    RawPdf shading = onePage(
        "/S sh", "/Shading << /S << /ShadingType 2 /ColorSpace /DeviceRGB /Coords [0 0 595 0] /Function << "
                 "/FunctionType 2 /Domain [0 1] /C0 [1 0 0] /C1 [0 0 1] /N 1 >> >> >>");
    RawPdf space =
        onePage(std::string("/Spot cs 1 scn") + AREA,
                "/ColorSpace << /Spot [/Separation /Red /DeviceRGB << /FunctionType 2 /Domain [0 1] "
                "/C0 [1 1 1] /C1 [1 0 0] /N 1 >>] >>");
    for (RawPdf const& pdf :
         {onePage(std::string("1 0 0 rg") + AREA), onePage(std::string("0 1 0 RG 9 w 100 100 200 200 re S")),
          onePage(std::string("0 1 0 0 k") + AREA), form, picture, nested, inherited, note, font, shading,
          space, onePage("200 0 0 200 100 100 cm BI /W 1 /H 1 /CS /RGB /BPC 8 ID \xFF\x01\x01 EI")}) {
        EXPECT_TRUE(isDrawnInColour(pdf));
        EXPECT_TRUE(mayHave(pdf));
    }
}

TEST(SaidColours, AreTakenForPossibleWhereNothingIsKnown) {
    EXPECT_TRUE(maySayColour("%PDF-1.7 nothing"));
    RawPdf endless = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    endless.stream(
        6, "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << /XObject << /X6 6 0 R >> >>",
        "/X6 Do");
    EXPECT_FALSE(mayHave(endless)) << "a form that draws itself shows nothing more";
}

} // namespace
} // namespace Production
