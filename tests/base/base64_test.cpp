#include "programs/base/base64.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(Base64, IsThatOfTheStandard) {
    std::pair<char const*, char const*> const cases[] = {
        {"", ""}, {"f", "Zg=="}, {"fo", "Zm8="}, {"foo", "Zm9v"}, {"foob", "Zm9vYg=="}, {"\xff\xfe", "//4="}};
    for (auto const& [bytes, text] : cases) {
        EXPECT_EQ(Base::toBase64(bytes), text);
        EXPECT_EQ(Base::fromBase64(text), bytes);
    }
}

TEST(Base64, GivesEveryByteBack) {
    std::string bytes;
    for (int i = 0; i < 1000; ++i)
        bytes += static_cast<char>(i * 7);
    for (std::size_t size = 0; size < bytes.size(); ++size)
        ASSERT_EQ(Base::fromBase64(Base::toBase64(bytes.substr(0, size))), bytes.substr(0, size)) << size;
}

TEST(Base64, IsNoOtherText) {
    for (char const* const text : {"Z", "Zg", "Zg=", "Zm9", "Z===", "====", "=Zm9", "Zm9v\n", " Zm9v",
                                   "Zm9v ", "Zm 9v", "Zm9-", "Zm9_", "Zh==", "Zm9=", "Zg==Zg=="})
        EXPECT_FALSE(Base::fromBase64(text)) << text;
}

} // namespace
