#include "programs/vlserviced/settings/tariff.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using VlServiced::estimate;
using VlServiced::LetterBatch;
using VlServiced::Tariff;

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

TEST(PriceEstimate, AnswersWithTheTotalAndThePartsOfIt) {
    EXPECT_EQ(
        print(estimate(parse(R"({"letters":[{"pages":3},{"pages":2,"duplex":true,"count":10}]})"), tariff())),
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
    EXPECT_EQ(failureOf([&] { estimate(parse(twice), dear); }), "nothing was thrown");
    std::string const often =
        R"({"letters":[)" + batch + "," + batch + "," + batch + "," + batch + "," + batch + "]}";
    EXPECT_EQ(failureOf([&] { estimate(parse(often), dear); }), "the price is beyond all bounds");
}

TEST(PriceEstimate, RefusesWhatItDoesNotKnow) {
    struct {
        char const* request;
        char const* message;
    } const cases[] = {
        {R"({})", R"("letters" of a price estimate has to be an array of 1 to 10000 objects)"},
        {R"({"letters":[]})", R"("letters" of a price estimate has to be an array of 1 to 10000 objects)"},
        {R"({"letters":{}})", R"("letters" of a price estimate has to be an array of 1 to 10000 objects)"},
        {R"({"letters":[1]})", "JSON error: Wrong type: integer. Expected type: object"},
        {R"({"letters":[{"sheets":1}]})", R"(the letters have no key "sheets")"},
        {R"({"letters":[{"pages":0}]})", R"("pages" of the letters has to be an integer from 1 to 10000)"},
        {R"({"letters":[{"pages":"1"}]})", R"("pages" of the letters has to be an integer from 1 to 10000)"},
        {R"({"letters":[{"pages":10001}]})",
         R"("pages" of the letters has to be an integer from 1 to 10000)"},
        {R"({"letters":[{"count":1000001}]})",
         R"("count" of the letters has to be an integer from 1 to 1000000)"},
        {R"({"letters":[{"colour":1}]})", R"("colour" of the letters has to be true or false)"},
    };
    for (auto const& [request, message] : cases)
        EXPECT_EQ(failureOf([&request = request] { estimate(parse(request), tariff()); }), message);
}

TEST(TariffReading, RefusesWhatIsNone) {
    struct {
        char const* object;
        char const* message;
    } const cases[] = {
        {R"({})", R"("currency" of the tariff has to be three capital letters)"},
        {R"({"currency":"euro"})", R"("currency" of the tariff has to be three capital letters)"},
        {R"({"currency":978})", R"("currency" of the tariff has to be three capital letters)"},
        {R"({"currency":"EUR","stamp":1})", R"(the tariff has no key "stamp")"},
        {R"({"currency":"EUR","sheet":0.1})",
         R"("sheet" of the tariff has to be an integer from -100000000 to 100000000)"},
        {R"({"currency":"EUR","sheet":100000001})",
         R"("sheet" of the tariff has to be an integer from -100000000 to 100000000)"},
    };
    for (auto const& [object, message] : cases)
        EXPECT_EQ(failureOf([&object = object] { Tariff{parse(object)}; }), message);
}

} // namespace
