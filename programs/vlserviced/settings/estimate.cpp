#include "programs/vlserviced/settings/estimate.h"

#include "programs/base/error.h"

#include <algorithm>

namespace VlServiced {

// The bounds of both keep the price of a batch within 64 bits: less than 2.6e12 a letter.
long long priceOf(Protocol::LetterBatch const& batch, Protocol::Tariff const& tariff) {
    Protocol::Amounts const& amounts = tariff.of(batch.channel);
    long long const oneLetter =
        amounts.letter + batch.sheets() * amounts.sheet + batch.pagesInColour() * amounts.colourPage +
        batch.duplexSheets() * amounts.duplexSheet + (batch.priority ? amounts.priorityLetter : 0);
    return batch.count * std::max(oneLetter, 0LL);
}

Protocol::Estimate estimate(Protocol::PriceRequest const& request, Protocol::Tariff const& tariff) {
    Protocol::Estimate estimate;
    estimate.currency = tariff.currency;
    for (Protocol::LetterBatch const& batch : request.letters) {
        long long const price = priceOf(batch, tariff);
        if (__builtin_add_overflow(estimate.total, price, &estimate.total))
            throw Base::Error(Base::Code::TooLarge, "the price is beyond all bounds");
        estimate.letters.emplace_back(batch.sheets(), price);
    }
    return estimate;
}

} // namespace VlServiced
