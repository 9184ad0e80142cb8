// By what a letter is known again: not by the file that it is in.
#include "programs/production/letter_digest.h"

#include "programs/reader/document.h"
#include "programs/reader/page_pictures.h"
#include "tests/support/json_helpers.h"
#include "tests/support/pdf_maker.h"
#include "tests/support/raw_pdf.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* HELLO = "BT /F 10 Tf 72 700 Td (Hello Ada) Tj ET";

/// Of all pages.
std::string digestOf(std::string const& pdf, std::string const& address = "Ada") {
    Cfg::ExtractedFields fields(valueOf(R"([{"name": "postal", "type": 0, "value": ")" + address +
                                        R"(", "priority": 1, "send_to_server": true}])")
                                    .toArray());
    Production::LetterDigest digest(fields);
    Reader::Document document = Reader::openDocument(pdf, "a.pdf");
    for (int number = 1; number <= document.pageCount(); ++number) {
        Reader::Page const& page = document.page(number);
        digest.add(page, Reader::pictureDigests(document.singlePagePdf(number), page.words.empty()));
    }
    return digest.text();
}

/// The picture's points lie in object 6.
RawPdf withPicture(std::string const& points, std::string const& keys = "", std::string const& packed = "") {
    RawPdf pdf = onePage(std::string(HELLO) + " q 90 0 0 90 100 100 cm /I Do Q", "/XObject << /I 6 0 R >>");
    pdf.stream(
        6,
        "/Type /XObject /Subtype /Image /Width 2 /Height 1 /BitsPerComponent 8 /ColorSpace /DeviceGray " +
            keys,
        packed.empty() ? points : packed);
    return pdf;
}

TEST(LetterDigest, IsThatOfTheSameLetterInAFileMadeAnew) {
    RawPdf anew = onePage(HELLO, "", "", "/Lang (de)");
    anew.object(7, "<< /Producer (Another) /CreationDate (D:20261122120000Z) >>");
    std::string const once = digestOf(onePage(HELLO).bytes());
    EXPECT_EQ(once, digestOf(anew.bytes()));
    EXPECT_EQ(once, digestOf(Reader::PdfMaker().page(HELLO).bytes()));
    EXPECT_EQ(once, digestOf(Reader::PdfMaker().page(HELLO).linearized()));
}

TEST(LetterDigest, IsAnotherWithADateThatIsPrinted) {
    EXPECT_NE(digestOf(onePage(HELLO).bytes()),
              digestOf(onePage(std::string(HELLO) + " BT /F 10 Tf 300 700 Td (20.11.2026) Tj ET").bytes()));
}

TEST(LetterDigest, IsAnotherWhereAWordStandsElsewhere) {
    EXPECT_NE(digestOf(onePage(HELLO).bytes()),
              digestOf(onePage("BT /F 10 Tf 72 680 Td (Hello Ada) Tj ET").bytes()));
}

TEST(LetterDigest, IsAnotherForAnotherRecipient) {
    std::string const pdf = onePage(HELLO).bytes();
    EXPECT_NE(digestOf(pdf, "Ada"), digestOf(pdf, "Eve"));
}

TEST(LetterDigest, TellsPagesApart) {
    Reader::PdfMaker one;
    Reader::PdfMaker two;
    EXPECT_NE(digestOf(one.page(HELLO).page(" ").bytes()), digestOf(two.page(" ").page(HELLO).bytes()));
}

TEST(LetterDigest, IsAnotherWithAnotherPicture) {
    std::string const dark = digestOf(withPicture("AB").bytes());
    EXPECT_NE(dark, digestOf(withPicture("AC").bytes()));
    EXPECT_NE(dark, digestOf(onePage(HELLO).bytes()));
    EXPECT_NE(dark, digestOf(withPicture("AB", "/Decode [1 0]").bytes()));
}

TEST(LetterDigest, IsThatOfTheSamePictureHoweverItIsPacked) {
    EXPECT_EQ(digestOf(withPicture("AB").bytes()),
              digestOf(withPicture("", "/Filter /FlateDecode", VLServiceTest::deflated("AB")).bytes()));
    EXPECT_EQ(digestOf(withPicture("AB").bytes()),
              digestOf(withPicture("", "/Filter /ASCIIHexDecode", "4142>").bytes()));
}

TEST(LetterDigest, LooksIntoPicturesThatStandInThePage) {
    auto const inlined = [](std::string const& points) {
        return digestOf(onePage(std::string(HELLO) + " q 90 0 0 90 9 9 cm BI /W 2 /H 1 /BPC 8 /CS /G ID " +
                                points + "\nEI Q")
                            .bytes());
    };
    EXPECT_NE(inlined("AB"), inlined("AC"));
    EXPECT_EQ(inlined("AB"), inlined("AB"));
}

TEST(LetterDigest, LooksAtWhatIsDrawnWhereThereIsNothingElse) {
    EXPECT_NE(digestOf(onePage("0 0 100 100 re f").bytes()), digestOf(onePage("0 0 100 200 re f").bytes()));
}

TEST(LetterDigest, TakesPicturesAsTheyArePackedThatCannotBeUnpacked) {
    std::string const one = digestOf(withPicture("", "/Filter /FlateDecode", "broken").bytes());
    EXPECT_NE(one, digestOf(withPicture("", "/Filter /FlateDecode", "damaged").bytes()));
    EXPECT_NE(Reader::pictureDigests("no PDF", false), Reader::pictureDigests("none", false));
}

} // namespace
