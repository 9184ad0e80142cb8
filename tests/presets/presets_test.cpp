#include "vlservice/presets/presets.h"

#include "tests/support/json_helpers.h"

#include <limits>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace Cfg {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr auto EXTRACT = PresetFieldIdxs::ExtractPresets;
constexpr auto PACK = PresetFieldIdxs::PackPresets;

constexpr bool GLOBAL = true;
constexpr bool SORTED = true;

constexpr char const* NO_PACK_PRESET = "Failed to find pack preset for extraction preset for ";
constexpr char const* NO_EXTRACT_PRESET = "Failed to find extraction preset for ";

Presets presets(std::string const& text, bool global = false, bool sorted = false) {
    return Presets(valueOf(text), global, sorted);
}

/// Name of each extraction preset, with a "^" for inherited ones.
std::vector<std::string> namesOf(Presets const& p) {
    std::vector<std::string> names;
    for (auto const& [preset, inh] : p.elements<EXTRACT>())
        names.push_back(preset.name() + (inh ? "^" : ""));
    return names;
}

std::vector<std::string> packNamesOf(Presets const& p) {
    std::vector<std::string> names;
    for (auto const& [preset, inh] : p.elements<PACK>())
        names.push_back(preset.name() + (inh ? "^" : ""));
    return names;
}

/// {"extract_presets":[{"match":..., "name":..., "order":...}...]}
std::string ordered(std::vector<std::pair<std::string, int>> const& nameAndOrder) {
    json::Array array;
    for (auto const& [name, order] : nameAndOrder)
        array.append(json::Object{{"match", name + ".*"}, {"name", name}, {"order", order}});
    return print(json::Object{{"extract_presets", array}});
}

TEST(PresetConstants, NamePartAndCatchAll) {
    EXPECT_EQ(Presets::PART_NAME, "presets");
    EXPECT_EQ(Presets::CATCH_ALL_PATTERN, ".*");
    EXPECT_EQ(Presets::CATCH_ALL_PACK_PRES_NAME, "GLOBAL");
}

TEST(PresetPositions, GiveExtractionPresetsThenPackPresets) {
    EXPECT_EQ(static_cast<int>(EXTRACT), 0);
    EXPECT_EQ(static_cast<int>(PACK), 1);
    EXPECT_EQ(
        print(presets(R"({"pack_presets":[{"name":"p"}],"extract_presets":[{"match":"m"}]})").serialize()),
        R"({"extract_presets":[{"match":"m"}],"pack_presets":[{"name":"p"}]})");
}

TEST(PresetReading, StartsEmpty) {
    Presets const p = presets("");
    EXPECT_TRUE(p.empty());
    EXPECT_FALSE(p.serialize());
    EXPECT_TRUE(presets(R"({"extract_presets":[],"pack_presets":[],"unknown":5})").empty());
}

TEST(PresetReading, IsNotEmptyWithOneOfTheLists) {
    EXPECT_FALSE(presets(R"({"extract_presets":[{}]})").empty());
    EXPECT_FALSE(presets(R"({"pack_presets":[{"name":""}]})").empty());
}

TEST(PresetReading, TellsOwnFromInheritedPresets) {
    Presets const p =
        presets(R"({"extract_presets":[{"name":"a"},{"inh":true,"v":{"name":"b"}},{"inh":false,"name":"c"}],)"
                R"("pack_presets":[{"inh":true,"v":{"name":"x"}},{"name":"y"}]})");
    EXPECT_THAT(namesOf(p), ElementsAre("a", "b^", "c"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("x^", "y"));
    EXPECT_EQ(
        print(p.serialize()),
        R"({"extract_presets":[{"match":"","name":"a"},{"match":"","name":"c"}],"pack_presets":[{"name":"y"}]})");
}

TEST(PresetReading, RefusesWrongTypes) {
    struct {
        char const* text;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {"5", "integer", "object"},
        {"null", "null", "object"},
        {"[]", "array", "object"},
        {R"({"extract_presets":{}})", "object", "array"},
        {R"({"pack_presets":null})", "null", "array"},
        {R"({"extract_presets":["m"]})", "string", "object"},
        {R"({"pack_presets":[{"name":"p"},5]})", "integer", "object"},
        {R"({"pack_presets":[{"inh":true}]})", "empty", "object"},
        {R"({"pack_presets":[{"inh":true,"v":5}]})", "integer", "object"},
        {R"({"pack_presets":[{}]})", "empty", "string"},
        {R"({"pack_presets":[{"pack_preset":"embedded"}]})", "empty", "string"},
        {R"({"extract_presets":[{"zones":{}}]})", "object", "array"},
        {R"({"extract_presets":5,"pack_presets":5.5})", "integer", "array"},
    };
    for (auto const& row : rows)
        expectWrongType([&] { presets(row.text); }, row.actual, row.wanted);
    expectFailure<std::runtime_error>([] { presets(R"({"pack_presets":[{"name":"p","process_mode":4}]})"); },
                                      "Invalid value for process_mode!");
}

TEST(PresetReading, LeavesTheListsAsTheyWereWhenItFails) {
    Presets p = presets(R"({"extract_presets":[{"name":"a"}],"pack_presets":[{"name":"p"}]})");
    expectWrongType(
        [&] {
            p.deserialize(valueOf(R"({"extract_presets":[{"name":"b"}],"pack_presets":[{"name":"q"},5]})"),
                          false);
        },
        "integer", "object");
    EXPECT_THAT(namesOf(p), ElementsAre("a", "b"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("p"));
}

TEST(PresetCatchAll, StandsInAGlobalPartWithoutConfiguration) {
    Presets const p = presets("", GLOBAL);
    ASSERT_EQ(p.elements<EXTRACT>().size(), 1U);
    ASSERT_EQ(p.elements<PACK>().size(), 1U);
    EXPECT_TRUE(p.elements<EXTRACT>().front().inh);
    EXPECT_TRUE(p.elements<PACK>().front().inh);

    PackPreset const& packPreset = p.elements<PACK>().front().value;
    EXPECT_EQ(packPreset.name(), "GLOBAL");
    EXPECT_EQ(packPreset.processMode(), ProcessMode(3));

    ExtractPreset const& extractPreset = p.elements<EXTRACT>().front().value;
    EXPECT_EQ(extractPreset.strRegex(), ".*");
    EXPECT_EQ(extractPreset.packPresetName(), "GLOBAL");
    EXPECT_EQ(extractPreset.order(), std::numeric_limits<int>::max());
    ASSERT_EQ(extractPreset.zones().size(), 1U);
    ExtractZone const& zone = extractPreset.zones().front();
    EXPECT_EQ(zone.name(), "_Address");
    EXPECT_FALSE(zone.hasLocation());
    std::vector<std::string> fields;
    for (ExtractField const& field : zone.fields())
        fields.push_back(field.name());
    EXPECT_THAT(fields, ElementsAre("reference", "email", "fax", "sms", "postal"));
}

TEST(PresetCatchAll, AnswersForEveryName) {
    Presets const p = presets("", GLOBAL);
    for (char const* name : {"", "a", "Invoice 2017.pdf", "two\nlines", "Übersicht"}) {
        auto const [extractPreset, packPreset] = p.findMatch(name);
        EXPECT_EQ(&extractPreset, &p.elements<EXTRACT>().front().value) << name;
        EXPECT_EQ(&packPreset, &p.elements<PACK>().front().value) << name;
    }
}

TEST(PresetCatchAll, IsWrittenWrappedAndFoundAgain) {
    Presets const p = presets("", GLOBAL);
    json::Object const written = p.serialize().toObject();
    for (char const* key : {"extract_presets", "pack_presets"}) {
        ASSERT_EQ(written.get(key).toArray().size(), 1U);
        EXPECT_TRUE(written.get(key).toArray().at(0).toObject().get("inh").isTrue()) << key;
    }
    EXPECT_EQ(print(written.get("pack_presets")), R"([{"inh":true,"v":{"name":"GLOBAL","process_mode":3}}])");
    EXPECT_EQ(Presets(written, GLOBAL, false).serialize(), written);
    EXPECT_EQ(Presets(written, GLOBAL, SORTED).serialize(), written);
}

TEST(PresetCatchAll, IsNotAddedToAPartThatIsNotGlobal) {
    EXPECT_THAT(packNamesOf(presets(R"({"pack_presets":[{"name":"p"}]})")), ElementsAre("p"));
    EXPECT_THAT(namesOf(presets(R"({"pack_presets":[{"name":"p"}]})")), IsEmpty());
}

TEST(PresetCatchAll, TakesTheConfiguredDefaultPackPreset) {
    Presets const p = presets(R"({"pack_presets":[{"name":"GLOBAL","title":"ours"}]})", GLOBAL);
    EXPECT_THAT(packNamesOf(p), ElementsAre("GLOBAL"));
    EXPECT_THAT(namesOf(p), ElementsAre("^"));
    EXPECT_EQ(p.findMatch("x").second.title(), "ours");
}

TEST(PresetCatchAll, TakesTheConfiguredCatchAllAndItsPackPreset) {
    Presets const p = presets(
        R"({"extract_presets":[{"match":".*","name":"all","pack_preset":"A"}],"pack_presets":[{"name":"A"}]})",
        GLOBAL);
    EXPECT_THAT(namesOf(p), ElementsAre("all"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("A"));
}

TEST(PresetCatchAll, StaysUnresolvedWhenItsPackPresetIsMissing) {
    Presets const p =
        presets(R"({"extract_presets":[{"match":".*","name":"all","pack_preset":"A"}]})", GLOBAL);
    EXPECT_THAT(namesOf(p), ElementsAre("all"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("GLOBAL^"));
    EXPECT_EQ(p.matchExtrPreset("x.pdf").name(), "all");
    expectFailure<std::runtime_error>([&] { p.findMatch("x.pdf"); }, std::string(NO_PACK_PRESET) + "x.pdf");
}

TEST(PresetCatchAll, IsDecidedByTheFirstOfSeveral) {
    Presets const p =
        presets(R"({"extract_presets":[{"match":".*","pack_preset":"A"},{"match":".*","pack_preset":"B"}],)"
                R"("pack_presets":[{"name":"B"}]})",
                GLOBAL);
    EXPECT_THAT(packNamesOf(p), ElementsAre("B", "GLOBAL^"));
}

TEST(PresetCatchAll, IsKnownByItsTextAndNotByWhatItMatches) {
    for (char const* pattern : {".+", "(.*)", ".*?", ""}) {
        json::Object const preset{{"match", pattern}, {"name", "own"}, {"pack_preset", "GLOBAL"}};
        json::Array array;
        array.append(preset);
        Presets const p(json::Object{{"extract_presets", array}}, GLOBAL, SORTED);
        EXPECT_THAT(namesOf(p), ElementsAre("own", "^")) << pattern;
    }
}

TEST(PresetCatchAll, StandsBehindEverythingInASortedList) {
    Presets const p =
        presets(ordered({{"last", std::numeric_limits<int>::max()}, {"first", -1}}), GLOBAL, SORTED);
    EXPECT_THAT(namesOf(p), ElementsAre("first", "last", "^"));
}

TEST(PresetOrder, IsThatOfArrivalWithoutSorting) {
    EXPECT_THAT(namesOf(presets(ordered({{"a", 5}, {"b", 1}, {"c", 5}}))), ElementsAre("a", "b", "c"));
}

TEST(PresetOrder, AscendsWithSortingAndKeepsArrivalAmongEquals) {
    EXPECT_THAT(namesOf(presets(ordered({{"a", 5}, {"b", 1}, {"c", 5}}), false, SORTED)),
                ElementsAre("b", "a", "c"));
    EXPECT_THAT(
        namesOf(presets(R"({"extract_presets":[{"name":"one","order":1},{"name":"none"}]})", false, SORTED)),
        ElementsAre("none", "one"));
}

TEST(PresetOrder, OfPackPresetsIsAlwaysThatOfArrival) {
    char const* const text = R"({"pack_presets":[{"name":"b","order":5},{"name":"a","order":1}]})";
    Presets p = presets(text, false, SORTED);
    EXPECT_THAT(packNamesOf(p), ElementsAre("b", "a"));
    p.deserializeParent(valueOf(text), SORTED);
    EXPECT_THAT(packNamesOf(p), ElementsAre("b", "a", "b^", "a^"));
}

TEST(PresetInheritance, PutsAParentsPresetsBehindOwnOnes) {
    Presets p = presets(ordered({{"own", 9}}), false, SORTED);
    p.deserializeParent(valueOf(ordered({{"a", 5}, {"b", 1}, {"c", 5}})), false);
    EXPECT_THAT(namesOf(p), ElementsAre("own", "a^", "b^", "c^"));
}

TEST(PresetInheritance, SortsEachCallByItselfInFrontOfEarlierOnes) {
    Presets p = presets(ordered({{"own", 9}}), false, SORTED);
    p.deserializeParent(valueOf(ordered({{"root5", 5}, {"root1", 1}})), SORTED);
    p.deserializeParent(valueOf(ordered({{"acc7", 7}, {"acc3", 3}, {"acc7b", 7}})), SORTED);
    EXPECT_THAT(namesOf(p), ElementsAre("own", "acc3^", "acc7^", "acc7b^", "root1^", "root5^"));
}

TEST(PresetInheritance, DoublesTheTailWhenAParentIsReadTwice) {
    Presets p = presets("");
    for (int i = 0; i < 2; ++i)
        p.deserializeParent(valueOf(R"({"extract_presets":[{"name":"a"}],"pack_presets":[{"name":"p"}]})"),
                            false);
    EXPECT_THAT(namesOf(p), ElementsAre("a^", "a^"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("p^", "p^"));
}

TEST(PresetInheritance, ReplacesTheTailWhenCombinedWithAParent) {
    Presets const parent = presets(
        R"({"extract_presets":[{"name":"d"},{"inh":true,"v":{"name":"e"}}],"pack_presets":[{"name":"q"}]})");
    Presets p = presets(
        R"({"extract_presets":[{"name":"a"},{"name":"b"},{"inh":true,"v":{"name":"c"}}],"pack_presets":[{"name":"p"}]})");
    for (int i = 0; i < 2; ++i) {
        p.combineParent(parent);
        EXPECT_THAT(namesOf(p), ElementsAre("a", "b", "d^", "e^"));
        EXPECT_THAT(packNamesOf(p), ElementsAre("p", "q^"));
    }
}

TEST(PresetInheritance, NeverBlendsPresetsOfOneName) {
    Presets p = presets(R"({"extract_presets":[{"match":"x","name":"own","pack_preset":"P"}],)"
                        R"("pack_presets":[{"name":"P","title":"own"}]})");
    p.combineParent(
        presets(R"({"extract_presets":[{"match":"x","name":"parent","pack_preset":"P","order":-5}],)"
                R"("pack_presets":[{"name":"P","duplex":true}]})"));
    EXPECT_THAT(namesOf(p), ElementsAre("own", "parent^"));
    EXPECT_THAT(packNamesOf(p), ElementsAre("P", "P^"));
    auto const [extractPreset, packPreset] = p.findMatch("X");
    EXPECT_EQ(extractPreset.name(), "own");
    EXPECT_EQ(packPreset.title(), "own");
    EXPECT_FALSE(packPreset.duplex());
}

TEST(PresetMatching, TakesTheFirstWholeNameMatchWithoutRegardToCase) {
    Presets const p = presets(R"({"extract_presets":[{"match":"invoice","name":"bare"},)"
                              R"({"match":"invoice.*\\.pdf","name":"pdf"},{"match":".*","name":"all"},)"
                              R"({"match":"z.*","name":"hidden"}]})");
    std::pair<char const*, char const*> const rows[] = {{"INVOICE", "bare"},
                                                        {"Invoice 2017.PDF", "pdf"},
                                                        {"Invoice 2017.pdf ", "all"},
                                                        {"zebra", "all"},
                                                        {"", "all"}};
    for (auto const& [name, preset] : rows)
        EXPECT_EQ(p.matchExtrPreset(name).name(), preset) << name;
}

TEST(PresetMatching, FailsWithTheDocumentsName) {
    expectFailure<std::runtime_error>([] { presets("").matchExtrPreset("a \"b\".pdf"); },
                                      std::string(NO_EXTRACT_PRESET) + "a \"b\".pdf");
    Presets const p =
        presets(R"({"extract_presets":[{"match":"a","pack_preset":"P"}],"pack_presets":[{"name":"p"}]})");
    expectFailure<std::runtime_error>([&] { p.findMatch("b"); }, std::string(NO_EXTRACT_PRESET) + "b");
    expectFailure<std::runtime_error>([&] { p.findMatch("A"); }, std::string(NO_PACK_PRESET) + "A");
}

TEST(PresetMatching, EndsAtABadExpressionThatItReaches) {
    Presets const p = presets(R"({"extract_presets":[{"match":"a.*"},{"match":"("},{"match":".*"}]})");
    EXPECT_NO_THROW(p.matchExtrPreset("abc"));
    EXPECT_THROW(p.matchExtrPreset("xyz"), std::runtime_error);
    EXPECT_THROW(p.matchExtrPreset("xyz"), std::runtime_error);
}

TEST(PresetMatching, PassesOverTypeAndMark) {
    Presets const p = presets(R"({"extract_presets":[{"match":"a","name":"attachments","type":1},)"
                              R"({"match":"b","erase_me":true},{"match":".*","name":"all"}]})");
    EXPECT_EQ(p.matchExtrPreset("a").name(), "attachments");
    EXPECT_TRUE(p.matchExtrPreset("b").eraseMe());
}

TEST(PresetTombstones, AreWrittenShortAndKept) {
    Presets p = presets(
        R"({"extract_presets":[{"match":"a","order":2,"name":"n","pack_preset":"P","erase_me":true}],)"
        R"("pack_presets":[{"name":"P","title":"t","erase_me":true}]})");
    char const* const shortForm =
        R"({"extract_presets":[{"match":"a","order":2,"erase_me":true}],"pack_presets":[{"name":"P","erase_me":true}]})";
    EXPECT_EQ(p.findMatch("a").second.title(), "t");
    EXPECT_EQ(print(p.serialize()), shortForm);

    Presets const readBack(p.serialize(), false, false);
    EXPECT_EQ(print(readBack.serialize()), shortForm);
    EXPECT_TRUE(readBack.matchExtrPreset("a").eraseMe());
    expectFailure<std::runtime_error>([&] { readBack.findMatch("a"); }, std::string(NO_PACK_PRESET) + "a");
}

TEST(PresetTombstones, FindAPackPresetWithoutAName) {
    Presets const p = presets(
        R"({"extract_presets":[{"match":"a","erase_me":true}],"pack_presets":[{"name":"","title":"unnamed"}]})");
    EXPECT_EQ(p.findMatch("a").second.title(), "unnamed");
}

TEST(PresetCopies, StartWithoutCompiledExpressions) {
    Presets p = presets(R"({"extract_presets":[{"match":"a","name":"first"},{"match":".*","name":"all"}]})");
    EXPECT_EQ(p.matchExtrPreset("a").name(), "first");
    Presets const other =
        presets(R"({"extract_presets":[{"match":"b","name":"first"},{"match":".*","name":"all"}]})");
    p = other;
    // The presets were overwritten in their places: the first one goes on answering by its former expression.
    EXPECT_EQ(p.matchExtrPreset("a").name(), "first");
    EXPECT_EQ(p.matchExtrPreset("b").name(), "all");
    EXPECT_EQ(p.matchExtrPreset("a").strRegex(), "b");
    Presets const copy(p);
    EXPECT_EQ(copy.matchExtrPreset("b").name(), "first");
    EXPECT_EQ(copy.matchExtrPreset("a").name(), "all");
}

TEST(PresetChanges, DoNotDisturbMatchedPresets) {
    Presets p = presets(R"({"extract_presets":[{"match":"a","name":"a"},{"match":"b","name":"b"}]})");
    EXPECT_EQ(p.matchExtrPreset("b").name(), "b");
    p.eraseOwn<EXTRACT>(0);
    EXPECT_EQ(p.matchExtrPreset("b").name(), "b");
    expectFailure<std::runtime_error>([&] { p.matchExtrPreset("a"); }, std::string(NO_EXTRACT_PRESET) + "a");
    p.addOwn<EXTRACT>(ExtractPreset("c", "P", nullptr));
    p.addOwn<PACK>(PackPreset(parse(R"({"name":"P"})"), {}));
    EXPECT_EQ(p.findMatch("c").second.name(), "P");
    EXPECT_EQ(p.matchExtrPreset("b").name(), "b");
}

} // namespace
} // namespace Cfg
