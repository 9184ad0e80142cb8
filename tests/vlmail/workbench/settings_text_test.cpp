#include "programs/vlmail/workbench/settings_text.h"

#include "programs/base/error.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

namespace {

using namespace VlMail::Workbench;

/// The text from the place on.
std::string at(SettingsText const& text, std::string const& pointer) {
    JsonPlace const* const place = text.find(pointer);
    return place ? text.text().substr(place->begin, place->end - place->begin) : "nowhere";
}

TEST(SettingsTextPlaces, AreFoundByPointers) {
    SettingsText const text(R"({"a": [1, {"b/c": "x,]}", "d~": null}], "\u0065": {"f": -1.5e3}})");
    EXPECT_EQ(at(text, ""), text.text());
    EXPECT_EQ(at(text, "/a/0"), "1");
    EXPECT_EQ(at(text, "/a/1/b~1c"), "\"x,]}\"");
    EXPECT_EQ(at(text, "/a/1/d~0"), "null");
    EXPECT_EQ(at(text, "/e/f"), "-1.5e3");
    EXPECT_EQ(at(text, "/a/2"), "nowhere");
    EXPECT_EQ(at(text, "/a/0/x"), "nowhere");
}

TEST(SettingsTextPlaces, AreThoseOfTheLastOfEqualKeys) {
    EXPECT_EQ(at(SettingsText(R"({"a": 1, "a": 2})"), "/a"), "2");
}

TEST(SettingsTextPlaces, CountAsEditorsDo) {
    std::string const text = "{\n  \"\xC3\xA4\xF0\x9F\x98\x80\": 1\n}";
    SettingsText const settings(text);
    Position const place = settings.positionOf(text.find('1'));
    EXPECT_EQ(place.line, 1U);
    // Two blanks, two quotes, one letter, a character of two units, colon and blank.
    EXPECT_EQ(place.column, 9U);
    EXPECT_EQ(settings.positionOf(0).line, 0U);
    EXPECT_EQ(settings.positionOf(text.size()).line, 2U);
}

TEST(SettingsTextPlaces, OfWhatIsMissingAreTheNearestAbove) {
    SettingsText const text(R"({"a": {"b": 1}})");
    EXPECT_EQ(text.nearest("/a/x/y").begin, text.find("/a")->begin);
}

TEST(BrokenSettings, NameTheLineAndWhereItIs) {
    auto const broken = whatIsBroken("{\n  \"a\": 1,\n  \"b\": x\n}");
    ASSERT_TRUE(broken);
    EXPECT_EQ(broken->says, "line 3: invalid token near 'x'");
    EXPECT_EQ(broken->place.line, 2U);
    EXPECT_FALSE(whatIsBroken("{}"));
    EXPECT_EQ(whatIsBroken("[1]")->says, "line 1: settings are an object, {...}");
    EXPECT_TRUE(whatIsBroken(""));
    EXPECT_TRUE(whatIsBroken(std::string(5000, '[')));
    EXPECT_THROW(SettingsText("{"), Base::Error);
}

struct ChangeCase {
    char const* before;
    char const* pointer;
    /// In a list.
    char const* value;
    char const* after;
};

ChangeCase const SETTINGS_CHANGES[]{
    {"{\"a\": 1}", "/a", "[[2]]", "{\"a\": [\n  2\n]}"},
    {"{\"a\":1}", "/b", "[2]", "{\"a\":1, \"b\": 2}"},
    {"{}", "/a", "[2]", "{\n  \"a\": 2\n}"},
    {"{\n    \"a\": 1\n}\n", "/b", "[{\"c\": 1}]",
     "{\n    \"a\": 1,\n    \"b\": {\n        \"c\": 1\n    }\n}\n"},
    {"{\n \"box\": {\"l\": 1, \"r\": 2}\n}", "/box", "[{\"l\": 3, \"r\": 4}]",
     "{\n \"box\": {\"l\": 3, \"r\": 4}\n}"},
    {"{\n \"box\": {\n  \"l\": 1\n }\n}", "/box", "[{\"l\": 3, \"r\": 4}]",
     "{\n \"box\": {\n  \"l\": 3,\n  \"r\": 4\n }\n}"},
    {"{\"a\": [1, 2]}", "/a/-", "[3]", "{\"a\": [1, 2, 3]}"},
    {"{\"a\": [1, 2]}", "/a/2", "[3]", "{\"a\": [1, 2, 3]}"},
    {"{\"a\": []}", "/a/-", "[\"x\"]", "{\"a\": [\n  \"x\"\n]}"},
    {"{\n  \"p\": {}\n}", "/p/reading/zones/T/page", "[2]",
     "{\n  \"p\": {\n    \"reading\": {\n      \"zones\": {\n        \"T\": {\n          \"page\": 2\n       "
     " }\n      "
     "}\n    }\n  }\n}"},
};

json::Value valueIn(char const* list) {
    std::string const document = "{\"v\":" + std::string(list) + '}';
    return json::strToObject(document.data(), document.size()).get("v").toArray().at(0);
}

TEST(SettingsTextChanges, LeaveTheRestAsItWasWritten) {
    for (ChangeCase const& one : SETTINGS_CHANGES)
        EXPECT_EQ(SettingsText(one.before).with(one.pointer, valueIn(one.value)).text(), one.after);
}

TEST(SettingsTextChanges, TakeMembersAway) {
    SettingsText const text("{\n  \"a\": 1,\n  \"b\": [1, 2, 3],\n  \"c\": 3\n}");
    EXPECT_EQ(text.without("/a").text(), "{\n  \"b\": [1, 2, 3],\n  \"c\": 3\n}");
    EXPECT_EQ(text.without("/c").text(), "{\n  \"a\": 1,\n  \"b\": [1, 2, 3]\n}");
    EXPECT_EQ(text.without("/b/1").text(), "{\n  \"a\": 1,\n  \"b\": [1, 3],\n  \"c\": 3\n}");
    EXPECT_EQ(SettingsText("{\"a\": [1]}").without("/a/0").text(), "{\"a\": []}");
    EXPECT_THROW(text.without("/x"), Base::Error);
    EXPECT_THROW(text.without(""), Base::Error);
}

TEST(SettingsTextChanges, PutElementsInFrontOfOthers) {
    EXPECT_EQ(SettingsText("{\"a\": [1, 2]}").withInserted("/a/1", 9).text(), "{\"a\": [1, 9, 2]}");
    EXPECT_EQ(SettingsText("{\n \"a\": [\n  1\n ]\n}").withInserted("/a/0", 9).text(),
              "{\n \"a\": [\n  9,\n  1\n ]\n}");
}

TEST(SettingsTextChanges, LeadNowhereWhereNothingCanBe) {
    SettingsText const text("{\"a\": 1, \"b\": [1]}");
    EXPECT_THROW(text.with("/a/b", 1), Base::Error);
    EXPECT_THROW(text.with("/b/7", 1), Base::Error);
}

TEST(SettingsEdits, ReplaceNoMoreThanWhatIsDifferent) {
    std::string const before = "{\n \"a\": \"\xC3\xA4\"\n}";
    std::vector<Edit> const edits = editsBetween(SettingsText(before), "{\n \"a\": \"\xC3\xB6x\"\n}");
    ASSERT_EQ(edits.size(), 1U);
    EXPECT_EQ(edits[0].from.line, 1U);
    EXPECT_EQ(edits[0].from.column, 7U);
    EXPECT_EQ(edits[0].to.column, 8U);
    EXPECT_EQ(edits[0].text, "\xC3\xB6x");
    EXPECT_TRUE(editsBetween(SettingsText(before), before).empty());
}

} // namespace
