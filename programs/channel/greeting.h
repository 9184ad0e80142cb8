#pragma once
// The keys of the greeting, by which both sides prove that they know the access token before anything else is
// said:
//
//     client:  {"nonce"}              request 0
//     service: {"nonce", "proof"}     response 0
//     client:  {"proof"}              request 1
//     service: {}                     response 1, or an error

#include <cstdint>

namespace Channel {

constexpr char const* NONCE = "nonce";
constexpr char const* PROOF = "proof";

constexpr std::uint32_t CHALLENGE = 0;
constexpr std::uint32_t PROVING = 1;
constexpr std::uint32_t FIRST_COMMAND = 2;

/// All that a stranger may send.
constexpr std::uint32_t MAX_GREETING = 1024;

} // namespace Channel
