#include "programs/vlmail/explain/words.h"

#include <gtest/gtest.h>

namespace VlMail {
namespace {

TEST(Words, ShortenByCharactersAndOnOneLine) {
    EXPECT_EQ(Words::shortened("a\nb", 10), "a / b");
    EXPECT_EQ(Words::shortened("\u00FC\u00FC\u00FC", 2), "\u00FC\u00FC\u2026");
    EXPECT_EQ(Words::shortened("\u00FC\u00FC", 2), "\u00FC\u00FC");
    EXPECT_EQ(Words::excerpt("abc", 2), "\"ab\u2026\"");
}

TEST(Words, TellLengthsAndNumbersAlikeInEveryLocale) {
    EXPECT_EQ(Words::millimetres(9500), "95 mm");
    EXPECT_EQ(Words::millimetres(9550), "95.5 mm");
    EXPECT_EQ(Words::millimetres(-205), "-2.05 mm");
    EXPECT_EQ(Words::number(2.5), "2.5");
    EXPECT_EQ(Words::number(1234567.89), "1234567.89");
}

} // namespace
} // namespace VlMail
