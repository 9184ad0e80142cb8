#include "vlservice/cfg/id.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <cstddef>
#include <string>
#include <type_traits>
#include <vector>

namespace {

using namespace VLServiceTest;
using Cfg::Id;
using testing::ElementsAre;
using testing::IsEmpty;

// Calls that would lose something in silence.
static_assert(!std::is_constructible_v<Id, char const*, char const*>);
static_assert(!std::is_constructible_v<Id, char const (&)[4], char const (&)[7]>);
static_assert(!std::is_constructible_v<Id, std::string, std::string>);
static_assert(!std::is_constructible_v<Id, std::string, json::Value>);
static_assert(!std::is_constructible_v<Id, std::string, int>);
static_assert(!std::is_constructible_v<Id, std::string, void*>);
static_assert(!std::is_constructible_v<Id, int>);
static_assert(!std::is_constructible_v<Id, bool>);
static_assert(!std::is_constructible_v<Id, double>);
static_assert(!std::is_constructible_v<Id, std::nullptr_t>);
static_assert(!std::is_constructible_v<Id, std::string>);
static_assert(std::is_convertible_v<char const*, Id>);
static_assert(std::is_convertible_v<json::Value, Id>);
static_assert(std::is_convertible_v<json::Object, Id>);
static_assert(std::is_constructible_v<Id, std::string, bool>);
static_assert(std::is_constructible_v<Id, std::string const&, bool>);
static_assert(std::is_constructible_v<Id, char const*, Id>);
static_assert(std::is_same_v<decltype(Id().tokens()), std::vector<std::string>>);
static_assert(std::is_same_v<decltype(Id().allIds()), std::vector<Id>>);
static_assert(std::is_same_v<decltype(std::declval<Id const&>().str()), std::string const&>);

Id raw(std::string const& text) { return Id(text, false); }

std::vector<std::string> texts(std::vector<Id> const& ids) {
    std::vector<std::string> texts;
    for (Id const& id : ids)
        texts.push_back(id.str());
    return texts;
}

// At namespace scope on purpose: the library's texts are ready when a program's static objects are built.
Id const BUILT_AT_START("bob/acme");
std::string const COPIED_AT_START = Id::USER_PREFIX + Id::GROUP_PREFIX + Id::ACCOUNT_PREFIX;

TEST(IdConstants, AreThePrefixesAndSymbols) {
    EXPECT_EQ(Id::ACCOUNT_PREFIX, "a=");
    EXPECT_EQ(Id::GROUP_PREFIX, "ou=");
    EXPECT_EQ(Id::USER_PREFIX, "u=");
    EXPECT_EQ(Id::TYPE_SYMBOL, '=');
    EXPECT_EQ(Id::CFG_ID_DELIM, '/');
}

TEST(IdConstants, AreReadyForStaticObjects) {
    EXPECT_EQ(BUILT_AT_START.str(), "u=bob/a=acme");
    EXPECT_EQ(COPIED_AT_START, "u=ou=a=");
}

struct FixCase {
    char const* input;
    char const* fixed;
};

constexpr FixCase FIX_CASES[] = {
    {"", ""},
    {"/", "u=/"},
    {"bob", "u=bob/"},
    {"u=bob", "u=bob/"},
    {"bob/acme", "u=bob/a=acme"},
    {"bob/sales/acme", "u=bob/ou=sales/a=acme"},
    {"bob/sales/north/acme", "u=bob/ou=sales/ou=north/a=acme"},
    {"/bob/acme", "u=bob/a=acme"},
    {"u=bob/ou=sales/a=acme", "u=bob/ou=sales/a=acme"},
    {"ou=sales/a=acme", "ou=sales/a=acme"},
    {"a=acme", "a=acme"},
    {"ou=sales", "ou=sales/"},
    {"bob/", "u=bob/a="},
    {"bob/acme/", "u=bob/ou=acme/a="},
    {"a=acme/", "a=acme/a="},
    {"u=bob/", "u=bob/a="},
    {"bob/north/a=acme", "u=bob/a=north/a=acme"},
    {"bob/ou=north/acme", "u=bob/ou=north/a=acme"},
    {"maria=x", "maria=x"},
    // A type symbol as a token's very first character is none.
    {"=bob", "u==bob/"},
    {"bob/=acme", "u=bob/a==acme"},
    // Every leading slash goes.
    {"///bob//", "u=bob/a=/"},
    {"//", "u=/"},
    // A slash right behind another is no delimiter.
    {"bob//acme", "u=bob/a=/acme"},
    {"bob//acme/x", "u=bob/ou=/acme/a=x"},
    {"bob//u=x", "u=bob//u=x/"},
    {"bob/x", "u=bob/a=x"},
    {"b/a/c/d/e", "u=b/ou=a/ou=c/ou=d/a=e"},
    // A type in between leaves the pending slash waiting.
    {"bob/x/ou=y/z/ou=w", "u=bob/ou=x/ou=y/a=z/ou=w"},
    {"u=", "u=/"},
    {"u", "u=u/"},
    {"ou", "u=ou/"},
    {"x=y/acme", "x=y/a=acme"},
};

TEST(IdFixing, CompletesLooselyTypedPaths) {
    for (FixCase const& c : FIX_CASES) {
        EXPECT_EQ(Id(c.input).str(), c.fixed) << c.input;
        EXPECT_EQ(Id(std::string(c.input), true).str(), c.fixed) << c.input;
    }
}

TEST(IdFixing, RunsOnlyWhereItIsAskedFor) {
    for (FixCase const& c : FIX_CASES) {
        std::string const text = c.input;
        EXPECT_EQ(Id(text, false).str(), c.input);
        EXPECT_EQ(Id(std::string(text), false).str(), c.input);
        EXPECT_EQ(Id(json::Value(text)).str(), c.input);
    }
}

TEST(IdFixing, ChangesATextWithoutAnAccountTheSecondTimeToo) {
    std::string const once = Id("bob").str();
    EXPECT_EQ(once, "u=bob/");
    EXPECT_EQ(Id(once, true).str(), "u=bob/a=");
    EXPECT_EQ(Id("u=bob/a=", true).str(), "u=bob/a=");
}

TEST(IdFixing, GetsThroughHundredsOfThousandsOfTokens) {
    std::string hostile;
    std::string fixed = "u=";
    for (int i = 0; i < 200'000; ++i) {
        hostile += "x/";
        fixed += i == 0 ? "x/" : "ou=x/";
    }
    EXPECT_TRUE(Id(hostile, true).str() == fixed + "a=");
}

TEST(IdConstruction, ByDefaultIsInvalid) {
    EXPECT_EQ(Id().str(), "/");
    EXPECT_TRUE(Id().invalid());
    EXPECT_FALSE(Id().valid());
}

struct ChildCase {
    char const* name;
    char const* parent;
    char const* child;
};

TEST(IdConstruction, OfAChildPutsTheNameInFrontOfTheParentsText) {
    ChildCase const cases[] = {
        {"bob", "a=acme", "u=bob/a=acme"},
        {"ou=sales", "a=acme", "ou=sales/a=acme"},
        {"u=bob", "a=acme", "u=bob/a=acme"},
        {"bob", "", "u=bob"},
        {"", "a=acme", "u=/a=acme"},
        {"", "", "u="},
        {"=bob", "a=acme", "u==bob/a=acme"},
        {"a=acme", "", "a=acme"},
        {"bob", "/", "u=bob//"},
        {"bob/x=y", "a=acme", "u=bob/x=y/a=acme"},
        {"bob", "u=eve/", "u=bob/u=eve/"},
    };
    for (ChildCase const& c : cases)
        EXPECT_EQ(Id(c.name, raw(c.parent)).str(), c.child) << c.name << " under " << c.parent;
}

TEST(IdConstruction, FromJsonTakesAStringAndNothingElse) {
    EXPECT_EQ(Id("\"bob\""_json).str(), "bob");
    for (json::Value const& other :
         {"1"_json, "1.5"_json, "true"_json, "null"_json, "[]"_json, "{}"_json, R"(["a=acme"])"_json})
        EXPECT_EQ(Id(other).str(), "") << text(other);
    EXPECT_EQ(Id(json::Value()).str(), "");
    EXPECT_TRUE(Id(json::Value()).valid());
    EXPECT_EQ(Id(json::Object()).str(), "");
}

TEST(IdSerializing, GivesTheText) { EXPECT_EQ(text(Id("bob/acme").serialize()), R"("u=bob/a=acme")"); }

TEST(IdComparison, IsThatOfTheTexts) {
    EXPECT_EQ(raw("u=bob"), raw("u=bob"));
    EXPECT_NE(raw("u=bob"), raw("u=bob/"));
    EXPECT_NE(raw("u=bob"), raw("u=Bob"));
    EXPECT_NE(raw(""), Id());
}

struct QueryCase {
    char const* id;
    bool valid, hasUser, accountOrBelow;
};

TEST(IdQueries, LookAtTheTextAlone) {
    QueryCase const cases[] = {
        {"", true, false, false},
        {"/", false, false, false},
        {"/u=bob/a=acme", false, false, true},
        {"u=", true, true, false},
        {"u", true, false, false},
        {"u=bob/", true, true, false},
        {"u=bob/a=acme", true, true, true},
        {"ou=sales/a=acme", true, false, true},
        {"a=acme", true, false, true},
        {"u=maria=1/", true, true, true},
        {"bob", true, false, false},
    };
    for (QueryCase const& c : cases) {
        SCOPED_TRACE(c.id);
        Id const id = raw(c.id);
        EXPECT_EQ(id.valid(), c.valid);
        EXPECT_EQ(id.invalid(), !c.valid);
        EXPECT_EQ(id.hasUser(), c.hasUser);
        EXPECT_EQ(Id::hasUserStr(c.id), c.hasUser);
        EXPECT_EQ(id.isParentId(), !c.hasUser);
        EXPECT_EQ(Id::isParentIdStr(c.id), !c.hasUser);
        EXPECT_EQ(id.accountLevelOrBelow(), c.accountOrBelow);
    }
}

TEST(IdQueries, OfTextsCanBeHandedAround) {
    bool (*const hasUser)(std::string) = &Id::hasUserStr;
    bool (*const isParent)(std::string const&) = &Id::isParentIdStr;
    EXPECT_TRUE(hasUser("u=bob/"));
    EXPECT_FALSE(isParent("u=bob/"));
}

struct NameCase {
    char const* id;
    char const* account;
    char const* user;
};

TEST(IdNames, AreCutOutBehindTheirPrefixes) {
    NameCase const cases[] = {
        {"u=bob/ou=sales/a=acme", "acme", "bob"},
        {"a=acme", "acme", ""},
        {"", "", ""},
        {"/", "", ""},
        {"u=bob/", "", "bob"},
        // "u=" is found inside "ou=".
        {"ou=sales/a=acme", "acme", "sales"},
        {"ou=sales", "", "sales"},
        // "a=" is found inside a name.
        {"u=maria=1/a=acme", "1", "maria=1"},
        // An empty name: the slash right behind the prefix is not looked at.
        {"u=/a=acme", "acme", "/a=acme"},
        {"u=/ou=x/a=acme", "acme", "/ou=x"},
        {"u=b/a=", "", "b"},
        {"u=b/a=/", "/", "b"},
        {"u=b/a=x", "x", "b"},
        {"u=b/a=x/", "x", "b"},
    };
    for (NameCase const& c : cases) {
        EXPECT_EQ(raw(c.id).accountName(), c.account) << c.id;
        EXPECT_EQ(raw(c.id).userName(), c.user) << c.id;
    }
}

TEST(IdParentage, IsATailAtItsFirstOccurrence) {
    struct {
        char const* parent;
        char const* child;
        bool isParentOrEqual;
    } const cases[] = {
        {"a=acme", "u=bob/a=acme", true},
        {"u=bob/a=acme", "u=bob/a=acme", true},
        {"", "u=bob/a=acme", true},
        {"", "", true},
        {"", "/", true},
        {"a=acme", "", false},
        {"u=bob/a=acme", "a=acme", false},
        {"a=x/", "a=x/a=x/", false},
        {"a=acme", "u=bob/a=acme/", false},
        {"a=acme", "u=bob/a=other", false},
        // A rule about texts: no token's border is looked for.
        {"cme", "u=bob/a=acme", true},
        {"a=acme", "u=bob/aa=acme", true},
    };
    for (auto const& c : cases)
        EXPECT_EQ(raw(c.parent).isParentOrEqual(raw(c.child)), c.isParentOrEqual)
            << c.parent << " of " << c.child;
}

TEST(IdTokens, AreSplitAtEverySlash) {
    EXPECT_THAT(raw("").tokens(), IsEmpty());
    EXPECT_THAT(raw("a=acme").tokens(), ElementsAre("a=acme"));
    EXPECT_THAT(raw("u=bob/ou=sales/a=acme").tokens(), ElementsAre("u=bob", "ou=sales", "a=acme"));
    EXPECT_THAT(raw("u=bob/").tokens(), ElementsAre("u=bob", ""));
    EXPECT_THAT(raw("a//b").tokens(), ElementsAre("a", "", "b"));
    EXPECT_THAT(raw("/").tokens(), ElementsAre("", ""));
}

TEST(IdChain, RunsFromTheNodeToTheRoot) {
    EXPECT_THAT(texts(raw("u=bob/ou=sales/a=acme").allIds()),
                ElementsAre("u=bob/ou=sales/a=acme", "ou=sales/a=acme", "a=acme", ""));
    EXPECT_THAT(texts(raw("a=acme").allIds()), ElementsAre("a=acme", ""));
    EXPECT_THAT(texts(raw("").allIds()), ElementsAre(""));
}

TEST(IdChain, HoldsTheRootTwiceForATextThatEndsInASlash) {
    EXPECT_THAT(texts(raw("u=bob/").allIds()), ElementsAre("u=bob/", "", ""));
    EXPECT_THAT(texts(raw("/").allIds()), ElementsAre("/", "", ""));
}

TEST(IdChain, TakesTailsAsTheyAre) {
    EXPECT_THAT(texts(raw("bob//acme").allIds()), ElementsAre("bob//acme", "/acme", "acme", ""));
}

TEST(IdToken, ValueIsWhatFollowsTheFirstTypeSymbol) {
    EXPECT_EQ(Id::tokenValue("u=bob"), "bob");
    EXPECT_EQ(Id::tokenValue("u=bob=x"), "bob=x");
    EXPECT_EQ(Id::tokenValue("bob"), "bob");
    EXPECT_EQ(Id::tokenValue("=bob"), "bob");
    EXPECT_EQ(Id::tokenValue("u="), "");
    EXPECT_EQ(Id::tokenValue(""), "");
}

TEST(IdToken, HasATypeWhenItHoldsTheSymbolAndNoSlash) {
    EXPECT_TRUE(Id::isTokenWithType("u=bob"));
    EXPECT_TRUE(Id::isTokenWithType("=bob"));
    EXPECT_TRUE(Id::isTokenWithType("bob="));
    EXPECT_FALSE(Id::isTokenWithType("bob"));
    EXPECT_FALSE(Id::isTokenWithType("u=bob/"));
    EXPECT_FALSE(Id::isTokenWithType("/"));
    EXPECT_FALSE(Id::isTokenWithType(""));
}

} // namespace
