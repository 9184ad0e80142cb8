#include "programs/vlmail/explain/refusal.h"

#include "tests/support/time_zone.h"
#include "vlservice/json/json_text.h"

#include <gtest/gtest.h>

namespace VlMail {
namespace {

struct Refused {
    char const* name;
    char const* keys;
    char const* text;
    char const* says;
};

Refused const REFUSALS[]{
    {"TextThatFits", R"({"value_match": "\\d+"})", "17", ""},
    {"TextThatDoesNotFit", R"({"value_match": "\\d+"})", "A 17",
     "\"A 17\" does not match the validation pattern \"\\d+\""},
    {"TextOfLines", R"({"value_match": "\\d+"})", "A\n17",
     "\"A / 17\" does not match the validation pattern \"\\d+\""},
    {"Integer", R"({"value_type": 1})", "1,234", ""},
    {"NoInteger", R"({"value_type": 1})", "1.5", "\"1.5\" is no integer"},
    {"IntegerOfItsOwnPattern", R"({"value_type": 1, "value_match": "\\d{5}"})", "15",
     "\"15\" does not match the validation pattern \"\\d{5}\""},
    {"IntegerBelow", R"({"value_type": 1, "value_min": 10})", "5", "5 is below the minimum 10"},
    {"IntegerAbove", R"({"value_type": 1, "value_max": 10})", "1,234", "1,234 is above the maximum 10"},
    {"IntegerAtTheLimits", R"({"value_type": 1, "value_min": 10, "value_max": 10})", "10", ""},
    {"LargeIntegers", R"({"value_type": 1, "value_max": 9007199254740992})", "9007199254740993",
     "9007199254740993 is above the maximum 9007199254740992"},
    {"NoNumber", R"({"value_type": 2})", "12,30 EUR", "\"12,30 EUR\" is no number"},
    {"NumberBelow", R"({"value_type": 2, "value_min": 0})", "-0.5", "-0.5 is below the minimum 0"},
    {"NumberAbove", R"({"value_type": 2, "value_max": 10})", "12.30", "12.30 is above the maximum 10"},
    {"NumberAboveALongLimit", R"({"value_type": 2, "value_max": 1234567.89})", "2,000,000",
     "2,000,000 is above the maximum 1234567.89"},
    {"BlanksAreTheLowestNumber", R"({"value_type": 1, "value_min": 0})", "   ", "    is below the minimum 0"},
    {"Date", R"({"value_type": 3})", "5/3/2021", ""},
    {"NoDate", R"({"value_type": 3})", "5.3.2021",
     "\"5.3.2021\" matches no date pattern: day/month/year is expected"},
    {"DateOfItsOwnPattern", R"({"value_type": 3, "value_match": "(?<day>\\d+)\\.(?<month>\\d+)\\."})", "5/3",
     "\"5/3\" does not match the validation pattern \"(?<day>\\d+)\\.(?<month>\\d+)\\.\""},
    {"NoSuchMonth", R"({"value_type": 3})", "5/0/2021",
     "\"5/0/2021\" is no date: its month, year or hour cannot be read; names of months are English"},
    {"DateBefore", R"({"value_type": 3, "value_min": "1/1/2022"})", "5/3/2021",
     "5/3/2021 is before the earliest date 2022/01/01"},
    {"DateAfter", R"({"value_type": 3, "value_max": "1/1/2020 12:30"})", "5/3/2021",
     "5/3/2021 is after the latest date 2020/01/01 12:30:00"},
    {"SingleLetterMarkMakesIntegers", R"({"mark": 2, "value_type": 3})", "x", "\"x\" is no integer"},
};

class Refusals : public testing::TestWithParam<Refused> {
protected:
    static Cfg::ExtractField field() {
        std::string const keys = GetParam().keys;
        json::Object object = json::strToObject(keys.data(), keys.size());
        object.set("name", "f");
        return object;
    }

private:
    VLServiceTest::TimeZone const zone_{"UTC"};
};

TEST_P(Refusals, SayWhatIsWrong) {
    auto const refusal = refusalOf(field(), GetParam().text);
    EXPECT_EQ(refusal ? refusal->says : "", GetParam().says);
}

/// The words follow the validator: they agree with it on what is refused.
TEST_P(Refusals, AgreeWithTheValidator) {
    Cfg::ExtractedField value("f", GetParam().text, 0, false, IgnoreOnGroup::MustMatch,
                              Cfg::ExtractedField::ValueType::NotValidated);
    field().validate(value);
    EXPECT_EQ(value.isValid(), !refusalOf(field(), GetParam().text).has_value());
}

INSTANTIATE_TEST_SUITE_P(Of, Refusals, testing::ValuesIn(REFUSALS),
                         [](auto const& test) { return std::string(test.param.name); });

TEST(TypeInWords, NamesTheKinds) {
    char const* const names[]{"text", "integer", "number", "date"};
    for (int type = 0; type < 4; ++type)
        EXPECT_STREQ(typeInWords(json::Object{{"name", "f"}, {"value_type", type}}), names[type]);
}

} // namespace
} // namespace VlMail
