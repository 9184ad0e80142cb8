#include "vlservice/extract/extracted_field.h"

#include "tests/support/json_helpers.h"

#include <cstdlib>
#include <ctime>
#include <limits>
#include <string>
#include <utility>
#include <vector>

namespace Cfg {
namespace {

using ValueType = ExtractedField::ValueType;

constexpr long long MAX_INT64 = std::numeric_limits<long long>::max();

ExtractedField field(json::Value const& value, ValueType type = ValueType::Plain,
                     IgnoreOnGroup ignore = IgnoreOnGroup::MustMatch) {
    return ExtractedField("f", value, 0, false, ignore, type);
}

ExtractedField grouped(IgnoreOnGroup ignore, std::string const& value) {
    return field(valueOf(value), ValueType::Plain, ignore);
}

class ExtractedFieldTimes : public testing::Test {
protected:
    void SetUp() override { setZone("Europe/Berlin"); }
    void TearDown() override { setZone("UTC"); }

    static void setZone(char const* zone) {
        setenv("TZ", zone, 1);
        tzset();
    }
};

TEST(IgnoreOnGroupNumbers, AreThoseOfTheWire) {
    std::pair<IgnoreOnGroup, int> const numbers[] = {
        {IgnoreOnGroup::NeverSame, -1}, {IgnoreOnGroup::MustMatch, 0}, {IgnoreOnGroup::Sum, 1},
        {IgnoreOnGroup::Min, 2},        {IgnoreOnGroup::Max, 3},       {IgnoreOnGroup::KeepFirst, 4},
        {IgnoreOnGroup::KeepLast, 5},   {IgnoreOnGroup::Collect, 6},
    };
    for (auto const& [rule, number] : numbers) {
        EXPECT_EQ(static_cast<int>(rule), number);
        EXPECT_EQ(ExtractedField("f", {}, 0, false, rule, ValueType::Plain).ignoreOnCompare(), number > 0)
            << number;
    }
    static_assert(sizeof(IgnoreOnGroup) == 4);
}

TEST(ExtractedFieldStates, AnswerWhetherTheyAreValidatedAndValid) {
    struct {
        ValueType type;
        int number;
        bool validated;
        bool valid;
    } const rows[] = {
        {ValueType::NotValidated, -1, false, false},
        {ValueType::Plain, 0, true, true},
        {ValueType::Time, 1, true, true},
        {ValueType::Invalid, 2, true, false},
    };
    for (auto const& row : rows) {
        EXPECT_EQ(static_cast<int>(row.type), row.number);
        EXPECT_EQ(field("x", row.type).isValidated(), row.validated) << row.number;
        EXPECT_EQ(field("x", row.type).isValid(), row.valid) << row.number;
    }
    static_assert(sizeof(ValueType) == 1);
}

TEST(ExtractedFieldPriorities, TellAddressesFromOrdinaryFields) {
    struct {
        int priority;
        bool address;
        bool recipient;
        bool notification;
    } const rows[] = {{-1, true, false, true}, {0, false, false, false}, {4, true, true, false}};
    for (auto const& row : rows) {
        ExtractedField const f("f", "x", row.priority, false, IgnoreOnGroup::MustMatch, ValueType::Plain);
        EXPECT_EQ(f.priority(), row.priority);
        EXPECT_EQ(f.isAddress(), row.address) << row.priority;
        EXPECT_EQ(f.isRcptAddress(), row.recipient) << row.priority;
        EXPECT_EQ(f.isNotifyAddress(), row.notification) << row.priority;
    }
}

TEST(ExtractedFieldConstruction, StartsNotValidatedWithoutNameOrValue) {
    ExtractedField const f;
    EXPECT_EQ(f.name(), "");
    EXPECT_FALSE(f.rawValue());
    EXPECT_EQ(f.valueType(), ValueType::NotValidated);
    EXPECT_EQ(f.priority(), 0);
    EXPECT_FALSE(f.sendToServer());
    EXPECT_EQ(f.ignoreType(), IgnoreOnGroup::MustMatch);
}

TEST(ExtractedFieldConstruction, TakesEveryMember) {
    ExtractedField const f("fax", "123", 3, true, IgnoreOnGroup::KeepLast, ValueType::Invalid);
    EXPECT_EQ(f.name(), "fax");
    EXPECT_EQ(f.strVal(), "123");
    EXPECT_EQ(f.priority(), 3);
    EXPECT_TRUE(f.sendToServer());
    EXPECT_EQ(f.ignoreType(), IgnoreOnGroup::KeepLast);
    EXPECT_EQ(f.valueType(), ValueType::Invalid);
}

TEST(ExtractedFieldConstruction, SharesTheValueBetweenCopies) {
    ExtractedField const f = field("x");
    ExtractedField copy(f);
    EXPECT_EQ(copy.rawValue().node(), f.rawValue().node());
    ExtractedField assigned;
    assigned = f;
    EXPECT_EQ(assigned.rawValue().node(), f.rawValue().node());
    ExtractedField const moved(std::move(copy));
    EXPECT_EQ(moved.rawValue().node(), f.rawValue().node());
    EXPECT_EQ(moved.name(), "f");
}

TEST(ExtractedFieldReading, NeedsNoKeyButTheName) {
    ExtractedField const f(parse(R"({"name":"ref"})"));
    EXPECT_EQ(f.name(), "ref");
    EXPECT_EQ(f.valueType(), ValueType::Plain);
    EXPECT_FALSE(f.rawValue());
    EXPECT_EQ(f.priority(), 0);
    EXPECT_FALSE(f.sendToServer());
    EXPECT_EQ(f.ignoreType(), IgnoreOnGroup::MustMatch);
}

TEST(ExtractedFieldReading, RefusesAMissingOrNumericName) {
    expectWrongType([] { ExtractedField f(parse("{}")); }, "empty", "string");
    expectWrongType([] { ExtractedField f(parse(R"({"name":5})")); }, "integer", "string");
}

TEST(ExtractedFieldReading, PassesOverKeysOfAnotherType) {
    ExtractedField const f(parse(
        R"({"name":"ref","type":"1","priority":2.5,"send_to_server":"true","ignore_on_group":null,"value":null})"));
    EXPECT_EQ(f.valueType(), ValueType::Plain);
    EXPECT_EQ(f.priority(), 0);
    EXPECT_FALSE(f.sendToServer());
    EXPECT_EQ(f.ignoreType(), IgnoreOnGroup::MustMatch);
    EXPECT_STREQ(f.rawValue().typeName(), "null");
}

TEST(ExtractedFieldReading, CutsNumbersToTheirMembers) {
    ExtractedField const f(
        parse(R"({"name":"ref","type":511,"priority":4294967297,"ignore_on_group":4294967295})"));
    EXPECT_EQ(f.valueType(), ValueType::NotValidated);
    EXPECT_EQ(f.priority(), 1);
    EXPECT_EQ(f.ignoreType(), IgnoreOnGroup::NeverSame);
}

TEST(ExtractedFieldWriting, KeepsTheOrderOfTheKeysAndLeavesOutDefaults) {
    struct {
        ExtractedField field;
        char const* text;
    } const rows[] = {
        {ExtractedField("", {}, 0, false, IgnoreOnGroup::MustMatch, ValueType::Plain), R"({"name":""})"},
        {field("x"), R"({"name":"f","value":"x"})"},
        {field("x", ValueType::NotValidated), R"({"name":"f","type":-1,"value":"x"})"},
        {field(json::Value(json_null())), R"({"name":"f","value":null})"},
        {ExtractedField("f", 5, -2, true, IgnoreOnGroup::Collect, ValueType::Time),
         R"({"name":"f","type":1,"value":5,"priority":-2,"send_to_server":true,"ignore_on_group":6})"},
    };
    for (auto const& row : rows) {
        EXPECT_EQ(print(row.field.serialize()), row.text);
        EXPECT_EQ(print(ExtractedField(row.field.serialize()).serialize()), row.text);
    }
}

TEST(ExtractedFieldValues, AreReadAsTheirTypeOnly) {
    EXPECT_EQ(field("x").strVal(), "x");
    EXPECT_EQ(field(MAX_INT64).intVal(), MAX_INT64);
    EXPECT_EQ(field(7).timeVal(), 7);
    EXPECT_EQ(field(1.5).floatVal(), 1.5);
    expectWrongType([] { field(1).strVal(); }, "integer", "string");
    expectWrongType([] { field("1").intVal(); }, "string", "integer");
    expectWrongType([] { field(1.5).timeVal(); }, "float", "integer");
    expectWrongType([] { field(1).floatVal(); }, "integer", "float");
    expectWrongType([] { field({}).strVal(); }, "empty", "string");
}

TEST(ExtractedFieldValues, ChangeTheStateWhenTheyAreFoundValid) {
    ExtractedField f = field("1970", ValueType::NotValidated);
    f.setValidValue(5, true);
    EXPECT_EQ(f.valueType(), ValueType::Time);
    EXPECT_EQ(f.intVal(), 5);
    f.setValidValue("x", false);
    EXPECT_EQ(f.valueType(), ValueType::Plain);
    EXPECT_EQ(f.strVal(), "x");
}

TEST(ExtractedFieldValues, StayWhenTheyAreFoundInvalid) {
    ExtractedField f = field("x", ValueType::NotValidated);
    f.setInvalid();
    EXPECT_EQ(f.valueType(), ValueType::Invalid);
    EXPECT_EQ(f.strVal(), "x");
}

TEST(ExtractedFieldText, FollowsStateAndJsonType) {
    struct {
        ValueType type;
        char const* value;
        char const* text;
    } const rows[] = {
        {ValueType::Plain, "", ""},
        {ValueType::Plain, R"("a \"b\"")", R"(a "b")"},
        {ValueType::Plain, "5", "5"},
        {ValueType::Plain, "2.5", "2.5"},
        {ValueType::Plain, "true", "true"},
        {ValueType::Plain, "null", "null"},
        {ValueType::Plain, "[]", "[]"},
        {ValueType::Plain, R"(["a",1])", R"(["a",1])"},
        {ValueType::Plain, R"({"$date":0})", R"({"$date":0})"},
        {ValueType::Plain, R"([{"$date":0,"b":1}])", R"([{"$date":0,"b":1}])"},
        {ValueType::Plain, R"([{"date":0}])", R"([{"date":0}])"},
        {ValueType::NotValidated, R"("raw")", "raw"},
        {ValueType::NotValidated, "5", ""},
        {ValueType::Invalid, R"("raw")", "raw"},
        {ValueType::Invalid, "[1]", ""},
        {ValueType::Invalid, "", ""},
    };
    for (auto const& row : rows)
        EXPECT_EQ(field(valueOf(row.value), row.type).valueToStr(), row.text) << row.value;
}

TEST_F(ExtractedFieldTimes, AreShownInLocalTime) {
    EXPECT_EQ(ExtractedField::timeToStr(0), "1970/01/01 01:00:00");
    EXPECT_EQ(ExtractedField::timeToStr(-3600), "1970/01/01 00:00:00");
    EXPECT_EQ(ExtractedField::timeToStr(MAX_INT64), "");
    EXPECT_EQ(field(1500000000, ValueType::Time).valueToStr(), "2017/07/14 04:40:00");
    expectWrongType([] { field(json::Array(), ValueType::Time).valueToStr(); }, "array", "integer");
}

TEST_F(ExtractedFieldTimes, AreListedAfterGrouping) {
    std::pair<char const*, char const*> const rows[] = {
        {R"([{"$date":1999}])", R"(["1970/01/01 01:00:01"])"},
        {R"([{"$date":-1999}])", R"(["1970/01/01 00:59:59"])"},
        {R"([{"$date":0},{"$date":1500000000000}])", R"(["1970/01/01 01:00:00","2017/07/14 04:40:00"])"},
        {R"([{"$date":2000.0},{"b":1}])", R"(["1970/01/01 01:00:02","1970/01/01 01:00:00"])"},
        {R"([{"$date":1e300}])", R"(["1970/01/01 01:00:00"])"},
    };
    for (auto const& [value, text] : rows)
        EXPECT_EQ(field(valueOf(value)).valueToStr(), text) << value;
    expectWrongType([] { field(valueOf(R"([{"$date":0},5])")).valueToStr(); }, "integer", "object");
}

TEST(ExtractedFieldComparison, GoesByStateNameAndValue) {
    ExtractedField const f("f", "x", 1, true, IgnoreOnGroup::Sum, ValueType::Plain);
    EXPECT_TRUE(f.sameAs(ExtractedField("f", "x", 0, false, IgnoreOnGroup::MustMatch, ValueType::Plain)));
    EXPECT_FALSE(f.sameAs(ExtractedField("g", "x", 1, true, IgnoreOnGroup::Sum, ValueType::Plain)));
    EXPECT_FALSE(f.sameAs(ExtractedField("f", "y", 1, true, IgnoreOnGroup::Sum, ValueType::Plain)));
    EXPECT_FALSE(f.sameAs(ExtractedField("f", "x", 1, true, IgnoreOnGroup::Sum, ValueType::NotValidated)));
    EXPECT_TRUE(field({}).sameAs(field({})));
    EXPECT_FALSE(field({}).sameAs(field(json::Value(json_null()))));
    EXPECT_FALSE(field(1).sameAs(field(1.0)));
}

TEST(ExtractedFieldComparison, IsNeverTrueForNeverSame) {
    ExtractedField const never = field("x", ValueType::Plain, IgnoreOnGroup::NeverSame);
    EXPECT_FALSE(never.sameAs(never));
    EXPECT_FALSE(never.sameAs(field("x")));
    EXPECT_FALSE(field("x").sameAs(never));
}

TEST(ExtractedFieldSorting, ComparesAsThisFieldWants) {
    struct {
        ValueType type;
        char const* value;
        ValueType otherType;
        char const* other;
        int sign;
    } const rows[] = {
        {ValueType::Time, "5", ValueType::Plain, "7", -1},
        {ValueType::Time, "7", ValueType::Time, "7", 0},
        {ValueType::Time, "9", ValueType::Invalid, "7", 1},
        {ValueType::Plain, R"("a")", ValueType::NotValidated, R"("ab")", -1},
        {ValueType::Plain, R"("a")", ValueType::Plain, "5", 1},
        {ValueType::Plain, R"("")", ValueType::Plain, "", 0},
        {ValueType::Plain, R"("é")", ValueType::Plain, R"("z")", 1},
        {ValueType::Plain, "-1", ValueType::Plain, R"("x")", -1},
        {ValueType::Plain, "10", ValueType::Plain, "9", 1},
        {ValueType::Plain, "1", ValueType::Plain, "5.5", 1},
        {ValueType::Plain, "1.5", ValueType::Plain, "2", -1},
        {ValueType::Plain, "1.5", ValueType::Plain, "1.5", 0},
        {ValueType::Plain, "1.5", ValueType::Plain, "true", 1},
        {ValueType::Plain, "", ValueType::Plain, "", 0},
        {ValueType::Plain, "", ValueType::Plain, R"("a")", 1},
        {ValueType::Plain, "false", ValueType::Plain, "true", -1},
        {ValueType::Plain, "[2]", ValueType::Plain, "[10]", 1},
        {ValueType::Invalid, "9", ValueType::Plain, "10", 1},
        {ValueType::NotValidated, R"("a")", ValueType::Plain, R"("b")", -1},
    };
    for (auto const& row : rows)
        EXPECT_EQ(field(valueOf(row.value), row.type).cmpSort(field(valueOf(row.other), row.otherType)),
                  row.sign)
            << row.value << " against " << row.other;
}

TEST(ExtractedFieldSorting, WantsIntegersOfDates) {
    ExtractedField const date = field(5, ValueType::Time);
    expectWrongType([&] { date.cmpSort(field("x")); }, "string", "integer");
    expectWrongType([&] { field("x", ValueType::Time).cmpSort(date); }, "string", "integer");
    EXPECT_EQ(field("x").cmpSort(date), 1);
}

TEST(ExtractedFieldGrouping, MergesByRuleAndJsonType) {
    struct {
        char const* value;
        char const* other;
        char const* sum;
        char const* min;
        char const* max;
    } const rows[] = {
        {R"("a")", R"("b")", R"("ab")", R"("a")", R"("b")"},
        {R"("b")", R"("ab")", R"("bab")", R"("ab")", R"("b")"},
        {R"("é")", R"("z")", R"("éz")", R"("z")", R"("é")"},
        {"2", "3", "5", "2", "3"},
        {"9223372036854775807", "1", "-9223372036854775808", "1", "9223372036854775807"},
        {"1.5", "2.5", "2.0", "1.0", "1.0"},
        {"1.5", "7", "1.0", "0.0", "1.0"},
        {"1.5", R"("x")", "1.0", "0.0", "1.0"},
        {"1.5", "", "1.0", "0.0", "1.0"},
        {"true", "false", "true", "false", "true"},
        {"false", "false", "false", "false", "false"},
        {"true", "true", "true", "true", "true"},
    };
    for (auto const& row : rows) {
        std::pair<IgnoreOnGroup, char const*> const rules[] = {
            {IgnoreOnGroup::Sum, row.sum}, {IgnoreOnGroup::Min, row.min}, {IgnoreOnGroup::Max, row.max}};
        for (auto const& [rule, merged] : rules) {
            ExtractedField f = grouped(rule, row.value);
            f.combineOnGroup(field(valueOf(row.other)));
            EXPECT_EQ(f.rawValue(), valueOf(merged))
                << row.value << " and " << row.other << " by " << static_cast<int>(rule) << " give "
                << print(f.rawValue());
        }
    }
}

TEST(ExtractedFieldGrouping, RefusesValuesOfDifferentTypes) {
    struct {
        char const* value;
        char const* other;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {R"("a")", "1", "integer", "string"}, {R"("a")", "", "empty", "string"},
        {"1", R"("a")", "string", "integer"}, {"1", "1.5", "float", "integer"},
        {"true", "1", "integer", "boolean"},  {"false", "null", "null", "boolean"},
    };
    for (auto const& row : rows) {
        for (IgnoreOnGroup const rule : {IgnoreOnGroup::Sum, IgnoreOnGroup::Min, IgnoreOnGroup::Max}) {
            ExtractedField f = grouped(rule, row.value);
            expectWrongType([&] { f.combineOnGroup(field(valueOf(row.other))); }, row.actual, row.wanted);
            EXPECT_EQ(f.rawValue(), valueOf(row.value));
            EXPECT_TRUE(f.isValid());
        }
    }
}

TEST(ExtractedFieldGrouping, RefusesWhatIsNoPrimitiveValue) {
    struct {
        char const* value;
        char const* other;
        char const* message;
    } const rows[] = {
        {"", R"("a")", R"(Grouping fields failed (not primitive type), arg1 is #absent#, arg2 is "a")"},
        {R"({"a":1})", "2", R"(Grouping fields failed (not primitive type), arg1 is {"a":1}, arg2 is 2)"},
        {"[1]", "[2]", "Grouping fields failed (not primitive type), arg1 is [1], arg2 is [2]"},
        {"null", "", "Grouping fields failed (not primitive type), arg1 is null, arg2 is #absent#"},
    };
    for (auto const& row : rows) {
        for (IgnoreOnGroup const rule : {IgnoreOnGroup::Sum, IgnoreOnGroup::Min, IgnoreOnGroup::Max}) {
            ExtractedField f = grouped(rule, row.value);
            expectFailure<json::Exc>([&] { f.combineOnGroup(field(valueOf(row.other))); }, row.message);
            EXPECT_EQ(f.rawValue(), valueOf(row.value));
        }
    }
}

TEST(ExtractedFieldGrouping, LeavesTheValueAloneForOtherRules) {
    for (int const rule : {-1, 0, 4, 7}) {
        ExtractedField f = grouped(IgnoreOnGroup{rule}, R"("a")");
        f.combineOnGroup(field("b"));
        EXPECT_EQ(f.strVal(), "a") << rule;
    }
}

TEST(ExtractedFieldGrouping, KeepsTheLastValueShared) {
    ExtractedField f = grouped(IgnoreOnGroup::KeepLast, R"("a")");
    ExtractedField const other("g", 5, 1, true, IgnoreOnGroup::Sum, ValueType::Time);
    f.combineOnGroup(other);
    EXPECT_EQ(f.rawValue().node(), other.rawValue().node());
    EXPECT_EQ(f.name(), "f");
    EXPECT_EQ(f.valueType(), ValueType::Plain);
}

TEST(ExtractedFieldGrouping, TurnsASumInvalidForGood) {
    for (ValueType const bad : {ValueType::NotValidated, ValueType::Invalid}) {
        ExtractedField f = grouped(IgnoreOnGroup::Sum, "2");
        f.combineOnGroup(field("x", bad));
        EXPECT_EQ(f.valueType(), ValueType::Invalid);
        EXPECT_EQ(f.intVal(), 2);
        f.combineOnGroup(field(3));
        EXPECT_EQ(f.valueType(), ValueType::Invalid);
        EXPECT_EQ(f.intVal(), 2);
    }
}

TEST(ExtractedFieldGrouping, PassesOverInvalidValuesForOtherRules) {
    for (int const rule : {-1, 0, 2, 3, 4, 5, 6}) {
        ExtractedField f = grouped(IgnoreOnGroup{rule}, R"("a")");
        f.combineOnGroup(field("x", ValueType::Invalid));
        EXPECT_EQ(f.valueType(), ValueType::Plain) << rule;
        EXPECT_EQ(f.strVal(), "a") << rule;
    }
}

TEST(ExtractedFieldGrouping, TakesOverAValidFieldWholeWhenItIsNotValid) {
    ExtractedField const other("g", 5, 3, true, IgnoreOnGroup::Collect, ValueType::Time);
    for (ValueType const bad : {ValueType::NotValidated, ValueType::Invalid}) {
        for (int const rule : {-1, 0, 2, 3, 4, 5, 6}) {
            ExtractedField f("f", "x", 0, false, IgnoreOnGroup{rule}, bad);
            f.combineOnGroup(other);
            EXPECT_EQ(f.serialize(), other.serialize()) << rule;
        }
    }
}

TEST(ExtractedFieldCollecting, GathersValuesInAnArray) {
    struct {
        char const* value;
        std::vector<char const*> others;
        char const* collected;
    } const rows[] = {
        {R"("a")", {R"("b")", R"("c")"}, R"(["a","b","c"])"},
        {R"("a")", {R"(["b","c"])"}, R"(["a","b","c"])"},
        {"[1]", {"[2,[3]]", "4"}, "[1,2,[3],4]"},
        {"[]", {"[]"}, "[]"},
        {"1", {""}, "[1]"},
        {"", {R"("b")"}, R"(["b"])"},
        {"null", {"null"}, "[null,null]"},
    };
    for (auto const& row : rows) {
        ExtractedField f = grouped(IgnoreOnGroup::Collect, row.value);
        for (char const* other : row.others)
            f.combineOnGroup(field(valueOf(other)));
        EXPECT_EQ(print(f.rawValue()), row.collected);
    }
}

TEST(ExtractedFieldCollecting, GrowsTheArrayThatCopiesShare) {
    ExtractedField f = grouped(IgnoreOnGroup::Collect, R"(["a"])");
    ExtractedField const copy = f;
    f.combineOnGroup(field("b"));
    EXPECT_EQ(print(copy.rawValue()), R"(["a","b"])");
    EXPECT_EQ(copy.rawValue().node(), f.rawValue().node());
}

TEST(ExtractedFieldCollecting, LeavesTheOtherLettersArrayAlone) {
    ExtractedField f = grouped(IgnoreOnGroup::Collect, R"("a")");
    ExtractedField const other = field(valueOf(R"(["b"])"));
    f.combineOnGroup(other);
    f.combineOnGroup(field("c"));
    EXPECT_EQ(print(f.rawValue()), R"(["a","b","c"])");
    EXPECT_EQ(print(other.rawValue()), R"(["b"])");
}

TEST(ExtractedFieldCollecting, TakesItsOwnElementsOnce) {
    ExtractedField f = grouped(IgnoreOnGroup::Collect, "[1,2]");
    f.combineOnGroup(f);
    EXPECT_EQ(print(f.rawValue()), "[1,2,1,2]");
    f.combineOnGroup(ExtractedField(f));
    EXPECT_EQ(print(f.rawValue()), "[1,2,1,2,1,2,1,2]");
}

TEST(ExtractedFieldCollecting, KeepsTheStateOfADate) {
    ExtractedField f("f", 5, 0, false, IgnoreOnGroup::Collect, ValueType::Time);
    f.combineOnGroup(field(6, ValueType::Time));
    EXPECT_EQ(f.valueType(), ValueType::Time);
    EXPECT_EQ(print(f.rawValue()), "[5,6]");
    expectWrongType([&] { f.valueToStr(); }, "array", "integer");
}

} // namespace
} // namespace Cfg
