#include "programs/vlserviced/store/token_store.h"

#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>

namespace {

using testing::ElementsAre;
using VlServiced::StoredToken;

class TokenStoreTest : public VLServiceTest::OnEachDatabase {
protected:
    static StoredToken token(std::string const& id, std::string const& name) {
        StoredToken token;
        token.id = id;
        token.grant = {name, Policy::Role::Send, "a=acme"};
        token.keys = {std::string("\0key\xff", 5), "digest of " + id};
        token.addedAt = 1000;
        token.addedBy = "admin";
        return token;
    }
    std::vector<std::string> names() const {
        std::vector<std::string> names;
        for (StoredToken const& each : store_.all())
            names.push_back(each.grant.name);
        return names;
    }

    VlServiced::TokenStore store_{*database_};
};

TEST_P(TokenStoreTest, KeepsATokenAsItWasGivenOut) {
    ASSERT_TRUE(store_.add(token("t1", "office")));
    StoredToken const kept = store_.find("t1").value();
    EXPECT_EQ(kept.grant.name, "office");
    EXPECT_EQ(kept.grant.role, Policy::Role::Send);
    EXPECT_EQ(kept.grant.node, "a=acme");
    EXPECT_EQ(kept.keys.service, std::string("\0key\xff", 5));
    EXPECT_EQ(kept.keys.clientDigest, "digest of t1");
    EXPECT_EQ(kept.addedAt, 1000);
    EXPECT_EQ(kept.addedBy, "admin");
    EXPECT_EQ(kept.revokedAt, 0);
    EXPECT_EQ(store_.named("office")->id, "t1");
    EXPECT_FALSE(store_.find("t2"));
}

TEST_P(TokenStoreTest, GivesANameToOneTokenAtATime) {
    EXPECT_TRUE(store_.add(token("t1", "office")));
    auto const other = open();
    EXPECT_FALSE(VlServiced::TokenStore(*other).add(token("t2", "office")));
    EXPECT_FALSE(store_.add(token("t1", "warehouse"))) << "an id is one's own for good";
    EXPECT_TRUE(store_.revoke("office", 2000));
    EXPECT_TRUE(VlServiced::TokenStore(*other).add(token("t2", "office")));
    EXPECT_EQ(store_.named("office")->id, "t2");
}

TEST_P(TokenStoreTest, KnowsOfATokenThatItWasRevokedForEverybodyAtOnce) {
    store_.add(token("t1", "office"));
    store_.add(token("t2", "archive"));
    EXPECT_THAT(names(), ElementsAre("archive", "office"));
    auto const other = open();
    EXPECT_TRUE(VlServiced::TokenStore(*other).revoke("office", 2000));
    EXPECT_EQ(store_.find("t1")->revokedAt, 2000);
    EXPECT_FALSE(store_.named("office"));
    EXPECT_THAT(names(), ElementsAre("archive"));
    EXPECT_FALSE(store_.revoke("office", 3000));
}

VLSERVICE_ON_EACH_DATABASE(TokenStoreTest);

} // namespace
