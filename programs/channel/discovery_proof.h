#pragma once
// What client and service add to discovery, so that a client tells its own service from whoever else answers:
// the question carries a nonce, the answer its proof. Others pass both over.

#include "vlservice/json/json.h"

#include <cstdint>
#include <optional>
#include <string>

namespace Channel {

/// A question with that nonce, and with the token's id where it has one.
json::Object signedQuestion(std::string const& nonce, std::string const& token = {});
/// The nonce in a question; none in one without or with one that nobody would make.
std::optional<std::string> nonceIn(json::Object const& question);
/// The id of the token that a question wants proved; empty for the service's own.
std::string tokenIdIn(json::Object const& question);

/// A service's answer, with its proof when the question had a nonce: by the token, or the service's key of
/// the token that the question names. Throws Error.
json::Object makeAnswer(std::string const& host, std::uint16_t port, std::string const& token,
                        std::optional<std::string> const& nonce);
/// Whether the answer comes from a service that knows the token and was asked with that nonce. Throws Error.
bool isProven(json::Object const& answer, std::string const& token, std::string const& nonce);

} // namespace Channel
