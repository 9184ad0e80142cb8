#include "programs/reader/month_names.h"
#include "programs/reader/number_reading.h"
#include "programs/reader/value_reading.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using namespace Reader;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

using Forms = std::vector<std::string>;

NumberRules const COMMA{NumberRules::Decimal::Given, ",", {".", "'", " "}};
NumberRules const POINT{NumberRules::Decimal::Given, ".", {",", "'"}};
NumberRules const AUTO{NumberRules::Decimal::Auto, {}, {}};

struct NumberCase {
    char const* text;
    Forms forms;
};

void expectForms(NumberRules const& rules, std::vector<NumberCase> const& cases) {
    for (auto const& [text, forms] : cases)
        EXPECT_EQ(numberForms(text, rules), forms) << text;
}

Cfg::ExtractField fieldFrom(std::string const& keys) {
    std::string const text = R"_({"name": "f", "value_extract": "(?<VAL>.*)", )_" + keys + "}";
    return Cfg::ExtractField(json::strToObject(text.data(), text.size()));
}

struct Read {
    Cfg::ExtractedField value;
    std::string doubt;
};

Read read(Cfg::ExtractField const& field, std::string const& text, ReadingRules const& rules) {
    Read read{{field.name(), text, 0, false, IgnoreOnGroup::MustMatch,
               Cfg::ExtractedField::ValueType::NotValidated},
              {}};
    read.doubt = readValue(field, read.value, rules);
    return read;
}

ReadingRules rulesOf(NumberRules const& numbers) { return {numbers, {}, {}}; }

} // namespace

TEST(NumberForms, FollowADecimalComma) {
    expectForms(COMMA, {
                           {"1.234,56", {"1234.56"}},
                           {"1234,56", {"1234.56"}},
                           {"1 234 567,8", {"1234567.8"}},
                           {"1\xC2\xA0"
                            "234,50",
                            {"1234.50"}},
                           {"1\xE2\x80\x99"
                            "234,50",
                            {"1234.50"}},
                           {"12", {"12"}},
                           {"1.234", {"1234"}},
                           {",50", {"0.50"}},
                           {"EUR 12,50", {"12.50"}},
                           {"12,50 \xE2\x82\xAC", {"12.50"}},
                           {"-12,50", {"-12.50"}},
                           {"\xE2\x88\x92"
                            "12,50",
                            {"-12.50"}},
                           {"12,50-", {"-12.50"}},
                           {"(12,50)", {"-12.50"}},
                           {"50,--", {"50"}},
                           {"50,-", {"50"}},
                           {"19,00 %", {"19.00"}},
                       });
}

TEST(NumberForms, FollowADecimalPoint) {
    expectForms(POINT, {
                           {"CHF 2'606.35", {"2606.35"}},
                           {"1'200.\xE2\x80\x93", {"1200"}},
                           {"1,234.50", {"1234.50"}},
                           {"12,34,567.00", {"1234567.00"}},
                           {".5", {"0.5"}},
                       });
}

// A separator at another place means another number, or none.
TEST(NumberForms, AreNoneOfWhatIsNoSuchNumber) {
    for (char const* text : {"", " ", ",", "abc", "1.5", "1.23.45", "1,2,3", "0.123", "12.2014,5.1",
                             "1234.567", "1/2", "12:30", "3 of 5", "Reference 12", "page 1,5 of 2", "1.2345"})
        EXPECT_THAT(numberForms(text, COMMA), IsEmpty()) << text;
}

TEST(NumberForms, DecideByThemselvesWhereOnlyOneReadingIsANumber) {
    expectForms(AUTO, {
                          {"1.234,56", {"1234.56"}},
                          {"1,234.56", {"1234.56"}},
                          {"CHF 2'606.35", {"2606.35"}},
                          {"12,50", {"12.50"}},
                          {"12.5", {"12.5"}},
                          {"1.234.567", {"1234567"}},
                          {"1234,567", {"1234.567"}},
                          {"0,234", {"0.234"}},
                          {"1 234", {"1234"}},
                          {"7", {"7"}},
                          {"1,234", {"1.234", "1234"}},
                          {"1.234", {"1234", "1.234"}},
                      });
}

TEST(NumberDoubts, AreAboutWhatWasLeftOut) {
    struct {
        char const* text;
        json::Value number;
        char const* doubt;
    } const cases[] = {
        {"1.234,56", 1.23456, "was read as 1.23456, without its comma"},
        {"12,50", 1250, "was read as 1250, without its comma"},
        {"12,50 EUR", 1250.0, "was read as 1250, without its comma"},
        {"12 EUR", 12.0, "was read as 12, without \"EUR\" at its end"},
        {"2'606.35", 2, "was read as 2, without \"'606.35\" at its end"},
        {"1.234", 1, "was read as 1, without \".234\" at its end"},
        {"1,234.50", 1234.5, ""},
        {"1,234", 1234, ""},
        {"-7", -7, ""},
        {"7.", 7.0, ""},
        {"12 ", 12, ""},
    };
    for (auto const& [text, number, doubt] : cases)
        EXPECT_EQ(doubtAbout(text, number), doubt) << text;
}

TEST(MonthNames, AreKnownInTheLanguagesOfIcu) {
    for (char const* language : {"de", "fr", "nl", "it", "es", "pl", "pt_BR", "de_CH", "en"})
        EXPECT_TRUE(hasMonthNames(language)) << language;
    for (char const* language : {"", "xx", "german", "tlh", "de;x", "../de"})
        EXPECT_FALSE(hasMonthNames(language)) << language;
}

TEST(MonthNames, BecomeEnglishOnesAndFigures) {
    EXPECT_THAT(datesInEnglish("29 maart 2014", "nl"), ElementsAre("29 March 2014", "29/3/2014"));
    EXPECT_THAT(datesInEnglish("5. M\xC3\xA4rz 2021", "de"), ElementsAre("5. March 2021", "5/3/2021"));
    EXPECT_THAT(datesInEnglish("1er f\xC3\xA9vr. 21", "fr"), ElementsAre("1er February 21", "1/2/21"));
    EXPECT_THAT(datesInEnglish("12 de marzo de 2020", "es"), ElementsAre("12 de March de 2020", "12/3/2020"));
    EXPECT_THAT(datesInEnglish("2020 DEZEMBER 24", "de"), ElementsAre("2020 December 24", "24/12/2020"));
    EXPECT_THAT(datesInEnglish("M\xC3\xA4rz 2021", "de"), ElementsAre("March 2021"));
    EXPECT_THAT(datesInEnglish("5.3.2021", "de"), IsEmpty());
    EXPECT_THAT(datesInEnglish("marzen 5 2021", "de"), IsEmpty());
    EXPECT_THAT(datesInEnglish("\xFF 5", "de"), IsEmpty());
}

TEST(ValueReading, RewritesNumbersBeforeTheyAreTyped) {
    Cfg::ExtractField const real = fieldFrom(R"("value_type": 2, "value_min": 0)");
    Read const comma = read(real, "1.234,56", rulesOf(COMMA));
    EXPECT_TRUE(comma.value.isValid());
    EXPECT_DOUBLE_EQ(comma.value.floatVal(), 1234.56);
    EXPECT_EQ(comma.doubt, "");
    EXPECT_DOUBLE_EQ(read(real, "CHF 2'606.35", rulesOf(POINT)).value.floatVal(), 2606.35);
    EXPECT_DOUBLE_EQ(read(real, "12,50", rulesOf(AUTO)).value.floatVal(), 12.5);
}

TEST(ValueReading, KeepsTheTextOfWhatItRefuses) {
    Cfg::ExtractField const real = fieldFrom(R"("value_type": 2, "value_max": 100)");
    Read const none = read(real, "1.5", rulesOf(COMMA));
    EXPECT_FALSE(none.value.isValid());
    EXPECT_EQ(none.value.strVal(), "1.5");
    EXPECT_EQ(none.doubt, "\"1.5\" is no number as \"reading\" has them");
    Read const tooMuch = read(real, "1.234,56", rulesOf(COMMA));
    EXPECT_FALSE(tooMuch.value.isValid());
    EXPECT_EQ(tooMuch.value.strVal(), "1.234,56");
    EXPECT_EQ(tooMuch.doubt, "");
}

TEST(ValueReading, CallsAnAmbiguousNumberInvalidWithBothReadings) {
    Read const ambiguous = read(fieldFrom(R"("value_type": 2)"), "1,234", rulesOf(AUTO));
    EXPECT_FALSE(ambiguous.value.isValid());
    EXPECT_EQ(ambiguous.value.strVal(), "1,234");
    EXPECT_EQ(ambiguous.doubt, "\"1,234\" may be 1.234 or 1234; say in \"reading\" which character stands in "
                               "front of decimals");
}

TEST(ValueReading, TakesNoDecimalsForAnInteger) {
    Cfg::ExtractField const integer = fieldFrom(R"("value_type": 1)");
    EXPECT_EQ(read(integer, "1.234", rulesOf(AUTO)).value.intVal(), 1234);
    EXPECT_EQ(read(integer, "12,00", rulesOf(COMMA)).value.intVal(), 12);
    EXPECT_FALSE(read(integer, "12,50", rulesOf(COMMA)).value.isValid());
}

TEST(ValueReading, DoubtsNumbersThatNothingIsSaidAbout) {
    Cfg::ExtractField const real = fieldFrom(R"("value_type": 2, "value_match": ".*")");
    Read const comma = read(real, "1.234,56", {});
    EXPECT_DOUBLE_EQ(comma.value.floatVal(), 1.23456);
    EXPECT_EQ(comma.doubt,
              "\"1.234,56\" was read as 1.23456, without its comma; say in \"reading\" of the pack "
              "preset how numbers are written");
    EXPECT_EQ(read(real, "1,234.50", {}).doubt, "");
    EXPECT_EQ(read(fieldFrom(R"("value_type": 0)"), "1.234,56", {}).doubt, "");
}

TEST(ValueReading, ReadsDatesWithNamesOfMonths) {
    ReadingRules dutch;
    dutch.months = "nl";
    Cfg::ExtractField const plain = fieldFrom(R"("value_type": 3)");
    Read const date = read(plain, "29 maart 2014", dutch);
    EXPECT_EQ(date.value.valueToStr(), "2014/03/29 00:00:00");
    Cfg::ExtractField const own =
        fieldFrom(R"_("value_type": 3, "value_match": "(?<day>\\d+) (?<month>\\w+) (?<year>\\d{4})")_");
    EXPECT_EQ(read(own, "29 maart 2014", dutch).value.valueToStr(), "2014/03/29 00:00:00");
    EXPECT_EQ(read(own, "29 March 2014", dutch).value.valueToStr(), "2014/03/29 00:00:00");
    EXPECT_EQ(read(plain, "29/03/2014", dutch).value.valueToStr(), "2014/03/29 00:00:00");
    Read const none = read(plain, "29 germinal 2014", dutch);
    EXPECT_FALSE(none.value.isValid());
    EXPECT_EQ(none.value.strVal(), "29 germinal 2014");
}
