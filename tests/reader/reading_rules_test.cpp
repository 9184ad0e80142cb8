#include "programs/base/error.h"
#include "programs/reader/reading_rules.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using namespace Reader;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

json::Object objectFrom(std::string const& text) { return json::strToObject(text.data(), text.size()); }

ReadingRules rulesFrom(std::string const& text) {
    std::vector<RulesFault> faults;
    ReadingRules rules = ReadingRules::from(objectFrom(text), faults);
    EXPECT_THAT(faults, IsEmpty()) << text;
    return rules;
}

/// "/path what; advice" for each.
std::vector<std::string> faultsOf(std::string const& reading) {
    json::Object const object = objectFrom(R"({"reading": )" + reading + "}");
    std::vector<RulesFault> faults;
    ReadingRules::from(object.get("reading"), faults);
    std::vector<std::string> lines;
    for (RulesFault const& fault : faults) {
        std::string line;
        for (std::string const& key : fault.path)
            line += '/' + key;
        lines.push_back(line + ' ' + fault.what + "; " + fault.advice);
    }
    return lines;
}

} // namespace

TEST(ReadingRulesReading, SayNothingWithoutAnObject) {
    std::vector<RulesFault> faults;
    ReadingRules const rules = ReadingRules::from({}, faults);
    EXPECT_THAT(faults, IsEmpty());
    EXPECT_EQ(rules.numbers.kind, NumberRules::Decimal::Plain);
    EXPECT_EQ(rules.months, "");
    EXPECT_EQ(rules.forZone("Total"), nullptr);
}

TEST(ReadingRulesReading, TakeEveryKey) {
    ReadingRules const rules = rulesFrom(
        R"({"decimal": ",", "grouping": ".' ", "months": "de",
            "zones": {"Total": {"page": "last", "anchor": "^Sum:", "column": true}, "Date": {"page": 2},
                      "All": {"page": "any"}, "None": {}}})");
    EXPECT_EQ(rules.numbers.kind, NumberRules::Decimal::Given);
    EXPECT_EQ(rules.numbers.decimal, ",");
    EXPECT_THAT(rules.numbers.grouping, ElementsAre(".", "'", " "));
    EXPECT_EQ(rules.months, "de");
    ASSERT_NE(rules.forZone("Total"), nullptr);
    EXPECT_EQ(rules.forZone("Total")->pages, ZoneRules::Pages::Last);
    EXPECT_EQ(rules.forZone("Total")->anchor, "^Sum:");
    EXPECT_TRUE(rules.forZone("Total")->byColumn);
    EXPECT_EQ(rules.forZone("Date")->pages, ZoneRules::Pages::One);
    EXPECT_EQ(rules.forZone("Date")->page, 2);
    EXPECT_EQ(rules.forZone("All")->pages, ZoneRules::Pages::Any);
    EXPECT_EQ(rules.forZone("None")->page, 1);
    EXPECT_FALSE(rules.forZone("None")->byColumn);
}

TEST(ReadingRulesReading, NameEachFaultWithItsPlace) {
    struct {
        char const* reading;
        std::vector<std::string> faults;
    } const cases[] = {
        {"7", {" is no object; write an object such as {\"decimal\": \",\", \"grouping\": \".\"}"}},
        {R"({"decimals": ","})",
         {"/decimals \"decimals\" is no key here; write one of \"decimal\", \"grouping\", \"months\", "
          "\"zones\""}},
        {R"({"decimal": ",,"})",
         {"/decimal is no character that a number has in front of its decimals; write \",\" or \".\" or "
          "\"auto\""}},
        {R"({"decimal": "1"})",
         {"/decimal is no character that a number has in front of its decimals; write \",\" or \".\" or "
          "\"auto\""}},
        {R"({"decimal": 5})",
         {"/decimal is no character that a number has in front of its decimals; write \",\" or \".\" or "
          "\"auto\""}},
        {R"({"decimal": ",", "grouping": ".,"})",
         {"/grouping \",\" is the decimal character too; take it out of one of the two"}},
        {R"({"grouping": "."})",
         {"/grouping stands without \"decimal\" and changes nothing; add \"decimal\""}},
        {R"({"decimal": ",", "grouping": "a"})",
         {"/grouping is no list of characters that stand between groups of digits; write them as one text, "
          "such as \".' \""}},
        {R"({"decimal": ",", "grouping": ["."]})",
         {"/grouping is no list of characters that stand between groups of digits; write them as one text, "
          "such as \".' \""}},
        {R"({"months": "tlh"})",
         {"/months is no language whose names of months are known; write its code, such as \"de\", \"fr\" or "
          "\"nl\""}},
        {R"({"months": 3})",
         {"/months is no language whose names of months are known; write its code, such as \"de\", \"fr\" or "
          "\"nl\""}},
        {R"({"zones": []})", {"/zones is no object; write the names of zones with an object each"}},
        {R"({"zones": {"A": 1}})", {"/zones/A is no object; write an object such as {\"page\": \"last\"}"}},
        {R"({"zones": {"A": {"pages": 1}}})",
         {"/zones/A/pages \"pages\" is no key here; write one of \"page\", \"anchor\", \"column\""}},
        {R"({"zones": {"A": {"page": 99999}}})",
         {"/zones/A/page is no page of a letter; write 1, 2 and so on, \"last\" or \"any\""}},
        {R"({"zones": {"A": {"page": 0}, "B": {"page": "first"}, "C": {"page": -1}}})",
         {"/zones/A/page is no page of a letter; write 1, 2 and so on, \"last\" or \"any\"",
          "/zones/B/page is no page of a letter; write 1, 2 and so on, \"last\" or \"any\"",
          "/zones/C/page is no page of a letter; write 1, 2 and so on, \"last\" or \"any\""}},
        {R"({"zones": {"A": {"anchor": "(a", "column": 1}}})",
         {"/zones/A/anchor is broken at character 3 (Unmatched marking parenthesis ( or \\(); correct the "
          "pattern",
          "/zones/A/column is neither true nor false; write true or false"}},
        {R"({"zones": {"A": {"anchor": ""}}})",
         {"/zones/A/anchor is no pattern; write a pattern that fits a text of the page"}},
        {R"({"zones": {"A": {"anchor": "a?+(?#why)b"}}})",
         {"/zones/A/anchor is broken at character 4 (A comment stands behind a possessive repeat); correct "
          "the pattern"}},
    };
    for (auto const& [reading, faults] : cases)
        EXPECT_EQ(faultsOf(reading), faults) << reading;
}

TEST(ReadingRulesReading, RefuseAPackPresetInOneLine) {
    Cfg::PackPreset const preset(
        objectFrom(R"({"name": "P", "reading": {"decimal": ",", "zones": {"A": {"page": 99999}}}})"), {});
    try {
        ReadingRules::of(preset);
        FAIL() << "no failure";
    } catch (Base::Error const& error) {
        EXPECT_STREQ(error.what(),
                     "\"reading/zones/A/page\" of the pack preset \"P\" is no page of a letter; "
                     "write 1, 2 and so on, \"last\" or \"any\"");
    }
}

TEST(ReadingRulesReading, ComeFromThePackPreset) {
    Cfg::PackPreset const preset(objectFrom(R"({"name": "P", "reading": {"decimal": "auto"}})"), {});
    EXPECT_EQ(ReadingRules::of(preset).numbers.kind, NumberRules::Decimal::Auto);
    Cfg::PackPreset const without(objectFrom(R"({"name": "P"})"), {});
    EXPECT_EQ(ReadingRules::of(without).numbers.kind, NumberRules::Decimal::Plain);
}
