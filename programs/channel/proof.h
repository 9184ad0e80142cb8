#pragma once
// What is computed with the access token: proofs that a side knows it, keys that hold what is said
// afterwards.

#include <cstdint>
#include <string>
#include <string_view>

namespace Channel {

enum class Side { Client, Service };

/// What both sides of a connection know, and strangers in between would have to change.
struct Terms {
    std::uint16_t version = 1;
    std::string token;
    /// Of the service's certificate as this side sees it; empty without TLS.
    std::string fingerprint;
    /// The two ends of a connection without TLS, as HOST:PORT; from version 2 on.
    std::string clientAddress;
    std::string serviceAddress;
};

/// The proof of one side for one greeting, 64 hexadecimal digits. Nothing of one version, side or connection
/// serves for another. Throws Error when the crypto library fails.
std::string makeProof(Side side, Terms const& terms, std::string_view clientNonce,
                      std::string_view serviceNonce);
/// The key under which that side seals its messages, 32 bytes. Throws Error.
std::string makeSealKey(Side side, Terms const& terms, std::string_view clientNonce,
                        std::string_view serviceNonce);
/// Shows that a service's answer to a question of discovery came from one that knows the token. Throws Error.
std::string makeDiscoveryProof(std::string_view token, std::string_view nonce, std::string_view host,
                               std::uint16_t port);
/// Takes the same time wherever the two differ. An empty proof is never the same.
bool isSameProof(std::string_view a, std::string_view b);

/// HMAC-SHA-256, 32 bytes. Throws Error when the crypto library fails.
std::string hmac(std::string_view key, std::string_view message);

} // namespace Channel
