#include "programs/vlmail/mailings/price.h"

#include "vlservice/json/json_text.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using VlMail::money;
using VlMail::pricedLettersOf;

Mailing::Metadata mailingWith(std::string const& presetKeys) {
    std::string const preset = R"({"name": "P")" + presetKeys + "}";
    Mailing::Metadata metadata;
    metadata.packPreset = Cfg::PackPreset(json::strToObject(preset.data(), preset.size()), {});
    metadata.letters = {
        {{{"a.pdf", {1, 2}}, {"b.pdf", {1}}}, {}}, {{{"c.pdf", {1}}}, {}}, {{{"d.pdf", {4}}}, {}}};
    return metadata;
}

TEST(PricedLetters, AreThoseOfEqualLengthTogether) {
    std::vector<Protocol::LetterBatch> const batches = pricedLettersOf(mailingWith(""));
    ASSERT_EQ(batches.size(), 2u);
    EXPECT_EQ(batches[0].pages, 1);
    EXPECT_EQ(batches[0].count, 2);
    EXPECT_EQ(batches[1].pages, 3);
    EXPECT_EQ(batches[1].count, 1);
}

TEST(PricedLetters, AreThoseOfTheSameChannelTogether) {
    Mailing::Metadata mailing = mailingWith("");
    auto const address = [&](std::size_t letter, char const* channel) {
        mailing.letters[letter].fields.emplace(1, Cfg::ExtractedField(channel, "x", 1, true,
                                                                      IgnoreOnGroup::MustMatch,
                                                                      Cfg::ExtractedField::ValueType::Plain));
    };
    address(0, "email");
    address(1, "postal");
    std::vector<Protocol::LetterBatch> const batches = pricedLettersOf(mailing);
    ASSERT_EQ(batches.size(), 3u);
    EXPECT_EQ(batches[0].channel, "");
    EXPECT_EQ(batches[1].channel, "email");
    EXPECT_EQ(batches[2].channel, "postal");
    address(2, "postal");
    EXPECT_EQ(pricedLettersOf(mailing).back().count, 2);
}

TEST(PricedLetters, FollowThePackPreset) {
    Protocol::LetterBatch const plain = pricedLettersOf(mailingWith("")).front();
    EXPECT_FALSE(plain.colour || plain.duplex || plain.priority);
    Protocol::LetterBatch const dear =
        pricedLettersOf(mailingWith(R"(,"colour_model":2,"duplex":true,"priority_delivery":true)")).front();
    EXPECT_TRUE(dear.colour && dear.duplex && dear.priority);
    EXPECT_FALSE(pricedLettersOf(mailingWith(R"(,"colour_model":1)")).front().colour) << "grey";
}

TEST(PricedLetters, HaveTheSheetsAndColouredPagesOfMailingsThatAreMadeReady) {
    Mailing::Metadata mailing = mailingWith(R"(,"duplex":true,"colour_model":2)");
    using Role = Mailing::DocumentPages::Role;
    mailing.madeReady = true;
    mailing.letters = {
        {{{"a.pdf", {1}}, {"blank", {1}, Role::Blank}, {"t.pdf", {1, 2, 3}, Role::Attachment}}, {}, 3, 2},
        {{{"b.pdf", {1, 2}}}, {}, 1, 2}};
    std::vector<Protocol::LetterBatch> const batches = pricedLettersOf(mailing);
    ASSERT_EQ(batches.size(), 2u);
    EXPECT_EQ(batches[0].pages, 2);
    EXPECT_EQ(batches[0].paperSheets, 0) << "as few as can be";
    EXPECT_TRUE(batches[0].colour);
    EXPECT_EQ(batches[0].colouredPages, 0);
    EXPECT_EQ(batches[1].pages, 4);
    EXPECT_EQ(batches[1].sheets(), 3);
    EXPECT_EQ(batches[1].duplexSheets(), 1);
    EXPECT_FALSE(batches[1].colour);
    EXPECT_EQ(batches[1].pagesInColour(), 2);
}

TEST(PriceEstimates, AreAskedForWithoutChannelsWhereAnOlderServiceKnowsNone) {
    int asked = 0;
    auto const older = [&](json::Object const& request) -> json::Object {
        ++asked;
        if (request.get("letters").toArray().at(0).toObject().get("channel"))
            return {{"err", "the letters have no key \"channel\""}};
        return {{"currency", "EUR"}, {"total", 5}};
    };
    Protocol::LetterBatch batch;
    batch.channel = "email";
    EXPECT_EQ(Protocol::Estimate(VlMail::estimatePrice(older, {batch})).total, 5);
    EXPECT_EQ(asked, 2);
    EXPECT_THROW(VlMail::estimatePrice(
                     [](json::Object const&) {
                         return json::Object{{"err", "the service has no tariff yet"}};
                     },
                     {batch}),
                 std::exception);
}

TEST(Money, IsWrittenWithItsSignInFront) {
    std::pair<long long, char const*> const cases[] = {
        {0, "0.00"},
        {5, "0.05"},
        {123456, "1234.56"},
        {-5, "-0.05"},
        {-100, "-1.00"},
        {-12345, "-123.45"},
        {std::numeric_limits<long long>::max(), "92233720368547758.07"},
        {std::numeric_limits<long long>::min(), "-92233720368547758.08"},
    };
    for (auto const& [hundredths, text] : cases)
        EXPECT_EQ(money(hundredths), text);
}

} // namespace
