#include "programs/reader/font_file.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::Key;

std::string fontBytes() {
    std::ifstream in("/usr/share/fonts/truetype/dejavu/DejaVuSansMono.ttf", std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

TEST(FontFile, KnowsItsCharactersAndMeasures) {
    FontFile const font(fontBytes());
    EXPECT_TRUE(font.has(U'A'));
    EXPECT_TRUE(font.has(U'Ω'));
    EXPECT_FALSE(font.has(U'中'));
    EXPECT_EQ(font.advance(), 602);
    EXPECT_EQ(font.ascent(), 928);
    EXPECT_EQ(font.descent(), -236);
}

TEST(FontFile, ASubsetIsAFontOfFewBytes) {
    FontFile const font(fontBytes());
    // An accented letter is made of two other glyphs.
    FontSubset const accented = font.subset({U'é'});
    EXPECT_LT(accented.file.size(), 1500U);
    EXPECT_GT(accented.file.size(), font.subset({}).file.size());
    EXPECT_GT(font.subset({U'a', U'b', U'c'}).file.size(), font.subset({U'a'}).file.size());
}

TEST(FontFile, TheSameCharactersGiveTheSameBytes) {
    FontFile const font(fontBytes());
    EXPECT_EQ(font.subset({U'Ω', U'é', U'ж'}).file, FontFile(fontBytes()).subset({U'ж', U'Ω', U'é'}).file);
}

TEST(FontFile, ASubsetNumbersTheGlyphsOfItsCharacters) {
    FontSubset const subset = FontFile(fontBytes()).subset({U'Ω', U'ж', U'中'});
    EXPECT_THAT(subset.glyphs, ElementsAre(Key(U'Ω'), Key(U'ж')));
    EXPECT_NE(subset.glyphs.at(U'Ω'), 0);
    EXPECT_NE(subset.glyphs.at(U'ж'), 0);
    EXPECT_NE(subset.glyphs.at(U'Ω'), subset.glyphs.at(U'ж'));
}

TEST(FontFile, DamagedFilesAreRefused) {
    std::string const file = fontBytes();
    for (std::size_t length : {0U, 3U, 11U, 40U, 300U, 5000U})
        EXPECT_THROW(FontFile{file.substr(0, length)}, std::runtime_error) << length;
    std::string other = file;
    other[0] = 'X';
    EXPECT_THROW(FontFile{other}, std::runtime_error);
}

} // namespace
} // namespace Reader
