#pragma once
// The access token: a secret text in a private file, the same on both sides, by which service and client know
// each other. It never travels: each side proves that it knows it.

#include <cstddef>
#include <string>

namespace Channel {

constexpr std::size_t MIN_TOKEN_LENGTH = 32;

/// The token in a private file, without white space around it. Throws Error when it is too short or not one
/// word.
std::string readToken(std::string const& file);
/// The same; where there is no file yet, one with a new random token is made.
std::string readOrCreateToken(std::string const& file);

/// A fresh token of the form ID.SECRET, 16 and 64 hexadecimal digits. The id says which of its tokens a
/// service is shown; the secret never travels.
std::string makeNamedToken();
/// The id of a token of that form; empty for any other.
std::string tokenIdOf(std::string const& token);

/// Fresh random bits for one greeting, as hexadecimal digits.
std::string makeNonce();

} // namespace Channel
