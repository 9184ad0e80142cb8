#include "programs/policy/limits.h"

#include "programs/base/email_address.h"

#include "tests/support/time_zone.h"
#include "tests/vlserviced/json_help.h"

#include <gmock/gmock.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long long NOW = 1'795'000'000;

Policy::Moment const MOMENT{NOW, [](long long) { return 0LL; }};

Policy::Rules rulesOf(json::Object const& parts) {
    return Policy::Rules(Policy::SourcedSettings(parts, "node.json"));
}

Cfg::PackPreset mailing(json::Object keys) {
    keys.set("name", "Bills");
    return Cfg::PackPreset(keys, {});
}

std::vector<std::string> refused(json::Object const& preset, json::Object const& parts) {
    std::vector<std::string> lines;
    for (auto const& refusal :
         Policy::refusalsOf(mailing(preset), rulesOf(parts), MOMENT,
                            [](std::string const& name) { return "the node of " + name; }))
        lines.push_back(refusal.line());
    return lines;
}

TEST(LimitOfSheets, RefusesMoreThanTheNodeAllowsAndNamesIt) {
    Policy::Rules const rules = rulesOf(parse(R"({"app": {"max_letter_sheets": 5}})"));
    EXPECT_FALSE(Policy::refusalOfSheets(5, rules));
    EXPECT_EQ(Policy::refusalOfSheets(31, rules)->line(),
              "too-many-sheets: 31 sheets, 5 allowed by node.json");
}

TEST(LimitOfSheets, IsTheBuiltInOneWhereNoneIsSetAndNoneWhereItIsNothing) {
    EXPECT_FALSE(Policy::refusalOfSheets(999, {}));
    EXPECT_EQ(Policy::refusalOfSheets(1000, {})->line(),
              "too-many-sheets: 1000 sheets, 999 allowed by the built-in settings");
    EXPECT_FALSE(Policy::refusalOfSheets(1000, rulesOf(parse(R"({"app": {"max_letter_sheets": 0}})"))));
}

TEST(LimitsOfMailings, LetEverythingOutThatNothingForbids) {
    EXPECT_THAT(refused(parse(R"({"department": "any", "profile": "any"})"), {}), IsEmpty());
    EXPECT_THAT(
        refused(
            parse(
                R"({"department": "IT", "profile": "Letters", "customer_email": "ada@example.com", "delay": {}})"),
            parse(R"({"app": {"enfoce_dep": true, "enforce_profile": true, "enforce_po": true},
                            "deps": {"vals": ["Law", {"name": "IT", "descrip": "computers"}]},
                            "profiles": {"vals": [{"name": "Letters"}]},
                            "po": {"code": "P-1"}})")),
        IsEmpty());
}

TEST(LimitsOfMailings, HoldUsersToTheListedDepartments) {
    json::Object const settings = parse(R"({"app": {"enfoce_dep": true}, "deps": {"vals": ["Law", "IT"]}})");
    EXPECT_THAT(
        refused(parse(R"({"department": "Sales"})"), settings),
        ElementsAre("department-not-listed: department \"Sales\", \"Law\", \"IT\" allowed by node.json"));
    EXPECT_THAT(
        refused(parse(R"({"department": "it"})"), settings),
        ElementsAre("department-not-listed: department \"it\", \"Law\", \"IT\" allowed by node.json"));
    EXPECT_THAT(refused(parse(R"({})"), parse(R"({"app": {"enfoce_dep": true}})")),
                ElementsAre("department-not-listed: no department, none allowed by node.json"));
}

TEST(LimitsOfMailings, HoldUsersToTheListedProfilesAndToHavingOne) {
    json::Object const settings = parse(R"({"app": {"enforce_profile": true}, "profiles": {"vals": [
        {"name": "1"}, {"name": "2"}, {"name": "3"}, {"name": "4"}, {"name": "5"}, {"name": "6"}, {"name": "7"}]}})");
    EXPECT_THAT(refused(parse(R"({"profile": "7"})"), settings), IsEmpty());
    EXPECT_THAT(refused(parse(R"({"profile": "a\u001b\nb"})"), settings),
                ElementsAre("profile-not-listed: profile \"a\\u001b b\", \"1\", \"2\", \"3\", \"4\", \"5\" "
                            "and 2 more allowed by "
                            "node.json"));
    EXPECT_THAT(refused(parse(R"({})"), settings),
                ElementsAre("profile-not-listed: no profile, \"1\", \"2\", \"3\", \"4\", \"5\" and 2 more "
                            "allowed by node.json"));
}

TEST(LimitsOfMailings, WantAPurchaseOrderThatHasNotExpired) {
    VLServiceTest::TimeZone const zone("UTC");
    auto const with = [](json::Object const& order) {
        return refused({}, {{"app", parse(R"({"enforce_po": true})")}, {"po", order}});
    };
    EXPECT_THAT(with({}), ElementsAre("purchase-order-missing: no purchase order, one wanted by node.json"));
    EXPECT_THAT(with({{"code", "P-1"}, {"expiry", 0}}), IsEmpty());
    EXPECT_THAT(with({{"code", "P-1"}, {"expiry", NOW + 1}}), IsEmpty());
    EXPECT_THAT(with({{"code", "P-1"}, {"expiry", NOW}}),
                ElementsAre("purchase-order-expired: purchase order \"P-1\", valid until 2026/11/18 11:06:40 "
                            "as set by node.json"));
    EXPECT_THAT(refused({}, {{"po", json::Object{{"code", "P-1"}, {"expiry", NOW - 5}}}}), IsEmpty());
}

TEST(LimitsOfMailings, WantOneEmailAddressWhereThereIsAny) {
    EXPECT_THAT(refused(parse(R"({"customer_email": "bob@"})"), {}),
                ElementsAre("email-malformed: \"customer_email\" \"bob@\", one address NAME@HOST possible, "
                            "as set by the node "
                            "of Bills"));
}

TEST(LimitsOfMailings, WantADelayThatEnds) {
    EXPECT_THAT(
        refused(parse(R"({"delay": {"week_days": [1, 9]}})"), {}),
        ElementsAre("delay-impossible: 9 in \"week_days\", 0 to 6 possible, as set by the node of Bills"));
}

TEST(LimitsOfMailings, AreToldTogether) {
    auto const refusals = Policy::refusalsOf(mailing(parse(R"({"customer_email": "bob"})")),
                                             rulesOf(parse(R"({"app": {"enforce_profile": true}})")), MOMENT,
                                             [](std::string const&) { return std::string("a=acme"); });
    EXPECT_EQ(Policy::inOneLine(refusals), "profile-not-listed: no profile, none allowed by node.json; "
                                           "email-malformed: \"customer_email\" \"bob\", one "
                                           "address NAME@HOST possible, as set by a=acme");
}

TEST(PriorityDelivery, IsThePresetsUnlessTheSettingsSayNeverOrAlways) {
    std::tuple<int, bool, bool> const cases[] = {{0, false, false}, {0, true, true},  {1, false, false},
                                                 {1, true, false},  {2, false, true}, {2, true, true},
                                                 {7, true, true},   {7, false, false}};
    for (auto const& [setting, preset, goes] : cases)
        EXPECT_EQ(Policy::goesWithPriority(mailing({{"priority_delivery", preset}}),
                                           rulesOf({{"app", json::Object{{"priority_delivery", setting}}}})),
                  goes)
            << setting << preset;
}

TEST(EmailAddresses, AreTakenByTheirForm) {
    for (char const* good :
         {"ada@example.com", "a.b+c@mail.example.co.uk", "o'neil@x-y.example", "zoë@müller.example", "1@2.3"})
        EXPECT_TRUE(Base::isEmailAddress(good)) << good;
    for (std::string const& bad : {std::string(),
                                   std::string("ada"),
                                   std::string("@example.com"),
                                   std::string("ada@"),
                                   std::string("ada@localhost"),
                                   std::string("ada@.com"),
                                   std::string("ada@example."),
                                   std::string("ada@exa mple.com"),
                                   std::string("a b@example.com"),
                                   std::string("ada@@example.com"),
                                   std::string("ada@example.com, bob@example.com"),
                                   std::string(".ada@example.com"),
                                   std::string("ada.@example.com"),
                                   std::string("a..b@example.com"),
                                   std::string("ada@-x.com"),
                                   std::string("ada@x-.com"),
                                   std::string("ada@exa_mple.com"),
                                   std::string("Ada <ada@example.com>"),
                                   std::string("ada@example..com"),
                                   std::string("ada\n@example.com"),
                                   std::string(65, 'a') + "@example.com",
                                   "a@" + std::string(64, 'b') + ".com",
                                   "a@b." + std::string(62, 'c') + '.' + std::string(62, 'c') + '.' +
                                       std::string(62, 'c') + '.' + std::string(62, 'c') + ".de"})
        EXPECT_FALSE(Base::isEmailAddress(bad)) << bad;
}

TEST(SourcedSettings, NameTheNodeThatAValueComesFrom) {
    Protocol::SettingsAnswer const answer(parse(R"({"id": "u=bob/a=acme", "chain": [], "parts": {
        "app": {"own": {}, "values": {"max_letter_sheets": 5, "enforce_po": true, "enfoce_dep": true},
                "origins": {"max_letter_sheets": "u=bob/a=acme", "enforce_po": "", "enfoce_dep": null}},
        "presets": {"own": {}, "values": {"pack_presets": [{"name": "Bills"}, {"name": "Bills"}, {"name": "GLOBAL"}]},
                    "origins": {"pack_presets": ["a=acme", "", null]}}}})"));
    Policy::SourcedSettings const settings(answer);
    EXPECT_EQ(settings.sourceOf("app", "max_letter_sheets"), "u=bob/a=acme");
    EXPECT_EQ(settings.sourceOf("app", "enforce_po"), "the root");
    EXPECT_EQ(settings.sourceOf("app", "enfoce_dep"), "the built-in settings");
    EXPECT_EQ(settings.sourceOf("po", "expiry"), "the built-in settings");
    EXPECT_EQ(settings.sourceOfPackPreset("Bills"), "a=acme");
    EXPECT_EQ(settings.sourceOfPackPreset("GLOBAL"), "the built-in settings");
    EXPECT_EQ(settings.sourceOfPackPreset("none"), "the built-in settings");
    EXPECT_EQ(Policy::refusalOfSheets(31, Policy::Rules(settings))->line(),
              "too-many-sheets: 31 sheets, 5 allowed by u=bob/a=acme");
}

TEST(SourcedSettings, NameTheDocumentWhereThereIsNoNode) {
    Policy::SourcedSettings const settings(
        parse(R"({"app": {"enforce_po": true}, "presets": {"pack_presets": [{"name": "Bills"}, 7]}})"),
        "node.json");
    EXPECT_EQ(settings.sourceOf("app", "enforce_po"), "node.json");
    EXPECT_EQ(settings.sourceOf("app", "enfoce_dep"), "the built-in settings");
    EXPECT_EQ(settings.sourceOfPackPreset("Bills"), "node.json");
    EXPECT_EQ(settings.sourceOfPackPreset("GLOBAL"), "the built-in settings");
    EXPECT_EQ(Policy::SourcedSettings().sourceOfPackPreset("GLOBAL"), "the built-in settings");
}

TEST(MembersOfMetadata, AreDecidedWhereTheSettingsSayMoreThanThePreset) {
    EXPECT_EQ(print(Policy::decidedMembers({})), "{}");
    EXPECT_EQ(print(Policy::decidedMembers(
                  rulesOf(parse(R"({"app": {"priority_delivery": 1}, "po": {"code": "P-1"}})")))),
              R"({"purchase_order":"P-1","priority_delivery":false})");
    EXPECT_EQ(print(Policy::decidedMembers(rulesOf(parse(R"({"app": {"priority_delivery": 2}})")))),
              R"({"priority_delivery":true})");
}

} // namespace
