#include "programs/protocol/price.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using Protocol::Estimate;
using Protocol::LetterBatch;
using Protocol::PriceRequest;
using Protocol::Tariff;

TEST(PriceRequestReading, RefusesWhatItDoesNotKnow) {
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
        {R"({"letters":[{"pages":4,"paper_sheets":3}]})",
         R"("paper_sheets" of the letters have to be 4 to 4)"},
        {R"({"letters":[{"pages":5,"duplex":true,"paper_sheets":2}]})",
         R"("paper_sheets" of the letters have to be 3 to 5)"},
        {R"({"letters":[{"pages":5,"duplex":true,"paper_sheets":6}]})",
         R"("paper_sheets" of the letters have to be 3 to 5)"},
        {R"({"letters":[{"pages":5,"coloured_pages":6}]})",
         R"("coloured_pages" of the letters have to be 5 at most)"},
        {R"({"letters":[{"colour":1}]})", R"("colour" of the letters has to be true or false)"},
        {R"({"letters":[{"channel":1}]})", R"("channel" of the letters has to be a text)"},
    };
    for (auto const& [request, message] : cases)
        EXPECT_EQ(failureOf([&request = request] { PriceRequest{parse(request)}; }), message);
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
        {R"({"currency":"EUR","channels":[]})",
         R"("channels" of the tariff has to be an object of at most 100 channels with the amounts of each)"},
        {R"({"currency":"EUR","channels":{"email":7}})",
         R"(the amounts of email in the tariff have to be an object, such as {"letter": 10})"},
        {R"({"currency":"EUR","channels":{"email":{"stamp":1}}})", R"(the tariff has no key "stamp")"},
        {R"({"currency":"EUR","channels":{"email":{"currency":"EUR"}}})",
         R"(the tariff has no key "currency")"},
        {R"({"currency":"EUR","channels":{"email":{"letter":"1"}}})",
         R"("letter" of the tariff has to be an integer from -100000000 to 100000000)"},
    };
    for (auto const& [object, message] : cases)
        EXPECT_EQ(failureOf([&object = object] { Tariff{parse(object)}; }), message);
}

TEST(PriceRequestWriting, LeavesOutWhatIsOnceAndNot) {
    LetterBatch many;
    many.count = 20;
    many.pages = 3;
    many.colour = many.duplex = many.priority = true;
    EXPECT_EQ(print(PriceRequest({many, {}}).serialize()),
              R"({"letters":[{"count":20,"pages":3,"colour":true,"duplex":true,"priority":true},{}]})");
}

TEST(PriceRequestWriting, IsReadAsItWasWritten) {
    LetterBatch batch;
    batch.pages = 7;
    batch.colour = true;
    batch.duplex = true;
    batch.paperSheets = 5;
    batch.colouredPages = 2;
    PriceRequest const read(PriceRequest({batch}).serialize());
    ASSERT_EQ(read.letters.size(), 1u);
    EXPECT_EQ(print(read.letters.front().serialize()), print(batch.serialize()));
}

TEST(EstimateReading, TakesWhatAServiceAnswers) {
    std::string const text =
        R"({"currency":"EUR","total":5,"letters":[{"sheets":1,"price":2},{"sheets":3,"price":3}]})";
    Estimate const estimate(parse(text));
    EXPECT_EQ(estimate.currency, "EUR");
    EXPECT_EQ(estimate.total, 5);
    ASSERT_EQ(estimate.letters.size(), 2u);
    EXPECT_EQ(estimate.letters[1].sheets, 3);
    EXPECT_EQ(print(estimate.serialize()), text);
}

} // namespace
