#pragma once
// What letters would cost.

#include "programs/channel/client.h"
#include "programs/mailing/metadata.h"
#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlMail {

/// Letters that cost the same each.
struct PricedLetters {
    long long count = 0;
    long long pages = 0;
    bool duplex = false;
    bool priority = false;
};

/// The letters of a mailing, those of equal length together.
std::vector<PricedLetters> pricedLettersOf(Mailing::Metadata const& mailing);

/// The service's estimate: {"currency", "total", "letters"}, amounts in hundredths. Throws std::exception
/// with a line for people.
json::Object estimatePrice(Channel::Client& service, std::vector<PricedLetters> const& letters, bool colour);

/// Hundredths as a person writes them.
std::string money(long long hundredths);

} // namespace VlMail
