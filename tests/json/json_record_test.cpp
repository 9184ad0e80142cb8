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

struct Child {
    std::string id;

    Child() = default;
    Child(json::Object const& object) : id(object.get("id").toString()) {}
    json::Object serialize() const { return {{"id", id}}; }
    bool operator==(Child const&) const = default;

    static json::RecordKeys const& keys() {
        static json::RecordKeys const keys{json::describeKeys(std::tuple{json::Required{"id", &Child::id}})};
        return keys;
    }
};

/// Rows with rules of their own.
struct Parent {
    std::vector<Child> children;
    std::vector<std::string> names;
    int place = -1;
    int always = 0;
    int doubled = 0;
    bool kept = false;
};

int twice(json::Value const& node) { return static_cast<int>(2 * node.toInt()); }

constexpr std::tuple PARENT_KEYS{
    json::Required{"children", &Parent::children},
    json::Key{"names", &Parent::names},
    json::Key{"place", &Parent::place, -1}.checked(),
    json::Key{"always", &Parent::always}.alwaysWritten(),
    json::Key{"doubled", &Parent::doubled}.readBy(twice),
    json::Key{"kept", &Parent::kept}.notClaimed(),
    json::Dropped{"foreign"},
};

Parent parentOf(std::string const& text) {
    Parent parent;
    json::readKeys(PARENT_KEYS, parse(text), parent);
    return parent;
}

std::string written(Parent const& parent) {
    json::Object object;
    json::writeKeys(PARENT_KEYS, parent, object);
    return print(object);
}

TEST(JsonRecordRows, RefuseAMissingListThatIsRequired) {
    expectWrongType([] { parentOf("{}"); }, "empty", "array");
    expectWrongType([] { parentOf(R"({"children":{}})"); }, "object", "array");
    expectWrongType([] { parentOf(R"({"children":[1]})"); }, "integer", "object");
    EXPECT_EQ(parentOf(R"({"children":[{"id":"a"}]})").children.at(0).id, "a");
}

TEST(JsonRecordRows, RefuseAnotherTypeWhereItIsChecked) {
    expectWrongType([] { parentOf(R"({"children":[],"place":1.5})"); }, "float", "integer");
    expectWrongType([] { parentOf(R"({"children":[],"place":null})"); }, "null", "integer");
    expectWrongType([] { parentOf(R"({"children":[],"names":"x"})"); }, "string", "array");
    EXPECT_EQ(parentOf(R"({"children":[]})").place, -1);
    EXPECT_EQ(parentOf(R"({"children":[],"place":0})").place, 0);
}

TEST(JsonRecordRows, WriteWhatIsRequiredOrAlwaysWritten) {
    EXPECT_EQ(written(Parent()), R"({"children":[],"always":0})");
}

TEST(JsonRecordRows, ReadByTheFunctionThatTheyName) {
    EXPECT_EQ(parentOf(R"({"children":[],"doubled":4})").doubled, 8);
    EXPECT_EQ(parentOf(R"({"children":[],"doubled":"4"})").doubled, 0);
    EXPECT_EQ(parentOf(R"({"children":[]})").doubled, 0);
}

TEST(JsonRecordRows, DropTheKeysOfOthers) {
    EXPECT_EQ(written(parentOf(R"({"children":[],"foreign":1})")), R"({"children":[],"always":0})");
}

TEST(JsonRecordRows, ClaimTheirKeysUnlessTheySayOtherwise) {
    for (char const* claimed : {"children", "names", "place", "always", "doubled", "foreign"})
        EXPECT_TRUE(json::claimsKey(PARENT_KEYS, claimed)) << claimed;
    for (char const* other : {"kept", "child", "childrens", ""})
        EXPECT_FALSE(json::claimsKey(PARENT_KEYS, other)) << other;
}

std::string described(json::KeyRow const& row) {
    char const* const types[] = {"text",   "flag",   "int32",   "uint32",  "int64", "uint64", "bits",
                                 "number", "record", "records", "numbers", "texts", "any"};
    char const* const uses[] = {"lenient", "checked", "required", "dropped"};
    return row.name + ' ' + types[static_cast<int>(row.form.type)] + ' ' + uses[static_cast<int>(row.use)] +
           ' ' + row.missing;
}

std::vector<std::string> described(std::vector<json::KeyRow> const& rows) {
    std::vector<std::string> texts;
    for (json::KeyRow const& row : rows)
        texts.push_back(described(row));
    return texts;
}

TEST(JsonRecordDescription, TellsTypeAndUseAndDefaultOfEachRow) {
    struct Numbers {
        std::uint32_t small = 0;
        long long wide = 0;
    };
    constexpr std::tuple NUMBERS{json::Key{"small", &Numbers::small}, json::Key{"wide", &Numbers::wide, -5},
                                 json::Named{"elsewhere", json::KeyType::Any}};
    constexpr std::tuple RECORD{
        json::Required{"name", &Record::name},
        json::Key{"title", &Record::title},
        json::Key{"flag", &Record::flag},
        json::Key{"number", &Record::number, 7},
        json::Key{"width", &Record::width},
        json::Key{"colour", &Record::colour, Colour::Red},
        json::Key{"distance", &Record::distance, 3.0},
        json::Key{"any", &Record::any},
    };
    EXPECT_THAT(
        described(json::describeKeys(RECORD, NUMBERS)),
        testing::ElementsAre("name text required ", "title text lenient \"\"", "flag flag lenient false",
                             "number int32 lenient 7", "width uint64 lenient 0", "colour int32 lenient 1",
                             "distance number lenient 3.0", "any any checked ", "small uint32 lenient 0",
                             "wide int64 lenient -5", "elsewhere any lenient "));
    EXPECT_THAT(described(json::describeKeys(PARENT_KEYS)),
                testing::ElementsAre("children records required ", "names texts checked []",
                                     "place int32 checked -1", "always int32 lenient 0",
                                     "doubled int32 lenient 0", "kept flag lenient false",
                                     "foreign any dropped "));
}

TEST(JsonRecordDescription, LeadsToTheKeysOfInnerRecords) {
    json::RecordKeys const keys{json::describeKeys(PARENT_KEYS)};
    ASSERT_TRUE(keys.find("children"));
    EXPECT_EQ(keys.find("children")->form.record, &Child::keys());
    EXPECT_EQ(keys.find("names")->form.record, nullptr);
    EXPECT_EQ(keys.find("child"), nullptr);
}

} // namespace
