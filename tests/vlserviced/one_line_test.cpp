#include "programs/vlserviced/one_line.h"

#include <gtest/gtest.h>

namespace {

using VlServiced::isPlainText;
using VlServiced::oneLine;

TEST(OneLine, HasNoControlCharactersAndIsValidUtf8) {
    EXPECT_EQ(oneLine("a\nb\tc\x7F"), "a b c ");
    EXPECT_EQ(oneLine("grüße"), "grüße");
    EXPECT_EQ(oneLine("gr\xFC\xDF"), "gr??");
    EXPECT_EQ(oneLine(""), "");
}

TEST(OneLine, IsCutBetweenCharacters) {
    EXPECT_EQ(oneLine(std::string(600, 'x')), std::string(500, 'x'));
    std::string const text = std::string(499, 'x') + "üx";
    EXPECT_EQ(oneLine(text), std::string(499, 'x'));
}

TEST(PlainText, IsUtf8OfABoundedLength) {
    EXPECT_TRUE(isPlainText("Grüße", 7));
    EXPECT_FALSE(isPlainText("Grüße", 6));
    EXPECT_FALSE(isPlainText("a\n", 7));
    EXPECT_FALSE(isPlainText("\xFF", 7));
    EXPECT_FALSE(isPlainText(std::string("a\0b", 3), 7));
    EXPECT_TRUE(isPlainText("", 0));
}

} // namespace
