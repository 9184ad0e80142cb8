#include "programs/production/joined_pages.h"

#include "programs/reader/document.h"
#include "tests/support/failure_of.h"
#include "tests/support/raw_pdf.h"

#include <gtest/gtest.h>

#include <map>

namespace {

using Production::JoinedPages;
using VLServiceTest::RawPdf;

std::string pageWith(std::string const& text, std::string const& keys = "", std::string const& ofAll = "") {
    return VLServiceTest::onePage("BT /F 10 Tf 72 700 Td (" + text + ") Tj ET", "", keys, ofAll).bytes();
}

/// The first word of each page; "-" for none.
std::string firstWords(std::string const& pdf) {
    Reader::Document document = Reader::openDocument(pdf, "joined.pdf");
    std::string words;
    for (int page = 1; page <= document.pageCount(); ++page) {
        auto const& all = document.page(page).words;
        words += (words.empty() ? "" : " ") + (all.empty() ? "-" : all.front().text);
    }
    return words;
}

TEST(JoinedPagesTest, StandInTheOrderInWhichTheyWereAdded) {
    JoinedPages pages;
    for (char const* const text : {"One", "Two", "Three"})
        pages.add(pageWith(text));
    EXPECT_EQ(pages.size(), 3U);
    EXPECT_EQ(firstWords(pages.bytes()), "One Two Three");
}

TEST(JoinedPagesTest, LookAsTheyDoAlone) {
    std::string const turned = pageWith("Turned", "/Rotate 90 /CropBox [50 50 500 800]");
    // The first layer is hidden, by a state of all and by itself.
    std::string const ofLayer = "BT /OC /L BDC /F 10 Tf 72 600 Td (Hidden) Tj EMC ET";
    auto const layered = [&](std::string const& configuration) {
        RawPdf pdf =
            VLServiceTest::onePage(ofLayer, "/Properties << /L 8 0 R >>", "",
                                   "/OCProperties << /OCGs [8 0 R] /D << " + configuration + " >> >>");
        return pdf.object(8, "<< /Type /OCG /Name (L) >>").bytes();
    };
    std::vector<std::string> const singles{turned, layered("/OFF [8 0 R]"), layered("/BaseState /OFF"),
                                           layered("")};
    JoinedPages pages;
    for (std::string const& single : singles)
        pages.add(single);
    Reader::Document joined = Reader::openDocument(pages.bytes(), "joined.pdf");
    for (std::size_t i = 0; i < singles.size(); ++i) {
        Reader::Document alone = Reader::openDocument(singles[i], "single.pdf");
        EXPECT_EQ(joined.renderPage(static_cast<int>(i) + 1, 72), alone.renderPage(1, 72)) << i;
    }
}

TEST(JoinedPagesTest, KeepTheFieldsOfFormsApart) {
    auto const form = [](std::string const& value) {
        RawPdf pdf = VLServiceTest::onePage(
            "", "", "/Annots [8 0 R]",
            "/AcroForm << /Fields [8 0 R] /DA (/F 10 Tf) /DR << /Font << /F 4 0 R >> >> >>");
        pdf.object(8, "<< /Type /Annot /Subtype /Widget /FT /Tx /T (name) /V (" + value +
                          ") /DA (/F 10 Tf) /Rect [72 700 272 720] /F 4 >>");
        return pdf.bytes();
    };
    JoinedPages pages;
    pages.add(form("Ada"));
    pages.add(form("Bert"));
    Reader::Document joined = Reader::openDocument(pages.bytes(), "joined.pdf");
    for (auto const& [page, value] : std::map<int, std::string>{{1, "Ada"}, {2, "Bert"}})
        EXPECT_EQ(joined.renderPage(page, 72),
                  Reader::openDocument(form(value), "single.pdf").renderPage(1, 72));
}

TEST(JoinedPagesTest, StoreAPageOnceThatIsAddedAgain) {
    std::string noise;
    for (unsigned i = 0, state = 1; i < 200'000; ++i) {
        state = state * 1664525 + 1013904223;
        noise += static_cast<char>(state >> 24);
    }
    RawPdf pdf = VLServiceTest::onePage("/P Do", "/XObject << /P 6 0 R >>");
    pdf.stream(
        6,
        "/Type /XObject /Subtype /Image /Width 200 /Height 1000 /BitsPerComponent 8 /ColorSpace /DeviceGray",
        noise);
    JoinedPages pages;
    pages.add(pdf.bytes());
    for (int i = 0; i < 9; ++i)
        pages.addAgain(0);
    EXPECT_EQ(pages.size(), 10U);
    EXPECT_LT(pages.bytes().size(), 250'000U);
}

TEST(JoinedPagesTest, HaveBlankSidesInTheSizeOfTheSheet) {
    JoinedPages pages;
    pages.add(pageWith("One", "/Rotate 90"));
    pages.addBlank();
    pages.add(pageWith("Two"));
    std::string const pdf = pages.bytes();
    EXPECT_EQ(firstWords(pdf), "One - Two");
    Reader::Document document = Reader::openDocument(pdf, "joined.pdf");
    EXPECT_EQ(document.pageSize(1).width, document.pageSize(2).width);
    EXPECT_EQ(document.pageSize(1).height, document.pageSize(2).height);
}

TEST(JoinedPagesTest, AreAsTheyWereWhenOneCannotBeAdded) {
    JoinedPages pages;
    pages.add(pageWith("One"));
    for (std::string const& bad : {std::string(), std::string("no PDF"), std::string("%PDF-1.7\n%%EOF\n"),
                                   pageWith("cut").substr(0, 100)})
        EXPECT_EQ(failureOf([&] { pages.add(bad); }), "is no page of a PDF") << bad;
    EXPECT_EQ(pages.size(), 1U);
    EXPECT_EQ(firstWords(pages.bytes()), "One");
}

TEST(JoinedPagesTest, CanBeTakenAwayFromTheEnd) {
    JoinedPages pages;
    for (char const* const text : {"One", "Two", "Three"})
        pages.add(pageWith(text));
    pages.shrink(1);
    pages.add(pageWith("Four"));
    EXPECT_EQ(firstWords(pages.bytes()), "One Four");
}

TEST(JoinedPagesTest, GiveTheSameBytesForTheSamePages) {
    auto const bytes = [] {
        JoinedPages pages;
        pages.add(pageWith("One"));
        pages.addBlank();
        return pages.bytes();
    };
    EXPECT_EQ(bytes(), bytes());
}

} // namespace
