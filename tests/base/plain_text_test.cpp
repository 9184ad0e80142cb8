#include "programs/base/plain_text.h"

#include "vlservice/json/json_text.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

struct Case {
    char const* what;
    std::string text;
    std::string plain;
};

TEST(PlainLine, ShowsWhatWouldActOnATerminal) {
    Case const cases[] = {
        {"ordinary text", "grüße 漢字 \U0001F600", "grüße 漢字 \U0001F600"},
        {"nothing", "", ""},
        {"white space", "a\nb\tc\rd\ve\ff", "a b c d e f"},
        {"an escape sequence", "\x1b[31mred", "\\u001b[31mred"},
        {"a title for the window", "\x1b]0;x\x07", "\\u001b]0;x\\u0007"},
        {"a zero", std::string("a\0b", 3), "a\\u0000b"},
        {"delete", "a\x7F", "a\\u007f"},
        {"a control sequence in one character",
         "a\xC2\x9B"
         "2J",
         "a\\u009b2J"},
        {"the next line",
         "a\xC2\x85"
         "b",
         "a\\u0085b"},
        {"a right-to-left override", "invoice\u202Efdp.exe", "invoice\\u202efdp.exe"},
        {"isolates", "\u2066a\u2069", "\\u2066a\\u2069"},
        {"marks of direction", "\u200Ea\u200Fb\u061C", "\\u200ea\\u200fb\\u061c"},
        {"separators of lines and paragraphs", "a\u2028b\u2029", "a\\u2028b\\u2029"},
        {"a joiner that scripts need", "न\u200Dम", "न\u200Dम"},
        {"no UTF-8",
         "gr\xFC\xDF"
         "e",
         "gr\uFFFD\uFFFDe"},
        {"an overlong escape", "\xC1\x9B", "\uFFFD\uFFFD"},
        {"a raw C1 byte",
         "\x9B"
         "31m",
         "\uFFFD31m"},
    };
    for (Case const& c : cases)
        EXPECT_EQ(Base::plainLine(c.text), c.plain) << c.what;
}

TEST(PlainText, KeepsItsLines) { EXPECT_EQ(Base::plainText("a\n\tb\r\n\x1b"), "a\n b \n\\u001b"); }

TEST(PlainText, OfJsonIsTheSameJson) {
    std::ostringstream text;
    json::Object const object{{"k\u202E", "a\xC2\x9B\x7F\n\x01\u2028z"}};
    text << object;
    std::string const plain = Base::plainText(text.str());
    EXPECT_EQ(Base::plainText(plain), plain);
    EXPECT_TRUE(json::strToObject(plain.data(), plain.size()) == object);
}

TEST(OneLine, IsCutBetweenCharacters) {
    EXPECT_EQ(Base::oneLine("a\nb"), "a b");
    EXPECT_EQ(Base::oneLine(std::string(600, 'x')), std::string(500, 'x'));
    EXPECT_EQ(Base::oneLine(std::string(499, 'x') + "üx"), std::string(499, 'x'));
    EXPECT_EQ(Base::oneLine(std::string(5000, '\x01')).size(), 500u);
}

TEST(PlainTextCheck, IsUtf8OfABoundedLength) {
    EXPECT_TRUE(Base::isPlainText("Grüße", 7));
    EXPECT_FALSE(Base::isPlainText("Grüße", 6));
    EXPECT_FALSE(Base::isPlainText("a\n", 7));
    EXPECT_FALSE(Base::isPlainText("\xFF", 7));
    EXPECT_FALSE(Base::isPlainText(std::string("a\0b", 3), 7));
    EXPECT_TRUE(Base::isPlainText("", 0));
}

} // namespace
