#include "programs/protocol/price.h"

#include "programs/base/plain_text.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <string_view>
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

constexpr char const* CHANNELS = "channels";
constexpr char const* CHANNEL = "channel";

constexpr IntegerForm AMOUNT{-Amounts::MAX_AMOUNT, Amounts::MAX_AMOUNT};

/// A key that is not known is a mistake that would cost money.
template<typename Record>
void requireKnownKeys(json::Object const& object, std::string const& haveNo) {
    for (auto const& [key, value] : object)
        if (!hasKey(Record::Keys::TABLE, key))
            throw Base::Error(Base::Code::SettingInvalid,
                              std::string(Record::IN_WORDS) + haveNo + '"' + key + '"');
}

} // namespace

struct Amounts::Keys {
    static constexpr std::tuple TABLE{
        Asked{"letter", &Amounts::letter, AMOUNT},
        Asked{"sheet", &Amounts::sheet, AMOUNT},
        Asked{"colour_page", &Amounts::colourPage, AMOUNT},
        Asked{"duplex_sheet", &Amounts::duplexSheet, AMOUNT},
        Asked{"priority_letter", &Amounts::priorityLetter, AMOUNT},
    };
};

/// The amounts and their channels are not among them.
struct Tariff::Keys {
    static constexpr std::tuple TABLE{
        Asked{CURRENCY, &Tariff::currency, CurrencyForm{}},
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
        Asked{CHANNEL, &LetterBatch::channel, TextForm{}},
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

namespace {

std::map<std::string, Amounts> channelsIn(json::Value const& each) {
    if (!each.isObject() || each.toObject().size() > Tariff::MAX_CHANNELS)
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"channels\" of the tariff has to be an object of at most " +
                              std::to_string(Tariff::MAX_CHANNELS) + " channels with the amounts of each");
    std::map<std::string, Amounts> channels;
    for (auto const& [channel, amounts] : each.toObject()) {
        if (!amounts.isObject())
            throw Base::Error(Base::Code::SettingInvalid,
                              "the amounts of " + Base::oneLine(channel) +
                                  " in the tariff have to be an object, such as {\"letter\": 10}");
        channels.emplace(channel, amounts.toObject());
    }
    return channels;
}

} // namespace

Amounts::Amounts(json::Object const& object) {
    requireKnownKeys<Amounts>(object, " has no key ");
    json::readKeys(Keys::TABLE, object, *this);
}

Tariff::Tariff(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    if (currency.empty())
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"currency\" of the tariff has to be " + CurrencyForm::wanted());
    json::Object general;
    for (auto const& [key, value] : object)
        if (std::string_view const name = key; name != CURRENCY && name != CHANNELS)
            general.set(key, value);
    amounts = Amounts(general);
    if (json::Value const each = object.get(CHANNELS))
        channels = channelsIn(each);
}

Amounts const& Tariff::of(std::string const& channel) const {
    auto const found = channels.find(channel);
    return found == channels.end() ? amounts : found->second;
}

json::Object Amounts::schema() {
    Base::Schema::Members members(Base::Schema::Members::Others::Refused);
    describeTable(Keys::TABLE, members);
    return members.schema();
}

json::Object Tariff::schema() {
    Base::Schema::Members members(Base::Schema::Members::Others::Refused);
    describeTable(Keys::TABLE, members);
    describeTable(Amounts::Keys::TABLE, members);
    json::Object const channels = Base::Schema::mapOf(Amounts::schema());
    return members.require(CURRENCY)
        .add(CHANNELS, Base::Schema::with(channels, "maxProperties", MAX_CHANNELS))
        .schema();
}

LetterBatch::LetterBatch(json::Object const& object) {
    requireKnownKeys<LetterBatch>(object, " have no key ");
    json::readKeys(Keys::TABLE, object, *this);
    if (paperSheets > 0 && (paperSheets > pages || paperSheets < fewestSheets()))
        throw Base::Error(Base::Code::RequestInvalid, "\"paper_sheets\" of the letters have to be " +
                                                          std::to_string(fewestSheets()) + " to " +
                                                          std::to_string(pages));
    if (colouredPages > pages)
        throw Base::Error(Base::Code::RequestInvalid, "\"coloured_pages\" of the letters have to be " +
                                                          std::to_string(pages) + " at most");
}

json::Object LetterBatch::serialize() const { return writeRecord(*this); }

PriceRequest::PriceRequest(std::vector<LetterBatch> batches) : letters(std::move(batches)) {}

PriceRequest::PriceRequest(json::Object const& object) {
    json::Value const batches = object.get(LETTERS);
    if (!batches.isArray() || batches.toArray().empty() || batches.toArray().size() > MAX_BATCHES)
        throw Base::Error(Base::Code::RequestInvalid,
                          "\"letters\" of a price estimate has to be an array of 1 to " +
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
