#include "programs/production/colour.h"

#include "tests/support/raw_pdf.h"

#include <gtest/gtest.h>

#include <string>

namespace Production {
namespace {

/// A white picture with so many points of that colour.
Reader::Picture withPoints(std::size_t count, unsigned char red, unsigned char green, unsigned char blue) {
    Reader::Picture picture{10, 10, std::string(300, '\xFF')};
    for (std::size_t i = 0; i < count; ++i) {
        picture.points[3 * i] = static_cast<char>(red);
        picture.points[3 * i + 1] = static_cast<char>(green);
        picture.points[3 * i + 2] = static_cast<char>(blue);
    }
    return picture;
}

TEST(Colour, IsMoreThanAFewPointsThatAreNotGrey) {
    EXPECT_FALSE(isColoured(withPoints(0, 0, 0, 0)));
    EXPECT_FALSE(isColoured(withPoints(100, 0, 0, 0)));
    EXPECT_FALSE(isColoured(withPoints(100, 128, 128, 128)));
    EXPECT_FALSE(isColoured(withPoints(3, 255, 0, 0)));
    EXPECT_TRUE(isColoured(withPoints(4, 255, 0, 0)));
    EXPECT_TRUE(isColoured(withPoints(4, 0, 0, 90)));
}

TEST(Colour, IsNotWhatPicturesOfGreyPaperHave) {
    EXPECT_FALSE(isColoured(withPoints(100, 224, 220, 200)));
    EXPECT_TRUE(isColoured(withPoints(100, 225, 220, 200)));
    EXPECT_TRUE(isColoured(withPoints(100, 200, 225, 220)));
    EXPECT_TRUE(isColoured(withPoints(100, 200, 220, 225)));
}

TEST(Colour, IsThatOfAPrintAndNotOfAScreen) {
    auto const isColouredWith = [](std::string const& flags) {
        std::string const pdf =
            VLServiceTest::onePage("", "", "/Annots [6 0 R]")
                .object(6, "<< /Type /Annot /Subtype /Stamp /Rect [100 100 200 200] /AP << /N 7 0 R >> /F " +
                               flags + " >>")
                .stream(7, "/Type /XObject /Subtype /Form /BBox [0 0 100 100]", "1 0 0 rg 0 0 100 100 re f")
                .bytes();
        Reader::Document document = Reader::openDocument(pdf, "a.pdf");
        return hasColour(document, 1, pdf);
    };
    EXPECT_TRUE(isColouredWith("4"));
    EXPECT_TRUE(isColouredWith("36"));
    EXPECT_FALSE(isColouredWith("0"));
    EXPECT_FALSE(isColouredWith("6"));
}

} // namespace
} // namespace Production
