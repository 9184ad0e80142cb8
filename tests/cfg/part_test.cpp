// The framework of settings parts on a part made up for these tests: a value, a list, and a list whose
// elements have an order.
#include "vlservice/cfg/part.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <memory>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace VLServiceTest;

/// An element of the common kind: a constructor from an object, and serialize.
class Named {
public:
    Named(json::Object const& object) : name_(object.get("name").toString()) {}
    Named(std::string name) : name_(std::move(name)) {}
    json::Object serialize() const { return {{"name", name_}}; }
    std::string const& name() const { return name_; }

private:
    std::string name_;
};

/// An element with an order, whose JSON form is not that of the common kind. Like a preset it holds something
/// that an assignment leaves alone.
class Ranked {
public:
    Ranked(int order, std::string name) : order_(order), name_(std::move(name)) {}
    Ranked(Ranked const& other) : order_(other.order_), name_(other.name_) {}
    Ranked& operator=(Ranked const& other) {
        order_ = other.order_;
        name_ = other.name_;
        return *this;
    }
    int order() const { return order_; }
    std::string const& name() const { return name_; }
    std::string const& firstName() const { return firstName_ ? *firstName_ : name_; }
    void remember() const { firstName_ = std::make_shared<std::string>(name_); }

private:
    int order_;
    std::string name_;
    mutable std::shared_ptr<std::string> firstName_;
};

} // namespace

template<>
struct json::Form<Ranked> {
    static Ranked read(json::Value const& node) {
        json::Object const& object = node.toObject();
        return {static_cast<int>(object.get("order").intOrZero()), object.get("name").toString()};
    }
    static json::Value write(Ranked const& ranked) {
        return json::Object{{"order", ranked.order()}, {"name", ranked.name()}};
    }
};

namespace {

enum class Idx { Number, Plain, Ranked };

using Fields = std::tuple<Cfg::Field<int, Cfg::Value<int>>, Cfg::Field<Named, Cfg::ArrValue<Named>>,
                          Cfg::Field<Ranked, Cfg::ArrValue<Ranked>>>;

class Sample : public Cfg::Part<Idx, Fields> {
public:
    explicit Sample(json::Value const& j = {}, bool global = false, bool sorted = false)
        : Part(global, {{"number", Cfg::RootDefault{NUMBER_OF_THE_ROOT}}, {"plain"}, {"ranked"}}) {
        deserialize(j, sorted);
    }
    using Part::addInherited;
    using Part::setDefault;
    using Part::takeRootDefaults;

private:
    static constexpr int NUMBER_OF_THE_ROOT = 8;
};

/// The names in list order, inherited elements in brackets: "A B (C)".
template<Idx I>
std::string list(Sample const& part) {
    std::string text;
    for (auto const& element : part.elements<I>()) {
        text += text.empty() ? "" : " ";
        text += element.inh ? "(" + element.value.name() + ")" : element.value.name();
    }
    return text;
}

std::string plain(Sample const& part) { return list<Idx::Plain>(part); }
std::string ranked(Sample const& part) { return list<Idx::Ranked>(part); }

/// A document whose ranked elements are given as order and name.
json::Object rankedDocument(std::vector<std::pair<int, char const*>> const& elements) {
    json::Array array;
    for (auto const& [order, name] : elements)
        array.append(json::Object{{"order", order}, {"name", name}});
    return {{"ranked", array}};
}

static_assert(std::is_aggregate_v<Cfg::Value<int>> && std::is_aggregate_v<Cfg::ArrValue<Named>>);
static_assert(
    std::is_nothrow_move_constructible_v<Cfg::Part<Idx, std::tuple<Cfg::Field<int, Cfg::Value<int>>>>>);

TEST(PartValue, IsZeroAndInheritedByDefault) {
    Cfg::Value<int> const number{};
    EXPECT_EQ(number.value, 0);
    EXPECT_TRUE(number.inh);
    EXPECT_TRUE(Cfg::Value<std::string>{}.inh);
}

TEST(PartField, HoldsItsKeyAndItsInitialValue) {
    Cfg::Field<int, Cfg::Value<int>> const withDefault("number");
    EXPECT_STREQ(withDefault.key, "number");
    EXPECT_EQ(withDefault.setting.value, 0);
    EXPECT_TRUE(withDefault.setting.inh);
    Cfg::Field<int, Cfg::Value<int>> const own("number", {5, false});
    EXPECT_EQ(own.setting.value, 5);
    EXPECT_FALSE(own.setting.inh);
    Cfg::Field<Named, Cfg::ArrValue<Named>> const names("plain");
    EXPECT_STREQ(names.key, "plain");
    EXPECT_TRUE(names.elements.empty());
}

TEST(PartDeserializing, OfTheEmptyHandleChangesNothing) {
    Sample part(R"({"number": 5, "plain": [{"name": "A"}]})"_json);
    part.deserialize(json::Value(), false);
    EXPECT_EQ(part.value<Idx::Number>(), 5);
    EXPECT_FALSE(part.isInherited<Idx::Number>());
    EXPECT_EQ(plain(part), "A");
}

TEST(PartDeserializing, WantsAnObject) {
    EXPECT_EQ(messageOf([] { Sample part("[]"_json); }),
              "JSON error: Wrong type: array. Expected type: object");
    EXPECT_EQ(messageOf([] { Sample part("null"_json); }),
              "JSON error: Wrong type: null. Expected type: object");
    EXPECT_EQ(messageOf([] { Sample().deserializeParent("1"_json, false); }),
              "JSON error: Wrong type: integer. Expected type: object");
}

TEST(PartDeserializing, AMissingKeyMakesAValueInheritedAndKeepsIt) {
    Sample part(R"({"number": 5})"_json);
    part.deserialize("{}"_json, false);
    EXPECT_EQ(part.value<Idx::Number>(), 5);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
}

TEST(PartDeserializing, TakesAWrapperOnlyWithInhTrue) {
    Sample const wrapped(R"({"number": {"inh": true, "v": 5}})"_json);
    EXPECT_EQ(wrapped.value<Idx::Number>(), 5);
    EXPECT_TRUE(wrapped.isInherited<Idx::Number>());
    std::string const refused = "JSON error: Wrong type: object. Expected type: integer";
    EXPECT_EQ(messageOf([] { Sample part(R"({"number": {"inh": false, "v": 1}})"_json); }), refused);
    EXPECT_EQ(messageOf([] { Sample part(R"({"number": {"inh": 1, "v": 1}})"_json); }), refused);
    EXPECT_EQ(messageOf([] { Sample part(R"({"number": {"v": 1}})"_json); }), refused);
}

TEST(PartDeserializing, AFailingFieldStaysAsItWasAndThoseAheadAreChanged) {
    Sample part(R"({"number": 1, "plain": [{"name": "A"}], "ranked": [{"name": "R"}]})"_json);
    auto const bad =
        R"({"number": 2, "plain": [{"name": "B"}, {"name": 3}], "ranked": [{"name": "S"}]})"_json;
    EXPECT_EQ(messageOf([&] { part.deserialize(bad, false); }),
              "JSON error: Wrong type: integer. Expected type: string");
    EXPECT_EQ(part.value<Idx::Number>(), 2);
    EXPECT_EQ(plain(part), "A");
    EXPECT_EQ(ranked(part), "R");
    EXPECT_THROW(part.deserialize(R"({"number": "x"})"_json, false), json::Exc);
    EXPECT_EQ(part.value<Idx::Number>(), 2);
    EXPECT_FALSE(part.isInherited<Idx::Number>());
}

TEST(PartDeserializing, OfAListWantsAnArrayOfObjects) {
    EXPECT_EQ(messageOf([] { Sample part(R"({"plain": {}})"_json); }),
              "JSON error: Wrong type: object. Expected type: array");
    EXPECT_EQ(messageOf([] { Sample part(R"({"plain": null})"_json); }),
              "JSON error: Wrong type: null. Expected type: array");
    EXPECT_EQ(messageOf([] { Sample part(R"({"plain": ["A"]})"_json); }),
              "JSON error: Wrong type: string. Expected type: object");
    EXPECT_EQ(messageOf([] { Sample part(R"({"plain": [{"inh": true}]})"_json); }),
              "JSON error: Wrong type: empty. Expected type: object");
    EXPECT_EQ(messageOf([] { Sample part(R"({"plain": [{"inh": true, "v": "A"}]})"_json); }),
              "JSON error: Wrong type: string. Expected type: object");
}

TEST(PartDeserializing, OfAListTakesPlainAndWrappedElementsInTheirOrder) {
    Sample const part(
        R"({"plain": [{"name": "A"}, {"inh": true, "v": {"name": "B"}}, {"inh": false, "name": "C", "v": 1}]})"_json);
    EXPECT_EQ(plain(part), "A (B) C");
}

TEST(PartDeserializing, NeverClearsAList) {
    auto const document = R"({"plain": [{"name": "A"}, {"name": "B"}]})"_json;
    Sample part(document);
    part.deserialize(document, false);
    EXPECT_EQ(plain(part), "A B A B");
    part.deserialize("{}"_json, false);
    EXPECT_EQ(plain(part), "A B A B");
}

TEST(PartSorting, KeepsAListAscendingAndEqualElementsInTheirOrderOfArrival) {
    auto const document = rankedDocument({{5, "first"}, {1, "one"}, {5, "second"}});
    EXPECT_EQ(ranked(Sample(document, false, true)), "one first second");
    EXPECT_EQ(ranked(Sample(document, false, false)), "first one second");
}

TEST(PartSorting, IsIgnoredByListsWithoutAnOrder) {
    EXPECT_EQ(plain(Sample(R"({"plain": [{"name": "B"}, {"name": "A"}]})"_json, false, true)), "B A");
}

TEST(PartSorting, GoesInFrontOfTheFirstGreaterElementOfAnUnsortedList) {
    Sample part(rankedDocument({{5, "five"}, {1, "one"}, {9, "nine"}}), false, false);
    part.deserialize(rankedDocument({{7, "seven"}, {3, "three"}, {5, "five2"}, {9, "nine2"}, {1, "one2"}}),
                     true);
    EXPECT_EQ(ranked(part), "one2 three five one five2 seven nine nine2");
}

/// Element by element, as the rule for one of them says.
void insertOneByOne(std::vector<std::pair<int, std::string>>& list, int order, std::string const& name) {
    auto place = list.begin();
    while (place != list.end() && place->first <= order)
        ++place;
    list.insert(place, {order, name});
}

TEST(PartSorting, OfManyElementsIsWhatInsertingOneByOneGives) {
    unsigned state = 20240607;
    auto const next = [&state] { return (state = state * 1664525u + 1013904223u) >> 24; };
    for (int round = 0; round < 200; ++round) {
        std::vector<std::pair<int, std::string>> expected;
        Sample part;
        for (int call = 0; call < 3; ++call) {
            bool const sorted = next() % 3 != 0;
            json::Array array;
            for (unsigned i = next() % 8; i > 0; --i) {
                int const order = static_cast<int>(next() % 6);
                std::string const name = std::to_string(call) + "-" + std::to_string(i);
                array.append(json::Object{{"order", order}, {"name", name}});
                if (sorted)
                    insertOneByOne(expected, order, name);
                else
                    expected.emplace_back(order, name);
            }
            part.deserialize(json::Object{{"ranked", array}}, sorted);
        }
        std::string text;
        for (auto const& element : expected)
            text += (text.empty() ? "" : " ") + element.second;
        ASSERT_EQ(ranked(part), text) << "round " << round;
    }
}

TEST(PartParentJson, OfAKeyThatIsAbsentKeepsTheValueOfTheCallBefore) {
    Sample part;
    part.deserializeParent(R"({"number": 5})"_json, false);
    part.deserializeParent("{}"_json, false);
    EXPECT_EQ(part.value<Idx::Number>(), 5);
    part.deserializeParent(json::Value(), false);
    EXPECT_EQ(part.value<Idx::Number>(), 5);
    part.deserializeParent(R"({"number": 7})"_json, false);
    EXPECT_EQ(part.value<Idx::Number>(), 7);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
}

TEST(PartParentJson, NeverTouchesAnOwnValueNotEvenToRefuseIt) {
    Sample part(R"({"number": 1})"_json);
    part.deserializeParent(R"({"number": "x"})"_json, false);
    EXPECT_EQ(part.value<Idx::Number>(), 1);
    EXPECT_FALSE(part.isInherited<Idx::Number>());
}

TEST(PartParentJson, AppendsToAListWithEachCallAndMakesAllInherited) {
    Sample part(R"({"plain": [{"name": "A"}]})"_json);
    auto const parent = R"({"plain": [{"name": "P"}, {"inh": true, "v": {"name": "Q"}}]})"_json;
    part.deserializeParent(parent, false);
    EXPECT_EQ(plain(part), "A (P) (Q)");
    part.deserializeParent(parent, false);
    EXPECT_EQ(plain(part), "A (P) (Q) (P) (Q)");
    part.deserializeParent("{}"_json, false);
    EXPECT_EQ(plain(part), "A (P) (Q) (P) (Q)");
}

TEST(PartParentJson, OfAListThatFailsLeavesItAsItWas) {
    Sample part(R"({"plain": [{"name": "A"}]})"_json);
    EXPECT_EQ(messageOf([&] { part.deserializeParent(R"({"plain": [{"name": "P"}, 1]})"_json, false); }),
              "JSON error: Wrong type: integer. Expected type: object");
    EXPECT_EQ(plain(part), "A");
}

TEST(PartParentJson, SortedPutsEachCallsRunBehindTheLeadingOwnElements) {
    Sample part(rankedDocument({{8, "own8"}, {2, "own2"}}));
    part.deserializeParent(rankedDocument({{5, "root5"}, {1, "root1"}}), true);
    EXPECT_EQ(ranked(part), "own8 own2 (root1) (root5)");
    part.deserializeParent(rankedDocument({{9, "group9"}, {3, "group3"}, {9, "group9b"}}), true);
    EXPECT_EQ(ranked(part), "own8 own2 (group3) (group9) (group9b) (root1) (root5)");
}

TEST(PartParentJson, SortedLooksOnlyAtTheLeadingOwnElements) {
    Sample part(R"({"ranked": [{"name": "A"}, {"inh": true, "v": {"name": "I"}}, {"name": "B"}]})"_json);
    part.deserializeParent(rankedDocument({{1, "P"}}), true);
    EXPECT_EQ(ranked(part), "A (P) (I) B");
}

TEST(PartParentJson, UnsortedAppendsElementsWithAnOrderToo) {
    Sample part(rankedDocument({{8, "own8"}}));
    part.deserializeParent(rankedDocument({{5, "five"}, {1, "one"}}), false);
    EXPECT_EQ(ranked(part), "own8 (five) (one)");
}

TEST(PartCombining, ReplacesTheInheritedTailOfAList) {
    Sample part(R"({"plain": [{"name": "A"}, {"name": "B"}, {"inh": true, "v": {"name": "C"}}]})"_json);
    Sample const parent(R"({"plain": [{"name": "D"}]})"_json);
    part.combineParent(parent);
    EXPECT_EQ(plain(part), "A B (D)");
    part.combineParent(parent);
    EXPECT_EQ(plain(part), "A B (D)");
}

TEST(PartCombining, TakesAllOfTheParentsListWhateverItsState) {
    Sample part;
    part.combineParent(Sample(R"({"plain": [{"name": "D"}, {"inh": true, "v": {"name": "E"}}]})"_json));
    EXPECT_EQ(plain(part), "(D) (E)");
}

TEST(PartCombining, LosesAnOwnElementBehindAnInheritedOne) {
    Sample part(R"({"plain": [{"name": "A"}, {"inh": true, "v": {"name": "I"}}, {"name": "B"}]})"_json);
    part.combineParent(Sample());
    EXPECT_EQ(plain(part), "A");
}

TEST(PartCombining, TakesAValueWhateverItsState) {
    Sample part;
    part.combineParent(Sample(R"({"number": {"inh": true, "v": 4}})"_json));
    EXPECT_EQ(part.value<Idx::Number>(), 4);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
    Sample own(R"({"number": 1})"_json);
    own.combineParent(part);
    EXPECT_EQ(own.value<Idx::Number>(), 1);
}

TEST(PartCombining, WithItselfDoesNothing) {
    Sample part(R"({"number": 1, "plain": [{"name": "A"}, {"inh": true, "v": {"name": "C"}}]})"_json);
    part.combineParent(part);
    EXPECT_EQ(plain(part), "A (C)");
    EXPECT_EQ(part.value<Idx::Number>(), 1);
}

TEST(PartCombining, CopiesTheParentsElements) {
    Sample const parent(R"({"plain": [{"name": "D"}]})"_json);
    Sample part;
    part.combineParent(parent);
    EXPECT_NE(&part.elements<Idx::Plain>().front(), &parent.elements<Idx::Plain>().front());
    EXPECT_EQ(plain(parent), "D");
}

TEST(PartSerializing, GivesTheEmptyHandleWhenNoKeyIsWritten) {
    EXPECT_EQ(text(Sample().serialize()), "#absent#");
    EXPECT_EQ(text(Sample(R"({"number": {"inh": true, "v": 1}})"_json).serialize()), "#absent#");
    EXPECT_EQ(text(Sample(R"({"plain": []})"_json).serialize()), "#absent#");
}

TEST(PartSerializing, OfAGlobalPartWritesEveryFieldAsAWrapperAndEmptyLists) {
    EXPECT_EQ(text(Sample(json::Value(), true).serialize()),
              R"({"number":{"inh":true,"v":0},"plain":[],"ranked":[]})");
}

TEST(PartSerializing, WritesAnOwnValueThatEqualsTheParents) {
    Sample part(R"({"number": 5})"_json);
    part.combineParent(Sample(R"({"number": 5})"_json));
    EXPECT_EQ(text(part.serialize()), R"({"number":5})");
}

TEST(PartSerializing, OfAListWritesOwnElementsPlainAndInheritedOnesWrappedOrNotAtAll) {
    auto const document =
        R"({"plain": [{"name": "A"}, {"inh": true, "v": {"name": "B"}}, {"name": "C"}]})"_json;
    EXPECT_EQ(text(Sample(document).serialize()), R"({"plain":[{"name":"A"},{"name":"C"}]})");
    EXPECT_EQ(
        text(Sample(document, true).serialize()),
        R"({"number":{"inh":true,"v":0},"plain":[{"name":"A"},{"inh":true,"v":{"name":"B"}},{"name":"C"}],)"
        R"("ranked":[]})");
    EXPECT_EQ(text(Sample(R"({"plain": [{"inh": true, "v": {"name": "B"}}]})"_json).serialize()), "#absent#");
}

TEST(PartSerializing, OfAGlobalPartIsReadBackTheSame) {
    Sample const part(
        R"({"number": 3, "plain": [{"name": "A"}, {"inh": true, "v": {"name": "B"}}], "ranked": [{"order": 2, "name": "R"}]})"_json,
        true);
    EXPECT_EQ(Sample(part.serialize(), true).serialize(), part.serialize());
}

TEST(PartAccess, SetsAnOwnValueAndResetsIt) {
    Sample part;
    part.setOwn<Idx::Number>(9);
    EXPECT_EQ(part.value<Idx::Number>(), 9);
    EXPECT_FALSE(part.isInherited<Idx::Number>());
    part.resetToInherited<Idx::Number>();
    EXPECT_EQ(part.value<Idx::Number>(), 9);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
    part.combineParent(Sample(R"({"number": 2})"_json));
    EXPECT_EQ(part.value<Idx::Number>(), 2);
}

TEST(PartAccess, SetsADefaultThatIsInherited) {
    Sample part(R"({"number": 1})"_json);
    part.takeRootDefaults();
    EXPECT_EQ(part.value<Idx::Number>(), 1);
    part.setDefault<Idx::Number>(7);
    EXPECT_EQ(part.value<Idx::Number>(), 7);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
    part.takeRootDefaults();
    EXPECT_EQ(part.value<Idx::Number>(), 8);
    EXPECT_TRUE(part.isInherited<Idx::Number>());
}

TEST(PartAccess, AddsOwnElementsBehindTheLastOwnOne) {
    Sample part(R"({"plain": [{"name": "A"}, {"inh": true, "v": {"name": "I"}}]})"_json);
    part.addOwn<Idx::Plain>(Named("B"));
    EXPECT_EQ(plain(part), "A B (I)");
    Sample none(R"({"plain": [{"inh": true, "v": {"name": "I"}}]})"_json);
    none.addOwn<Idx::Plain>(Named("A"));
    EXPECT_EQ(plain(none), "A (I)");
    Sample empty;
    empty.addOwn<Idx::Plain>(Named("A"));
    EXPECT_EQ(plain(empty), "A");
    empty.addInherited<Idx::Plain>(Named("Z"));
    EXPECT_EQ(plain(empty), "A (Z)");
}

TEST(PartAccess, ErasesTheOwnElementAtItsPlaceAmongTheOwnOnes) {
    Sample part(
        R"({"plain": [{"name": "A"}, {"inh": true, "v": {"name": "I"}}, {"name": "B"}, {"name": "C"}]})"_json);
    part.eraseOwn<Idx::Plain>(1);
    EXPECT_EQ(plain(part), "A (I) C");
    part.eraseOwn<Idx::Plain>(0);
    EXPECT_EQ(plain(part), "(I) C");
    EXPECT_EQ(messageOf<std::out_of_range>([&] { part.eraseOwn<Idx::Plain>(1); }),
              "There is no own element at this position");
    EXPECT_EQ(messageOf<std::out_of_range>([] { Sample().eraseOwn<Idx::Plain>(0); }),
              "There is no own element at this position");
    EXPECT_EQ(plain(part), "(I) C");
}

TEST(PartAccess, ToAListDisturbsNoOtherElement) {
    Sample part(rankedDocument({{1, "A"}, {2, "B"}, {3, "C"}}));
    for (auto const& element : part.elements<Idx::Ranked>())
        element.value.remember();
    part.addOwn<Idx::Ranked>(Ranked(0, "D"));
    part.eraseOwn<Idx::Ranked>(0);
    part.deserialize(rankedDocument({{0, "E"}, {2, "F"}}), true);
    part.deserializeParent(rankedDocument({{0, "G"}}), true);
    EXPECT_EQ(ranked(part), "E B F C D (G)");
    for (auto const& element : part.elements<Idx::Ranked>())
        EXPECT_EQ(element.value.firstName(), element.value.name());
}

TEST(PartCopying, TakesFieldsStatesKeysAndTheGlobalFlag) {
    Sample const source(R"({"number": 3, "plain": [{"name": "A"}]})"_json, true);
    Sample const copy = source;
    EXPECT_TRUE(copy.global());
    EXPECT_EQ(copy.serialize(), source.serialize());
    Sample assigned(R"({"plain": [{"name": "X"}, {"name": "Y"}]})"_json);
    EXPECT_FALSE(assigned.global());
    assigned = source;
    EXPECT_TRUE(assigned.global());
    EXPECT_EQ(assigned.serialize(), source.serialize());
    Sample moved;
    moved = std::move(assigned);
    EXPECT_EQ(moved.serialize(), source.serialize());
}

TEST(PartCopying, AssignsElementsInPlaceOverThoseThatStandThere) {
    Sample target(rankedDocument({{1, "A"}}));
    target.elements<Idx::Ranked>().front().value.remember();
    Sample const source(rankedDocument({{1, "B"}}));
    target = source;
    EXPECT_EQ(ranked(target), "B");
    EXPECT_EQ(target.elements<Idx::Ranked>().front().value.firstName(), "A");
    Sample const copy = target;
    EXPECT_EQ(copy.elements<Idx::Ranked>().front().value.firstName(), "B");
}

} // namespace
