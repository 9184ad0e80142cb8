#pragma once
// What letters would cost.

#include "programs/channel/client.h"
#include "programs/mailing/metadata.h"
#include "programs/protocol/price.h"

#include <string>
#include <vector>

namespace VlMail {

/// The letters of a mailing, those of as many pages, sheets and coloured pages together.
std::vector<Protocol::LetterBatch> pricedLettersOf(Mailing::Metadata const& mailing);

/// The service's estimate as it answers it. Throws std::exception with a line for people.
json::Object estimatePrice(Channel::Client& service, std::vector<Protocol::LetterBatch> const& letters);

/// Hundredths as a person writes them: -0.05.
std::string money(long long hundredths);

} // namespace VlMail
