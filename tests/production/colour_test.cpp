#include "programs/production/colour.h"

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

} // namespace
} // namespace Production
