#include "programs/mailing/json_walk.h"

#include "tests/support/failure_of.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

namespace {

using Mailing::behindNested;
using Mailing::JsonWalk;

/// The same, a character at a time.
std::size_t behindNestedSlowly(std::string_view text, std::size_t at) {
    int depth = 0;
    bool isInString = false;
    for (; at < text.size(); ++at) {
        char const c = text[at];
        if (isInString)
            at += c == '\\' ? 1 : 0;
        if (c == '"')
            isInString = !isInString;
        if (isInString || c == '"')
            continue;
        depth += (c == '{' || c == '[' ? 1 : 0) - (c == '}' || c == ']' ? 1 : 0);
        if (depth == 0)
            return at + 1;
    }
    return text.npos;
}

std::string randomText(std::mt19937& random, std::string_view characters, std::size_t size) {
    std::string text = "[";
    while (text.size() < size)
        text += characters[random() % characters.size()];
    return text;
}

TEST(NestedValues, EndWhereEachCharacterSaysSo) {
    std::mt19937 random(20261122);
    for (char const* const characters : {"[]{}", "[]{}\"", "[{a\"", "[]{}\"\\", "]}aaaaaaaa\"[{aa",
                                         "\\\"]aaaaaaaaaaaa", "[\\\\\\\"aaaaaa]", "\"\"\\a[]"})
        for (int round = 0; round < 3000; ++round) {
            std::string const text = randomText(random, characters, 1 + random() % 300);
            ASSERT_EQ(behindNested(text, 0), behindNestedSlowly(text, 0)) << text;
        }
}

TEST(NestedValues, EndAtAnyPlaceOfABlockAndBehindIt) {
    for (std::size_t before = 0; before < 200; ++before)
        for (char const* const end : {"]", "\"]\"]", "\"\\\"]\"]", "\"\\\\\"]", "{\"}\"}]"}) {
            std::string const text = "[" + std::string(before, ' ') + end;
            ASSERT_EQ(behindNested(text + std::string(100, ']'), 0), text.size()) << text;
            ASSERT_EQ(behindNested(text.substr(0, text.size() - 1), 0), std::string::npos) << text;
        }
}

TEST(JsonWalks, GiveTheTextsOfValuesAndFailWhereThereIsNone) {
    JsonWalk walk(R"( [ 1.5e3 , "a\"]", {"b": [ ]},null] )");
    std::string values;
    walk.array([&] { values += std::string(walk.value()) + ';'; });
    walk.end();
    EXPECT_EQ(values, R"(1.5e3;"a\"]";{"b": [ ]};null;)");
    for (char const* const none : {"", " ", ",", ":", "]", "}", "\"", "\"a\\\"", "[", "{\"a\":[}", "[\"]"})
        EXPECT_EQ(failureOf([&] { JsonWalk(none).value(); }), "it is no metadata of a mailing") << none;
    EXPECT_EQ(failureOf([] { JsonWalk("\v1").end(); }), "it is no metadata of a mailing");
}

} // namespace
