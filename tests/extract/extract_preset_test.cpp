#include "vlservice/extract/extract_preset.h"

#include "support.h"

#include <boost/regex/pattern_except.hpp>
#include <gmock/gmock.h>

#include <ctime>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

namespace Cfg {
namespace {

using testing::AllOf;
using testing::Ge;
using testing::Le;
using testing::StrEq;
using testing::ThrowsMessage;

ExtractPreset preset(std::string const& json) { return ExtractPreset(parse(json)); }

ExtractPreset matching(std::string const& regex) { return ExtractPreset(regex, "", nullptr); }

std::string written(ExtractPreset const& made) { return print(made.serialize()); }

std::shared_ptr<ExtractZones> oneZone(std::string const& name = "Z") {
    auto zones = std::make_shared<ExtractZones>();
    zones->emplace_back(name, std::vector<ExtractField>());
    return zones;
}

long long now() { return std::time(nullptr); }

/// MAX_ORDER as it was, behind a test that writes it.
class MaxOrder {
public:
    ~MaxOrder() { ExtractPreset::MAX_ORDER = before_; }

private:
    int before_ = ExtractPreset::MAX_ORDER;
};

TEST(ExtractPresetConstants, AreThoseOfTheClient) {
    EXPECT_EQ(ExtractPreset::MAX_ORDER, 2147483647);
    EXPECT_EQ(ExtractPreset::MAX_SPACES_BETWEEN_FRAGS_DEFAULT, 3.0);
    EXPECT_EQ(ExtractPreset::LINE_DISTANCE_MAX_DEFAULT, 1.8);
    EXPECT_EQ(static_cast<int>(ExtractPresetType::Letters), 0);
    EXPECT_EQ(static_cast<int>(ExtractPresetType::Attachments), 1);
    EXPECT_EQ(static_cast<int>(OcrMode::Default), 0);
    EXPECT_EQ(static_cast<int>(TETPageOption::Default), 0);
    static_assert(std::is_same_v<std::underlying_type_t<ExtractPresetType>, std::int32_t>);
    static_assert(std::is_same_v<std::underlying_type_t<OcrMode>, std::int32_t>);
    static_assert(std::is_same_v<std::underlying_type_t<TETPageOption>, std::int32_t>);
}

TEST(ExtractPresetConstruction, GivesDefaults) {
    ExtractPreset made;
    EXPECT_EQ(made.order(), 2147483647);
    EXPECT_EQ(made.strRegex(), "");
    EXPECT_EQ(made.packPresetName(), "");
    EXPECT_EQ(made.name(), "");
    EXPECT_EQ(made.type(), ExtractPresetType::Letters);
    EXPECT_FALSE(made.useFieldsOnly());
    EXPECT_EQ(made.ocrMode(), OcrMode::Default);
    EXPECT_EQ(made.ocrTestPages(), 0u);
    EXPECT_EQ(made.tetPageOption(), TETPageOption::Default);
    EXPECT_EQ(made.spaceAdjustPerc(), 0);
    EXPECT_FALSE(made.noSpacesInFrags());
    EXPECT_FALSE(made.trimFrags());
    EXPECT_FALSE(made.skipImagesAndFontNames());
    EXPECT_EQ(made.sigThresholdAdjust(), 0);
    EXPECT_EQ(made.retryOnRepeated(), 0u);
    EXPECT_FALSE(made.skipFirstPage());
    EXPECT_EQ(made.maxSpacesBetweenFrags(), 3.0);
    EXPECT_EQ(made.maxLineDistance(), 1.8);
    EXPECT_EQ(made.lastUsedAt(), 0);
    EXPECT_FALSE(made.lastUsedIsSet());
    EXPECT_FALSE(made.eraseMe());
    EXPECT_EQ(written(made), R"({"match":"","order":2147483647})");
}

TEST(ExtractPresetConstruction, TakesExpressionPackPresetAndZones) {
    auto const zones = oneZone();
    ExtractPreset const made("inv.*", "Invoices", zones);
    EXPECT_EQ(&made.zones(), zones.get());
    EXPECT_EQ(written(made), R"({"match":"inv.*","order":2147483647,"pack_preset":"Invoices",)"
                             R"("zones":[{"name":"Z","fields":[]}]})");
}

TEST(ExtractPresetConstruction, TakesFlagsAndZones) {
    auto const zones = oneZone();
    EXPECT_EQ(&ExtractPreset(true, false, false, zones).zones(), zones.get());
    EXPECT_EQ(written(ExtractPreset(true, false, false, nullptr)),
              R"({"match":"","order":2147483647,"use_only_fields":true})");
    EXPECT_EQ(written(ExtractPreset(false, true, false, nullptr)),
              R"({"match":"","order":2147483647,"skip_images":true})");
    EXPECT_EQ(written(ExtractPreset(false, false, true, nullptr)),
              R"({"match":"","order":2147483647,"skip_first_page":true})");
}

TEST(ExtractPresetConstruction, ReadsTheOrderThatTheProgramSet) {
    MaxOrder const restored;
    ExtractPreset::MAX_ORDER = 99;
    EXPECT_EQ(ExtractPreset().order(), 99);
    EXPECT_EQ(ExtractPreset("", "", nullptr).order(), 99);
    EXPECT_EQ(ExtractPreset(false, false, false, nullptr).order(), 99);
    EXPECT_EQ(preset("{}").order(), 0);
}

TEST(ExtractPresetReading, GivesAnEmptyObjectItsDefaults) {
    auto const read = preset("{}");
    EXPECT_EQ(read.order(), 0);
    EXPECT_EQ(read.strRegex(), "");
    EXPECT_EQ(read.maxSpacesBetweenFrags(), 3.0);
    EXPECT_EQ(read.maxLineDistance(), 1.8);
    EXPECT_EQ(written(read), R"({"match":""})");
}

std::string const EVERY_KEY =
    R"({"match":"inv.*","order":7,"pack_preset":"P","name":"N","type":1,"use_only_fields":true,"ocr_mode":2,)"
    R"("ocr_test_pages":3,"tet_granularity":4,"space_adjust_perc":-5,"no_spaces_in_frags":true,"trim_frags":true,)"
    R"("skip_images":true,"signature_adjust":-6,"retry_on_repeated":8,"skip_first_page":true,)"
    R"("last_used":5000000000,"max_spaces_between_fragments":2.5,"max_line_distance":1.25,)"
    R"("zones":[{"name":"Y","fields":[{"name":"f"}]},{"name":"Z","fields":[]}]})";

TEST(ExtractPresetReading, TakesEveryKey) {
    auto read = preset(EVERY_KEY);
    EXPECT_EQ(read.strRegex(), "inv.*");
    EXPECT_EQ(read.order(), 7);
    EXPECT_EQ(read.packPresetName(), "P");
    EXPECT_EQ(read.name(), "N");
    EXPECT_EQ(read.type(), ExtractPresetType::Attachments);
    EXPECT_TRUE(read.useFieldsOnly());
    EXPECT_EQ(static_cast<int>(read.ocrMode()), 2);
    EXPECT_EQ(read.ocrTestPages(), 3u);
    EXPECT_EQ(static_cast<int>(read.tetPageOption()), 4);
    EXPECT_EQ(read.spaceAdjustPerc(), -5);
    EXPECT_TRUE(read.noSpacesInFrags());
    EXPECT_TRUE(read.trimFrags());
    EXPECT_TRUE(read.skipImagesAndFontNames());
    EXPECT_EQ(read.sigThresholdAdjust(), -6);
    EXPECT_EQ(read.retryOnRepeated(), 8u);
    EXPECT_TRUE(read.skipFirstPage());
    EXPECT_EQ(read.lastUsedAt(), 5000000000);
    EXPECT_TRUE(read.lastUsedIsSet());
    EXPECT_EQ(read.maxSpacesBetweenFrags(), 2.5);
    EXPECT_EQ(read.maxLineDistance(), 1.25);
    EXPECT_EQ(read.zones().size(), 2u);
    EXPECT_FALSE(read.eraseMe());
    EXPECT_TRUE(preset(R"({"erase_me":true})").eraseMe());
}

TEST(ExtractPresetReading, TakesAnotherJsonTypeAsMissing) {
    EXPECT_EQ(written(preset(R"({"match":5,"order":"7","pack_preset":1,"name":null,"type":1.0,
        "use_only_fields":1,"ocr_mode":"2","ocr_test_pages":true,"tet_granularity":[],"space_adjust_perc":{},
        "no_spaces_in_frags":"true","trim_frags":0,"skip_images":null,"signature_adjust":"x",
        "retry_on_repeated":1.5,"skip_first_page":false,"last_used":"now","max_spaces_between_fragments":"2",
        "max_line_distance":true,"erase_me":1})")),
              R"({"match":""})");
}

TEST(ExtractPresetReading, CutsNumbersToTheirWidth) {
    auto const read = preset(R"({"order":4294967297,"ocr_test_pages":-1,"retry_on_repeated":4294967298})");
    EXPECT_EQ(read.order(), 1);
    EXPECT_EQ(read.ocrTestPages(), 4294967295u);
    EXPECT_EQ(read.retryOnRepeated(), 2u);
    EXPECT_EQ(written(read), R"({"match":"","order":1,"ocr_test_pages":4294967295,"retry_on_repeated":2})");
}

TEST(ExtractPresetReading, TakesDistancesThatAreGreaterThanZero) {
    struct {
        char const* value;
        double spaces;
        double distance;
    } const rows[] = {
        {"-1", 3.0, 1.8},  {"0", 3.0, 1.8}, {"0.0", 3.0, 1.8}, {"-0.5", 3.0, 1.8},
        {"0.1", 0.1, 0.1}, {"2", 2.0, 2.0}, {"1e9", 1e9, 1e9},
    };
    for (auto const& row : rows) {
        auto const read = preset(std::string(R"({"max_spaces_between_fragments":)") + row.value +
                                 R"(,"max_line_distance":)" + row.value + "}");
        EXPECT_EQ(read.maxSpacesBetweenFrags(), row.spaces) << row.value;
        EXPECT_EQ(read.maxLineDistance(), row.distance) << row.value;
    }
}

TEST(ExtractPresetReading, NeedsZonesToBeAnArrayOfZones) {
    expectWrongType([] { preset(R"({"zones":{}})"); }, "object", "array");
    expectWrongType([] { preset(R"({"zones":null})"); }, "null", "array");
    expectWrongType([] { preset(R"({"zones":["Z"]})"); }, "string", "object");
    expectWrongType([] { preset(R"({"zones":[{"name":"Z"}]})"); }, "empty", "array");
}

TEST(ExtractPresetWriting, WritesKeysInOrder) { EXPECT_EQ(written(preset(EVERY_KEY)), EVERY_KEY); }

TEST(ExtractPresetWriting, WritesDistancesAsRealsWhenTheyDiffer) {
    EXPECT_EQ(written(preset(R"({"max_spaces_between_fragments":3,"max_line_distance":1.8})")),
              R"({"match":""})");
    EXPECT_EQ(written(preset(R"({"max_spaces_between_fragments":1,"max_line_distance":2})")),
              R"({"match":"","max_spaces_between_fragments":1.0,"max_line_distance":2.0})");
}

TEST(ExtractPresetWriting, SendsAMarkedPresetAsATombstone) {
    auto made = preset(EVERY_KEY);
    made.setEraseMe(true);
    EXPECT_EQ(written(made), R"({"match":"inv.*","order":7,"erase_me":true})");
    made.setOrder(0);
    EXPECT_EQ(written(made), R"({"match":"inv.*","erase_me":true})");
    made.setEraseMe(false);
    EXPECT_TRUE(made.serialize().get("zones"));
}

TEST(ExtractPresetWriting, WritesNoEmptyZones) {
    EXPECT_EQ(written(preset(R"({"zones":[]})")), R"({"match":""})");
    auto const none = preset("{}");
    EXPECT_TRUE(none.zones().empty()); // makes a list
    EXPECT_EQ(&none.zones(), &none.zones());
    EXPECT_EQ(written(none), R"({"match":""})");
}

TEST(ExtractPresetAccess, EachSetterWritesItsMemberAlone) {
    struct {
        void (*set)(ExtractPreset&);
        char const* written;
    } const rows[] = {
        {[](ExtractPreset& p) { p.setRegex("x"); }, R"({"match":"x"})"},
        {[](ExtractPreset& p) { p.setOrder(-1); }, R"({"match":"","order":-1})"},
        {[](ExtractPreset& p) { p.setPackPreset("P"); }, R"({"match":"","pack_preset":"P"})"},
        {[](ExtractPreset& p) { p.setName("N"); }, R"({"match":"","name":"N"})"},
        {[](ExtractPreset& p) { p.setType(ExtractPresetType(9)); }, R"({"match":"","type":9})"},
        {[](ExtractPreset& p) { p.setUseFieldsOnly(true); }, R"({"match":"","use_only_fields":true})"},
        {[](ExtractPreset& p) { p.setOcrMode(OcrMode(9)); }, R"({"match":"","ocr_mode":9})"},
        {[](ExtractPreset& p) { p.setOcrTestPages(9); }, R"({"match":"","ocr_test_pages":9})"},
        {[](ExtractPreset& p) { p.setTetPageOption(TETPageOption(9)); },
         R"({"match":"","tet_granularity":9})"},
        {[](ExtractPreset& p) { p.setSpaceAdjustPerc(-9); }, R"({"match":"","space_adjust_perc":-9})"},
        {[](ExtractPreset& p) { p.setNoSpacesInFrags(true); }, R"({"match":"","no_spaces_in_frags":true})"},
        {[](ExtractPreset& p) { p.setTrimFrags(true); }, R"({"match":"","trim_frags":true})"},
        {[](ExtractPreset& p) { p.setSkipImagesAndFontNames(true); }, R"({"match":"","skip_images":true})"},
        {[](ExtractPreset& p) { p.setSigThresholdAdjust(-9); }, R"({"match":"","signature_adjust":-9})"},
        {[](ExtractPreset& p) { p.setRetryOnRepeated(9); }, R"({"match":"","retry_on_repeated":9})"},
        {[](ExtractPreset& p) { p.setSkipFirstPage(true); }, R"({"match":"","skip_first_page":true})"},
        {[](ExtractPreset& p) { p.setMaxSpacesBetweenFrags(1); },
         R"({"match":"","max_spaces_between_fragments":1.0})"},
        {[](ExtractPreset& p) { p.setMaxLineDistance(1); }, R"({"match":"","max_line_distance":1.0})"},
        {[](ExtractPreset& p) { p.setEraseMe(true); }, R"({"match":"","erase_me":true})"},
        {[](ExtractPreset& p) { p.zones().emplace_back(); },
         R"({"match":"","zones":[{"name":"","fields":[]}]})"},
    };
    for (auto const& row : rows) {
        auto made = preset("{}");
        row.set(made);
        EXPECT_EQ(written(made), row.written);
    }
}

TEST(ExtractPresetAccess, ChangesItsBookkeepingThroughAConstObject) {
    ExtractPreset const made;
    made.setOrder(5);
    made.setEraseMe(true);
    auto const before = now();
    made.resetLastUsed();
    EXPECT_EQ(made.order(), 5);
    EXPECT_TRUE(made.eraseMe());
    EXPECT_THAT(made.lastUsedAt(), AllOf(Ge(before), Le(now())));
}

TEST(ExtractPresetAccess, ForgetsTheLastUse) {
    auto made = preset(R"({"last_used":5})");
    EXPECT_TRUE(made.lastUsedIsSet());
    made.deleteLastUsed();
    EXPECT_FALSE(made.lastUsedIsSet());
    EXPECT_EQ(made.lastUsedAt(), 0);
}

TEST(ExtractPresetType, IsForLettersOrAttachmentsOrNeither) {
    for (int const type : {-1, 0, 1, 2}) {
        ExtractPreset made;
        made.setType(ExtractPresetType(type));
        EXPECT_EQ(made.isForLetters(), type == 0) << type;
        EXPECT_EQ(made.isForAttachemnt(), type == 1) << type;
    }
}

struct NameCase {
    char const* regex;
    char const* name;
    bool matches;
};

NameCase const NAMES[] = {
    {"invoice", "Invoice 2017.pdf", false},
    {"invoice.*", "Invoice 2017.pdf", true},
    {R"(invoice\.pdf)", "INVOICE.PDF", true},
    {R"(invoice\.pdf)", "invoice_pdf", false},
    {".*pdf", "invoice.pdf.txt", false},
    {"", "", true},
    {"", "a", false},
    {"a|ab", "ab", true}, // the whole name, whichever branch it takes
    {"ПИСЬМО.*", "письмо 01.pdf", true},
    {"größe", "GRÖßE", true},
    {"straße", "STRASSE", false}, // one character for one
    {"^.{3}$", "äöü", true},
    {".", "😀", true},
    {".*", "two\nlines\r\n", true},
    {".*", "\u2028", true},
    {R"(\d+)", "٣٤", true},
    {"[a-c]+", "ABC", true},
    {R"((x)\1)", "xX", true},
};

TEST(ExtractPresetMatching, FitsTheWholeNameWithoutRegardToCase) {
    for (auto const& row : NAMES) {
        EXPECT_EQ(matching(row.regex).match(row.name), row.matches) << row.regex << " on " << row.name;
        EXPECT_EQ(ExtractPreset::match(row.regex, row.name), row.matches) << row.regex << " on " << row.name;
    }
}

TEST(ExtractPresetMatching, RepeatsItsAnswers) {
    auto const made = matching("a+");
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(made.match("aA"));
        EXPECT_FALSE(made.match("b"));
    }
}

TEST(ExtractPresetMatching, RefusesABadExpressionEachTime) {
    auto const made = matching("(");
    EXPECT_THROW(made.match("a"), boost::regex_error);
    EXPECT_THROW(made.match("a"), std::runtime_error);
    EXPECT_THROW(ExtractPreset::match("*", "a"), boost::regex_error);
}

TEST(ExtractPresetMatching, RefusesWhatIsNotUtf8) {
    auto const refused = ThrowsMessage<std::out_of_range>(
        StrEq("Invalid UTF-8 sequence encountered while trying to encode UTF-32 character"));
    for (char const* const bad :
         {"\xff", "a\xe2\x82", "\x80", "x\xc0\xaf", "\xed\xa0\x80", "\xf4\x90\x80\x80"}) {
        EXPECT_THAT([&] { matching(bad).match(""); }, refused);
        EXPECT_THAT([&] { ExtractPreset::match(bad, "a"); }, refused);
        EXPECT_THAT([&] { matching("x").match(bad); }, refused); // though the first character decides
        EXPECT_THAT([&] { ExtractPreset::match("", bad); }, refused);
    }
}

TEST(ExtractPresetMatching, CompilesTheExpressionBeforeItReadsTheName) {
    EXPECT_THROW(matching("(").match("\xff"), boost::regex_error);
}

TEST(ExtractPresetMatching, RefusesRunawayBacktracking) {
    EXPECT_THROW(matching("(a|aa)*b").match(std::string(40, 'a')), std::runtime_error);
}

TEST(ExtractPresetCache, SurvivesANewExpression) {
    auto made = matching("a");
    EXPECT_TRUE(made.match("a"));
    made.setRegex("b");
    EXPECT_TRUE(made.match("a"));
    EXPECT_FALSE(made.match("b"));
    EXPECT_EQ(made.strRegex(), "b");
    EXPECT_EQ(made.serialize().get("match"), json::Value("b"));
}

TEST(ExtractPresetCache, SurvivesBothAssignments) {
    auto made = matching("a");
    auto const other = matching("b");
    EXPECT_TRUE(made.match("a"));
    EXPECT_TRUE(other.match("b"));
    made = other;
    EXPECT_TRUE(made.match("a"));
    made = matching("c");
    EXPECT_TRUE(made.match("a"));
    EXPECT_EQ(made.strRegex(), "c");
}

TEST(ExtractPresetCache, TakesTheNewTextWhileItIsEmpty) {
    auto made = matching("a");
    made = matching("b");
    made.setRegex("c");
    EXPECT_TRUE(made.match("c"));
}

TEST(ExtractPresetCache, StartsEmptyInCopiesAndMovedToPresets) {
    auto made = matching("a");
    EXPECT_TRUE(made.match("a"));
    made.setRegex("b");
    ExtractPreset const copy = made;
    EXPECT_TRUE(copy.match("b"));
    ExtractPreset const moved = std::move(made);
    EXPECT_TRUE(moved.match("b"));
}

TEST(ExtractPresetCopies, HaveZonesOfTheirOwn) {
    ExtractPreset const made("a", "P", oneZone());
    ExtractPreset copy = made;
    ExtractPreset assigned;
    assigned = made;
    EXPECT_NE(&copy.zones(), &made.zones());
    EXPECT_NE(&assigned.zones(), &made.zones());
    EXPECT_EQ(copy, made);
    EXPECT_EQ(assigned, made);
    copy.zones().front().setName("Y");
    EXPECT_EQ(made.zones().front().name(), "Z");
}

TEST(ExtractPresetCopies, HaveNoZonesWhereThereAreNone) {
    auto const empty = std::make_shared<ExtractZones>();
    ExtractPreset const made("a", "P", empty);
    ExtractPreset const copy = made;
    EXPECT_NE(&copy.zones(), empty.get());
    ExtractPreset assigned("a", "P", oneZone());
    assigned = made;
    EXPECT_TRUE(assigned.zones().empty());
}

TEST(ExtractPresetCopies, AreSafeOfThemselves) {
    ExtractPreset made("a", "P", oneZone());
    auto& self = made;
    made = self;
    EXPECT_EQ(written(made), written(ExtractPreset("a", "P", oneZone())));
}

TEST(ExtractPresetCopies, TakeOverEverything) {
    auto const made = preset(EVERY_KEY);
    ExtractPreset copy = made;
    EXPECT_EQ(written(copy), EVERY_KEY);
    ExtractPreset const moved = std::move(copy);
    EXPECT_EQ(written(moved), EVERY_KEY);
}

TEST(ExtractPresetMoving, TakesTheZonesAndThrowsNothing) {
    static_assert(std::is_nothrow_move_constructible_v<ExtractPreset>);
    static_assert(std::is_nothrow_move_assignable_v<ExtractPreset>);
    auto const zones = oneZone();
    ExtractPreset made("a", "P", zones);
    ExtractPreset moved = std::move(made);
    EXPECT_EQ(&moved.zones(), zones.get());
    ExtractPreset assigned("b", "Q", oneZone("Y"));
    assigned = std::move(moved);
    EXPECT_EQ(&assigned.zones(), zones.get());
    EXPECT_EQ(assigned.strRegex(), "a");
}

TEST(ExtractPresetEquality, ComparesEverySetting) {
    void (*const settings[])(ExtractPreset&) = {
        [](ExtractPreset& p) { p.resetLastUsed(); },
        [](ExtractPreset& p) { p.setType(ExtractPresetType::Attachments); },
        [](ExtractPreset& p) { p.setUseFieldsOnly(true); },
        [](ExtractPreset& p) { p.setOcrMode(OcrMode(1)); },
        [](ExtractPreset& p) { p.setOcrTestPages(1); },
        [](ExtractPreset& p) { p.setTetPageOption(TETPageOption(1)); },
        [](ExtractPreset& p) { p.setSpaceAdjustPerc(1); },
        [](ExtractPreset& p) { p.setNoSpacesInFrags(true); },
        [](ExtractPreset& p) { p.setTrimFrags(true); },
        [](ExtractPreset& p) { p.setSkipImagesAndFontNames(true); },
        [](ExtractPreset& p) { p.setSigThresholdAdjust(1); },
        [](ExtractPreset& p) { p.setRetryOnRepeated(1); },
        [](ExtractPreset& p) { p.setSkipFirstPage(true); },
        [](ExtractPreset& p) { p.setMaxSpacesBetweenFrags(1); },
        [](ExtractPreset& p) { p.setMaxLineDistance(1); },
        [](ExtractPreset& p) { p.setEraseMe(true); },
        [](ExtractPreset& p) { p.zones().front().setName("Y"); },
        [](ExtractPreset& p) { p.zones().emplace_back(); },
        [](ExtractPreset& p) { p.zones().clear(); },
    };
    ExtractPreset const made("a", "P", oneZone());
    EXPECT_TRUE(made.compareSettings(ExtractPreset("a", "P", oneZone())));
    EXPECT_TRUE(made == ExtractPreset("a", "P", oneZone()));
    for (auto const change : settings) {
        ExtractPreset other = made;
        change(other);
        EXPECT_FALSE(made.compareSettings(other)) << written(other);
        EXPECT_FALSE(made == other) << written(other);
        EXPECT_TRUE(made != other) << written(other);
    }
}

TEST(ExtractPresetEquality, ComparesWhatIdentifiesItApartFromTheSettings) {
    void (*const identity[])(ExtractPreset&) = {
        [](ExtractPreset& p) { p.setName("N"); },
        [](ExtractPreset& p) { p.setPackPreset("Q"); },
        [](ExtractPreset& p) { p.setRegex("b"); },
        [](ExtractPreset& p) { p.setOrder(1); },
    };
    ExtractPreset const made("a", "P", oneZone());
    for (auto const change : identity) {
        ExtractPreset other = made;
        change(other);
        EXPECT_TRUE(made.compareSettings(other)) << written(other);
        EXPECT_FALSE(made == other) << written(other);
    }
}

TEST(ExtractPresetEquality, TakesNoZonesForEmptyZones) {
    ExtractPreset const none("a", "P", nullptr);
    ExtractPreset const empty("a", "P", std::make_shared<ExtractZones>());
    EXPECT_EQ(none, empty);
    EXPECT_EQ(empty, none);
    EXPECT_NE(none, ExtractPreset("a", "P", oneZone()));
    EXPECT_NE(ExtractPreset("a", "P", oneZone()), none);
}

TEST(AutoExpire, MakesAPresetForOneNameThatWasUsedNow) {
    auto made = preset(R"({"name":"N","match":"x","pack_preset":"P"})");
    auto const before = now();
    made.setAsAutoExpireFor("Smith & Co (1)");
    EXPECT_EQ(made.strRegex(), R"(Smith & Co \(1\))");
    EXPECT_EQ(made.packPresetName(), "#auto_Smith & Co (1)");
    EXPECT_EQ(made.name(), "");
    EXPECT_THAT(made.lastUsedAt(), AllOf(Ge(before), Le(now())));
    EXPECT_TRUE(made.match("smith & co (1)"));
    EXPECT_FALSE(made.match("Smith & Co 1"));
}

TEST(AutoExpire, EscapesWhatIsSpecialInAnExpression) {
    struct {
        char const* name;
        char const* regex;
    } const rows[] = {
        {"a.b[1]", R"(a\.b\[1])"}, {R"(.[{}()\*+?|^$)", R"(\.\[\{\}\(\)\\\*\+\?\|\^\$)"},
        {R"(a\.b)", R"(a\\\.b)"},  {"a-b]c", "a-b]c"},
        {"..", R"(\.\.)"},         {"", ""},
        {"grüße 😀", "grüße 😀"},
    };
    for (auto const& row : rows) {
        ExtractPreset made;
        made.setAsAutoExpireFor(row.name);
        EXPECT_EQ(made.strRegex(), row.regex) << row.name;
        EXPECT_TRUE(made.match(row.name)) << row.name;
    }
}

TEST(AutoExpire, TakesTheNameFromThePresetItself) {
    ExtractPreset made;
    made.setRegex("a.b");
    made.setAsAutoExpireFor(made.strRegex());
    EXPECT_EQ(made.strRegex(), R"(a\.b)");
    EXPECT_EQ(made.packPresetName(), "#auto_a.b");
    made.setName("c.d");
    made.setAsAutoExpireFor(made.name());
    EXPECT_EQ(made.strRegex(), R"(c\.d)");
    made.setAsAutoExpireFor(made.packPresetName());
    EXPECT_EQ(made.strRegex(), R"(#auto_c\.d)");
    EXPECT_EQ(made.packPresetName(), "#auto_#auto_c.d");
}

TEST(AutoExpire, LeavesTheCompiledExpression) {
    auto made = matching("a");
    EXPECT_TRUE(made.match("a"));
    made.setAsAutoExpireFor("b");
    EXPECT_TRUE(made.match("a"));
    EXPECT_FALSE(made.match("b"));
}

} // namespace
} // namespace Cfg
