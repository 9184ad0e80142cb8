#pragma once
// What mailings cost by a tariff.

#include "programs/protocol/price.h"

namespace VlServiced {

/// The price of all letters of the batch, in hundredths; never below 0.
long long priceOf(Protocol::LetterBatch const& batch, Protocol::Tariff const& tariff);

/// Throws Error when the total is beyond 64 bits.
Protocol::Estimate estimate(Protocol::PriceRequest const& request, Protocol::Tariff const& tariff);

} // namespace VlServiced
