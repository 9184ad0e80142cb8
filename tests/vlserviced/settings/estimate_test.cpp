#include "programs/vlserviced/settings/estimate.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using Protocol::LetterBatch;
using Protocol::PriceRequest;
using Protocol::Tariff;
using VlServiced::estimate;
using VlServiced::priceOf;

Tariff tariff() {
    return Tariff(parse(R"({"currency":"EUR","letter":85,"sheet":10,"colour_page":7,"duplex_sheet":-3,)"
                        R"("priority_letter":150})"));
}

TEST(PriceEstimate, CountsLettersSheetsColourDuplexAndPriority) {
    struct {
        char const* letters;
        long long sheets;
        long long price;
    } const cases[] = {
        {R"({})", 1, 85 + 10},
        {R"({"pages":3})", 3, 85 + 30},
        {R"({"pages":3,"count":1000})", 3, 115000},
        {R"({"pages":3,"colour":true})", 3, 85 + 30 + 21},
        {R"({"pages":3,"duplex":true})", 2, 85 + 20 - 3},
        {R"({"pages":4,"duplex":true})", 2, 85 + 20 - 6},
        {R"({"pages":1,"duplex":true})", 1, 85 + 10},
        {R"({"pages":4,"duplex":true,"paper_sheets":3})", 3, 85 + 30 - 3},
        {R"({"pages":4,"coloured_pages":3})", 4, 85 + 40 + 21},
        {R"({"pages":4,"coloured_pages":3,"colour":true})", 4, 85 + 40 + 28},
        {R"({"pages":1,"priority":true,"colour":false,"duplex":false})", 1, 85 + 10 + 150},
        {R"({"pages":5,"colour":true,"duplex":true,"priority":true,"count":2})", 3,
         2 * (85 + 30 + 35 - 6 + 150)},
    };
    for (auto const& [letters, sheets, price] : cases) {
        LetterBatch const batch(parse(letters));
        EXPECT_EQ(batch.sheets(), sheets) << letters;
        EXPECT_EQ(priceOf(batch, tariff()), price) << letters;
    }
}

TEST(PriceEstimate, TakesTheAmountsOfAChannelWhereItHasSome) {
    Tariff const byChannel(
        parse(R"({"currency":"EUR","letter":85,"sheet":10,"channels":{"email":{"letter":5},)"
              R"("fax":{"letter":1,"sheet":4,"priority_letter":2}}})"));
    struct {
        char const* letters;
        long long price;
    } const cases[] = {
        {R"({"pages":3})", 85 + 30},
        {R"({"pages":3,"channel":"postal"})", 85 + 30},
        {R"({"pages":3,"channel":"email","priority":true,"colour":true})", 5},
        {R"({"pages":3,"channel":"fax","priority":true,"count":2})", 2 * (1 + 12 + 2)},
    };
    for (auto const& [letters, price] : cases)
        EXPECT_EQ(priceOf(LetterBatch(parse(letters)), byChannel), price) << letters;
}

TEST(PriceEstimate, AnswersWithTheTotalAndThePartsOfIt) {
    EXPECT_EQ(
        print(
            estimate(PriceRequest(parse(R"({"letters":[{"pages":3},{"pages":2,"duplex":true,"count":10}]})")),
                     tariff())
                .serialize()),
        R"({"currency":"EUR","total":1035,"letters":[{"sheets":3,"price":115},{"sheets":1,"price":920}]})");
}

TEST(PriceEstimate, IsNeverBelowNothing) {
    Tariff const discount(parse(R"({"currency":"EUR","sheet":1,"duplex_sheet":-100})"));
    EXPECT_EQ(priceOf(LetterBatch(parse(R"({"pages":10,"duplex":true})")), discount), 0);
}

TEST(PriceEstimate, StaysWithin64BitsAtTheBoundsOfAllCounts) {
    Tariff const dear(
        parse(R"({"currency":"EUR","letter":100000000,"sheet":100000000,"colour_page":100000000,)"
              R"("duplex_sheet":100000000,"priority_letter":100000000})"));
    std::string const batch =
        R"({"count":1000000,"pages":10000,"colour":true,"duplex":true,"priority":true})";
    EXPECT_EQ(priceOf(LetterBatch(parse(batch)), dear),
              1000000LL * 100000000LL * (1 + 5000 + 10000 + 5000 + 1));
    std::string const twice = R"({"letters":[)" + batch + "," + batch + "," + batch + "," + batch + "]}";
    EXPECT_EQ(failureOf([&] { estimate(PriceRequest(parse(twice)), dear); }), "nothing was thrown");
    std::string const often =
        R"({"letters":[)" + batch + "," + batch + "," + batch + "," + batch + "," + batch + "]}";
    EXPECT_EQ(failureOf([&] { estimate(PriceRequest(parse(often)), dear); }),
              "the price is beyond all bounds");
}

} // namespace
