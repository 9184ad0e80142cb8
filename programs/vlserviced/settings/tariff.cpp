#include "programs/vlserviced/settings/tariff.h"

#include "programs/base/error.h"

#include <algorithm>
#include <string_view>

namespace VlServiced {
namespace {

// The bounds keep the price of a batch within 64 bits: less than 2.6e12 a letter.
constexpr long long MAX_AMOUNT = 100'000'000;
constexpr long long MAX_LETTERS = 1'000'000;
constexpr long long MAX_PAGES = 10'000;
constexpr std::size_t MAX_BATCHES = 10'000;

constexpr char const* CURRENCY = "currency";

template<typename Member>
struct Row {
    char const* key;
    Member member;
};
constexpr Row<long long Tariff::*> AMOUNTS[] = {
    {"letter", &Tariff::letter},
    {"sheet", &Tariff::sheet},
    {"colour_page", &Tariff::colourPage},
    {"duplex_sheet", &Tariff::duplexSheet},
    {"priority_letter", &Tariff::priorityLetter},
};
struct Count {
    char const* key;
    long long LetterBatch::*member;
    long long highest;
};
constexpr Count COUNTS[] = {
    {"count", &LetterBatch::count, MAX_LETTERS},
    {"pages", &LetterBatch::pages, MAX_PAGES},
};
constexpr Row<bool LetterBatch::*> FLAGS[] = {
    {"colour", &LetterBatch::colour},
    {"duplex", &LetterBatch::duplex},
    {"priority", &LetterBatch::priority},
};

template<typename Rows>
auto find(Rows const& rows, std::string const& key) {
    auto const row =
        std::find_if(std::begin(rows), std::end(rows), [&](auto const& r) { return key == r.key; });
    return row == std::end(rows) ? nullptr : row;
}

long long integerWithin(json::Value const& value, long long lowest, long long highest,
                        std::string const& what) {
    if (!value.isInt() || value.toInt() < lowest || value.toInt() > highest)
        throw Base::Error(what + " has to be an integer from " + std::to_string(lowest) + " to " +
                          std::to_string(highest));
    return value.toInt();
}

std::string currencyIn(json::Value const& value) {
    std::string const text = value.textOrEmpty();
    if (text.size() != 3 ||
        !std::all_of(text.begin(), text.end(), [](char c) { return c >= 'A' && c <= 'Z'; }))
        throw Base::Error("\"currency\" of the tariff has to be three capital letters");
    return text;
}

} // namespace

Tariff::Tariff(json::Object const& object) : currency(currencyIn(object.get(CURRENCY))) {
    for (auto const& [key, value] : object) {
        if (std::string_view(key) == CURRENCY)
            continue;
        auto const* const row = find(AMOUNTS, key);
        if (!row)
            throw Base::Error("the tariff has no key \"" + std::string(key) + "\"");
        this->*row->member =
            integerWithin(value, -MAX_AMOUNT, MAX_AMOUNT, '"' + std::string(key) + "\" of the tariff");
    }
}

LetterBatch::LetterBatch(json::Object const& object) {
    for (auto const& [key, value] : object) {
        std::string const what = '"' + std::string(key) + "\" of the letters";
        if (auto const* const row = find(COUNTS, key)) {
            this->*row->member = integerWithin(value, 1, row->highest, what);
        } else if (auto const* const flag = find(FLAGS, key)) {
            if (!json_is_boolean(value.node()))
                throw Base::Error(what + " has to be true or false");
            this->*flag->member = value.isTrue();
        } else {
            throw Base::Error("the letters have no key \"" + std::string(key) + "\"");
        }
    }
}

long long priceOf(LetterBatch const& batch, Tariff const& tariff) {
    long long const oneLetter =
        tariff.letter + batch.sheets() * tariff.sheet + (batch.colour ? batch.pages * tariff.colourPage : 0) +
        batch.duplexSheets() * tariff.duplexSheet + (batch.priority ? tariff.priorityLetter : 0);
    return batch.count * std::max(oneLetter, 0LL);
}

json::Object estimate(json::Object const& request, Tariff const& tariff) {
    json::Value const batches = request.get("letters");
    if (!batches.isArray() || batches.toArray().empty() || batches.toArray().size() > MAX_BATCHES)
        throw Base::Error("\"letters\" of a price estimate has to be an array of 1 to " +
                          std::to_string(MAX_BATCHES) + " objects");
    long long total = 0;
    json::Array prices;
    for (json::Value const& element : batches.toArray()) {
        LetterBatch const batch(element.toObject());
        long long const price = priceOf(batch, tariff);
        if (__builtin_add_overflow(total, price, &total))
            throw Base::Error("the price is beyond all bounds");
        prices.append(json::Object{{"sheets", batch.sheets()}, {"price", price}});
    }
    return {{CURRENCY, tariff.currency}, {"total", total}, {"letters", prices}};
}

} // namespace VlServiced
