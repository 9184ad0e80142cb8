// Tokens that the service gives out and takes back.

#include "programs/channel/token.h"
#include "programs/vlserviced/settings/token_service.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>

namespace {

using namespace testing;
using Policy::Grant;
using Policy::Role;
using VlServiced::TokenService;

std::string const PLAIN(32, 't');
constexpr char const* DONE = "nothing was thrown";

class TokenServiceTest : public Test {
protected:
    static Grant root() { return {"admin", Role::Admin, {}}; }

    std::string add(std::string const& name, Role role, std::string const& node, Grant const& by = root()) {
        return service_.add({name, role, node}, by).token;
    }
    std::string revoke(std::string const& name, Grant const& by = root()) {
        return failureOf([&] { service_.revoke(Protocol::TokenRevocation(name), by); });
    }
    std::string names(Grant const& by = root()) const {
        std::string all;
        for (Protocol::TokenReport const& token : service_.list(by).tokens)
            all += token.name + ' ' + Protocol::roleName(token.role) + '@' + token.id + ' ';
        return all;
    }

    TemporaryFolder folder_;
    long long now_ = 1000;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::TokenStore store_{*database_};
    TokenService service_{store_, PLAIN, [this] { return now_; }};
};

TEST_F(TokenServiceTest, GivesOutTokensThatAllowWhatWasSaid) {
    std::string const token = add("office", Role::Send, "a=acme");
    std::string const id = Channel::tokenIdOf(token);
    EXPECT_NE(id, "");
    auto const grant = service_.grantOf(id);
    ASSERT_TRUE(grant);
    EXPECT_EQ(grant->name, "office");
    EXPECT_EQ(grant->role, Role::Send);
    EXPECT_EQ(grant->node, "a=acme");
    EXPECT_EQ(service_.keysOf(id)->clientDigest, Channel::keysOf(token).clientDigest);
    EXPECT_EQ(names(), "admin admin@ office send@a=acme ");
}

TEST_F(TokenServiceTest, KeepsNothingThatLetsAnybodyIn) {
    std::string const token = add("office", Role::Send, "a=acme");
    std::string const secret = token.substr(token.find('.') + 1);
    std::string const key = Channel::clientKeyOf(token);
    for (auto const& entry : std::filesystem::directory_iterator(folder_.path())) {
        std::ifstream in(entry.path(), std::ios::binary);
        std::string const bytes{std::istreambuf_iterator<char>(in), {}};
        EXPECT_THAT(bytes, Not(HasSubstr(secret))) << entry.path();
        EXPECT_THAT(bytes, Not(HasSubstr(key))) << entry.path();
    }
}

TEST_F(TokenServiceTest, TakesTokensBackAtOnceAndForGood) {
    std::string const id = Channel::tokenIdOf(add("office", Role::Send, "a=acme"));
    EXPECT_EQ(revoke("office"), DONE);
    EXPECT_FALSE(service_.grantOf(id));
    EXPECT_FALSE(service_.keysOf(id));
    EXPECT_EQ(revoke("office"), "there is no token office: \"vlmail token list\" shows those that there are");
    std::string const other = Channel::tokenIdOf(add("office", Role::Read, "a=acme"));
    EXPECT_FALSE(service_.grantOf(id));
    EXPECT_EQ(service_.grantOf(other)->role, Role::Read);
}

TEST_F(TokenServiceTest, GivesOutNothingBeyondTheHoldersOwn) {
    Grant const acme{"boss", Role::Admin, "a=acme"};
    add("below", Role::Admin, "u=bob/a=acme", acme);
    EXPECT_EQ(
        failureOf([&] { add("x", Role::Read, "a=other", acme); }),
        "this needs the role admin at a=other, and the token boss has the role admin at a=acme: ask for "
        "a token that may (\"vlmail token add\")");
    EXPECT_THAT(failureOf([&] { add("x", Role::Read, "", acme); }),
                StartsWith("this needs the role admin at the root"));
    EXPECT_EQ(names(acme), "below admin@u=bob/a=acme ");
    add("elsewhere", Role::Read, "a=other");
    EXPECT_EQ(names(acme), "below admin@u=bob/a=acme ");
    EXPECT_EQ(revoke("elsewhere", acme),
              "there is no token elsewhere: \"vlmail token list\" shows those that there are");
    EXPECT_EQ(revoke("below", acme), DONE);
}

TEST_F(TokenServiceTest, RefusesNamesThatAreNoneOrTaken) {
    add("office", Role::Read, "a=acme");
    EXPECT_EQ(failureOf([&] { add("office", Role::Send, "a=acme"); }),
              "there is a token office already: choose another name, or revoke that one first");
    for (char const* const name : {"", "two words", "-x", "admin", "line\nfeed", "\x1b[2J",
                                   "a123456789a123456789a123456789a123456789a123456789a123456789a1234"})
        EXPECT_THAT(failureOf([&] { add(name, Role::Read, "a=acme"); }),
                    HasSubstr("cannot be the name of a token: give it one word of at most 64 bytes, other "
                              "than admin"))
            << name;
    EXPECT_THAT(failureOf([&] { add("x", Role::Read, "acme"); }),
                StartsWith("node id \"acme\" is not valid"));
}

TEST_F(TokenServiceTest, TakesTheTokenOfItsFileForOneOfAnAdministrator) {
    auto const grant = service_.grantOf("");
    ASSERT_TRUE(grant);
    EXPECT_EQ(grant->name, "admin");
    EXPECT_EQ(grant->role, Role::Admin);
    EXPECT_EQ(grant->node, "");
    EXPECT_EQ(revoke("admin"), "the token admin is the one in the service's own file: put another one there, "
                               "and start the service again");
    service_.enrol();
    EXPECT_EQ(names(), "admin admin@ ");
    EXPECT_TRUE(store_.all().empty());
}

TEST_F(TokenServiceTest, GivesTheTokenOfTheFirstStartOutAsAnyOther) {
    std::string const own = Channel::makeNamedToken();
    TokenService first(store_, own, [] { return 1000LL; });
    std::string const id = Channel::tokenIdOf(own);
    EXPECT_EQ(first.grantOf(id)->name, "admin");
    first.enrol();
    first.enrol();
    EXPECT_EQ(store_.all().size(), 1u);
    // By its id, and by nothing, as clients name it that know of no ids.
    EXPECT_EQ(first.grantOf(id)->role, Role::Admin);
    EXPECT_EQ(first.grantOf("")->role, Role::Admin);
    EXPECT_THAT(
        failureOf([&] { first.revoke(Protocol::TokenRevocation("admin"), root()); }),
        "the token admin is the last one with the role admin at the root: give out another one first");
    first.add({"boss", Role::Admin, ""}, root());
    first.revoke(Protocol::TokenRevocation("admin"), root());
    EXPECT_FALSE(first.grantOf(id));
    EXPECT_FALSE(first.grantOf(""));
    EXPECT_FALSE(first.keysOf(id));
    EXPECT_FALSE(TokenService(store_, own, [] { return 1000LL; }).grantOf(""));
}

TEST_F(TokenServiceTest, KnowsNoTokenThatItDidNotGiveOut) {
    EXPECT_FALSE(service_.grantOf("0123456789abcdef"));
    EXPECT_FALSE(service_.keysOf("0123456789abcdef"));
    EXPECT_FALSE(service_.keysOf(""));
}

} // namespace
