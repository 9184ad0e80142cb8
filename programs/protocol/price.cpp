#include "programs/protocol/price.h"

#include "programs/protocol/rows.h"

#include <algorithm>
#include <utility>

namespace Protocol {
namespace {

constexpr char const* CURRENCY = "currency";
constexpr char const* LETTERS = "letters";

struct CurrencyForm {
    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        return text.size() == 3 &&
               std::all_of(text.begin(), text.end(), [](char c) { return c >= 'A' && c <= 'Z'; });
    }
    static std::string wanted() { return "three capital letters"; }
    static json::Object schema() { return Base::Schema::textLike("^[A-Z]{3}$"); }
};

constexpr IntegerForm AMOUNT{-Tariff::MAX_AMOUNT, Tariff::MAX_AMOUNT};

/// A key that is not known is a mistake that would cost money.
template<typename Record>
void requireKnownKeys(json::Object const& object, std::string const& haveNo) {
    for (auto const& [key, value] : object)
        if (!hasKey(Record::Keys::TABLE, key))
            throw Base::Error(std::string(Record::IN_WORDS) + haveNo + '"' + key + '"');
}

} // namespace

struct Tariff::Keys {
    static constexpr std::tuple TABLE{
        Asked{CURRENCY, &Tariff::currency, CurrencyForm{}},
        Asked{"letter", &Tariff::letter, AMOUNT},
        Asked{"sheet", &Tariff::sheet, AMOUNT},
        Asked{"colour_page", &Tariff::colourPage, AMOUNT},
        Asked{"duplex_sheet", &Tariff::duplexSheet, AMOUNT},
        Asked{"priority_letter", &Tariff::priorityLetter, AMOUNT},
    };
};

struct LetterBatch::Keys {
    static constexpr std::tuple TABLE{
        Asked{"count", &LetterBatch::count, IntegerForm{1, MAX_LETTERS}, 1LL},
        Asked{"pages", &LetterBatch::pages, IntegerForm{1, MAX_PAGES}, 1LL},
        Asked{"colour", &LetterBatch::colour, FlagForm{}},
        Asked{"duplex", &LetterBatch::duplex, FlagForm{}},
        Asked{"priority", &LetterBatch::priority, FlagForm{}},
        Asked{"paper_sheets", &LetterBatch::paperSheets, IntegerForm{0, MAX_PAGES}},
        Asked{"coloured_pages", &LetterBatch::colouredPages, IntegerForm{0, MAX_PAGES}},
    };
};

struct BatchPrice::Keys {
    static constexpr std::tuple TABLE{
        Always{"sheets", &BatchPrice::sheets},
        Always{"price", &BatchPrice::price},
    };
};

struct Estimate::Keys {
    static constexpr std::tuple TABLE{
        Always{CURRENCY, &Estimate::currency},
        Always{"total", &Estimate::total},
        Always{LETTERS, &Estimate::letters},
    };
};

Tariff::Tariff(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    if (currency.empty())
        throw Base::Error("\"currency\" of the tariff has to be " + CurrencyForm::wanted());
    requireKnownKeys<Tariff>(object, " has no key ");
}

json::Object Tariff::schema() {
    Base::Schema::Members members(Base::Schema::Members::Others::Refused);
    describeTable(Keys::TABLE, members);
    return members.require(CURRENCY).schema();
}

LetterBatch::LetterBatch(json::Object const& object) {
    requireKnownKeys<LetterBatch>(object, " have no key ");
    json::readKeys(Keys::TABLE, object, *this);
    if (paperSheets > 0 && (paperSheets > pages || paperSheets < fewestSheets()))
        throw Base::Error("\"paper_sheets\" of the letters have to be " + std::to_string(fewestSheets()) +
                          " to " + std::to_string(pages));
    if (colouredPages > pages)
        throw Base::Error("\"coloured_pages\" of the letters have to be " + std::to_string(pages) +
                          " at most");
}

json::Object LetterBatch::serialize() const { return writeRecord(*this); }

PriceRequest::PriceRequest(std::vector<LetterBatch> batches) : letters(std::move(batches)) {}

PriceRequest::PriceRequest(json::Object const& object) {
    json::Value const batches = object.get(LETTERS);
    if (!batches.isArray() || batches.toArray().empty() || batches.toArray().size() > MAX_BATCHES)
        throw Base::Error("\"letters\" of a price estimate has to be an array of 1 to " +
                          std::to_string(MAX_BATCHES) + " objects");
    for (json::Value const& batch : batches.toArray())
        letters.emplace_back(batch.toObject());
}

json::Object PriceRequest::serialize() const {
    return {{LETTERS, json::Form<std::vector<LetterBatch>>::write(letters)}};
}

BatchPrice::BatchPrice(long long sheetsEach, long long priceOfAll) : sheets(sheetsEach), price(priceOfAll) {}
BatchPrice::BatchPrice(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object BatchPrice::serialize() const { return writeRecord(*this); }

Estimate::Estimate(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object Estimate::serialize() const { return writeRecord(*this); }

} // namespace Protocol
