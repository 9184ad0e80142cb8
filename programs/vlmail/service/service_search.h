#pragma once
// Looking for the service on the network.

#include "programs/vlmail/service/service_address.h"

#include <chrono>
#include <optional>
#include <string>

namespace VlMail {

constexpr std::chrono::milliseconds SEARCH_TIME{2000};

/// The service that proves that it knows the token, as soon as it answers; when the time is up without one,
/// the first that answered with an address. Without a token the first answer counts. What is no answer is
/// passed over.
std::optional<ServiceAddress> searchNetwork(std::string const& token,
                                            std::chrono::milliseconds time = SEARCH_TIME);
/// The same for services alone that prove that they know the token.
std::optional<ServiceAddress> searchProven(std::string const& token,
                                           std::chrono::milliseconds time = SEARCH_TIME);

} // namespace VlMail
