#include "vlservice/json/json_record.h"

#include "tests/support/json_helpers.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>
#include <tuple>
#include <utility>

namespace {

enum class Colour : std::int32_t { None = 0, Red = 1 };
enum class Small : signed char { Zero = 0 };

struct Record {
    std::string name;
    std::string title;
    bool flag = false;
    int number = 0;
    std::uint32_t unsignedNumber = 0;
    unsigned long long width = 0;
    Colour colour = Colour::None;
    Small small = Small::Zero;
    double distance = 0;
    json::Value any;
};

constexpr std::tuple KEYS{
    json::Required{"name", &Record::name},
    json::Key{"title", &Record::title},
    json::Key{"flag", &Record::flag},
    json::Key{"number", &Record::number, 7},
    json::Key{"unsigned", &Record::unsignedNumber},
    json::Key{"width", &Record::width},
    json::Key{"colour", &Record::colour, Colour::Red},
    json::Key{"small", &Record::small},
    json::Key{"distance", &Record::distance, 1.5},
    json::Key{"any", &Record::any},
};

std::string rewritten(std::string const& text) {
    Record record;
    json::readKeys(KEYS, parse(text), record);
    json::Object object;
    json::writeKeys(KEYS, record, object);
    return print(object);
}

TEST(JsonRecords, WriteInTheOrderOfTheRows) {
    char const* const everyKey =
        R"({"name":"n","title":"t","flag":true,"number":-1,"unsigned":4294967295,"width":-1,"colour":5,"small":-1,)"
        R"("distance":2.5,"any":[null]})";
    EXPECT_EQ(rewritten(everyKey), everyKey);
    EXPECT_EQ(rewritten(R"({"flag":true,"title":"t","unknown":1,"name":"n"})"),
              R"({"name":"n","title":"t","flag":true})");
}

TEST(JsonRecords, LeaveOutWhatEqualsItsDefault) {
    EXPECT_EQ(rewritten(R"({"name":"","title":"","flag":false,"number":7,"unsigned":0,"width":0,"colour":1,)"
                        R"("small":0,"distance":1.5})"),
              R"({"name":""})");
}

TEST(JsonRecords, ReadOtherTypesAsMissingKeys) {
    std::pair<char const*, char const*> const rows[] = {
        {"title", "5"},       {"flag", "1"},        {"flag", R"("true")"}, {"number", "2.0"},
        {"number", R"("2")"}, {"unsigned", "null"}, {"colour", "true"},    {"distance", R"("2.5")"},
    };
    for (auto const& [key, value] : rows)
        EXPECT_EQ(rewritten(std::string(R"({"name":"n",")") + key + "\":" + value + "}"), R"({"name":"n"})")
            << key << value;
}

TEST(JsonRecords, CutIntegersToTheirMembers) {
    EXPECT_EQ(rewritten(R"({"name":"n","number":4294967299,"unsigned":-1,"small":511,"colour":4294967296})"),
              R"({"name":"n","number":3,"unsigned":4294967295,"colour":0,"small":-1})");
}

TEST(JsonRecords, TakeAnIntegerForAReal) {
    EXPECT_EQ(rewritten(R"({"name":"n","distance":2})"), R"({"name":"n","distance":2.0})");
}

TEST(JsonRecords, WriteNothingForARealWithoutAJsonForm) {
    for (double const real : {std::nan(""), std::numeric_limits<double>::infinity()}) {
        Record record;
        record.distance = real;
        record.number = 7;
        record.colour = Colour::Red;
        json::Object object;
        json::writeKeys(KEYS, record, object);
        EXPECT_EQ(print(object), R"({"name":""})");
    }
}

TEST(JsonRecords, RefuseAMissingIdentifier) {
    Record record;
    expectWrongType([&] { json::readKeys(KEYS, parse("{}"), record); }, "empty", "string");
    expectWrongType([&] { json::readKeys(KEYS, parse(R"({"name":null})"), record); }, "null", "string");
}

} // namespace
