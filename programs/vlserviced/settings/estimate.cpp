#include "programs/vlserviced/settings/estimate.h"

#include "programs/base/error.h"

#include <algorithm>

namespace VlServiced {

// The bounds of both keep the price of a batch within 64 bits: less than 2.6e12 a letter.
long long priceOf(Protocol::LetterBatch const& batch, Protocol::Tariff const& tariff) {
    long long const oneLetter =
        tariff.letter + batch.sheets() * tariff.sheet + batch.pagesInColour() * tariff.colourPage +
        batch.duplexSheets() * tariff.duplexSheet + (batch.priority ? tariff.priorityLetter : 0);
    return batch.count * std::max(oneLetter, 0LL);
}

Protocol::Estimate estimate(Protocol::PriceRequest const& request, Protocol::Tariff const& tariff) {
    Protocol::Estimate estimate;
    estimate.currency = tariff.currency;
    for (Protocol::LetterBatch const& batch : request.letters) {
        long long const price = priceOf(batch, tariff);
        if (__builtin_add_overflow(estimate.total, price, &estimate.total))
            throw Base::Error("the price is beyond all bounds");
        estimate.letters.emplace_back(batch.sheets(), price);
    }
    return estimate;
}

} // namespace VlServiced
