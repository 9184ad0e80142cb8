#pragma once
// What letters would cost.

#include "programs/channel/client.h"
#include "programs/mailing/metadata.h"
#include "vlservice/cfg/json.h"

namespace VlMail {

/// The service's estimate for the letters of a mailing: {"currency", "total", "letters"}, amounts in
/// hundredths. Throws std::exception with a line for people.
json::Object estimatePrice(Channel::Client& service, Mailing::Metadata const& mailing);

/// Hundredths as a person writes them.
std::string money(long long hundredths);

} // namespace VlMail
