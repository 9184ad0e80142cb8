#include "vlservice/json/json_text.h"

#include "tests/support/foreign_locale.h"
#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <limits>
#include <new>
#include <random>
#include <sstream>
#include <string>
#include <vector>

namespace {

using namespace VLServiceTest;

json::Object parse(std::string const& text) { return json::strToObject(text.data(), text.size()); }

template<typename Container>
std::string print(Container const& container) {
    std::ostringstream out;
    out << container;
    return out.str();
}

TEST(JsonParsing, NeedsNoTerminator) {
    char const text[] = R"({"a": 1}garbage)";
    EXPECT_EQ(json::strToObject(text, std::strlen(R"({"a": 1})")).get("a").toInt(), 1);
}

struct BadText {
    char const* text;
    char const* message;
};

TEST(JsonParsing, OfBadTextGivesTheParsersWordsWithLineAndColumn) {
    BadText const cases[] = {
        {"", "JSON error: '[' or '{' expected near end of file (line 1, column 0)"},
        {"{\"a\": }", "JSON error: unexpected token near '}' (line 1, column 7)"},
        {"{\n \"a\": 1,\n}", "JSON error: string or '}' expected near '}' (line 3, column 1)"},
        {"{\"a\": 1} x", "JSON error: end of file expected near 'x' (line 1, column 10)"},
        {"5", "JSON error: '[' or '{' expected near '5' (line 1, column 1)"},
        {"{\"a\": \"\\u0000\"}",
         "JSON error: \\u0000 is not allowed without JSON_ALLOW_NUL near '\"\\u0000\"' (line 1, column 14)"},
    };
    for (BadText const& c : cases)
        EXPECT_EQ(messageOf([&] { parse(c.text); }), c.message) << c.text;
}

TEST(JsonParsing, RefusesTextThatIsNoObject) {
    EXPECT_EQ(messageOf([] { parse("[1]"); }), "JSON error: Wrong type: array. Expected type: object");
}

TEST(JsonParsing, RefusesWhatIsNotUtf8) {
    EXPECT_TRUE(
        messageOf([] { parse("{\"a\": \"\xff\"}"); }).starts_with("JSON error: unable to decode byte 0xff"));
    EXPECT_TRUE(
        messageOf([] { parse("{\"\xff\": 1}"); }).starts_with("JSON error: unable to decode byte 0xff"));
}

TEST(JsonParsing, RefusesHostileDepth) {
    std::string const deep = "{\"a\":" + std::string(100'000, '[') + std::string(100'000, ']') + "}";
    EXPECT_TRUE(messageOf([&] { parse(deep); }).starts_with("JSON error: maximum parsing depth reached"));
}

TEST(JsonParsing, RefusesNothingAtAll) {
    EXPECT_TRUE(messageOf([] { json::strToObject(nullptr, 0); }).starts_with("JSON error: "));
}

TEST(JsonPrinting, IsCompactAndKeepsTheOrderOfTheKeys) {
    EXPECT_EQ(print(parse(R"({ "z" : [ 1 , 2.5, true, null ], "a b" : { } })")),
              R"({"z":[1,2.5,true,null],"a b":{}})");
    json::Array array;
    array.append("x y");
    array.append(json::Array());
    EXPECT_EQ(print(array), R"(["x y",[]])");
}

TEST(JsonPrinting, EscapesWhatMustBeEscaped) {
    EXPECT_EQ(print(json::Object{{"k\"", "a\\b\n\x01/\xc3\xa4"}}),
              "{\"k\\\"\":\"a\\\\b\\n\\u0001/\xc3\xa4\"}");
}

TEST(JsonPrinting, OfAnEmptyHandleThrows) {
    json::Object object;
    json::Object const taken = std::move(object);
    EXPECT_EQ(messageOf([&] { print(object); }), "JSON error: an empty handle cannot be printed");
}

TEST(JsonPrinting, OfWhatIsNotUtf8Throws) {
    EXPECT_EQ(messageOf([] {
                  print(json::Object{{"a", "\xff"}});
              }),
              "JSON error: a text that is not valid UTF-8 cannot be printed");
    EXPECT_EQ(messageOf([] {
                  print(json::Object{{"\xff", "a"}});
              }),
              "JSON error: a key that is not valid UTF-8 cannot be printed");
    json::Array array;
    array.append(json::Object{{"a", json::Object{{"\xff", "b"}}}});
    EXPECT_EQ(messageOf([&] { print(array); }),
              "JSON error: a key that is not valid UTF-8 cannot be printed");
}

TEST(JsonPrinting, TakesAndRefusesTheKeysThatJanssonDoes) {
    std::mt19937 random(17);
    std::vector<unsigned> const bytes{0x01, 0x41, 0x7F, 0x80, 0x8F, 0x90, 0x9F, 0xA0, 0xBF, 0xC0, 0xC1,
                                      0xC2, 0xDF, 0xE0, 0xE1, 0xED, 0xEF, 0xF0, 0xF1, 0xF4, 0xF5, 0xFF};
    for (int round = 0; round < 20'000; ++round) {
        std::string key;
        for (std::size_t left = 1 + random() % 4; left > 0; --left)
            key += static_cast<char>(bytes[random() % bytes.size()]);
        bool const isTaken = static_cast<bool>(json::Value(json_string(key.c_str())));
        json::Object object;
        object.set(key, "a");
        EXPECT_EQ(messageOf([&] { print(object); }),
                  isTaken ? "nothing was thrown"
                          : "JSON error: a key that is not valid UTF-8 cannot be printed")
            << testing::PrintToString(key);
    }
}

/// While it lives, jansson gets no memory.
class NoMemoryForJansson {
public:
    NoMemoryForJansson() {
        json_get_alloc_funcs(&allocate_, &release_);
        json_set_alloc_funcs([](std::size_t) -> void* { return nullptr; }, release_);
    }
    ~NoMemoryForJansson() { json_set_alloc_funcs(allocate_, release_); }
    NoMemoryForJansson(NoMemoryForJansson const&) = delete;
    NoMemoryForJansson& operator=(NoMemoryForJansson const&) = delete;

private:
    json_malloc_t allocate_ = nullptr;
    json_free_t release_ = nullptr;
};

TEST(JsonPrinting, TellsMissingMemoryFromTextThatIsNotUtf8) {
    json::Object const whole = parse(R"({"a": ["\u00FC", {"\u20AC": "b"}]})");
    json::Object const broken{{"a", "\xff"}};
    std::ostringstream out;
    NoMemoryForJansson const none;
    EXPECT_THROW(out << whole, std::bad_alloc);
    EXPECT_THROW(out << broken, json::Exc);
}

struct RealCase {
    double real;
    char const* text;
};

TEST(JsonPrinting, OfRealsReadsAsPeopleWroteThem) {
    RealCase const cases[] = {{0.1, "0.1"}, {1.0, "1.0"},   {-2.5, "-2.5"}, {1e300, "1e300"},
                              {1.8, "1.8"}, {1e-7, "1e-7"}, {-0.0, "-0.0"}, {123456.0, "123456.0"}};
    for (RealCase const& c : cases)
        EXPECT_EQ(print(json::Object{{"r", c.real}}), std::string("{\"r\":") + c.text + "}");
}

double randomReal(std::mt19937_64& random) {
    for (;;) {
        auto const bits = random();
        double real = 0;
        std::memcpy(&real, &bits, sizeof real);
        if (real - real == 0)
            return real;
    }
}

TEST(JsonPrinting, OfRealsReadsBackAsTheSameReal) {
    std::mt19937_64 random(7);
    for (int i = 0; i < 2000; ++i) {
        double const real = randomReal(random);
        std::string const text = print(json::Object{{"r", real}});
        ASSERT_EQ(parse(text).get("r").toReal(), real) << text;
    }
    for (double const real : {0.1 + 0.2, 1.0 / 3.0, std::numeric_limits<double>::denorm_min()})
        EXPECT_EQ(parse(print(json::Object{{"r", real}})).get("r").toReal(), real);
}

TEST(JsonPrinting, OfIntegersKeepsAllSixtyFourBits) {
    EXPECT_EQ(print(json::Object{{"min", std::numeric_limits<long long>::min()},
                                 {"max", std::numeric_limits<long long>::max()}}),
              R"({"min":-9223372036854775808,"max":9223372036854775807})");
}

TEST(JsonForPeople, HasAFormForEveryType) {
    std::pair<json::Value, char const*> const cases[] = {
        {json::Value(), "#absent#"},
        {"text \"as\" it stands\n", "\"text \"as\" it stands\n\""},
        {1234567, "1234567"},
        {-5, "-5"},
        {1.5, "1.5"},
        {2.0, "2"},
        {1234567.0, "1.23457e+06"},
        {true, "true"},
        {false, "false"},
        {"null"_json, "null"},
        {R"({"a": [1]})"_json, R"({"a":[1]})"},
        {R"([1, "x"])"_json, R"([1,"x"])"},
    };
    for (auto const& [value, expected] : cases)
        EXPECT_EQ(print(value), expected);
}

TEST(JsonTextInAForeignLocale, IsTestedInOne) {
    ForeignLocale const foreign;
    std::ostringstream out;
    out << 1234.5;
    EXPECT_EQ(out.str(), "1.234,5");
    if (!ForeignLocale::isForeignInC())
        GTEST_SKIP() << "the system could not make a locale that is foreign in C too";
    char printed[16];
    std::snprintf(printed, sizeof printed, "%.1f", 1.5);
    EXPECT_STREQ(printed, "1,5");
}

TEST(JsonTextInAForeignLocale, IsTheSame) {
    ForeignLocale const foreign;
    json::Object const object = parse(R"({"r": 1234.5, "i": 1234567})");
    EXPECT_EQ(object.get("r").toReal(), 1234.5);
    EXPECT_EQ(print(object), R"({"r":1234.5,"i":1234567})");
    EXPECT_EQ(print(object.get("r")), "1234.5");
    EXPECT_EQ(print(object.get("i")), "1234567");
    EXPECT_EQ(messageOf([] { parse("{" + std::string(2000, '\n') + "]"); }),
              "JSON error: string or '}' expected near ']' (line 2001, column 1)");
}

TEST(JsonTextInAForeignLocale, RefusesTheEmptyHandleWithAPlainSize) {
    ForeignLocale const foreign;
    json::Array array;
    for (int i = 0; i < 1234; ++i)
        array.append(i);
    EXPECT_EQ(messageOf([&] { array.append(json::Value()); }),
              "JSON error: array element can not be appended. Size: 1234. New value type: empty");
}

TEST(JsonTextOfAnyValue, IsCompactJson) {
    std::pair<json::Value, char const*> const rows[] = {
        {{}, ""},
        {"a\"b", R"("a\"b")"},
        {"", R"("")"},
        {1, "1"},
        {3.0, "3.0"},
        {0.1, "0.1"},
        {true, "true"},
        {json::Value(json_null()), "null"},
        {json::Array(), "[]"},
        {json::Object{{"a", 1.5}}, R"({"a":1.5})"},
    };
    for (auto const& [value, text] : rows)
        EXPECT_EQ(json::toText(value), text);
}

TEST(JsonTextOfAnyValue, RefusesTextThatIsNotUtf8) {
    EXPECT_EQ(messageOf([] { json::toText("\xff"); }),
              "JSON error: a text that is not valid UTF-8 cannot be printed");
}

} // namespace
