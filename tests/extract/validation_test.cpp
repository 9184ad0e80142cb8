#include "vlservice/extract/extract_field.h"

#include "support.h"

#include <boost/regex/pattern_except.hpp>
#include <gmock/gmock.h>

#include <clocale>
#include <cstddef>
#include <cstring>
#include <limits>
#include <locale>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>

namespace Cfg {
namespace {

using testing::StrEq;
using testing::ThrowsMessage;
using Validation = ExtractField::Validation;
using ValueType = ExtractedField::ValueType;

constexpr long long MAX_INT64 = std::numeric_limits<long long>::max();
constexpr long long MIN_INT64 = std::numeric_limits<long long>::min();
constexpr double MAX_DOUBLE = std::numeric_limits<double>::max();

constexpr char const* NOT_UTF8 = "Invalid UTF-8 sequence encountered while trying to encode UTF-32 character";

ExtractField integers(std::string const& keys = "") {
    return definition(R"("value_type":1)" + (keys.empty() ? "" : "," + keys));
}

ExtractField reals(std::string const& keys = "") {
    return definition(R"("value_type":2)" + (keys.empty() ? "" : "," + keys));
}

ExtractField dates(std::string const& keys = "") {
    return definition(R"("value_type":3)" + (keys.empty() ? "" : "," + keys));
}

/// Dates by a pattern of the user's own.
ExtractField datesBy(char const* pattern) {
    return ExtractField(json::Object{{"name", "f"}, {"value_type", 3}, {"value_match", pattern}});
}

/// The validator's own keys, as the definition writes them.
std::string written(ExtractField const& field) {
    json::Object kept;
    for (auto const& [key, value] : field.serialize())
        if (std::string(key).starts_with("value_") || std::string(key) == "default_value")
            kept.set(key, value);
    return print(kept);
}

std::string defaultOf(ExtractField const& field) {
    auto const* const value = field.validation().defaultValue();
    return value ? print(value->serialize()) : "none";
}

TEST(FieldValueTypeNumbers, AreThoseOfTheWire) {
    EXPECT_EQ(static_cast<int>(FieldValueType::String), 0);
    EXPECT_EQ(static_cast<int>(FieldValueType::Integer), 1);
    EXPECT_EQ(static_cast<int>(FieldValueType::Float), 2);
    EXPECT_EQ(static_cast<int>(FieldValueType::Date), 3);
    static_assert(std::is_same_v<std::underlying_type_t<FieldValueType>, std::int32_t>);
}

TEST(ValidatorFactory, ChoosesByTheNumberOfTheType) {
    struct {
        char const* keys;
        FieldValueType type;
    } const rows[] = {
        {"", FieldValueType::String},
        {R"("value_type":0)", FieldValueType::String},
        {R"("value_type":1)", FieldValueType::Integer},
        {R"("value_type":2)", FieldValueType::Float},
        {R"("value_type":3)", FieldValueType::Date},
        {R"("value_type":4)", FieldValueType::String},
        {R"("value_type":-1)", FieldValueType::String},
        {R"("value_type":"1")", FieldValueType::String},
        {R"("value_type":2.0)", FieldValueType::String},
        {R"("value_type":4294967297)", FieldValueType::Integer}, // cut to 32 bits
    };
    for (auto const& row : rows)
        EXPECT_EQ(definition(row.keys).validation().valueType(), row.type) << row.keys;
}

TEST(ValidatorFactory, MakesTheClassOfTheType) {
    EXPECT_TRUE(dynamic_cast<ExtractField::ValidateString const*>(&definition("").validation()));
    EXPECT_TRUE(dynamic_cast<ExtractField::ValidateNum<long long> const*>(&integers().validation()));
    EXPECT_TRUE(dynamic_cast<ExtractField::ValidateNum<double> const*>(&reals().validation()));
    EXPECT_TRUE(dynamic_cast<ExtractField::ValidateDate const*>(&dates().validation()));
}

TEST(ValidatorFactory, GivesASingleLetterMarkIntegersWhateverTheTypeSays) {
    EXPECT_EQ(dates(R"("mark":2)").validation().valueType(), FieldValueType::Integer);
    EXPECT_EQ(definition(R"("mark":2)").validation().valueType(), FieldValueType::Integer);
    EXPECT_EQ(dates(R"("mark":1)").validation().valueType(), FieldValueType::Date);
}

TEST(ValidatorCreation, TakesPatternLimitsAndDefault) {
    ExtractField const field = definition("");
    std::unique_ptr<Validation> const made(
        Validation::create(FieldValueType::Integer, R"(\d+)", 3, "1,000", "7", field));
    EXPECT_EQ(made->valueType(), FieldValueType::Integer);
    EXPECT_EQ(made->strRegex(), R"(\d+)");
    EXPECT_EQ(made->minVal(), json::Value(3));
    EXPECT_EQ(made->maxVal(), json::Value(1000));
    ASSERT_TRUE(made->defaultValue());
    EXPECT_EQ(made->defaultValue()->rawValue(), json::Value(7));
}

TEST(ValidatorCreation, TakesEmptyArgumentsAsNone) {
    std::unique_ptr<Validation> const made(
        Validation::create(FieldValueType::Float, "", {}, {}, "", definition("")));
    EXPECT_EQ(made->strRegex(), R"(\A[\+\-]?[\d,\s]+\.?\d*\z)");
    EXPECT_FALSE(made->minVal());
    EXPECT_FALSE(made->maxVal());
    EXPECT_FALSE(made->defaultValue());
}

TEST(ValidatorCreation, ObeysTheMarkOfTheField) {
    ExtractField field;
    field.setMark(LetterSeparatorMark::SingleLetter);
    std::unique_ptr<Validation> const made(Validation::create(FieldValueType::Date, "", {}, {}, "5", field));
    EXPECT_EQ(made->valueType(), FieldValueType::Integer);
    EXPECT_EQ(made->defaultValue()->intVal(), 5);
}

TEST(ValidatorCreation, FromADefaultAloneMakesATextValidator) {
    std::unique_ptr<Validation> const made(Validation::create("EUR", definition("")));
    EXPECT_EQ(made->valueType(), FieldValueType::String);
    EXPECT_EQ(made->defaultValue()->strVal(), "EUR");
}

TEST(ValidatorCreation, FromADefaultThatIsEmptyFails) {
    EXPECT_THAT(
        [] { Validation::create(json::Value(), definition("")); },
        ThrowsMessage<json::Exc>(StrEq("JSON error: object element can not be set. Key: default_value. "
                                       "New value type: empty")));
}

TEST(TextValidation, AcceptsEveryTextWithoutAPattern) {
    for (char const* const text : {"", "x", "\n", "grüß Gott", "1,234"})
        EXPECT_EQ(validate(definition(""), text), plain(text));
}

TEST(TextValidation, NeedsThePatternToSpanTheWholeText) {
    auto const field = definition(R"("value_match":"\\d{3}")");
    EXPECT_EQ(validate(field, "123"), plain("123"));
    for (char const* const text : {"12", "1234", " 123", "123\n", ""})
        EXPECT_EQ(validate(field, text), invalid(text));
}

TEST(TextValidation, CountsCodePointsAndKeepsTheDotOnItsLine) {
    auto const three = definition(R"("value_match":".{3}")");
    EXPECT_EQ(validate(three, "äöü"), plain("äöü"));
    EXPECT_EQ(validate(three, "a\nb"), invalid("a\nb"));
    EXPECT_EQ(validate(three, "a\rb"), invalid("a\rb"));
}

TEST(TextValidation, KeepsTheTextAndItsHandle) {
    json::Value const text = "x";
    ExtractedField value = rawValue(text);
    definition("").validate(value);
    EXPECT_EQ(value.rawValue().node(), text.node());
}

TEST(IntegerValidation, ReadsWhatItsDefaultPatternAccepts) {
    struct {
        char const* text;
        Typed typed;
    } const rows[] = {
        {"0", plain(0)},
        {"1,234", plain(1234)},
        {"1 234", plain(1234)},
        {"+5", plain(5)},
        {"-5", plain(-5)},
        {"5-", invalid("5-")},
        {"", invalid("")},
        {"+", invalid("+")},
        {"1.5", invalid("1.5")},
        {"x", invalid("x")},
        {"0x10", invalid("0x10")},
        {"007", plain(7)},
        {"1\t234", plain(1)}, // a tab ends the number
        {"1\n2", plain(1)},
        {"\t12", plain(12)},
        {"1234567890123456789", plain(1234567890123456789)},
        {"9999999999999999999", plain(MAX_INT64)},
        {"-9999999999999999999", plain(MIN_INT64)},
        {"12345678901234567890", invalid("12345678901234567890")}, // 20 digits
        {"1,234,567,890,123,456", invalid("1,234,567,890,123,456")},
        {" ", plain(MIN_INT64)},
        {",", plain(MIN_INT64)},
        {"-,", plain(MIN_INT64)},
        {"\t", plain(MIN_INT64)},
        {"٣", plain(MIN_INT64)}, // a digit for the pattern, not for the number
    };
    for (auto const& row : rows)
        EXPECT_EQ(validate(integers(), row.text), row.typed) << '"' << row.text << '"';
}

TEST(IntegerValidation, ReadsTheNumberInFrontOfWhatAPatternLetsIn) {
    auto const anything = integers(R"("value_match":".*")");
    EXPECT_EQ(validate(anything, "12 EUR 5"), plain(12));
    EXPECT_EQ(validate(anything, "1 2 3 pages"), plain(123));
    EXPECT_EQ(validate(anything, "EUR 12"), plain(MIN_INT64));
    EXPECT_EQ(validate(anything, "0x10"), plain(0));
    EXPECT_EQ(validate(anything, "1.9"), plain(1));
    EXPECT_EQ(validate(anything, "+-5"), plain(MIN_INT64));
    EXPECT_EQ(validate(anything, ""), plain(MIN_INT64));
}

TEST(RealValidation, ReadsWhatItsDefaultPatternAccepts) {
    struct {
        char const* text;
        Typed typed;
    } const rows[] = {
        {"0", plain(0.0)},           {"1 234.50", plain(1234.5)}, {"1,234.5", plain(1234.5)},
        {"+5", plain(5.0)},          {"-5.25", plain(-5.25)},     {"5.", plain(5.0)},
        {".5", invalid(".5")},       {"1.2.3", invalid("1.2.3")}, {"1e5", invalid("1e5")},
        {"5-", invalid("5-")},       {"", invalid("")},           {"1\t2.5", plain(1.0)},
        {" , ", plain(-MAX_DOUBLE)},
    };
    for (auto const& row : rows)
        EXPECT_EQ(validate(reals(), row.text), row.typed) << '"' << row.text << '"';
}

TEST(RealValidation, ReadsTheNumberInFrontOfWhatAPatternLetsIn) {
    auto const anything = reals(R"("value_match":".*")");
    EXPECT_EQ(validate(anything, "1e3"), plain(1000.0));
    EXPECT_EQ(validate(anything, "1e999"), plain(MAX_DOUBLE));
    EXPECT_EQ(validate(anything, "-1e999"), plain(-MAX_DOUBLE));
    EXPECT_EQ(validate(anything, "nan"), plain(-MAX_DOUBLE));
    EXPECT_EQ(validate(anything, "inf"), plain(-MAX_DOUBLE));
    EXPECT_EQ(validate(anything, "2.5 kg"), plain(2.5));
    EXPECT_EQ(validate(anything, "2.5 EUR"), plain(-MAX_DOUBLE)); // an exponent without digits
    EXPECT_EQ(validate(anything, "0.0x"), plain(0.0));
}

TEST(NumberValidation, DoesNotDependOnTheLocale) {
    struct German : std::numpunct<char> {
        char do_decimal_point() const override { return ','; }
        char do_thousands_sep() const override { return '.'; }
        std::string do_grouping() const override { return "\3"; }
    };
    auto const before = std::locale::global(std::locale(std::locale::classic(), new German));
    Typed const real = validate(reals(), "1,234.50");
    Typed const integer = validate(integers(R"("value_match":".*")"), "1.234");
    std::locale::global(before);
    EXPECT_EQ(real, plain(1234.5));
    EXPECT_EQ(integer, plain(1));
}

TEST(NumberValidation, HoldsTheNumberAgainstBothLimits) {
    auto const field = integers(R"("value_min":-2,"value_max":10)");
    EXPECT_EQ(validate(field, "-3"), invalid("-3"));
    EXPECT_EQ(validate(field, "-2"), plain(-2));
    EXPECT_EQ(validate(field, "10"), plain(10));
    EXPECT_EQ(validate(field, "1 1"), invalid("1 1"));
    EXPECT_EQ(validate(field, " "), invalid(" "));
}

TEST(NumberValidation, ReadsLimitsOfEachJsonType) {
    struct {
        char const* value;
        json::Value integer;
        json::Value real;
    } const rows[] = {
        {"1.9", 1, 1.9},
        {"-1.9", -1, -1.9},
        {"3", 3, 3.0},
        {R"("4")", 4, 4.0},
        {R"("1,000")", 1000, 1000.0},
        {R"("1 000")", 1000, 1000.0},
        {R"("12 kg")", 12, 12.0},
        {R"("")", {}, {}},
        {R"(" ")", {}, {}},
        {R"("none")", {}, {}},
        {"true", {}, {}},
        {"null", {}, {}},
        {"[1]", {}, {}},
        {R"({"v":1})", {}, {}},
    };
    for (auto const& row : rows) {
        std::string const limits =
            std::string(R"("value_min":)") + row.value + R"(,"value_max":)" + row.value;
        EXPECT_EQ(integers(limits).validation().minVal(), row.integer) << row.value;
        EXPECT_EQ(integers(limits).validation().maxVal(), row.integer) << row.value;
        EXPECT_EQ(reals(limits).validation().minVal(), row.real) << row.value;
        EXPECT_EQ(reals(limits).validation().maxVal(), row.real) << row.value;
    }
}

TEST(NumberValidation, ClampsARealLimitThatNoIntegerHolds) {
    auto const wide = integers(R"("value_min":-1e30,"value_max":1e30)");
    EXPECT_FALSE(wide.validation().minVal());
    EXPECT_FALSE(wide.validation().maxVal());
    EXPECT_EQ(integers(R"("value_max":-1e30)").validation().maxVal(), json::Value(MIN_INT64));
    EXPECT_EQ(integers(R"("value_min":1e30)").validation().minVal(), json::Value(MAX_INT64));
}

TEST(NumberValidation, TakesALimitAtItsExtremeAsNotSet) {
    auto const integer = integers(R"("value_min":-9223372036854775808,"value_max":9223372036854775807)");
    EXPECT_FALSE(integer.validation().minVal());
    EXPECT_FALSE(integer.validation().maxVal());
    auto const real = reals(R"("value_min":-1.7976931348623157e308,"value_max":1.7976931348623157e308)");
    EXPECT_FALSE(real.validation().minVal());
    EXPECT_FALSE(real.validation().maxVal());
}

TEST(NumberValidation, ReadsDefaultsOfEachJsonType) {
    struct {
        char const* value;
        char const* integer;
        char const* real;
    } const rows[] = {
        {"1.9", R"({"name":"f","value":1})", R"({"name":"f","value":1.9})"},
        {"3", R"({"name":"f","value":3})", R"({"name":"f","value":3.0})"},
        {R"("1,000")", R"({"name":"f","value":1000})", R"({"name":"f","value":1000.0})"},
        {R"("")", "none", "none"},
        {R"("none")", "none", "none"},
        {R"("-")", "none", "none"},
        {"true", "none", "none"},
        {"null", "none", "none"},
    };
    for (auto const& row : rows) {
        std::string const key = std::string(R"("default_value":)") + row.value;
        EXPECT_EQ(defaultOf(integers(key)), row.integer) << row.value;
        EXPECT_EQ(defaultOf(reals(key)), row.real) << row.value;
    }
}

TEST(NumberValidation, HasNoDefaultThatIsTheLowestValue) {
    EXPECT_EQ(defaultOf(integers(R"("default_value":-9223372036854775808)")), "none");
    EXPECT_EQ(defaultOf(integers(R"("default_value":-1e30)")), "none");
    EXPECT_EQ(defaultOf(reals(R"("default_value":-1.7976931348623157e308)")), "none");
}

TEST(NumberValidation, DoesNotHoldTheDefaultAgainstTheLimits) {
    EXPECT_EQ(defaultOf(integers(R"("value_min":10,"default_value":1)")), R"({"name":"f","value":1})");
}

class DateValidation : public testing::Test {
    VLServiceTest::TimeZone zone_{"UTC"};
};

TEST_F(DateValidation, ReadsWhatItsDefaultPatternAccepts) {
    struct {
        char const* text;
        Typed typed;
    } const rows[] = {
        {"05/03/21", date(utc(2021, 3, 5))},
        {"5/3/2021", date(utc(2021, 3, 5))},
        {"5/3/98", date(utc(2098, 3, 5))},
        {"5/3/099", date(utc(2099, 3, 5))},
        {"5/3/100", date(-1)},
        {"5/3/2021 2:30 pm", date(utc(2021, 3, 5, 14, 30))},
        {"5/3/2021 2:30pm", date(utc(2021, 3, 5, 14, 30))},
        {"5/3/2021 2:30 AM", date(utc(2021, 3, 5, 2, 30))},
        {"5/3/2021 12:15 am", date(utc(2021, 3, 5, 0, 15))},
        {"5/3/2021 12:15 PM", date(utc(2021, 3, 5, 12, 15))},
        {"5/3/2021 14:30", date(utc(2021, 3, 5, 14, 30))},
        {"5/3/2021 0:15", date(utc(2021, 3, 5, 0, 15))},
        {"5/3/2021 14:30:59", date(utc(2021, 3, 5, 14, 30, 59))},
        {"5/3/2021 0:15 pm", invalid("5/3/2021 0:15 pm")},
        {"5/3/2021 13:15 PM", invalid("5/3/2021 13:15 PM")},
        {"5/3/2021 2:30 Pm", invalid("5/3/2021 2:30 Pm")},
        {"00/03/2021", date(utc(2021, 2, 28))},
        {"31/02/2021", date(utc(2021, 3, 3))},
        {"5/00/2021", invalid("5/00/2021")},
        {"5/13/2021", date(utc(2022, 1, 5))},
        {"5/3/2021 25:61:61", date(utc(2021, 3, 6, 2, 2, 1))},
        {"5/3", date(-1)},
        {"5/3 10:00", date(-1)},
        {"31/12/1969", date(-1)},
        {"01/01/1970", date(0)},
        {"29/02/2400", date(utc(2400, 2, 29))},
        {"5/3/2", invalid("5/3/2")},
        {"5/3/20211", invalid("5/3/20211")},
        {"5.3.2021", invalid("5.3.2021")},
        {" 5/3/2021", invalid(" 5/3/2021")},
        {"5/3/2021\n", invalid("5/3/2021\n")},
        {"", invalid("")},
    };
    for (auto const& row : rows)
        EXPECT_EQ(validate(dates(), row.text), row.typed) << '"' << row.text << '"';
}

TEST_F(DateValidation, KnowsTheMonthsByName) {
    char const* const names[][2] = {
        {"january", "jan"},   {"february", "feb"}, {"march", "mar"},    {"april", "apr"},
        {"may", "may"},       {"june", "jun"},     {"july", "jul"},     {"august", "aug"},
        {"september", "sep"}, {"october", "oct"},  {"november", "nov"}, {"december", "dec"},
    };
    auto const field = datesBy(R"re((?<day>\d+) (?<month>\w+) (?<year>\d+))re");
    for (int month = 1; month <= 12; ++month)
        for (char const* const name : names[month - 1])
            EXPECT_EQ(validate(field, "7 " + std::string(name) + " 2022"), date(utc(2022, month, 7))) << name;
}

TEST_F(DateValidation, ReadsMonthsWithoutRegardToCaseAndByLength) {
    auto const field = datesBy(R"re((?<day>\d+) (?<month>\w+) (?<year>\d+))re");
    EXPECT_EQ(validate(field, "1 Mar 2021"), date(utc(2021, 3, 1)));
    EXPECT_EQ(validate(field, "1 MARCH 2021"), date(utc(2021, 3, 1)));
    EXPECT_EQ(validate(field, "1 3 2021"), date(utc(2021, 3, 1)));
    EXPECT_EQ(validate(field, "1 Sept 2021"), invalid("1 Sept 2021"));
    EXPECT_EQ(validate(field, "1 003 2021"), invalid("1 003 2021"));
    EXPECT_EQ(validate(field, "1 März 2021"), invalid("1 März 2021"));
    // Two bytes that are no number: one month before the year's first, less one.
    EXPECT_EQ(validate(field, "1 ma 2021"), date(utc(2020, 11, 1)));
}

TEST_F(DateValidation, TakesTheGroupsInAnyOrderAndWithAnyMissing) {
    struct {
        char const* pattern;
        char const* text;
        Typed typed;
    } const rows[] = {
        {R"re((?<year>\d+)-(?<month>\d+)-(?<day>\d+))re", "2021-03-05", date(utc(2021, 3, 5))},
        {R"re((?<year>\d+))re", "2021", date(utc(2021, 1, 1))},
        {R"re((?<month>\w+) (?<year>\d+))re", "May 21", date(utc(2021, 5, 1))},
        {R"re((?<day>\d+)\.(?<year>\d+))re", "32.2021", date(utc(2021, 2, 1))},
        {"today", "today", date(-1)},
        {R"re((?<year>\d+) (?<min>\d+) (?<sec>\d+))re", "2021 90 90", date(utc(2021, 1, 1, 1, 31, 30))},
        // A group that took no part leaves its place as it is.
        {R"re((?<year>\d+)(x(?<month>\d+))?)re", "2021", date(utc(2021, 1, 1))},
    };
    for (auto const& row : rows)
        EXPECT_EQ(validate(datesBy(row.pattern), row.text), row.typed) << row.pattern;
}

TEST_F(DateValidation, ReadsGroupsThatAreNoNumbers) {
    auto const field = datesBy(
        R"re((?<year>[^;]*);(?<month>[^;]*);(?<day>[^;]*);(?<hour>[^;]*);(?<min>[^;]*);(?<sec>[^;]*))re");
    EXPECT_EQ(validate(field, "x;1;1;0;0;0"), invalid("x;1;1;0;0;0"));
    EXPECT_EQ(validate(field, ";1;1;0;0;0"), invalid(";1;1;0;0;0"));
    EXPECT_EQ(validate(field, "-1;1;1;0;0;0"), invalid("-1;1;1;0;0;0"));
    EXPECT_EQ(validate(field, "2021;1;x;0;0;0"), date(utc(2020, 12, 30)));
    EXPECT_EQ(validate(field, "2021;1;1;x;0;0"), date(utc(2020, 12, 31, 23)));
    EXPECT_EQ(validate(field, "2021;1;1;0;x;0"), date(utc(2020, 12, 31, 23, 59)));
    EXPECT_EQ(validate(field, "2021;1;1;0;0;x"), date(utc(2020, 12, 31, 23, 59, 59)));
    EXPECT_EQ(validate(field, "2021;1; 7th;0;0;0"), date(utc(2021, 1, 7)));
}

TEST_F(DateValidation, SurvivesNumbersBeyondThirtyTwoBits) {
    auto const field =
        datesBy(R"re((?<year>[^;]*);(?<month>[^;]*);(?<day>[^;]*);(?<hour>[^; ]*)( (?<ampm>.*))?)re");
    EXPECT_EQ(validate(field, "-99999999999;1;1;0"), date(-1));
    EXPECT_EQ(validate(field, "2021;-9;1;0"), date(utc(2020, 3, 1)));
    EXPECT_EQ(validate(field, "2021;1;-99999999999;0"), date(-1));
    EXPECT_EQ(validate(field, "2021;1;1;99999999999 pm"), invalid("2021;1;1;99999999999 pm"));
    EXPECT_EQ(validate(field, "1970;1;1;-99999999999 pm"), date(-1));
    // Far beyond any calendar, but a time.
    EXPECT_EQ(validate(field, "99999999999;1;1;0").state, ValueType::Time);
}

TEST_F(DateValidation, CountsAnythingButAmAsTheAfternoon) {
    auto const field = datesBy(R"re((?<year>\d+) (?<hour>\S+) (?<ampm>.*))re");
    EXPECT_EQ(validate(field, "2021 2 Am"), date(utc(2021, 1, 1, 2)));
    EXPECT_EQ(validate(field, "2021 2 a.m."), date(utc(2021, 1, 1, 14)));
    EXPECT_EQ(validate(field, "2021 2 "), date(utc(2021, 1, 1, 14)));
    EXPECT_EQ(validate(field, "2021 12 noon"), date(utc(2021, 1, 1, 12)));
    EXPECT_EQ(validate(field, "2021 x pm"), date(utc(2021, 1, 1, 11)));
    EXPECT_EQ(validate(datesBy(R"re((?<year>\d+)(?<ampm>am))re"), "2021am"), invalid("2021am"));
}

TEST_F(DateValidation, HoldsTheDateAgainstLimitsOfEachJsonType) {
    auto const texts = dates(R"("value_min":"01/01/2020","value_max":"31/12/2020")");
    EXPECT_EQ(texts.validation().minVal(), json::Value(utc(2020, 1, 1)));
    EXPECT_EQ(texts.validation().maxVal(), json::Value(utc(2020, 12, 31)));
    EXPECT_EQ(validate(texts, "31/12/2019"), invalid("31/12/2019"));
    EXPECT_EQ(validate(texts, "01/01/2020"), date(utc(2020, 1, 1)));
    EXPECT_EQ(validate(texts, "31/12/2020"), date(utc(2020, 12, 31)));
    EXPECT_EQ(validate(texts, "31/12/2020 0:00:01"), invalid("31/12/2020 0:00:01"));

    auto const seconds = dates(R"("value_min":0,"value_max":86400)");
    EXPECT_EQ(seconds.validation().minVal(), json::Value(0));
    EXPECT_EQ(validate(seconds, "5/3"), invalid("5/3"));
    EXPECT_EQ(validate(seconds, "02/01/1970"), date(86400));

    for (char const* const ignored : {"1.5", "true", "null", R"("")", R"("soon")"}) {
        auto const none = dates(std::string(R"("value_min":)") + ignored + R"(,"value_max":)" + ignored);
        EXPECT_FALSE(none.validation().minVal()) << ignored;
        EXPECT_FALSE(none.validation().maxVal()) << ignored;
    }
}

TEST_F(DateValidation, ReadsDefaultsOfEachJsonType) {
    EXPECT_EQ(defaultOf(dates(R"("default_value":"05/03/2021")")),
              R"({"name":"f","type":1,"value":)" + std::to_string(utc(2021, 3, 5)) + "}");
    EXPECT_EQ(defaultOf(dates(R"("default_value":86400)")), R"({"name":"f","type":1,"value":86400})");
    for (char const* const ignored : {"1.5", "true", "null", R"("")", R"("soon")", "-9223372036854775808"})
        EXPECT_EQ(defaultOf(dates(std::string(R"("default_value":)") + ignored)), "none") << ignored;
}

TEST_F(DateValidation, ReadsLimitsAndDefaultByItsOwnPattern) {
    auto const field =
        dates(R"("value_match":"(?<year>\\d+)?","value_min":"2020","value_max":"","default_value":"2021")");
    EXPECT_EQ(field.validation().minVal(), json::Value(utc(2020, 1, 1)));
    EXPECT_FALSE(field.validation().maxVal()); // empty, though the pattern fits
    EXPECT_EQ(field.validation().defaultValue()->timeVal(), utc(2021, 1, 1));
}

TEST(DateValidationInBerlin, CountsTheStandardOffset) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    EXPECT_EQ(validate(dates(), "05/03/21"), date(utc(2021, 3, 4, 23)));
    EXPECT_EQ(validate(dates(), "05/07/21"), date(utc(2021, 7, 4, 23)));
}

TEST(TextDefault, IsBuiltFromATextThatIsNotEmpty) {
    EXPECT_EQ(defaultOf(definition(R"("default_value":"EUR")")), R"({"name":"f","value":"EUR"})");
    for (char const* const none : {R"("")", "1", "1.5", "true", "null", "[]"})
        EXPECT_EQ(defaultOf(definition(std::string(R"("default_value":)") + none)), "none") << none;
}

TEST(DefaultValue, TakesOverWhatGroupingAndSendingNeed) {
    auto const field =
        definition(R"("priority":-3,"send_to_server":true,"ignore_on_group":5,"default_value":"x","mark":1)");
    EXPECT_EQ(defaultOf(field),
              R"({"name":"f","value":"x","priority":-3,"send_to_server":true,"ignore_on_group":5})");
}

TEST(DefaultValue, IsNotBuiltForARecipientAddress) {
    for (char const* const type : {"0", "1", "2", "3"}) {
        auto const field =
            definition(std::string(R"("priority":1,"default_value":"5","value_type":)") + type);
        EXPECT_EQ(defaultOf(field), "none") << type;
        EXPECT_FALSE(field.serialize().get("default_value")) << type;
    }
}

TEST(DefaultValue, IsNotBuiltForANewFieldOfPositivePriority) {
    ExtractField field;
    field.setPriority(1);
    std::unique_ptr<Validation> const made(Validation::create("x", field));
    EXPECT_FALSE(made->defaultValue());
}

TEST(ValidatorWriting, WritesKeysInOrderAndLeavesOutDefaults) {
    VLServiceTest::TimeZone const zone("UTC");
    struct {
        char const* keys;
        char const* written;
    } const rows[] = {
        {"", "{}"},
        {R"("value_match":"x","value_min":1,"value_max":2,"value_type":7)", R"({"value_match":"x"})"},
        {R"("default_value":"d","value_match":"x")", R"({"value_match":"x","default_value":"d"})"},
        {R"("value_type":1)", R"({"value_type":1})"},
        {R"("value_type":1,"value_match":"\\A[\\+\\-]?[\\d,\\s]{1,19}\\z")", R"({"value_type":1})"},
        {R"("value_type":2,"value_match":"\\A[\\+\\-]?[\\d,\\s]{1,19}\\z")",
         R"({"value_match":"\\A[\\+\\-]?[\\d,\\s]{1,19}\\z","value_type":2})"},
        {R"("value_type":2)", R"({"value_type":2})"},
        {R"("value_type":3)", R"({"value_type":3})"},
        {R"("value_type":1,"default_value":"9","value_max":"1,000","value_min":"-5","value_match":"\\d+")",
         R"({"value_match":"\\d+","value_type":1,"value_min":-5,"value_max":1000,"default_value":9})"},
        {R"("value_type":2,"default_value":9,"value_max":2,"value_min":-0.5)",
         R"({"value_type":2,"value_min":-0.5,"value_max":2.0,"default_value":9.0})"},
        {R"("value_type":3,"default_value":"02/01/1970","value_max":"03/01/1970","value_min":0)",
         R"({"value_type":3,"value_min":0,"value_max":172800,"default_value":86400})"},
        {R"("mark":2,"value_type":3,"default_value":0)", R"({"value_type":1,"default_value":0})"},
    };
    for (auto const& row : rows)
        EXPECT_EQ(written(definition(row.keys)), row.written) << row.keys;
}

/// The place of a virtual operation in its class's table.
template<typename Operation>
std::ptrdiff_t slotOf(Operation operation) {
    std::ptrdiff_t parts[2];
    static_assert(sizeof operation == sizeof parts);
    std::memcpy(parts, &operation, sizeof parts);
    return (parts[0] - 1) / static_cast<std::ptrdiff_t>(sizeof(void*));
}

// Part of the binary interface: a destructor takes the first two places, the private ones lie between and
// behind.
TEST(ValidatorOperations, KeepTheirPlacesForProgramsThatAreBuiltAlready) {
    EXPECT_EQ(slotOf(&Validation::valueType), 2);
    EXPECT_EQ(slotOf(&Validation::minVal), 3);
    EXPECT_EQ(slotOf(&Validation::maxVal), 4);
    EXPECT_EQ(slotOf(&Validation::clone), 6);
}

TEST(ValidatorCloning, CopiesClassLimitsAndADefaultOfItsOwn) {
    auto const field = integers(R"("value_min":1,"value_max":9,"default_value":5,"value_match":"\\d")");
    std::unique_ptr<Validation> const clone(field.validation().clone());
    EXPECT_TRUE(dynamic_cast<ExtractField::ValidateNum<long long>*>(clone.get()));
    EXPECT_EQ(clone->minVal(), json::Value(1));
    EXPECT_EQ(clone->maxVal(), json::Value(9));
    EXPECT_EQ(clone->strRegex(), R"(\d)");
    EXPECT_NE(clone->defaultValue(), field.validation().defaultValue());
    EXPECT_EQ(clone->defaultValue()->intVal(), 5);
}

TEST(ValidatorAssignment, SharesTheDefaultAndThePattern) {
    auto const source = definition(R"("value_match":"a+","default_value":"a")");
    ExtractField target = definition(R"("value_match":"b+","default_value":"b")");
    EXPECT_EQ(validate(target, "b"), plain("b")); // the target's pattern is compiled
    EXPECT_EQ(validate(source, "a"), plain("a"));
    auto& validator = const_cast<Validation&>(target.validation());
    validator = source.validation();
    EXPECT_EQ(validator.strRegex(), "a+");
    EXPECT_EQ(validator.defaultValue(), source.validation().defaultValue());
    EXPECT_EQ(validate(target, "a"), plain("a"));
    EXPECT_EQ(validate(target, "b"), invalid("b"));
}

TEST(ValidatorAssignment, TakesOverThatNothingIsCompiledYet) {
    auto const source = definition(R"("value_match":"a+")");
    ExtractField target = definition(R"("value_match":"b+")");
    EXPECT_EQ(validate(target, "b"), plain("b"));
    const_cast<Validation&>(target.validation()) = source.validation();
    EXPECT_EQ(validate(target, "a"), plain("a"));
}

TEST(ValidationFailures, LetABadPatternOut) {
    for (char const* const type : {"0", "1", "2", "3"}) {
        auto const field = definition(std::string(R"("value_match":"(","value_type":)") + type);
        EXPECT_THROW(validate(field, "x"), boost::regex_error) << type;
        EXPECT_THROW(validate(field, "x"), boost::regex_error) << type; // nothing was cached
    }
}

TEST(ValidationFailures, LetABadPatternOutOfADateThatIsBuiltWithIt) {
    EXPECT_NO_THROW(dates(R"("value_match":"(","value_min":0)"));
    EXPECT_THROW(dates(R"("value_match":"(","value_min":"x")"), boost::regex_error);
    EXPECT_THROW(dates(R"("value_match":"(","default_value":"x")"), boost::regex_error);
}

TEST(ValidationFailures, LetTextThatIsNotUtf8Out) {
    auto const notUtf8 = ThrowsMessage<std::out_of_range>(StrEq(NOT_UTF8));
    EXPECT_THAT([] { validate(integers(), "\xff"); }, notUtf8);
    EXPECT_THAT([] { validate(dates(), "5/3/\xe2\x82"); }, notUtf8);
    EXPECT_EQ(validate(definition(""), "\xff"), plain("\xff")); // nothing reads it
}

TEST(ValidationFailures, LetAValueThatIsNoTextOut) {
    for (char const* const type : {"1", "2", "3"}) {
        ExtractedField value = rawValue(5);
        auto const field = definition(std::string(R"("value_type":)") + type);
        expectWrongType([&] { field.validate(value); }, "integer", "string");
        EXPECT_EQ(value.valueType(), ValueType::NotValidated);
    }
}

TEST(ValidationFailures, LetRunawayBacktrackingOut) {
    auto const field = definition(R"("value_match":"(a|aa)*b")");
    EXPECT_THROW(validate(field, std::string(40, 'a')), std::runtime_error);
}

} // namespace
} // namespace Cfg
