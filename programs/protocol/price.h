#pragma once
// Prices as client and service speak of them: the tariff, the letters that are asked about, the estimate.

#include "vlservice/json/json.h"

#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace Protocol {

/// Integers, in hundredths of the currency. All default to 0.
struct Amounts {
    static constexpr char const* IN_WORDS = "the tariff";
    /// Of each amount, either way.
    static constexpr long long MAX_AMOUNT = 100'000'000;

    /// For each letter.
    long long letter = 0;
    /// For each sheet of paper.
    long long sheet = 0;
    /// Added for each page that is printed in colour.
    long long colourPage = 0;
    /// Added for each sheet that is printed on both sides; below 0 it is a discount.
    long long duplexSheet = 0;
    /// Added for each letter that is delivered with priority.
    long long priorityLetter = 0;

    Amounts() = default;
    /// Throws Error on an unknown key, and on amounts beyond MAX_AMOUNT either way.
    explicit Amounts(json::Object const& object);
    /// What they may be, as a JSON schema.
    static json::Object schema();

    struct Keys;
};

/// What letters cost.
struct Tariff {
    static constexpr char const* IN_WORDS = Amounts::IN_WORDS;
    static constexpr std::size_t MAX_CHANNELS = 100;

    /// Three capital letters.
    std::string currency;
    Amounts amounts;
    /// Of letters of these channels, in place of the others.
    std::map<std::string, Amounts> channels;

    /// Throws Error on a currency that is none, and as Amounts does.
    explicit Tariff(json::Object const& object);
    /// What it may be, as a JSON schema.
    static json::Object schema();

    Amounts const& of(std::string const& channel) const;

    struct Keys;
};

/// Letters that cost the same each.
struct LetterBatch {
    static constexpr char const* IN_WORDS = "the letters";
    static constexpr long long MAX_LETTERS = 1'000'000;
    static constexpr long long MAX_PAGES = 10'000;

    long long count = 1;
    /// Of one letter, without blank sides.
    long long pages = 1;
    bool colour = false;
    bool duplex = false;
    bool priority = false;
    /// Of one letter; 0 where its parts are not known: then the pages lie on as few sheets as they can.
    long long paperSheets = 0;
    /// Of one letter that is not in colour throughout.
    long long colouredPages = 0;
    /// That they go by; empty where that is not known.
    std::string channel;

    LetterBatch() = default;
    /// Throws Error on an unknown key, a wrong type, counts below 1 or beyond their bounds, more sheets or
    /// coloured pages than pages, and sheets that could not hold the pages.
    explicit LetterBatch(json::Object const& object);
    json::Object serialize() const;

    /// Sheets of one letter: a sheet has two pages with duplex, or one where a part ends.
    long long sheets() const { return paperSheets > 0 ? paperSheets : fewestSheets(); }
    /// Sheets of one letter that have something on both sides.
    long long duplexSheets() const { return duplex ? pages - sheets() : 0; }
    /// Pages of one letter that are printed in colour.
    long long pagesInColour() const { return colour ? pages : colouredPages; }

    struct Keys;

private:
    long long fewestSheets() const { return duplex ? (pages + 1) / 2 : pages; }
};

struct PriceRequest {
    static constexpr std::size_t MAX_BATCHES = 10'000;

    std::vector<LetterBatch> letters;

    PriceRequest() = default;
    explicit PriceRequest(std::vector<LetterBatch> batches);
    /// Throws Error when there are none or too many, and with the first that is wrong.
    explicit PriceRequest(json::Object const& object);
    json::Object serialize() const;
};

/// What a batch costs.
struct BatchPrice {
    /// Of one letter.
    long long sheets = 0;
    /// Of all letters, in hundredths.
    long long price = 0;

    BatchPrice() = default;
    BatchPrice(long long sheetsEach, long long priceOfAll);
    explicit BatchPrice(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct Estimate {
    std::string currency;
    /// In hundredths.
    long long total = 0;
    /// One a batch, in the order of the request.
    std::vector<BatchPrice> letters;

    Estimate() = default;
    explicit Estimate(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
