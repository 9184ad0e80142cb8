#include "vlservice/pack/index_tags.h"

#include <gtest/gtest.h>

#include <string>

namespace {

std::string const WHOLE_ITEM =
    R"(<mailitem name="1.pdf" offset="4294967296" length="17" role="page" crc="99" document="a &amp; b.pdf" />)";

TEST(TagsOfAnIndex, GiveAnItemWithAllThatItSays) {
    auto const item = Container::itemInTag(WHOLE_ITEM);
    ASSERT_TRUE(item);
    EXPECT_EQ(item->name, "1.pdf");
    EXPECT_EQ(item->offset, 4294967296u);
    EXPECT_EQ(item->length, 17u);
    EXPECT_EQ(item->role, "page");
    EXPECT_EQ(item->crc, 99u);
    EXPECT_EQ(item->document, "a & b.pdf");
}

TEST(TagsOfAnIndex, LeaveOutWhatIsNotThereOrUnreadable) {
    auto const item = Container::itemInTag(R"(<mailitem name="1.pdf" length="many">)");
    ASSERT_TRUE(item);
    EXPECT_EQ(item->name, "1.pdf");
    EXPECT_EQ(item->length, 0u);
    EXPECT_EQ(item->document, "");
}

TEST(TagsOfAnIndex, KeepBytesThatAreNoText) {
    auto const item = Container::itemInTag("<mailitem name=\"\xE0\x80.pdf\" role=\"page\">");
    ASSERT_TRUE(item);
    EXPECT_EQ(item->name, "\xE0\x80.pdf");
    EXPECT_EQ(item->role, "page");
}

TEST(TagsOfAnIndex, GiveTheIdOfTheMailing) {
    EXPECT_EQ(Container::mailingIdInTag(R"(<corbulet id="pack 7" items="2">)"), "pack 7");
    EXPECT_EQ(Container::mailingIdInTag(R"(<corbulet items="2">)"), std::nullopt);
}

TEST(TagsOfAnIndex, GiveNothingOfOtherElements) {
    EXPECT_FALSE(Container::itemInTag(R"(<corbulet id="pack 7">)"));
    EXPECT_FALSE(Container::mailingIdInTag(WHOLE_ITEM));
}

TEST(TagsOfAnIndex, GiveNothingOfWhatIsNoTag) {
    std::string nested;
    for (int i = 0; i < 100'000; ++i)
        nested += "<mailitem>";
    for (std::string const& text : {std::string(), std::string(">"), std::string("<>"),
                                    std::string("mailitem"), std::string("<mailitem name=\"1"), nested})
        EXPECT_FALSE(Container::itemInTag(text)) << text.substr(0, 40);
}

TEST(TagsOfAnIndex, GiveNothingBeforeTheTagIsWhole) {
    for (std::size_t size = 0; size + 2 < WHOLE_ITEM.size(); ++size)
        EXPECT_FALSE(Container::itemInTag(WHOLE_ITEM.substr(0, size))) << size;
}

} // namespace
