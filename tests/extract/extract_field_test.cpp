#include "vlservice/extract/extract_field.h"

#include "vlservice/extract/extracted_fields.h"

#include "support.h"

#include <gmock/gmock.h>

#include <clocale>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace Cfg {
namespace {

using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using ValueType = ExtractedField::ValueType;

/// A definition named "f" with an extraction pattern and further keys, given as the inside of a JSON object.
ExtractField finding(std::string const& pattern, std::string const& keys = "") {
    json::Object object = parse("{" + keys + "}");
    if (!object.get("name"))
        object.set("name", "f");
    object.set("value_extract", pattern);
    return ExtractField(object);
}

/// The value's text, or "nothing".
std::string extracted(ExtractField const& field, std::string text) {
    auto const value = field.extractField(text);
    return value ? print(value->rawValue()) : "nothing";
}

ExtractField::Measure measuring(unsigned long long width) {
    return [width](std::string&, unsigned long long, unsigned long long) { return width; };
}

TEST(LetterSeparatorMarkNumbers, AreThoseOfTheWire) {
    EXPECT_EQ(static_cast<int>(LetterSeparatorMark::None), 0);
    EXPECT_EQ(static_cast<int>(LetterSeparatorMark::SingleLetter), 2);
    EXPECT_EQ(static_cast<int>(FieldPostalMatch::None), 0);
    static_assert(std::is_same_v<std::underlying_type_t<LetterSeparatorMark>, std::int32_t>);
    static_assert(std::is_same_v<std::underlying_type_t<FieldPostalMatch>, std::int32_t>);
}

TEST(FieldReading, NeedsAName) {
    expectWrongType([] { ExtractField field{json::Object()}; }, "empty", "string");
    expectWrongType([] { ExtractField field(parse(R"({"name":5})")); }, "integer", "string");
    expectWrongType([] { ExtractField field(parse(R"({"name":null})")); }, "null", "string");
}

TEST(FieldReading, GivesEveryOtherKeyItsDefault) {
    ExtractField const read(parse(R"({"name":"Total"})"));
    ExtractField made;
    EXPECT_EQ(made.name(), "");
    made.setName("Total");
    for (ExtractField const& field : {std::cref(read), std::cref(made)}) {
        EXPECT_EQ(field.name(), "Total");
        EXPECT_EQ(field.strRegex(), "");
        EXPECT_EQ(field.mark(), LetterSeparatorMark::None);
        EXPECT_FALSE(field.ignoreFontMetrics());
        EXPECT_EQ(field.priority(), 0);
        EXPECT_FALSE(field.mustHave());
        EXPECT_EQ(field.maxWidth(), 0u);
        EXPECT_FALSE(field.make1Line());
        EXPECT_FALSE(field.sendToServer());
        EXPECT_EQ(field.ignoreOnGroup(), IgnoreOnGroup::MustMatch);
        EXPECT_FALSE(field.nameIsRedirectMatch());
        EXPECT_EQ(field.postalMatchType(), FieldPostalMatch::None);
    }
    EXPECT_EQ(read.validation().valueType(), FieldValueType::String);
}

TEST(FieldReading, TakesEveryKey) {
    ExtractField const field(parse(R"({"name":"total","value_extract":"x","mark":7,"ignore_font_metrics":true,
        "priority":-2,"obligatory":true,"make_one_line":true,"send_to_server":true,"width":14000,
        "ignore_on_group":6,"name_is_redirect_match":true,"postal_match":9,"value_type":2})"));
    EXPECT_EQ(field.name(), "total");
    EXPECT_EQ(field.strRegex(), "x");
    EXPECT_EQ(static_cast<int>(field.mark()), 7);
    EXPECT_TRUE(field.ignoreFontMetrics());
    EXPECT_EQ(field.priority(), -2);
    EXPECT_TRUE(field.mustHave());
    EXPECT_EQ(field.maxWidth(), 14000u);
    EXPECT_TRUE(field.make1Line());
    EXPECT_TRUE(field.sendToServer());
    EXPECT_EQ(field.ignoreOnGroup(), IgnoreOnGroup::Collect);
    EXPECT_TRUE(field.nameIsRedirectMatch());
    EXPECT_EQ(static_cast<int>(field.postalMatchType()), 9);
    EXPECT_EQ(field.validation().valueType(), FieldValueType::Float);
}

TEST(FieldReading, TakesAnotherJsonTypeAsMissing) {
    ExtractField const field(parse(R"({"name":"f","value_extract":5,"mark":"1","ignore_font_metrics":1,
        "priority":1.0,"obligatory":"true","make_one_line":[],"send_to_server":null,"width":"7",
        "ignore_on_group":{},"name_is_redirect_match":false,"postal_match":true})"));
    EXPECT_EQ(print(field.serialize()), R"({"name":"f"})");
}

TEST(FieldReading, CutsNumbersToTheirWidth) {
    auto const field = definition(R"("priority":4294967295,"postal_match":4294967301,"width":-1)");
    EXPECT_EQ(field.priority(), -1);
    EXPECT_EQ(static_cast<int>(field.postalMatchType()), 5);
    EXPECT_EQ(field.maxWidth(), ~0ull);
}

TEST(FieldReading, PutsInOrderWhatBelongsTogether) {
    auto const address = finding("x", R"("name":"E-MAIL","priority":1,"default_value":"d")");
    EXPECT_EQ(address.name(), "e-mail");
    EXPECT_FALSE(address.validation().defaultValue());
    EXPECT_TRUE(definition(R"("mark":-1)").mustHave());
    EXPECT_TRUE(definition(R"("mark":2)").mustHave());
}

TEST(FieldWriting, WritesKeysInOrder) {
    std::string const all =
        R"({"name":"total","value_extract":"x","mark":7,"ignore_font_metrics":true,"priority":-2,"obligatory":true,)"
        R"("make_one_line":true,"send_to_server":true,"width":14000,"ignore_on_group":-1,)"
        R"("name_is_redirect_match":true,"postal_match":9,"value_match":"y","value_type":1,"value_min":1,)"
        R"("value_max":3,"default_value":2})";
    EXPECT_EQ(print(ExtractField(parse(all)).serialize()), all);
}

TEST(FieldWriting, LeavesOutDefaults) {
    EXPECT_EQ(print(ExtractField(parse(R"({"name":""})")).serialize()), R"({"name":""})");
    EXPECT_EQ(print(ExtractField().serialize()), R"({"name":""})"); // without a validator
}

TEST(FieldWriting, WritesNoDefaultOfARecipientAddress) {
    EXPECT_EQ(print(definition(R"("priority":1,"default_value":"x")").serialize()),
              R"({"name":"f","priority":1})");
}

TEST(FieldAccess, EachSetterWritesItsAttributeAlone) {
    struct {
        void (*set)(ExtractField&);
        char const* written;
    } const rows[] = {
        {[](ExtractField& f) { f.setName("N"); }, R"({"name":"N"})"},
        {[](ExtractField& f) { f.setRegex("x"); }, R"({"name":"","value_extract":"x"})"},
        {[](ExtractField& f) { f.setMark(LetterSeparatorMark::SingleLetter); }, R"({"name":"","mark":2})"},
        {[](ExtractField& f) { f.setIgnoreFontMertics(true); }, R"({"name":"","ignore_font_metrics":true})"},
        {[](ExtractField& f) { f.setPriority(-1); }, R"({"name":"","priority":-1})"},
        {[](ExtractField& f) { f.setMustHave(true); }, R"({"name":"","obligatory":true})"},
        {[](ExtractField& f) { f.setMake1Line(true); }, R"({"name":"","make_one_line":true})"},
        {[](ExtractField& f) { f.setSendToServer(true); }, R"({"name":"","send_to_server":true})"},
        {[](ExtractField& f) { f.setWidth(5); }, R"({"name":"","width":5})"},
        {[](ExtractField& f) { f.setIgnoreOnGroup(IgnoreOnGroup::Max); },
         R"({"name":"","ignore_on_group":3})"},
        {[](ExtractField& f) { f.setNameIsRedirectMatch(true); },
         R"({"name":"","name_is_redirect_match":true})"},
        {[](ExtractField& f) { f.setPostalMatch(FieldPostalMatch(4)); }, R"({"name":"","postal_match":4})"},
        {[](ExtractField& f) { f.setValidation(ExtractField::Validation::create("d", f)); },
         R"({"name":"","default_value":"d"})"},
    };
    for (auto const& row : rows) {
        ExtractField field;
        row.set(field);
        EXPECT_EQ(print(field.serialize()), row.written);
    }
}

TEST(FieldFixing, LowersTheNameOfEveryAddress) {
    for (int const priority : {-1, 1, 4}) {
        ExtractField field;
        field.setName("FAX Nr");
        field.setPriority(priority);
        field.fix();
        EXPECT_EQ(field.name(), "fax nr") << priority;
    }
    ExtractField ordinary;
    ordinary.setName("FAX Nr");
    ordinary.fix();
    EXPECT_EQ(ordinary.name(), "FAX Nr");
}

TEST(FieldFixing, LeavesBytesThatAreNoAsciiToTheLocale) {
    EXPECT_EQ(finding("x", R"("name":"GRÜSSE","priority":1)").name(), "grÜsse");
}

TEST(FieldFixing, MakesAMarkingFieldObligatory) {
    ExtractField field;
    field.fix();
    EXPECT_FALSE(field.mustHave());
    field.setMark(LetterSeparatorMark(1));
    field.fix();
    EXPECT_TRUE(field.mustHave());
    field.setMark(LetterSeparatorMark::None);
    field.fix();
    EXPECT_TRUE(field.mustHave());
}

TEST(FieldFixing, DropsTheDefaultOfARecipientAddressAlone) {
    auto field = definition(R"("default_value":"d")");
    field.setPriority(-1);
    field.fix();
    EXPECT_TRUE(field.validation().defaultValue());
    field.setPriority(1);
    field.fix();
    EXPECT_FALSE(field.validation().defaultValue());
}

TEST(FieldFixing, LeavesTheNameInsideTheDefaultOfANotificationAddress) {
    auto const field = finding("x", R"("name":"Boss","priority":-1,"default_value":"b@acme.example")");
    EXPECT_EQ(field.name(), "boss");
    ASSERT_TRUE(field.validation().defaultValue());
    EXPECT_EQ(field.validation().defaultValue()->name(), "Boss");
}

TEST(FieldOwnership, KnowsItsValuesByTheirExactName) {
    auto const field = finding("x", R"("name":"Ref")");
    auto const named = [](char const* name) {
        return ExtractedField(name, "x", 0, false, IgnoreOnGroup::MustMatch, ValueType::Plain);
    };
    EXPECT_TRUE(field.isMyField(named("Ref")));
    EXPECT_FALSE(field.isMyField(named("ref")));
    EXPECT_FALSE(field.isMyField(named("")));
}

TEST(FieldCoexistence, RefusesEqualNamesAndEqualRecipientPriorities) {
    auto const field = [](char const* name, int priority) {
        ExtractField made;
        made.setName(name);
        made.setPriority(priority);
        return made;
    };
    EXPECT_FALSE(field("a", 0).fieldsCanCoexist(field("a", 1)));
    EXPECT_FALSE(field("a", 2).fieldsCanCoexist(field("b", 2)));
    EXPECT_TRUE(field("a", 2).fieldsCanCoexist(field("b", 1)));
    EXPECT_TRUE(field("a", 0).fieldsCanCoexist(field("b", 0)));
    EXPECT_TRUE(field("a", -1).fieldsCanCoexist(field("b", -1)));
    EXPECT_TRUE(field("a", 0).fieldsCanCoexist(field("A", 0)));
}

TEST(FieldEquality, ComparesEveryAttribute) {
    void (*const changes[])(ExtractField&) = {
        [](ExtractField& f) { f.setName("g"); },
        [](ExtractField& f) { f.setRegex("y"); },
        [](ExtractField& f) { f.setMark(LetterSeparatorMark(1)); },
        [](ExtractField& f) { f.setIgnoreFontMertics(true); },
        [](ExtractField& f) { f.setPriority(1); },
        [](ExtractField& f) { f.setMustHave(true); },
        [](ExtractField& f) { f.setMake1Line(true); },
        [](ExtractField& f) { f.setSendToServer(true); },
        [](ExtractField& f) { f.setWidth(1); },
        [](ExtractField& f) { f.setIgnoreOnGroup(IgnoreOnGroup::Sum); },
        [](ExtractField& f) { f.setNameIsRedirectMatch(true); },
        [](ExtractField& f) { f.setPostalMatch(FieldPostalMatch(1)); },
    };
    auto const field = finding("x");
    EXPECT_TRUE(field == finding("x"));
    EXPECT_FALSE(field != finding("x"));
    for (auto const change : changes) {
        ExtractField other = field;
        change(other);
        EXPECT_FALSE(field == other) << print(other.serialize());
        EXPECT_TRUE(field != other) << print(other.serialize());
    }
}

TEST(FieldEquality, ComparesOfTheValidatorThePatternAlone) {
    auto const field = definition(R"("value_match":"x")");
    EXPECT_NE(field, definition(R"("value_match":"y")"));
    EXPECT_EQ(field, definition(R"("value_match":"x","value_type":1,"value_min":1,"default_value":5)"));
}

TEST(FieldEquality, TakesAMissingValidatorAsOneWithoutAPattern) {
    ExtractField bare;
    bare.setName("f");
    EXPECT_EQ(bare, bare);
    EXPECT_EQ(bare, definition(R"("send_to_server":false)"));
    EXPECT_NE(bare, definition(R"("value_match":"x")"));
}

TEST(Extraction, WithoutAPatternYieldsACopyOfTheDefaultAndLeavesTheText) {
    auto const field = definition(R"("default_value":"EUR")");
    std::string text = "EUR 5";
    auto const value = field.extractField(text);
    ASSERT_TRUE(value);
    EXPECT_NE(value.get(), field.validation().defaultValue());
    EXPECT_NE(value, field.extractField(text));
    EXPECT_EQ(typed(*value), plain("EUR"));
    EXPECT_EQ(text, "EUR 5");
}

TEST(Extraction, WithoutAPatternOrADefaultYieldsNothing) {
    std::string text = "EUR 5";
    EXPECT_FALSE(definition(R"("mark":0)").extractField(text));
    EXPECT_FALSE(ExtractField().extractField(text));
    EXPECT_EQ(text, "EUR 5");
}

TEST(Extraction, YieldsTheGroupWithTheAttributesOfTheField) {
    auto const field =
        finding("Ref (?<VAL>\\d+);", R"("priority":-3,"send_to_server":true,"ignore_on_group":5)");
    std::string text = "x Ref 42; y";
    auto const value = field.extractField(text);
    ASSERT_TRUE(value);
    EXPECT_EQ(
        print(value->serialize()),
        R"({"name":"f","type":-1,"value":"42","priority":-3,"send_to_server":true,"ignore_on_group":5})");
}

TEST(Extraction, WithoutAMeasureErasesTheWholeMatch) {
    std::string text = "x Ref 42; y";
    finding("Ref (?<VAL>\\d+);").extractField(text);
    EXPECT_EQ(text, "x  y");
}

TEST(Extraction, TakesTheFirstMatchOnly) {
    auto const field = finding("(?<VAL>\\d+)");
    std::string text = "1 2 3";
    EXPECT_EQ(field.extractField(text)->strVal(), "1");
    EXPECT_EQ(text, " 2 3");
    EXPECT_EQ(field.extractField(text)->strVal(), "2");
    EXPECT_EQ(text, "  3");
}

TEST(Extraction, TakesAnEmptyGroupAsAValue) { EXPECT_EQ(extracted(finding("a(?<VAL>x*)b"), "ab"), "\"\""); }

TEST(Extraction, LeavesTheTextWhenTheGroupIsMissingOrTookNoPart) {
    for (char const* const pattern : {"a", "(a)", "(?<val>a)", "(?<VAL>x)?a"}) {
        std::string text = "abc";
        EXPECT_FALSE(finding(pattern).extractField(text)) << pattern;
        EXPECT_EQ(extracted(finding(pattern, R"("default_value":"d")"), text), "\"d\"") << pattern;
        EXPECT_EQ(text, "abc") << pattern;
    }
}

TEST(Extraction, TakesTheGroupThatTookPartOfSeveralWithTheName) {
    auto const field = finding("(?<VAL>a)1|(?<VAL>b)2");
    EXPECT_EQ(extracted(field, "xa1"), "\"a\"");
    EXPECT_EQ(extracted(field, "xb2"), "\"b\"");
}

TEST(Extraction, LeavesTheTextAndLogsNothingWithoutAMatch) {
    VLServiceTest::LogLines const log;
    std::string text = "abc";
    EXPECT_FALSE(finding("(?<VAL>x)").extractField(text));
    EXPECT_EQ(text, "abc");
    EXPECT_THAT(log.texts(), IsEmpty());
}

TEST(Extraction, MeasuresTheWholeMatchInBytes) {
    auto const field = finding("ä (?<VAL>ö+) ü");
    std::string text = "xyz ß ä öö ü!";
    std::string seen;
    auto const value = field.extractField(text, [&](std::string& zone, auto offset, auto length) {
        EXPECT_EQ(&zone, &text);
        seen = zone.substr(offset, length);
        return 0ull;
    });
    EXPECT_EQ(seen, "ä öö ü");
    EXPECT_EQ(value->strVal(), "öö");
    EXPECT_EQ(text, "xyz ß ä öö ü!"); // whether it leaves the text is the measure's affair
}

TEST(Extraction, YieldsTheValueThoughTheMeasureErasesIt) {
    std::string text = "a 1 b";
    auto const value = finding("(?<VAL>\\d)").extractField(text, [](std::string& zone, auto, auto) {
        zone.clear();
        zone.shrink_to_fit();
        return 0ull;
    });
    EXPECT_EQ(value->strVal(), "1");
    EXPECT_EQ(text, "");
}

TEST(Extraction, AcceptsTheWidthItselfAndNoMore) {
    auto const field = finding("(?<VAL>a)", R"("width":100,"default_value":"d")");
    std::string text = "a";
    EXPECT_EQ(field.extractField(text, measuring(100))->strVal(), "a");
    EXPECT_EQ(field.extractField(text, measuring(101)).get(), field.validation().defaultValue()); // shared
    EXPECT_EQ(text, "a");
    EXPECT_FALSE(finding("(?<VAL>a)", R"("width":100)").extractField(text, measuring(101)));
    EXPECT_EQ(finding("(?<VAL>a)").extractField(text, measuring(~0ull))->strVal(), "a");
}

TEST(Extraction, WithoutAMeasureKnowsNoWidth) {
    EXPECT_EQ(extracted(finding("(?<VAL>a+)", R"("width":1)"), "aaaa"), "\"aaaa\"");
}

TEST(Extraction, JoinsLinesWithoutABlankWhenOneLineIsWanted) {
    EXPECT_EQ(
        extracted(finding("\\A(?<VAL>(.|\\n)*)\\z", R"("make_one_line":true)"), "12 Long St\nSpringfield\n"),
        "\"12 Long StSpringfield\"");
    EXPECT_EQ(finding("(?<VAL>a\nb)").make1Line(), false);
    std::string text = "a\nb";
    EXPECT_EQ(finding("(?<VAL>a\\nb)").extractField(text)->strVal(), "a\nb");
}

TEST(Extraction, MakesBlanksOfTabsInTheValueAlone) {
    std::string text = "\tx\t(1\t2\t)\t";
    EXPECT_EQ(finding("\\((?<VAL>.*)\\)").extractField(text)->strVal(), "1 2 ");
    EXPECT_EQ(text, "\tx\t\t");
}

TEST(Extraction, KeepsBlanksAtTheEndsAndOtherWhiteSpace) {
    std::string text = "( a\r\v )";
    EXPECT_EQ(finding("\\((?<VAL>[^)]*)\\)").extractField(text)->strVal(), " a\r\v ");
}

TEST(ExtractionPatterns, CountCodePoints) {
    EXPECT_EQ(extracted(finding("^(?<VAL>.{3})$"), "äöü"), "\"äöü\"");
    EXPECT_EQ(extracted(finding("^(?<VAL>.{1})$"), "😀"), "\"😀\"");
    EXPECT_EQ(extracted(finding("(?<VAL>[ä-ö])"), "a ö"), "\"ö\"");
}

TEST(ExtractionPatterns, FollowUnicodeInTheirClasses) {
    EXPECT_EQ(extracted(finding("(?<VAL>\\d+)"), "x٣٤"), "\"٣٤\"");
    EXPECT_EQ(extracted(finding("(?<VAL>\\w+)"), "-Éa ß"), "\"Éa\"");
    EXPECT_EQ(extracted(finding("a(?<VAL>\\s)b"), "a\u2003b"), "\"\u2003\"");
    EXPECT_EQ(extracted(finding("a\\h*(?<VAL>\\S)"), "a \u00a0b"), "\"b\"");
}

TEST(ExtractionPatterns, KeepTheDotOnItsLine) {
    for (char const* const lineBreak : {"\n", "\r", "\r\n", "\f", "\u0085", "\u2028", "\u2029"})
        EXPECT_EQ(extracted(finding("(?<VAL>a.*)"), std::string("xab") + lineBreak + "c"), "\"ab\"");
    EXPECT_EQ(extracted(finding("(?<VAL>a[^x]*)"), "a\nb"), "\"a\nb\"");
}

TEST(ExtractionPatterns, AnchorAtLinesAndAtTheEndsOfTheText) {
    std::string const text = "one\ntwo\nthree\n";
    EXPECT_EQ(extracted(finding("^(?<VAL>t.*)$"), text), "\"two\"");
    EXPECT_EQ(extracted(finding("\\A(?<VAL>.*)$"), text), "\"one\"");
    EXPECT_EQ(extracted(finding("^(?<VAL>.*)\\Z"), text), "\"three\"");
    EXPECT_EQ(extracted(finding("^(?<VAL>.+)\\z"), text), "nothing");
    EXPECT_EQ(extracted(finding("\\A(?<VAL>t.*)"), text), "nothing");
}

TEST(ExtractionPatterns, RegardCaseUnlessTheySayOtherwise) {
    EXPECT_EQ(extracted(finding("(?<VAL>ä)"), "Ä"), "nothing");
    EXPECT_EQ(extracted(finding("(?i:(?<VAL>ä))"), "Ä"), "\"Ä\"");
}

TEST(ExtractionFailures, LogABadPatternEachTimeAndYieldTheDefault) {
    auto const field = finding("(?<VAL>a", R"("default_value":"d")");
    VLServiceTest::LogLines const log;
    EXPECT_EQ(extracted(field, "a"), "\"d\"");
    EXPECT_EQ(extracted(field, "a"), "\"d\"");
    EXPECT_THAT(log.texts(), ElementsAre(StartsWith("3 Extract field failed with "),
                                         StartsWith("3 Extract field failed with ")));
}

TEST(ExtractionFailures, LogAPatternThatTheEngineWouldNeverParse) {
    VLServiceTest::LogLines const log;
    for (char const* const pattern :
         {"a?+(?#why)(?<VAL>b)", "a*+ (?#why)b", "a++(?#x)(?#y)b", "a{1}+(?#why)b", "a*?+(?#why)b"})
        EXPECT_EQ(extracted(finding(pattern), "ab"), "nothing") << pattern;
    EXPECT_THAT(log.texts(),
                Each(StartsWith("3 Extract field failed with A comment stands behind a possessive")));
    EXPECT_EQ(log.texts().size(), 5u);
}

TEST(ExtractionPatterns, TakeCommentsAndPossessiveRepeatsApartFromEachOther) {
    for (char const* const pattern : {"a(?#why)(?<VAL>b)", "a+(?#why)(?<VAL>b)", "a++(?<VAL>b)(?#why)"})
        EXPECT_EQ(extracted(finding(pattern), "ab"), "\"b\"") << pattern;
}

TEST(Extraction, TakesCharactersOfAllLengthsForwardAndBackward) {
    for (std::string const one : {"x", "\u00FC", "\u2014", "\U0001F600"}) {
        std::string const text = "\u00E4" + one + one + "\u20AC" + one + "b";
        EXPECT_EQ(extracted(finding("^.(?<VAL>.*)(?<=\u20AC.)b$"), text),
                  print(json::Value(one + one + "\u20AC" + one)));
        EXPECT_EQ(extracted(finding("(?<VAL>" + one + ")b"), text), print(json::Value(one)));
    }
}

TEST(Extraction, FindsNothingWhereAnyPartOfACharacterIsMissing) {
    VLServiceTest::LogLines const log;
    for (std::string const part : {"\xFF", "\x80", "\xC3", "\xE2\x82", "\xF0\x9F\x98"})
        for (std::string const& text :
             {part, "a" + part, part + "b", "a" + part + "b", "\u00E4" + part + "\u00FC"})
            EXPECT_EQ(extracted(finding("(?<VAL>^[^z]*$)"), text), "nothing") << text;
}

TEST(ExtractionFailures, LogTextAndPatternsThatAreNotUtf8) {
    VLServiceTest::LogLines const log;
    std::string const line =
        "3 Extract field failed with Invalid UTF-8 sequence encountered while trying to encode "
        "UTF-32 character";
    std::string text = "\xff 1";
    EXPECT_FALSE(finding("(?<VAL>\\d)").extractField(text));
    EXPECT_EQ(text, "\xff 1");
    EXPECT_FALSE(finding("(?<VAL>\\d)\xe2\x82").extractField(text));
    EXPECT_THAT(log.texts(), ElementsAre(line, line));
}

TEST(ExtractionFailures, ComeOnlyFromTextThatIsLookedAt) {
    EXPECT_EQ(extracted(finding("(?<VAL>\\d)"), "1 \xff 2"), "\"1\"");
}

TEST(ExtractionFailures, LogAFailingMeasureAndYieldTheDefault) {
    VLServiceTest::LogLines const log;
    std::string text = "a";
    auto const field = finding("(?<VAL>a)", R"("default_value":"d")");
    auto const value = field.extractField(
        text, [](std::string&, auto, auto) -> unsigned long long { throw std::runtime_error("no page"); });
    ASSERT_TRUE(value);
    EXPECT_EQ(typed(*value), plain("d"));
    EXPECT_NE(value.get(), field.validation().defaultValue());
    EXPECT_THAT(log.texts(), ElementsAre("3 Extract field failed with no page"));
}

TEST(ExtractionFailures, LetPassWhatIsNoException) {
    VLServiceTest::LogLines const log;
    std::string text = "a";
    EXPECT_THROW(finding("(?<VAL>a)")
                     .extractField(text, [](std::string&, auto, auto) -> unsigned long long { throw 5; }),
                 int);
    EXPECT_THAT(log.texts(), IsEmpty());
}

TEST(ExtractionFailures, LogRunawayBacktracking) {
    VLServiceTest::LogLines const log;
    std::string text(40, 'a');
    EXPECT_FALSE(finding("(?<VAL>(a|aa)*b)").extractField(text));
    EXPECT_THAT(log.texts(), ElementsAre(StartsWith("3 Extract field failed with ")));
}

TEST(FieldCopies, OwnTheirValidator) {
    auto const field = definition(R"("default_value":"d","value_match":"d+")");
    ExtractField const copy = field;
    ExtractField assigned = definition(R"("value_type":1)");
    assigned = field;
    for (ExtractField const& other : {std::cref(copy), std::cref(assigned)}) {
        EXPECT_EQ(print(other.serialize()), print(field.serialize()));
        EXPECT_NE(&other.validation(), &field.validation());
        EXPECT_NE(other.validation().defaultValue(), field.validation().defaultValue());
    }
}

TEST(FieldCopies, AreCompiledAnew) {
    auto field = finding("(?<VAL>a)");
    EXPECT_EQ(extracted(field, "ab"), "\"a\"");
    auto const other = finding("(?<VAL>b)");
    field = other;
    ExtractField const copy = field;
    EXPECT_EQ(extracted(copy, "ab"), "\"b\"");
    ExtractField const moved = std::move(field);
    EXPECT_EQ(extracted(moved, "ab"), "\"b\"");
}

TEST(FieldAssignment, GoesOnMatchingByTheFormerPattern) {
    auto field = finding("(?<VAL>a)");
    EXPECT_EQ(extracted(field, "ab"), "\"a\"");
    field = finding("(?<VAL>b)");
    EXPECT_EQ(field.strRegex(), "(?<VAL>b)");
    EXPECT_EQ(extracted(field, "ab"), "\"a\"");
    auto const copied = finding("(?<VAL>b)");
    field = copied;
    EXPECT_EQ(extracted(field, "ab"), "\"a\"");
    field.setRegex(field.strRegex());
    EXPECT_EQ(extracted(field, "ab"), "\"b\"");
}

TEST(FieldAssignment, TakesThePatternWhileNothingIsCompiled) {
    auto field = finding("(?<VAL>a)");
    field = finding("(?<VAL>b)");
    EXPECT_EQ(extracted(field, "ab"), "\"b\"");
}

TEST(FieldAssignment, OfAnEmptyPatternStopsTheSearch) {
    auto field = finding("(?<VAL>a)");
    EXPECT_EQ(extracted(field, "ab"), "\"a\"");
    field = definition(R"("mark":0)");
    EXPECT_EQ(extracted(field, "ab"), "nothing");
}

TEST(FieldAssignment, ByMovingSwapsTheValidators) {
    auto target = definition(R"("value_match":"t")");
    auto source = definition(R"("value_match":"s")");
    auto const* const targets = &target.validation();
    auto const* const sources = &source.validation();
    target = std::move(source);
    EXPECT_EQ(&target.validation(), sources);
    EXPECT_EQ(&source.validation(), targets);
}

TEST(FieldAssignment, ToItselfIsSafe) {
    auto field = finding("(?<VAL>a)", R"("default_value":"d")");
    auto& self = field;
    field = self;
    EXPECT_EQ(print(field.serialize()), R"x({"name":"f","value_extract":"(?<VAL>a)","default_value":"d"})x");
    field = std::move(self);
    EXPECT_EQ(field.validation().defaultValue()->strVal(), "d");
}

TEST(FieldMoving, TakesTheValidatorAndThrowsNothing) {
    static_assert(std::is_nothrow_move_constructible_v<ExtractField>);
    static_assert(std::is_nothrow_move_assignable_v<ExtractField>);
    auto field = definition(R"("value_match":"s","send_to_server":true)");
    auto const* const validator = &field.validation();
    ExtractField const moved = std::move(field);
    EXPECT_EQ(&moved.validation(), validator);
    EXPECT_TRUE(moved.sendToServer());
}

TEST(FieldWithoutAValidator, IsCopiedFixedAndMoved) {
    ExtractField field;
    field.setName("A");
    field.setPriority(1);
    field.fix();
    ExtractField copy = field;
    copy = field;
    ExtractField const moved = std::move(copy);
    EXPECT_EQ(moved.name(), "a");
    ExtractedField value = rawValue("x");
    moved.validate(value);
    EXPECT_EQ(value.valueType(), ValueType::NotValidated);
}

TEST(FieldValidation, TouchesOnlyWhatIsNotValidated) {
    auto const field = definition(R"("value_match":"x")");
    for (ValueType const state : {ValueType::Plain, ValueType::Time, ValueType::Invalid}) {
        ExtractedField value("f", "y", 0, false, IgnoreOnGroup::MustMatch, state);
        field.validate(value);
        EXPECT_EQ(value.valueType(), state);
    }
    EXPECT_EQ(validate(field, "y"), invalid("y"));
}

TEST(FieldValidation, LeavesADefaultAlone) {
    auto const field = finding("(?<VAL>\\d)", R"("default_value":"none","value_match":"\\d")");
    std::string text = "x";
    auto const value = field.extractField(text);
    field.validate(*value);
    EXPECT_EQ(typed(*value), plain("none"));
}

struct DefaultField {
    ExtractField const& field;
    char const* written;
};

TEST(DefaultFields, AreDefinedAsTheClientExpects) {
    DefaultField const rows[] = {
        {ExtractField::DefReference(),
         R"x({"name":"reference","value_extract":"^(?i:ref):+\\h*(?<VAL>\\S.*)$","send_to_server":true})x"},
        {ExtractField::DefEmail(),
         R"x({"name":"email","value_extract":"^(?i:email):+\\h*(?<VAL>.*)$","priority":2,"send_to_server":true,)x"
         R"x("value_match":"\\S.*@\\S.*\\.\\S.*"})x"},
        {ExtractField::DefFax(),
         R"x({"name":"fax","value_extract":"^(?i:fax):+\\h*(?<VAL>.*)$","priority":3,"send_to_server":true,)x"
         R"x("value_match":"\\S.*"})x"},
        {ExtractField::DefSms(),
         R"x({"name":"sms","value_extract":"^(?i:sms):+\\h*(?<VAL>.*)$","priority":4,"send_to_server":true,)x"
         R"x("value_match":"\\S.*"})x"},
        {ExtractField::DefPostal(),
         R"x({"name":"postal","value_extract":"\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z","priority":1,)x"
         R"x("send_to_server":true,"width":14000,"value_match":"(.{1,72}(\\n|$)){2,7}"})x"},
    };
    for (auto const& row : rows)
        EXPECT_EQ(print(row.field.serialize()), row.written);
}

TEST(DefaultFields, AreOneObjectEach) {
    EXPECT_EQ(&ExtractField::DefReference(), &ExtractField::DefReference());
    EXPECT_EQ(&ExtractField::DefEmail(), &ExtractField::DefEmail());
    EXPECT_EQ(&ExtractField::DefFax(), &ExtractField::DefFax());
    EXPECT_EQ(&ExtractField::DefSms(), &ExtractField::DefSms());
    EXPECT_EQ(&ExtractField::DefPostal(), &ExtractField::DefPostal());
}

TEST(DefaultFields, CoexistWithEachOther) {
    ExtractField const* const fields[] = {&ExtractField::DefReference(), &ExtractField::DefEmail(),
                                          &ExtractField::DefFax(), &ExtractField::DefSms(),
                                          &ExtractField::DefPostal()};
    for (auto const* const a : fields)
        for (auto const* const b : fields)
            EXPECT_EQ(a->fieldsCanCoexist(*b), a != b) << a->name() << " and " << b->name();
}

TEST(DefaultKeyedFields, TakeTheRestOfTheirLineAndLeaveTheOthers) {
    std::string text = "Dear Sir,\nEMAIL::  ann@acme.example\nsms:0123\nFax: 99\nRef:  A 1 \nBye";
    EXPECT_EQ(ExtractField::DefEmail().extractField(text)->strVal(), "ann@acme.example");
    EXPECT_EQ(ExtractField::DefSms().extractField(text)->strVal(), "0123");
    EXPECT_EQ(ExtractField::DefFax().extractField(text)->strVal(), "99");
    EXPECT_EQ(ExtractField::DefReference().extractField(text)->strVal(), "A 1 ");
    EXPECT_EQ(text, "Dear Sir,\n\n\n\n\nBye");
}

TEST(DefaultKeyedFields, StandAtTheBeginningOfALine) {
    EXPECT_EQ(extracted(ExtractField::DefEmail(), "My email: a@b.c"), "nothing");
    EXPECT_EQ(extracted(ExtractField::DefEmail(), "email a@b.c"), "nothing");
    EXPECT_EQ(extracted(ExtractField::DefReference(), "ref:   \n"), "nothing");
}

TEST(DefaultKeyedFields, TakeAnEmptyAddressAsAValueThatFailsValidation) {
    std::string text = "email:\nfax: \nsms:";
    for (auto const* const field :
         {&ExtractField::DefEmail(), &ExtractField::DefFax(), &ExtractField::DefSms()}) {
        auto const value = field->extractField(text);
        ASSERT_TRUE(value) << field->name();
        EXPECT_EQ(value->strVal(), "") << field->name();
        field->validate(*value);
        EXPECT_EQ(value->valueType(), ValueType::Invalid) << field->name();
    }
    EXPECT_EQ(text, "\n\n");
}

TEST(DefaultEmail, WantsAnAtSignAndADotBehindIt) {
    EXPECT_EQ(validate(ExtractField::DefEmail(), "ann@acme.example"), plain("ann@acme.example"));
    for (char const* const text : {"ann", "ann@acme", "@acme.example", "ann@acme.", " ann@acme.example"})
        EXPECT_EQ(validate(ExtractField::DefEmail(), text), invalid(text));
}

/// Lines of `width` characters each, with two bytes per character.
std::string block(int lines, int width = 3) {
    std::string line;
    for (int i = 0; i < width; ++i)
        line += "ö";
    std::string text;
    for (int i = 0; i < lines; ++i)
        text += (i ? "\n" : "") + line;
    return text;
}

TEST(DefaultPostal, AcceptsTwoToSevenLines) {
    for (int lines = 1; lines <= 10; ++lines) {
        std::string text = block(lines);
        auto const value = ExtractField::DefPostal().extractField(text);
        if (lines == 10) {
            EXPECT_FALSE(value);
            EXPECT_EQ(text, block(lines));
            continue;
        }
        ASSERT_TRUE(value) << lines;
        ExtractField::DefPostal().validate(*value);
        bool const good = lines >= 2 && lines <= 7;
        EXPECT_EQ(typed(*value), good ? plain(block(lines)) : invalid(block(lines))) << lines;
        EXPECT_EQ(text, "");
    }
}

TEST(DefaultPostal, AcceptsLinesOfSeventyTwoCharacters) {
    EXPECT_EQ(extracted(ExtractField::DefPostal(), block(2, 72)), '"' + block(2, 72) + '"');
    EXPECT_EQ(extracted(ExtractField::DefPostal(), block(2, 73)), "nothing");
    EXPECT_EQ(validate(ExtractField::DefPostal(), block(2, 72)), plain(block(2, 72)));
    EXPECT_EQ(validate(ExtractField::DefPostal(), block(2, 73)), invalid(block(2, 73)));
}

TEST(DefaultPostal, KeepsItsLineFeedsButNotTheFinalOne) {
    EXPECT_EQ(extracted(ExtractField::DefPostal(), "A\nB\n"), "\"A\nB\"");
}

TEST(DefaultPostal, YieldsNothingForAnEmptyLineOrReturns) {
    EXPECT_EQ(extracted(ExtractField::DefPostal(), "A\n\nB"), "nothing");
    EXPECT_EQ(extracted(ExtractField::DefPostal(), "\nA\nB"), "nothing");
    EXPECT_EQ(extracted(ExtractField::DefPostal(), ""), "nothing");
    EXPECT_EQ(extracted(ExtractField::DefPostal(), "A\r\nB\r\n"), "nothing");
}

TEST(DefaultPostal, YieldsNothingWhenItIsWiderThanAnAddress) {
    std::string text = block(3);
    EXPECT_TRUE(ExtractField::DefPostal().extractField(text, measuring(14000)));
    EXPECT_FALSE(ExtractField::DefPostal().extractField(text, measuring(14001)));
}

TEST(DefaultPostal, StopsALetterWithOneLineFromGoingOut) {
    std::string text = "A";
    auto const value = ExtractField::DefPostal().extractField(text);
    ExtractField::DefPostal().validate(*value);
    ExtractedFields fields;
    fields.emplace(value->priority(), *value);
    std::string message;
    EXPECT_FALSE(fields.isProductionReady(message));
    EXPECT_EQ(message, "Field name: \"postal\"");
}

} // namespace
} // namespace Cfg
