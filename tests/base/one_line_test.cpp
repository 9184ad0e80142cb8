#include "programs/base/one_line.h"

#include <gtest/gtest.h>

namespace {

using Base::isPlainText;
using Base::oneLine;

TEST(OneLine, HasNoControlCharactersAndIsValidUtf8) {
    EXPECT_EQ(Base::oneLine("a\nb\tc\x7F"), "a b c ");
    EXPECT_EQ(Base::oneLine("grüße"), "grüße");
    EXPECT_EQ(Base::oneLine("gr\xFC\xDF"), "gr??");
    EXPECT_EQ(Base::oneLine(""), "");
}

TEST(OneLine, IsCutBetweenCharacters) {
    EXPECT_EQ(Base::oneLine(std::string(600, 'x')), std::string(500, 'x'));
    std::string const text = std::string(499, 'x') + "üx";
    EXPECT_EQ(Base::oneLine(text), std::string(499, 'x'));
}

TEST(PlainText, IsUtf8OfABoundedLength) {
    EXPECT_TRUE(Base::isPlainText("Grüße", 7));
    EXPECT_FALSE(Base::isPlainText("Grüße", 6));
    EXPECT_FALSE(Base::isPlainText("a\n", 7));
    EXPECT_FALSE(Base::isPlainText("\xFF", 7));
    EXPECT_FALSE(Base::isPlainText(std::string("a\0b", 3), 7));
    EXPECT_TRUE(Base::isPlainText("", 0));
}

} // namespace
