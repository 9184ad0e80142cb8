#include "vlservice/cfg/cfg_node_id.h"

#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <string>
#include <type_traits>

namespace {

using namespace VLServiceTest;
using Cfg::CfgNodeId;
using Cfg::Id;

CfgNodeId node(char const* path) { return Id(std::string(path), false); }

TEST(CfgNodeIdKey, IsId) { EXPECT_STREQ(CfgNodeId::NODE_ID_FLD_NAME, "id"); }

TEST(CfgNodeIdConstruction, ByDefaultNamesTheRoot) {
    EXPECT_EQ(text(CfgNodeId().serialize()), "[]");
    EXPECT_EQ(CfgNodeId().asCfgId().str(), "");
}

TEST(CfgNodeIdConstruction, FromAnIdTakesItsTokens) {
    EXPECT_EQ(text(node("u=bob/ou=sales/a=acme").serialize()), R"(["u=bob","ou=sales","a=acme"])");
    EXPECT_EQ(text(node("u=bob/").serialize()), R"(["u=bob",""])");
    EXPECT_EQ(text(node("").serialize()), "[]");
}

TEST(CfgNodeIdConstruction, FromJsonSharesTheArray) {
    json::Value const array = R"(["u=bob"])"_json;
    EXPECT_EQ(CfgNodeId(array).serialize().node(), array.node());
}

TEST(CfgNodeIdConstruction, FromJsonWantsAnArray) {
    EXPECT_EQ(messageOf([] { CfgNodeId("{}"_json); }),
              "JSON error: Wrong type: object. Expected type: array");
    EXPECT_EQ(messageOf([] { CfgNodeId{json::Value()}; }),
              "JSON error: Wrong type: empty. Expected type: array");
    EXPECT_EQ(messageOf([] { CfgNodeId(R"("a=acme")"_json); }),
              "JSON error: Wrong type: string. Expected type: array");
}

TEST(CfgNodeIdText, IsThatOfTheIdItCameFrom) {
    for (char const* path : {"", "/", "u=bob/", "a=acme", "u=bob/ou=sales/a=acme", "a//b", "//", "bob"})
        EXPECT_EQ(node(path).asCfgId().str(), path);
}

TEST(CfgNodeIdText, IsTakenUnfixed) {
    EXPECT_EQ(CfgNodeId(R"(["bob", "acme"])"_json).asCfgId().str(), "bob/acme");
}

TEST(CfgNodeIdText, WantsStrings) {
    CfgNodeId const bad(R"(["u=bob", 1])"_json);
    EXPECT_EQ(messageOf([&] { bad.asCfgId(); }), "JSON error: Wrong type: integer. Expected type: string");
}

TEST(CfgNodeIdText, OfAnIdThatWasMovedFromIsTheRoot) {
    CfgNodeId source = node("u=bob/a=acme");
    CfgNodeId const target = std::move(source);
    EXPECT_EQ(source.asCfgId().str(), "");
    EXPECT_EQ(target.asCfgId().str(), "u=bob/a=acme");
}

TEST(CfgNodeIdComparison, IsThatOfTheArrays) {
    EXPECT_EQ(node("u=bob/a=acme"), CfgNodeId(R"(["u=bob", "a=acme"])"_json));
    EXPECT_NE(node("u=bob/a=acme"), node("a=acme"));
    EXPECT_EQ(CfgNodeId(), node(""));
}

TEST(CfgNodeIdParentage, IsOfAncestorsAtAnyDistanceByWholeTokens) {
    struct {
        char const* parent;
        char const* child;
        bool isParent;
    } const cases[] = {
        {"", "a=acme", true},
        {"", "", false},
        {"a=acme", "u=bob/a=acme", true},
        {"a=acme", "u=bob/ou=sales/a=acme", true},
        {"ou=sales/a=acme", "u=bob/ou=sales/a=acme", true},
        {"a=acme", "a=acme", false},
        {"u=bob/a=acme", "a=acme", false},
        {"ou=north/a=acme", "u=bob/ou=sales/a=acme", false},
        {"cme", "u=bob/a=acme", false},
        {"a=other", "u=bob/a=acme", false},
        {"a=x/", "a=x/a=x/", true},
    };
    for (auto const& c : cases)
        EXPECT_EQ(node(c.parent).isParentOf(node(c.child)), c.isParent) << c.parent << " of " << c.child;
}

} // namespace
