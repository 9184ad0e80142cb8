#include "programs/protocol/settings.h"

#include "programs/protocol/service_settings.h"
#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

namespace {

using Protocol::SettingsAnswer;
using Protocol::SettingsQuery;
using Protocol::TreeNode;

TEST(SettingsQueryReading, NeverTakesAMissingIdForTheRoot) {
    EXPECT_EQ(SettingsQuery(parse(R"({"id":""})")).id, "");
    for (char const* query : {"{}", R"({"id":7})", R"({"id":null})"})
        EXPECT_EQ(failureOf([&] { SettingsQuery{parse(query)}; }),
                  "\"id\" of a query for settings has to be the id of a node")
            << query;
}

TEST(SettingsQueryReading, TakesFewPartsAlone) {
    std::string const message = "\"parts\" of a query for settings has to be an array of at most 20 texts";
    SettingsQuery many{"", std::vector<std::string>(21, "app")};
    EXPECT_EQ(failureOf([&] { SettingsQuery{many.serialize()}; }), message);
    EXPECT_EQ(failureOf([&] { SettingsQuery{parse(R"({"id":"","parts":[1]})")}; }), message);
    many.parts.pop_back();
    EXPECT_EQ(SettingsQuery(many.serialize()).parts.size(), 20u);
}

TEST(SettingsReplacementReading, WantsANodeAndBothSides) {
    using Protocol::SettingsReplacement;
    std::string const text =
        R"({"query":"replace_settings","id":"a=acme","was":{},"own":{"po":{"code":"A"}}})";
    EXPECT_EQ(print(SettingsReplacement(parse(text)).serialize()), text);
    for (auto const& row : std::map<std::string, std::string>{
             {R"({"was":{},"own":{}})", "\"id\" of a replacement of settings has to be the id of a node"},
             {R"({"id":"","own":{}})", "\"was\" of a replacement of settings has to be an object"},
             {R"({"id":"","was":{},"own":[]})", "\"own\" of a replacement of settings has to be an object"}})
        EXPECT_EQ(failureOf([&] { SettingsReplacement{parse(row.first)}; }), row.second) << row.first;
}

TEST(SettingsAnswerReading, GivesEachPartByItsName) {
    std::string const text = R"({"id":"a=acme","known":true,"chain":["a=acme",""],"parts":{"po":)"
                             R"({"own":{"code":"A"},"values":{"code":"A"},"origins":{"code":"a=acme"}}}})";
    SettingsAnswer const answer(parse(text));
    EXPECT_EQ(answer.id, "a=acme");
    EXPECT_TRUE(answer.known);
    EXPECT_EQ(answer.chain, (std::vector<std::string>{"a=acme", ""}));
    EXPECT_EQ(print(answer.part("po").values), R"({"code":"A"})");
    EXPECT_EQ(print(answer.part("po").own), R"({"code":"A"})");
    EXPECT_EQ(print(answer.part("po").origins), R"({"code":"a=acme"})");
    EXPECT_TRUE(answer.part("app").values.empty());
    EXPECT_EQ(print(answer.serialize()), text);
}

TEST(SettingsAnswerReading, TellsWhetherNoticesAreSentWhereTheServiceSaysSo) {
    auto const sends = [](char const* answer) { return SettingsAnswer(parse(answer)).sendsNotices(); };
    EXPECT_EQ(sends("{}"), std::nullopt);
    EXPECT_EQ(sends(R"({"carriers":7})"), std::nullopt);
    EXPECT_EQ(sends(R"({"carriers":{}})"), false);
    EXPECT_EQ(sends(R"({"carriers":{"email":"folder","fax":"smtp"}})"), false);
    EXPECT_EQ(sends(R"({"carriers":{"email":"smtp"}})"), true);
    SettingsAnswer const answer(parse(R"({"carriers":{"email":"smtp"}})"));
    EXPECT_EQ(SettingsAnswer(answer.serialize()).sendsNotices(), true);
}

TEST(TreeNodeReading, FollowsTheTreeDown) {
    std::string const text =
        R"({"id":"","descr":"","parts":[],"children":[{"id":"a=acme","descr":"Acme","disabled":true,)"
        R"("parts":["po"],"children":[]}]})";
    TreeNode const root(parse(text));
    ASSERT_EQ(root.children.size(), 1u);
    EXPECT_EQ(root.children[0].id, "a=acme");
    EXPECT_TRUE(root.children[0].disabled);
    EXPECT_FALSE(root.disabled);
    EXPECT_EQ(print(root.serialize()), text);
}

TEST(TreeNodeReading, FollowsTheTreeAsDeepAsAnAnswerCanBe) {
    constexpr int DEPTH = 1000;
    std::string text;
    for (int i = 0; i < DEPTH; ++i)
        text += R"({"id":"x","children":[)";
    text += "{}";
    for (int i = 0; i < DEPTH; ++i)
        text += "]}";
    TreeNode const root(parse(text));
    int depth = 0;
    for (TreeNode const* node = &root; !node->children.empty(); node = &node->children.front())
        ++depth;
    EXPECT_EQ(depth, DEPTH);
}

TEST(ServiceSettingsReading, LeavesOutWhatHasAWrongType) {
    Protocol::ServiceSettings const settings(
        parse(R"({"upload_folder":"/up","tariff":{"currency":"EUR"},"disabled":["a=x"],"suspended":2})"));
    EXPECT_EQ(settings.uploadFolder, "/up");
    EXPECT_EQ(print(settings.tariff), R"({"currency":"EUR"})");
    EXPECT_EQ(settings.disabled, std::vector<std::string>{"a=x"});
    EXPECT_EQ(settings.suspended, 2);
    Protocol::ServiceSettings const wrong(parse(R"({"upload_folder":7,"tariff":[],"suspended":"2"})"));
    EXPECT_EQ(wrong.uploadFolder, "");
    EXPECT_TRUE(wrong.tariff.empty());
    EXPECT_EQ(wrong.suspended, 0);
}

} // namespace
