#include "programs/reader/true_type.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

namespace Reader {
namespace {

std::string fontFile() {
    std::ifstream in("/usr/share/fonts/truetype/dejavu/DejaVuSansMono.ttf", std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

TEST(TrueType, KnowsTheGlyphsOfCharacters) {
    TrueTypeFont const font(fontFile());
    EXPECT_NE(font.glyphOf(U'A'), 0);
    EXPECT_NE(font.glyphOf(U'Ω'), 0);
    EXPECT_NE(font.glyphOf(U'A'), font.glyphOf(U'B'));
    EXPECT_EQ(font.glyphOf(U'中'), 0);
    EXPECT_EQ(font.advance(), 602);
}

TEST(TrueType, ASubsetIsAFontOfFewBytes) {
    std::string const file = fontFile();
    TrueTypeFont const font(file);
    // An accented letter is made of two other glyphs.
    std::string const small = font.subset({font.glyphOf(U'é')});
    EXPECT_LT(small.size(), file.size() / 10);
    EXPECT_GT(small.size(), font.subset({}).size());
    EXPECT_EQ(small, font.subset({font.glyphOf(U'é')}));
    EXPECT_EQ(small, font.subset({font.glyphOf(U'é'), font.glyphOf(U'e')}));
}

TEST(TrueType, DamagedFilesAreRefused) {
    std::string const file = fontFile();
    for (std::size_t length : {0U, 3U, 11U, 40U, 300U, 5000U})
        EXPECT_THROW(TrueTypeFont{file.substr(0, length)}, std::runtime_error) << length;
    std::string other = file;
    other[0] = 'O';
    EXPECT_THROW(TrueTypeFont{other}, std::runtime_error);
}

} // namespace
} // namespace Reader
