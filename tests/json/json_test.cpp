#include "vlservice/json/json.h"

#include "tests/support/json_literal.h"
#include "tests/support/sanitized.h"

#include <gmock/gmock.h>

#include <functional>
#include <limits>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace VLServiceTest;
using testing::ElementsAre;
using testing::Pair;

std::string wrongType(std::string const& actual, std::string const& expected) {
    return "JSON error: Wrong type: " + actual + ". Expected type: " + expected;
}

// What must not compile, or only where the conversion is asked for.
static_assert(!std::is_convertible_v<json_t*, json::Value>);
static_assert(std::is_constructible_v<json::Value, json_t*>);
static_assert(!std::is_convertible_v<void*, json::Value>);
static_assert(!std::is_constructible_v<json::Value, void*>);
static_assert(!std::is_constructible_v<json::Value, int const*>);
static_assert(!std::is_constructible_v<json::Value, char>);
static_assert(!std::is_constructible_v<json::Value, unsigned char>);
static_assert(!std::is_constructible_v<json::Value, wchar_t>);
static_assert(!std::is_constructible_v<json::Object, json::Value>);
static_assert(!std::is_constructible_v<json::Array, json::Value>);
static_assert(!std::is_convertible_v<json::Value, bool>);
static_assert(std::is_convertible_v<bool, json::Value>);
static_assert(std::is_convertible_v<short, json::Value>);
static_assert(std::is_convertible_v<unsigned long long, json::Value>);
static_assert(std::is_convertible_v<double, json::Value>);
static_assert(std::is_convertible_v<char const*, json::Value>);
static_assert(std::is_convertible_v<std::string, json::Value>);
static_assert(std::is_base_of_v<std::runtime_error, json::Exc>);
static_assert(std::is_convertible_v<std::string, json::Exc>);
static_assert(std::is_nothrow_move_constructible_v<json::Value>);
static_assert(sizeof(json::Value) == sizeof(json_t*) && sizeof(json::Object) == sizeof(json_t*));

struct TypeCase {
    char const* name;
    json::Value value;
    bool isObject, isArray, isString, isInt, isReal, isTrue;
};

std::vector<TypeCase> typeCases() {
    return {
        {"empty", {}, false, false, false, false, false, false},
        {"object", json::Object(), true, false, false, false, false, false},
        {"array", json::Array(), false, true, false, false, false, false},
        {"string", "text", false, false, true, false, false, false},
        {"integer", 1, false, false, false, true, false, false},
        {"float", 1.0, false, false, false, false, true, false},
        {"boolean", true, false, false, false, false, false, true},
        {"boolean", false, false, false, false, false, false, false},
        {"null", "null"_json, false, false, false, false, false, false},
    };
}

TEST(JsonTypes, HaveTheirNamesAndTests) {
    for (TypeCase const& c : typeCases()) {
        SCOPED_TRACE(text(c.value));
        EXPECT_STREQ(c.value.typeName(), c.name);
        EXPECT_EQ(c.value.isObject(), c.isObject);
        EXPECT_EQ(c.value.isArray(), c.isArray);
        EXPECT_EQ(c.value.isString(), c.isString);
        EXPECT_EQ(c.value.isInt(), c.isInt);
        EXPECT_EQ(c.value.isReal(), c.isReal);
        EXPECT_EQ(c.value.isTrue(), c.isTrue);
    }
}

TEST(JsonTypes, OutsideTheTableAreUnknown) {
    if (SANITIZED)
        GTEST_SKIP() << "the sanitizers object to the value itself";
    json_t strange{static_cast<json_type>(99), static_cast<std::size_t>(-1)};
    EXPECT_STREQ(json::Value(&strange).typeName(), "unknown");
}

struct Reader {
    std::string wanted;
    std::function<void(json::Value const&)> read;
};

TEST(JsonCheckedReading, ThrowsOnEveryOtherTypeWithBothNames) {
    Reader const readers[] = {
        {"object", [](json::Value const& v) { v.toObject(); }},
        {"array", [](json::Value const& v) { v.toArray(); }},
        {"string", [](json::Value const& v) { v.toString(); }},
        {"integer", [](json::Value const& v) { v.toInt(); }},
        {"float", [](json::Value const& v) { v.toReal(); }},
        {"boolean", [](json::Value const& v) { v.toBool(); }},
    };
    for (TypeCase const& c : typeCases()) {
        for (Reader const& reader : readers) {
            std::string const message =
                reader.wanted == c.name ? "nothing was thrown" : wrongType(c.name, reader.wanted);
            EXPECT_EQ(messageOf([&] { reader.read(c.value); }), message);
        }
    }
}

TEST(JsonCheckedReading, OfTemporariesThrowsTheSame) {
    EXPECT_EQ(messageOf([] { json::Value(1).toObject(); }), wrongType("integer", "object"));
    EXPECT_EQ(messageOf([] { json::Value(1).toArray(); }), wrongType("integer", "array"));
}

TEST(JsonCheckedReading, OfAMissingKeyNamesTheEmptyType) {
    json::Value const missing = json::Object().get("x");
    EXPECT_FALSE(missing);
    EXPECT_EQ(messageOf([&] { missing.toString(); }), "JSON error: Wrong type: empty. Expected type: string");
}

TEST(JsonCheckedReading, OfARealAsIntegerNamesAFloat) {
    EXPECT_EQ(messageOf([] { json::Value(1.5).toInt(); }), wrongType("float", "integer"));
}

TEST(JsonCheckedReading, OfAnIntegerAsRealIsRefused) {
    EXPECT_EQ(messageOf([] { json::Value(1).toReal(); }), wrongType("integer", "float"));
}

TEST(JsonCheckedReading, OfNullAsBooleanNamesNull) {
    EXPECT_EQ(messageOf([] { "null"_json.toBool(); }), wrongType("null", "boolean"));
}

TEST(JsonCheckedReading, GivesTheValue) {
    EXPECT_STREQ(json::Value("text").toString(), "text");
    EXPECT_EQ(json::Value(-5).toInt(), -5);
    EXPECT_EQ(json::Value(1.25).toReal(), 1.25);
    EXPECT_TRUE(json::Value(true).toBool());
    EXPECT_FALSE(json::Value(false).toBool());
}

TEST(JsonCheckedReading, OfContainersGivesTheSameHandle) {
    json::Value const object = json::Object();
    json::Value const array = json::Array();
    EXPECT_EQ(static_cast<json::Value const*>(&object.toObject()), &object);
    EXPECT_EQ(static_cast<json::Value const*>(&array.toArray()), &array);
}

TEST(JsonCheckedReading, OfATemporaryContainerOutlivesIt) {
    auto const make = [] { return R"({"a": [1, 2]})"_json; };
    std::vector<long long> numbers;
    for (auto const& number : make().toObject().get("a").toArray())
        numbers.push_back(number.toInt());
    EXPECT_THAT(numbers, ElementsAre(1, 2));
    static_assert(std::is_same_v<decltype(make().toObject()), json::Object>);
    static_assert(std::is_same_v<decltype(make().toArray()), json::Array>);
    static_assert(std::is_same_v<decltype(std::declval<json::Value const>().toObject()), json::Object>);
    static_assert(std::is_same_v<decltype(std::declval<json::Value&>().toObject()), json::Object const&>);
}

TEST(JsonLenientReading, GivesTheDefaultOnEveryOtherType) {
    for (TypeCase const& c : typeCases()) {
        SCOPED_TRACE(text(c.value));
        EXPECT_EQ(c.value.intOrZero(), c.isInt ? 1 : 0);
        EXPECT_EQ(c.value.numberOrZero(), c.isInt || c.isReal ? 1.0 : 0.0);
        EXPECT_EQ(c.value.textOrEmpty(), c.isString ? "text" : "");
    }
}

TEST(JsonConstruction, KeepsTheBitsOfEveryInteger) {
    EXPECT_EQ(json::Value(std::numeric_limits<long long>::min()).toInt(),
              std::numeric_limits<long long>::min());
    EXPECT_EQ(json::Value(std::numeric_limits<unsigned long long>::max()).toInt(), -1);
    EXPECT_EQ(json::Value(std::numeric_limits<unsigned>::max()).toInt(), 4294967295);
    EXPECT_EQ(json::Value(static_cast<short>(-7)).toInt(), -7);
}

TEST(JsonConstruction, OfNothingToHoldIsEmpty) {
    EXPECT_FALSE(json::Value(std::numeric_limits<double>::quiet_NaN()));
    EXPECT_FALSE(json::Value(std::numeric_limits<double>::infinity()));
    EXPECT_FALSE(json::Value(-std::numeric_limits<double>::infinity()));
    EXPECT_FALSE(json::Value(static_cast<char const*>(nullptr)));
    EXPECT_FALSE(json::Value(static_cast<json_t*>(nullptr)));
    EXPECT_FALSE(json::Value());
}

TEST(JsonConstruction, DoesNotTestTextsForUtf8) {
    EXPECT_STREQ(json::Value("\xff").toString(), "\xff");
    json::Object object;
    object.set("\xff", std::string("\xfe"));
    EXPECT_STREQ(object.get("\xff").toString(), "\xfe");
}

TEST(JsonConstruction, OfContainersMakesNewEmptyOnes) {
    EXPECT_EQ(text(json::Object()), "{}");
    EXPECT_EQ(text(json::Array()), "[]");
    EXPECT_TRUE(json::Object().empty());
    EXPECT_TRUE(json::Array().empty());
}

TEST(JsonConstruction, FromPairsSetsThemInOrder) {
    json::Object const object{{"b", 1}, {"a", "x"}, {"b", true}};
    EXPECT_EQ(text(object), R"({"b":true,"a":"x"})");
}

TEST(JsonReferences, AreCountedByCopiesAndHandedOverByMoves) {
    json::Value first = json::Object();
    json_t* const node = first.node();
    EXPECT_EQ(node->refcount, 1u);
    json::Value second = first;
    EXPECT_EQ(second.node(), node);
    EXPECT_EQ(node->refcount, 2u);
    json::Value third = std::move(first);
    EXPECT_FALSE(first);
    EXPECT_EQ(node->refcount, 2u);
    second = json::Value();
    EXPECT_EQ(node->refcount, 1u);
    json::Value const& same = third;
    third = same;
    EXPECT_EQ(node->refcount, 1u);
    EXPECT_EQ(third.node(), node);
}

TEST(JsonReferences, AreTakenOverFromARawNode) {
    json_t* const node = json_integer(5);
    json_incref(node);
    {
        json::Value const value(node);
        EXPECT_EQ(node->refcount, 2u);
    }
    EXPECT_EQ(node->refcount, 1u);
    json_decref(node);
}

TEST(JsonReferences, OfStaticNodesAreNotCounted) {
    std::size_t const before = json_true()->refcount;
    json::Value const one = true;
    json::Value const two = one;
    EXPECT_EQ(json_true()->refcount, before);
}

TEST(JsonReferences, MoveAssignmentBetweenHandlesOfOneNodeDoesNothing) {
    json::Value first = json::Object();
    json::Value second = first;
    second = std::move(first);
    EXPECT_TRUE(first);
    EXPECT_TRUE(second);
    EXPECT_EQ(second.node()->refcount, 2u);
}

TEST(JsonObject, SetOnACopyLeavesTheFirstUnchanged) {
    json::Object const first{{"a", 1}};
    json::Object second = first;
    second.set("b", 2);
    EXPECT_EQ(text(first), R"({"a":1})");
    EXPECT_EQ(text(second), R"({"a":1,"b":2})");
}

TEST(JsonObject, WithOneReferenceIsChangedInPlace) {
    json::Object object;
    json_t* const node = object.node();
    object.set("a", 1);
    EXPECT_EQ(object.node(), node);
}

TEST(JsonObject, CopyOnWriteSharesTheMembers) {
    json::Object const first{{"list", json::Array()}};
    json::Object second = first;
    second.set("b", 2);
    EXPECT_EQ(first.get("list").node(), second.get("list").node());
}

TEST(JsonObject, GivesAReferenceToAMember) {
    json::Object const object{{"list", json::Array()}};
    json::Value const member = object.get("list");
    EXPECT_EQ(member.node()->refcount, 2u);
    EXPECT_EQ(object.get(std::string("list")), member);
    EXPECT_FALSE(object.get("other"));
}

TEST(JsonObject, RefusesTheEmptyHandleAsAMember) {
    json::Object object{{"a", 1}};
    EXPECT_EQ(messageOf([&] { object.set("key", json::Value()); }),
              "JSON error: object element can not be set. Key: key. New value type: empty");
    EXPECT_EQ(text(object), R"({"a":1})");
}

TEST(JsonObject, AFailingSetHasDoneItsCopyOnWrite) {
    json::Object const first{{"a", 1}};
    json::Object second = first;
    EXPECT_THROW(second.set("b", json::Value()), json::Exc);
    EXPECT_NE(first.node(), second.node());
    EXPECT_EQ(first, second);
}

TEST(JsonObject, SetIntoItselfStoresItsFormerContents) {
    json::Object object{{"a", 1}};
    object.set("self", object);
    EXPECT_EQ(text(object), R"({"a":1,"self":{"a":1}})");
}

TEST(JsonObject, ThatWasMovedFromIsEmptyAndRefusesMembers) {
    json::Object source{{"a", 1}};
    json::Object const target = std::move(source);
    EXPECT_TRUE(source.empty());
    EXPECT_EQ(source.size(), 0u);
    EXPECT_FALSE(source.get("a"));
    EXPECT_EQ(source.begin(), source.end());
    EXPECT_EQ(messageOf([&] { source.set("b", 2); }),
              "JSON error: object element can not be set. Key: b. New value type: integer");
}

TEST(JsonObject, IteratesInTheOrderOfInsertion) {
    json::Object const object{{"z", 1}, {"a", 2}, {"m", 3}};
    std::vector<std::pair<std::string, long long>> members;
    for (auto const& [key, value] : object)
        members.emplace_back(key, value.toInt());
    EXPECT_THAT(members, ElementsAre(Pair("z", 1), Pair("a", 2), Pair("m", 3)));
}

TEST(JsonObject, IterationRunsOverTheContentsAsTheyWereWhenItBegan) {
    json::Object object{{"a", 1}, {"b", 2}};
    std::string keys;
    for (auto const& [key, value] : object) {
        keys += key;
        object.set(std::string(key) + "2", value);
        object.set("b", 7);
    }
    EXPECT_EQ(keys, "ab");
    EXPECT_EQ(text(object), R"({"a":1,"b":7,"a2":1,"b2":2})");
}

TEST(JsonArray, GivesItsElements) {
    json::Array array;
    array.append(1);
    array.append("x");
    EXPECT_EQ(array.size(), 2u);
    EXPECT_FALSE(array.empty());
    EXPECT_EQ(array.at(0).toInt(), 1);
    EXPECT_STREQ(array.at(1).toString(), "x");
    EXPECT_FALSE(array.at(2));
}

TEST(JsonArray, AppendOnACopyLeavesTheFirstUnchanged) {
    json::Array const first;
    json::Array second = first;
    second.append(1);
    EXPECT_EQ(text(first), "[]");
    EXPECT_EQ(text(second), "[1]");
}

TEST(JsonArray, WithOneReferenceIsChangedInPlace) {
    json::Array array;
    json_t* const node = array.node();
    array.append(1);
    EXPECT_EQ(array.node(), node);
}

TEST(JsonArray, RefusesTheEmptyHandleAndNamesItsSize) {
    json::Array array;
    array.append(1);
    EXPECT_EQ(messageOf([&] { array.append(json::Value()); }),
              "JSON error: array element can not be appended. Size: 1. New value type: empty");
}

TEST(JsonArray, AFailingAppendHasDoneItsCopyOnWrite) {
    json::Array const first;
    json::Array second = first;
    EXPECT_THROW(second.append(json::Value()), json::Exc);
    EXPECT_NE(first.node(), second.node());
}

TEST(JsonArray, AppendedToItselfStoresItsFormerContents) {
    json::Array array;
    array.append(1);
    array.append(array);
    EXPECT_EQ(text(array), "[1,[1]]");
}

TEST(JsonArray, IterationRunsOverTheContentsAsTheyWereWhenItBegan) {
    json::Array array;
    array.append(1);
    array.append(2);
    for (json::Value const& element : array)
        array.append(element.toInt() * 10);
    EXPECT_EQ(text(array), "[1,2,10,20]");
}

TEST(JsonEquality, IsThatOfTheNodes) {
    EXPECT_EQ(R"({"a": [1, 2.5, "x"]})"_json, R"({"a": [1, 2.5, "x"]})"_json);
    EXPECT_EQ(R"({"a": 1, "b": 2})"_json, R"({"b": 2, "a": 1})"_json);
    EXPECT_NE(R"({"a": 1})"_json, R"({"a": 1.0})"_json);
    EXPECT_NE(json::Value(1), json::Value(2));
    EXPECT_EQ(json::Object(), json::Object());
    EXPECT_EQ(json::Array(), json::Array());
}

TEST(JsonEquality, OfEmptyHandles) {
    EXPECT_EQ(json::Value(), json::Value());
    EXPECT_NE(json::Value(), "null"_json);
    EXPECT_NE("null"_json, json::Value());
    EXPECT_NE(json::Value(), json::Object());
}

} // namespace
