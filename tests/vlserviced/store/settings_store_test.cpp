#include "programs/vlserviced/store/settings_store.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using VlServiced::SettingsStore;

class SettingsStoreTest : public VLServiceTest::OnEachDatabase {
protected:
    std::vector<std::string> chainIds(std::string const& id) {
        std::vector<std::string> ids;
        for (VlServiced::SettingsLevel const& level : store_.chain(id))
            ids.push_back(level.id);
        return ids;
    }

    std::vector<std::string> nodeIds() {
        std::vector<std::string> ids;
        for (VlServiced::SettingsNode const& node : store_.nodes())
            ids.push_back(node.id);
        return ids;
    }
    json::Value part(std::string const& id, char const* part) { return store_.parts(id).get(part); }

    SettingsStore store_{*database_};
};

TEST_P(SettingsStoreTest, HoldsTheRootAtFirst) { EXPECT_THAT(nodeIds(), ElementsAre("")); }

TEST_P(SettingsStoreTest, AddsANodeWithAllAboveIt) {
    store_.add("u=bob/ou=sales/a=acme");
    EXPECT_THAT(nodeIds(), ElementsAre("", "a=acme", "ou=sales/a=acme", "u=bob/ou=sales/a=acme"));
    store_.add("u=bob/ou=sales/a=acme");
    store_.add("u=eve/");
    EXPECT_THAT(nodeIds(), ElementsAre("", "a=acme", "ou=sales/a=acme", "u=bob/ou=sales/a=acme", "u=eve/"));
    EXPECT_TRUE(store_.contains("a=acme"));
    EXPECT_FALSE(store_.contains("a=other"));
}

TEST_P(SettingsStoreTest, KeepsAPartOfANode) {
    json::Object const first{{"descr", "first"}};
    json::Object const second{{"descr", "second"}};
    store_.setPart("a=acme", "app", first);
    store_.setPart("a=acme", "po", json::Object{{"code", "7"}});
    EXPECT_EQ(part("a=acme", "app"), first);
    store_.setPart("a=acme", "app", second);
    EXPECT_EQ(part("a=acme", "app"), second);
    store_.setPart("a=acme", "app", json::Value());
    EXPECT_FALSE(part("a=acme", "app"));
    EXPECT_TRUE(part("a=acme", "po"));
    EXPECT_FALSE(part("a=other", "app"));
}

TEST_P(SettingsStoreTest, ListsNodesWithDescriptionAndParts) {
    store_.setPart("a=acme", "po", json::Object{{"code", "7"}});
    store_.setPart("a=acme", "app", json::Object{{"descr", "Acme Ltd"}});
    store_.add("u=bob/a=acme");
    std::vector<VlServiced::SettingsNode> const nodes = store_.nodes();
    ASSERT_EQ(nodes.size(), 3u);
    EXPECT_EQ(nodes[1].id, "a=acme");
    EXPECT_EQ(nodes[1].description, "Acme Ltd");
    EXPECT_THAT(nodes[1].parts, ElementsAre("app", "po"));
    EXPECT_EQ(nodes[2].description, "");
    EXPECT_THAT(nodes[2].parts, ElementsAre());
}

TEST_P(SettingsStoreTest, ClearsANodeAndKeepsIt) {
    store_.setPart("a=acme", "app", json::Object{{"descr", "x"}});
    store_.clear("a=acme");
    EXPECT_FALSE(part("a=acme", "app"));
    EXPECT_TRUE(store_.contains("a=acme"));
}

TEST_P(SettingsStoreTest, GivesTheLevelsFromTheNodeToTheRoot) {
    store_.setPart("a=acme", "app", json::Object{{"descr", "x"}});
    EXPECT_THAT(chainIds("u=bob/ou=sales/a=acme"),
                ElementsAre("u=bob/ou=sales/a=acme", "ou=sales/a=acme", "a=acme", ""));
    EXPECT_EQ(store_.chain("u=bob/a=acme")[1].parts.get("app"), (json::Object{{"descr", "x"}}));
    EXPECT_TRUE(store_.chain("u=bob/a=acme")[0].parts.empty());
}

TEST_P(SettingsStoreTest, HasTheRootOnceInTheChainOfAnIdThatEndsInASlash) {
    EXPECT_THAT(chainIds("u=bob/"), ElementsAre("u=bob/", ""));
    EXPECT_THAT(chainIds(""), ElementsAre(""));
}

TEST_P(SettingsStoreTest, RemovesANodeWithItsParts) {
    store_.setPart("a=acme", "app", json::Object{{"descr", "x"}});
    store_.remove("a=acme");
    EXPECT_FALSE(store_.contains("a=acme"));
    store_.add("a=acme");
    EXPECT_FALSE(part("a=acme", "app"));
}

TEST_P(SettingsStoreTest, RefusesToRemoveWhatOthersStandOn) {
    store_.add("u=bob/ou=sales/a=acme");
    store_.add("u=eve/ou=sales/a=acme");
    EXPECT_EQ(failureOf([&] { store_.remove("a=acme"); }),
              "node a=acme has 1 child (ou=sales/a=acme): remove what is below it first");
    EXPECT_EQ(failureOf([&] { store_.remove("ou=sales/a=acme"); }),
              "node ou=sales/a=acme has 2 children (u=bob/ou=sales/a=acme): remove what is below it first");
    EXPECT_EQ(failureOf([&] { store_.remove(""); }), "the root cannot be removed");
    EXPECT_EQ(failureOf([&] { store_.remove("a=other"); }), "there is no node a=other");
    EXPECT_EQ(store_.nodes().size(), 5u);
    EXPECT_EQ(failureOf([&] { store_.remove("u=bob/ou=sales/a=acme"); }), "nothing was thrown");
}

TEST_P(SettingsStoreTest, KeepsTheServicesOwnSettings) {
    EXPECT_EQ(store_.serviceSettings(), json::Object());
    json::Object const settings{{"upload_folder", "/srv/upload"}};
    store_.setServiceSettings(settings);
    EXPECT_EQ(store_.serviceSettings(), settings);
    store_.setServiceSettings(json::Object());
    EXPECT_EQ(store_.serviceSettings(), json::Object());
}

TEST_P(SettingsStoreTest, IsThereForTheNextThatOpensTheFile) {
    store_.setPart("a=acme", "app", json::Object{{"descr", "grüße"}});
    auto const again = open();
    EXPECT_EQ(SettingsStore(*again).parts("a=acme").get("app"), (json::Object{{"descr", "grüße"}}));
}

TEST_P(SettingsStoreTest, ChangesNothingWhenTheTextCannotBeKept) {
    std::string const noUtf8 = "\xFF";
    EXPECT_THROW(store_.setPart("a=acme", "app", json::Object{{"descr", noUtf8}}), json::Exc);
    EXPECT_THAT(nodeIds(), ElementsAre(""));
}

TEST_P(SettingsStoreTest, KeepsPartsOfABoundedSize) {
    json::Object const part{{"descr", std::string(5 << 20, 'x')}};
    EXPECT_EQ(failureOf([&] { store_.setPart("a=acme", "app", part); }),
              "the settings \"app\" of node a=acme are too large: they have 5242892 bytes, and 4194304 are "
              "possible");
    EXPECT_FALSE(store_.contains("a=acme"));
}

TEST_P(SettingsStoreTest, ReadsChainsOfABoundedSize) {
    json::Object const part{{"descr", std::string(3 << 20, 'x')}};
    for (char const* node : {"", "a=acme", "u=bob/a=acme"})
        store_.setPart(node, "app", part);
    EXPECT_EQ(store_.chain("a=acme").size(), 2u);
    EXPECT_EQ(
        failureOf([&] { store_.chain("u=bob/a=acme"); }),
        "the settings that count at node u=bob/a=acme are too large, more than 8388608 bytes of JSON: let "
        "its nodes hold less");
}

TEST_P(SettingsStoreTest, KeepsABoundedNumberOfNodes) {
    std::string const refusal =
        "there is no room for more nodes: 20000 are possible, whose ids have 4194304 bytes "
        "together; remove some first";
    // With the root there are 19,999 then.
    database_->run("WITH RECURSIVE n(i) AS (VALUES (1) UNION ALL SELECT i + 1 FROM n WHERE i < 19998) "
                   "INSERT INTO nodes (id, parent) SELECT 'a=' || i, '' FROM n");
    EXPECT_EQ(failureOf([&] { store_.add("u=bob/a=acme"); }), refusal);
    EXPECT_FALSE(store_.contains("a=acme"));
    store_.add("a=acme");
    EXPECT_EQ(failureOf([&] { store_.setPart("a=other", "po", json::Object{{"code", "1"}}); }), refusal);
    store_.setPart("a=acme", "po", json::Object{{"code", "1"}});
    store_.remove("a=17");
    store_.add("a=other");
}

TEST_P(SettingsStoreTest, KeepsIdsOfABoundedSize) {
    database_->run("WITH RECURSIVE n(i) AS (VALUES (1) UNION ALL SELECT i + 1 FROM n WHERE i < 4200) "
                   "INSERT INTO nodes (id, parent) SELECT 'a=' || i || '" +
                   std::string(998, 'x') + "', '' FROM n");
    EXPECT_THAT(failureOf([&] { store_.add("a=acme"); }),
                testing::StartsWith("there is no room for more nodes"));
}

VLSERVICE_ON_EACH_DATABASE(SettingsStoreTest);

} // namespace
