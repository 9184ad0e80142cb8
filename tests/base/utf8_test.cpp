#include "programs/base/utf8.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using namespace std::string_literals;

std::vector<std::string> const NO_UTF8 = {
    "\xFF",             // no lead byte
    "\x80",             // a trail byte alone
    "\xC3",             // cut
    "\xE2\x82",         // cut
    "\xC0\xAF",         // overlong "/"
    "\xE0\x80\x80",     // overlong
    "\xED\xA0\x80",     // a surrogate
    "\xF0\x80\x80\x80", // overlong
    "\xF4\x90\x80\x80", // beyond U+10FFFF
};

TEST(Utf8, IsToldFromOtherBytes) {
    for (std::string const& text : {""s, "a"s, "ü漢\U0001F600"s, "\0"s, "\uFFFF"s, "\U0010FFFF"s})
        EXPECT_TRUE(Base::isUtf8(text)) << text;
    for (std::string const& text : NO_UTF8) {
        EXPECT_FALSE(Base::isUtf8(text));
        EXPECT_FALSE(Base::isUtf8("a" + text + "b"));
    }
}

TEST(Utf8, IsMadeOutOfAnyBytes) {
    EXPECT_EQ(Base::validUtf8("grüße"), "grüße");
    EXPECT_EQ(Base::validUtf8("a\xFFz\xC3"), "a\uFFFDz\uFFFD");
    for (std::string const& text : NO_UTF8)
        EXPECT_TRUE(Base::isUtf8(Base::validUtf8(text + "a" + text)));
}

TEST(Utf8, IsCountedAndCutByCharacters) {
    EXPECT_EQ(Base::characterCount("aü漢\U0001F600"), 4u);
    EXPECT_EQ(Base::characterCount(""), 0u);
    EXPECT_EQ(Base::firstCharacters("aü漢b", 3), "aü漢");
    EXPECT_EQ(Base::firstCharacters("aü", 9), "aü");
    EXPECT_EQ(Base::firstCharacters("aü", 0), "");
}

TEST(Utf8, IsCutToBytesBetweenCharacters) {
    std::string const text = "aü漢\U0001F600b";
    std::vector<std::size_t> const lengths{0, 1, 1, 3, 3, 3, 6, 6, 6, 6, 10, 11, 11};
    for (std::size_t bytes = 0; bytes < lengths.size(); ++bytes)
        EXPECT_EQ(Base::firstBytes(text, bytes), text.substr(0, lengths[bytes])) << bytes;
}

TEST(Utf8, HasPlacesBetweenCharacters) {
    std::string const text = "\U0001F600ü";
    for (std::size_t at : {0, 4, 6, 7})
        EXPECT_TRUE(Base::isBetweenCharacters(text, at)) << at;
    for (std::size_t at : {1, 2, 3, 5})
        EXPECT_FALSE(Base::isBetweenCharacters(text, at)) << at;
    EXPECT_TRUE(Base::isBetweenCharacters("\x80\x80", 1));
}

TEST(Utf8, IsWrittenAsItIsRead) {
    std::string text;
    for (char32_t const c : {U'\0', U'a', U'ü', U'漢', U'\U0010FFFF'})
        Base::appendCharacter(text, c);
    EXPECT_EQ(text, "\0aü漢\U0010FFFF"s);
}

} // namespace
