#pragma once
// What mailings cost: the tariff of the service's settings, and the estimate of a mailing by it.

#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlServiced {

/// Amounts are integers, in hundredths of the currency. All but the currency default to 0.
struct Tariff {
    /// Three capital letters.
    std::string currency;
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

    /// Throws Error on an unknown key, a currency that is none, and amounts beyond 1,000,000.00 either way.
    explicit Tariff(json::Object const& object);
};

/// Letters of one kind.
struct LetterBatch {
    long long count = 1;
    long long pages = 1;
    bool colour = false;
    bool duplex = false;
    bool priority = false;

    /// Throws Error on an unknown key, a wrong type, less than one letter or page, and more than
    /// 1,000,000 letters or 10,000 pages.
    explicit LetterBatch(json::Object const& object);

    /// Sheets of one letter: a sheet has two pages with duplex.
    long long sheets() const { return duplex ? (pages + 1) / 2 : pages; }
    /// Sheets of one letter that have something on both sides.
    long long duplexSheets() const { return duplex ? pages / 2 : 0; }
};

/// The price of all letters of the batch; never below 0.
long long priceOf(LetterBatch const& batch, Tariff const& tariff);

/// Answers an estimate: "letters" is an array of batches; the answer has "currency", "total" and "letters",
/// an array with "sheets" (of one letter) and "price" (of the batch) for each. Throws Error.
json::Object estimate(json::Object const& request, Tariff const& tariff);

} // namespace VlServiced
