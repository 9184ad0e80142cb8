#include "programs/vlserviced/settings/parts.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"
#include "vlservice/cfg/app.h"
#include "vlservice/presets/presets.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using VlServiced::ownForm;
using VlServiced::resolve;
using VlServiced::SettingsLevel;

SettingsLevel level(std::string const& id, std::string const& parts) { return {id, parse(parts)}; }

/// One part of what counts at the first level.
json::Object resolved(std::vector<SettingsLevel> const& chain, std::string const& part) {
    return resolve(chain, {part}).get(part).toObject();
}

json::Value valueOf(json::Object const& part, char const* key) {
    return part.get("values").toObject().get(key);
}
std::string originOf(json::Object const& part, char const* key) {
    return print(part.get("origins").toObject().get(key));
}

TEST(OwnForm, KeepsOwnValuesAndLeavesOutInheritedOnes) {
    EXPECT_EQ(
        print(ownForm("app", parse(R"({"max_letter_sheets":7,"descr":{"inh":true,"v":"from above"}})"))),
        R"({"max_letter_sheets":7})");
    EXPECT_EQ(print(ownForm("profiles", parse(R"({"vals":[{"name":"A"},{"inh":true,"v":{"name":"B"}}]})"))),
              R"({"vals":[{"name":"A"}]})");
}

TEST(OwnForm, OfAWrittenGlobalPartIsItsOwnValuesAlone) {
    Cfg::App app(json::Value(), true, false);
    EXPECT_FALSE(ownForm("app", app.serialize()));
    app.setOwn<Cfg::AppFieldIdxs::PrintArea>(Cfg::Rect(1, 2, 3, 4));
    EXPECT_EQ(print(ownForm("app", app.serialize())),
              R"({"print_area":{"left":1,"top":2,"right":3,"bottom":4}})");
}

TEST(OwnForm, OfNothingIsNothing) {
    EXPECT_FALSE(ownForm("app", json::Value()));
    EXPECT_FALSE(ownForm("app", json::Object()));
}

TEST(OwnForm, RefusesWhatThePartDoesNotHave) {
    struct {
        std::string part;
        std::string sent;
        std::string message;
    } const cases[] = {
        {"app", R"({"max_sheets":7})", R"(the settings "app" have no key "max_sheets")"},
        {"profiles", R"({"values":[]})", R"(the settings "profiles" have no key "values")"},
        {"app", R"({"max_letter_sheets":"7"})",
         R"(the settings "app" were not changed: JSON error: Wrong type: string. Expected type: integer)"},
        {"deps", R"({"vals":[{"descrip":"x"}]})",
         R"(the settings "deps" were not changed: JSON error: Wrong type: empty. Expected type: string)"},
    };
    for (auto const& [part, sent, message] : cases)
        EXPECT_EQ(failureOf([&part = part, &sent = sent] { ownForm(part, parse(sent)); }), message);
    EXPECT_TRUE(failureOf([] {
                    ownForm("apps", json::Object());
                }).starts_with(R"(there are no settings "apps"; there are app, inet, po, deps, profiles)"));
    EXPECT_EQ(
        failureOf([] { ownForm("app", "text"); }),
        R"(the settings "app" were not changed: JSON error: Wrong type: string. Expected type: object)");
}

TEST(Resolving, TakesEachValueFromTheNearestNodeThatHasIt) {
    std::vector<SettingsLevel> const chain{
        level("u=bob/a=acme", R"({"app":{"debug_view":3}})"),
        level("a=acme", R"({"app":{"debug_view":2,"max_letter_sheets":20}})"),
        level("", R"({"app":{"max_letter_sheets":10,"db_name":"packs"}})"),
    };
    json::Object const app = resolved(chain, "app");
    EXPECT_EQ(valueOf(app, "debug_view"), json::Value(3));
    EXPECT_EQ(originOf(app, "debug_view"), R"("u=bob/a=acme")");
    EXPECT_EQ(valueOf(app, "max_letter_sheets"), json::Value(20));
    EXPECT_EQ(originOf(app, "max_letter_sheets"), R"("a=acme")");
    EXPECT_EQ(valueOf(app, "db_name"), json::Value("packs"));
    EXPECT_EQ(originOf(app, "db_name"), R"("")");
    EXPECT_EQ(app.get("own"), parse(R"({"debug_view":3})"));
}

TEST(Resolving, EndsAtTheBuiltInValues) {
    std::vector<SettingsLevel> const chain{level("a=acme", "{}"), level("", "{}")};
    json::Object const app = resolved(chain, "app");
    EXPECT_EQ(print(valueOf(app, "show_ctrls")), "[-1,16383]");
    EXPECT_EQ(print(valueOf(app, "print_area")), R"({"left":300,"top":300,"right":20700,"bottom":29300})");
    EXPECT_EQ(valueOf(app, "auto_save_preset"), json::Value(true));
    EXPECT_EQ(valueOf(app, "max_letter_sheets"), json::Value(999));
    EXPECT_EQ(originOf(app, "max_letter_sheets"), "null");
    json::Object const inet = resolved(chain, "inet");
    EXPECT_EQ(valueOf(inet, "status_update_hours"), json::Value(2));
    EXPECT_EQ(valueOf(inet, "lodged_alarm_hours"), json::Value(168));
    EXPECT_EQ(inet.get("own"), json::Object());
}

TEST(Resolving, GivesTheSameForTheRootAlone) {
    json::Object const app = resolved({level("", R"({"app":{"max_letter_sheets":5}})")}, "app");
    EXPECT_EQ(valueOf(app, "max_letter_sheets"), json::Value(5));
    EXPECT_EQ(originOf(app, "max_letter_sheets"), R"("")");
    EXPECT_EQ(valueOf(app, "auto_save_preset"), json::Value(true));
}

TEST(Resolving, HasEveryKeyOfEveryPart) {
    json::Object const parts = resolve({level("a=acme", "{}"), level("", "{}")}, VlServiced::partNames());
    ASSERT_EQ(parts.size(), VlServiced::partNames().size());
    for (auto const& [name, part] : parts)
        for (auto const& [key, value] : part.toObject().get("values").toObject())
            EXPECT_TRUE(part.toObject().get("origins").toObject().get(key)) << name << ' ' << key;
    EXPECT_EQ(parts.get("app").toObject().get("values").toObject().size(), 15u);
    EXPECT_EQ(parts.get("inet").toObject().get("values").toObject().size(), 6u);
    EXPECT_EQ(parts.get("po").toObject().get("values").toObject().size(), 2u);
}

TEST(Resolving, PutsTheNearestNodesElementsFirst) {
    std::vector<SettingsLevel> const chain{
        level("u=bob/ou=sales/a=acme", R"({"profiles":{"vals":[{"name":"B1"},{"name":"B2"}]}})"),
        level("ou=sales/a=acme", "{}"),
        level("a=acme", R"({"profiles":{"vals":[{"name":"A"}]}})"),
        level("", R"({"profiles":{"vals":[{"name":"R","descrip":"root's"}]}})"),
    };
    json::Object const profiles = resolved(chain, "profiles");
    EXPECT_EQ(print(valueOf(profiles, "vals")),
              R"([{"name":"B1"},{"name":"B2"},{"name":"A"},{"name":"R","descrip":"root's"}])");
    EXPECT_EQ(originOf(profiles, "vals"), R"(["u=bob/ou=sales/a=acme","u=bob/ou=sales/a=acme","a=acme",""])");
}

TEST(Resolving, TakesAListThatIsOneValueAsAWhole) {
    std::vector<SettingsLevel> const chain{
        level("u=bob/a=acme", "{}"),
        level("a=acme", R"({"deps":{"vals":["Sales",{"name":"IT","descrip":"computers"}]}})"),
        level("", R"({"deps":{"vals":["Board"]}})"),
    };
    json::Object const departments = resolved(chain, "deps");
    EXPECT_EQ(print(valueOf(departments, "vals")), R"(["Sales",{"name":"IT","descrip":"computers"}])");
    EXPECT_EQ(originOf(departments, "vals"), R"("a=acme")");
    EXPECT_EQ(
        print(valueOf(resolved({level("a=acme", R"({"deps":{"vals":[]}})"), chain.back()}, "deps"), "vals")),
        "[]");
}

TEST(Resolving, TestsTheNearestNodesPresetsFirstAndTheCatchAllLast) {
    std::vector<SettingsLevel> const chain{
        level("u=bob/a=acme",
              R"({"presets":{"extract_presets":[{"match":"b2.*","order":9},{"match":"b1.*","order":3}],)"
              R"("pack_presets":[{"name":"bob"}]}})"),
        level("a=acme", R"({"presets":{"extract_presets":[{"match":"a.*","order":1}]}})"),
        level("", R"({"presets":{"pack_presets":[{"name":"root"}]}})"),
    };
    json::Object const presets = resolved(chain, "presets");
    Cfg::Presets const read(presets.get("values"), false, false);
    std::vector<std::string> patterns;
    for (auto const& element : read.elements<Cfg::PresetFieldIdxs::ExtractPresets>())
        patterns.push_back(element.value.strRegex());
    EXPECT_EQ(patterns, (std::vector<std::string>{"b1.*", "b2.*", "a.*", ".*"}));
    EXPECT_EQ(originOf(presets, "extract_presets"), R"(["u=bob/a=acme","u=bob/a=acme","a=acme",null])");
    EXPECT_EQ(originOf(presets, "pack_presets"), R"(["u=bob/a=acme","",null])");
    EXPECT_EQ(read.findMatch("xyz").second.name(), "GLOBAL");
}

TEST(OwnForm, DropsPresetsThatBearAnEraseMark) {
    EXPECT_EQ(print(ownForm("presets", parse(R"({"pack_presets":[{"name":"a","erase_me":true},{"name":"b"},)"
                                             R"({"name":"c","erase_me":true}]})"))),
              R"({"pack_presets":[{"name":"b"}]})");
    EXPECT_FALSE(ownForm("presets", parse(R"({"extract_presets":[{"match":"x","erase_me":true}]})")));
}

TEST(OwnForm, RefusesAPresetWhoseExpressionCannotBeCompiled) {
    std::string const text =
        failureOf([] { ownForm("presets", parse(R"({"extract_presets":[{"match":"bill("}]})")); });
    EXPECT_TRUE(text.starts_with("the expression bill( cannot be used: ")) << text;
    EXPECT_EQ(failureOf([] {
                  ownForm("presets", parse(R"({"extract_presets":[{"match":"bill(","erase_me":true}]})"));
              }),
              "nothing was thrown");
}

TEST(OwnForm, OfTheRootsPresetsLeavesTheBuiltInOnesOut) {
    Cfg::Presets const global(json::Value(), true, false);
    EXPECT_EQ(print(ownForm("presets", global.serialize())), "#absent#");
}

TEST(Resolving, NamesNodeAndPartThatCannotBeRead) {
    EXPECT_EQ(
        failureOf([] {
            resolve({level("u=bob/a=acme", "{}"), level("a=acme", R"({"app":{"descr":1}})"), level("", "{}")},
                    {"app"});
        }),
        R"(the settings "app" of node a=acme cannot be read: )"
        "JSON error: Wrong type: integer. Expected type: string");
    EXPECT_EQ(failureOf([] { resolve({level("", R"({"po":[]})")}, {"po"}); }),
              R"(the settings "po" of the root cannot be read: )"
              "JSON error: Wrong type: array. Expected type: object");
}

} // namespace
