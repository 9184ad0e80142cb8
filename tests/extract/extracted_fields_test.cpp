#include "vlservice/extract/extracted_fields.h"

#include "tests/support/json_helpers.h"

#include <string>
#include <utility>
#include <vector>

namespace Cfg {
namespace {

using testing::ElementsAre;
using ValueType = ExtractedField::ValueType;

json::Array arrayOf(std::string const& text) { return valueOf(text).toArray(); }

struct Entry {
    std::string name;
    json::Value value = "x";
    int priority = 0;
    IgnoreOnGroup ignore = IgnoreOnGroup::MustMatch;
    bool sendToServer = true;
    ValueType type = ValueType::Plain;
};

ExtractedFields fieldsOf(std::vector<Entry> const& entries) {
    ExtractedFields fields;
    for (Entry const& e : entries)
        fields.emplace(e.priority,
                       ExtractedField(e.name, e.value, e.priority, e.sendToServer, e.ignore, e.type));
    return fields;
}

std::vector<std::string> namesOf(ExtractedFields const& fields) {
    std::vector<std::string> names;
    for (auto const& [priority, field] : fields)
        names.push_back(field.name());
    return names;
}

Entry const EMAIL{.name = "email", .priority = 2};
Entry const POSTAL{.name = "postal", .priority = 1};
Entry const NOTICE{.name = "notice", .priority = -1};
Entry const REFERENCE{.name = "reference"};

TEST(ExtractedFieldsOrder, RunsFromTheHighestPriorityAndByInsertion) {
    EXPECT_THAT(namesOf(fieldsOf({NOTICE, REFERENCE, POSTAL, {.name = "date"}, EMAIL})),
                ElementsAre("email", "postal", "reference", "date", "notice"));
}

TEST(ExtractedFieldsReading, InsertsEachElementUnderItsPriority) {
    ExtractedFields const fields(
        arrayOf(R"([{"name":"a"},{"name":"n","priority":-1},{"name":"p","priority":1},{"name":"b"}])"));
    EXPECT_THAT(namesOf(fields), ElementsAre("p", "a", "b", "n"));
    for (auto const& [priority, field] : fields)
        EXPECT_EQ(priority, field.priority());
    EXPECT_TRUE(ExtractedFields(json::Array()).empty());
}

TEST(ExtractedFieldsReading, RefusesWhatIsNoField) {
    std::pair<char const*, char const*> const rows[] = {
        {R"([{"name":"a"},5])", "JSON error: Wrong type: integer. Expected type: object"},
        {"[[]]", "JSON error: Wrong type: array. Expected type: object"},
        {"[null]", "JSON error: Wrong type: null. Expected type: object"},
        {"[{}]", "JSON error: Wrong type: empty. Expected type: string"},
    };
    for (auto const& row : rows)
        expectFailure<json::Exc>([&] { ExtractedFields fields(arrayOf(row.first)); }, row.second);
}

TEST(ExtractedFieldsWriting, GivesTheFieldsInIterationOrder) {
    ExtractedFields const fields = fieldsOf({REFERENCE, NOTICE, EMAIL});
    EXPECT_EQ(print(fields.serialize()),
              R"([{"name":"email","value":"x","priority":2,"send_to_server":true},)"
              R"({"name":"reference","value":"x","send_to_server":true},)"
              R"({"name":"notice","value":"x","priority":-1,"send_to_server":true}])");
    EXPECT_EQ(ExtractedFields(fields.serialize()).serialize(), fields.serialize());
    EXPECT_EQ(print(ExtractedFields().serialize()), "[]");
}

TEST(ExtractedFieldsPrimaryAddress, IsTheHighestThatGoesToTheServer) {
    struct {
        std::vector<Entry> entries;
        char const* primary;
    } const rows[] = {
        {{POSTAL, EMAIL}, "email"},
        {{POSTAL, {.name = "sms", .priority = 4, .sendToServer = false}}, "postal"},
        {{POSTAL, {.name = "sms", .priority = 4, .type = ValueType::Invalid}}, "sms"},
        {{{.name = "first", .priority = 2}, {.name = "second", .priority = 2}}, "first"},
    };
    for (auto const& row : rows) {
        ExtractedFields const fields = fieldsOf(row.entries);
        ASSERT_NE(fields.primaryAddressField(), nullptr) << row.primary;
        EXPECT_EQ(fields.primaryAddressField()->name(), row.primary);
        ExtractedFields const readBack(fields.serialize());
        EXPECT_EQ(readBack.primaryAddressField()->name(), row.primary);
        EXPECT_EQ(namesOf(readBack), namesOf(fields));
    }
}

TEST(ExtractedFieldsPrimaryAddress, IsMissingWithoutARecipientForTheServer) {
    EXPECT_EQ(ExtractedFields().primaryAddressField(), nullptr);
    EXPECT_EQ(fieldsOf({REFERENCE, NOTICE}).primaryAddressField(), nullptr);
    EXPECT_EQ(fieldsOf({{.name = "p", .priority = 1, .sendToServer = false}}).primaryAddressField(), nullptr);
}

TEST(ExtractedFieldsProduction, IsReadyWithValidFieldsAndAnAddress) {
    std::string message = "as before";
    EXPECT_TRUE(fieldsOf({REFERENCE, POSTAL, NOTICE}).isProductionReady(message));
    EXPECT_EQ(message, "as before");
}

TEST(ExtractedFieldsProduction, LeavesTheMessageWhenThereIsNoAddress) {
    std::string message = "as before";
    EXPECT_FALSE(ExtractedFields().isProductionReady(message));
    EXPECT_FALSE(fieldsOf({REFERENCE, NOTICE}).isProductionReady(message));
    EXPECT_EQ(message, "as before");
}

TEST(ExtractedFieldsProduction, NamesTheFirstFieldThatIsNotValid) {
    Entry const badReference{.name = "reference", .type = ValueType::Invalid};
    Entry const badPostal{.name = "postal", .priority = 1, .type = ValueType::Invalid};
    Entry const rawNotice{.name = "no\"tice", .priority = -1, .type = ValueType::NotValidated};
    std::pair<std::vector<Entry>, char const*> const rows[] = {
        {{EMAIL, badReference, badPostal}, R"(Field name: "postal")"},
        {{EMAIL, badReference}, R"(Field name: "reference")"},
        {{EMAIL, rawNotice}, R"(Field name: "no"tice")"},
        {{badReference}, R"(Field name: "reference")"},
    };
    for (auto const& [entries, expected] : rows) {
        std::string message = "as before";
        EXPECT_FALSE(fieldsOf(entries).isProductionReady(message));
        EXPECT_EQ(message, expected);
    }
}

TEST(ExtractedFieldsComparison, GoesByPositionAndSkipsWhatIsMerged) {
    Entry const sum{.name = "amount", .value = 1, .ignore = IgnoreOnGroup::Sum};
    Entry const otherSum{.name = "amount", .value = 2, .ignore = IgnoreOnGroup::Sum};
    Entry const last{.name = "zz", .ignore = IgnoreOnGroup::KeepLast};
    Entry const date{.name = "date"};
    struct {
        std::vector<Entry> a;
        std::vector<Entry> b;
        bool same;
    } const rows[] = {
        {{}, {}, true},
        {{EMAIL, REFERENCE}, {REFERENCE, EMAIL}, true},
        {{REFERENCE, date}, {date, REFERENCE}, false},
        {{EMAIL, sum}, {EMAIL, otherSum}, true},
        {{EMAIL, sum, last}, {EMAIL}, true},
        {{sum, REFERENCE, last}, {last, last, REFERENCE}, true},
        {{sum}, {}, true},
        {{EMAIL}, {EMAIL, REFERENCE}, false},
        {{EMAIL}, {}, false},
        {{REFERENCE}, {{.name = "reference", .value = "y"}}, false},
        {{REFERENCE}, {{.name = "reference", .type = ValueType::NotValidated}}, false},
        {{{.name = "r", .value = {}}}, {{.name = "r", .value = {}}}, true},
    };
    for (auto const& row : rows) {
        ExtractedFields const a = fieldsOf(row.a);
        ExtractedFields const b = fieldsOf(row.b);
        EXPECT_EQ(a.sameAs(b), row.same) << print(a.serialize()) << print(b.serialize());
        EXPECT_EQ(b.sameAs(a), row.same) << print(b.serialize()) << print(a.serialize());
    }
}

TEST(ExtractedFieldsComparison, FailsForAFieldThatIsNeverTheSame) {
    ExtractedFields const never =
        fieldsOf({EMAIL, {.name = "reference", .ignore = IgnoreOnGroup::NeverSame}});
    EXPECT_FALSE(never.sameAs(ExtractedFields(never)));
    EXPECT_FALSE(fieldsOf({EMAIL, REFERENCE}).sameAs(never));
}

TEST(ExtractedFieldsGrouping, MergesWhatIsNotCompared) {
    ExtractedFields group = fieldsOf({{.name = "amount", .value = 2, .ignore = IgnoreOnGroup::Sum},
                                      {.name = "note", .value = "a", .ignore = IgnoreOnGroup::Collect}});
    group.combineOnGroup(fieldsOf({{.name = "note", .value = "b", .ignore = IgnoreOnGroup::Collect},
                                   {.name = "amount", .value = 3, .ignore = IgnoreOnGroup::KeepLast}}));
    EXPECT_EQ(print(group.serialize()),
              R"([{"name":"amount","value":5,"send_to_server":true,"ignore_on_group":1},)"
              R"({"name":"note","value":["a","b"],"send_to_server":true,"ignore_on_group":6}])");
}

TEST(ExtractedFieldsGrouping, AddsAFieldThatOnlyTheLetterHas) {
    ExtractedFields group = fieldsOf({EMAIL, {.name = "a", .priority = 1}});
    ExtractedFields const letter =
        fieldsOf({{.name = "b", .value = 3, .priority = 1, .ignore = IgnoreOnGroup::Sum}});
    group.combineOnGroup(letter);
    EXPECT_THAT(namesOf(group), ElementsAre("email", "a", "b"));
    EXPECT_EQ(std::prev(group.end())->first, 1);
    EXPECT_EQ(letter.size(), 1U);
}

TEST(ExtractedFieldsGrouping, LeavesWhatMustAgreeAlone) {
    for (int const rule : {0, -1}) {
        ExtractedFields group = fieldsOf({{.name = "r", .value = "a", .ignore = IgnoreOnGroup::KeepLast}});
        group.combineOnGroup(fieldsOf({{.name = "r", .value = "b", .ignore = IgnoreOnGroup{rule}},
                                       {.name = "new", .ignore = IgnoreOnGroup{rule}}}));
        EXPECT_EQ(print(group.serialize()),
                  R"([{"name":"r","value":"a","send_to_server":true,"ignore_on_group":5}])");
    }
    ExtractedFields group = fieldsOf({REFERENCE});
    group.combineOnGroup(fieldsOf({{.name = "reference", .value = "b", .ignore = IgnoreOnGroup::KeepLast}}));
    EXPECT_EQ(group.begin()->second.strVal(), "x");
}

TEST(ExtractedFieldsGrouping, FindsNamesInEveryPriorityAndTakesTheFirst) {
    ExtractedFields group =
        fieldsOf({{.name = "n", .value = 1, .priority = -1, .ignore = IgnoreOnGroup::Sum},
                  {.name = "n", .value = 2, .priority = 3, .ignore = IgnoreOnGroup::Sum}});
    group.combineOnGroup(fieldsOf({{.name = "n", .value = 10, .ignore = IgnoreOnGroup::Sum}}));
    EXPECT_EQ(group.size(), 2U);
    EXPECT_EQ(group.begin()->second.intVal(), 12);
    EXPECT_EQ(std::prev(group.end())->second.intVal(), 1);
}

TEST(ExtractedFieldsGrouping, KeepsWhatWasMergedBeforeAFailure) {
    ExtractedFields group = fieldsOf({{.name = "a", .value = 1, .ignore = IgnoreOnGroup::Sum},
                                      {.name = "b", .value = 1, .ignore = IgnoreOnGroup::Sum}});
    ExtractedFields const letter = fieldsOf({{.name = "a", .value = 2, .ignore = IgnoreOnGroup::Sum},
                                             {.name = "b", .value = "x", .ignore = IgnoreOnGroup::Sum}});
    expectWrongType([&] { group.combineOnGroup(letter); }, "string", "integer");
    EXPECT_EQ(group.begin()->second.intVal(), 3);
    EXPECT_EQ(std::next(group.begin())->second.intVal(), 1);
}

TEST(ExtractedFieldsGrouping, BearsItselfAsTheOther) {
    ExtractedFields group = fieldsOf({{.name = "a", .value = 2, .ignore = IgnoreOnGroup::Sum},
                                      {.name = "b", .value = "x", .ignore = IgnoreOnGroup::Collect}});
    group.combineOnGroup(group);
    EXPECT_EQ(print(group.serialize()),
              R"([{"name":"a","value":4,"send_to_server":true,"ignore_on_group":1},)"
              R"({"name":"b","value":["x","x"],"send_to_server":true,"ignore_on_group":6}])");
}

} // namespace
} // namespace Cfg
