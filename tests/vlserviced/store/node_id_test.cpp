#include "programs/vlserviced/store/node_id.h"

#include "tests/support/failure_of.h"

#include <gtest/gtest.h>

namespace {

using VlServiced::checkNodeId;
using VlServiced::parentNodeId;

std::string tokens(std::size_t count) {
    std::string id;
    for (std::size_t i = 1; i < count; ++i)
        id += "ou=x/";
    return id + "a=y";
}

TEST(NodeId, OfAWellFormedTextIsLetThrough) {
    for (std::string const id :
         {"", "a=acme", "ou=sales/a=acme", "u=bob/ou=sales/ou=north/a=acme", "u=bob/a=acme", "u=bob/",
          "ou=sales/", "u=bob/ou=sales/", "u=maria=1/", "u=müller/a=söhne & co"})
        EXPECT_NO_THROW(checkNodeId(id)) << id;
    EXPECT_NO_THROW(checkNodeId(tokens(32)));
}

TEST(NodeId, OfAnyOtherTextIsRefused) {
    std::string const form = "wanted is a path like u=NAME/ou=GROUP/a=ACCOUNT, or the same without its front";
    struct {
        std::string id;
        std::string why;
    } const cases[] = {
        {"/", form},
        {"/a=acme", form},
        {"bob", form},
        {"u=bob", form},
        {"ou=sales", form},
        {"u=", form},
        {"u=/a=acme", form},
        {"a=", form},
        {"u=bob/a=", form},
        {"a=acme/", form},
        {"a=acme/u=bob", form},
        {"ou=x/u=bob/a=acme", form},
        {"u=bob/u=eve/a=acme", form},
        {"a=one/a=two", form},
        {"u=bob//a=acme", form},
        {"u=bob//", form},
        {"maria=x", form},
        {"u=bob/ou=x/a=acme\n", "it holds control characters"},
        {std::string("a=x\0y", 5), "it holds control characters"},
        {"a=" + std::string(1023, 'x'), "it is longer than 1024 bytes"},
        {tokens(33), "it has more than 32 tokens"},
        {std::string(40000, '/'), "it is longer than 1024 bytes"},
    };
    for (auto const& [id, why] : cases) {
        std::string const text = failureOf([&id = id] { checkNodeId(id); });
        EXPECT_TRUE(text.starts_with("node id \"")) << text;
        EXPECT_TRUE(text.ends_with("\" is not valid: " + why)) << text << " for " << id;
    }
}

TEST(NodeId, IsShownOnOneShortLineWhenItIsRefused) {
    EXPECT_EQ(failureOf([] { checkNodeId("a=b\n<3>forged"); }),
              "node id \"a=b?<3>forged\" is not valid: it holds control characters");
    EXPECT_EQ(failureOf([] { checkNodeId(std::string(5000, 'x')); }),
              "node id \"" + std::string(80, 'x') + "...\" is not valid: it is longer than 1024 bytes");
}

TEST(NodeId, OfTheParentIsTheTextBehindTheFirstSlash) {
    EXPECT_EQ(parentNodeId("u=bob/ou=sales/a=acme"), "ou=sales/a=acme");
    EXPECT_EQ(parentNodeId("a=acme"), "");
    EXPECT_EQ(parentNodeId("u=bob/"), "");
    EXPECT_EQ(parentNodeId(""), "");
}

} // namespace
