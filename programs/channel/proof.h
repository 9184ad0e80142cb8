#pragma once
// What is computed with the access token: proofs that a side knows it, keys that hold what is said
// afterwards.

#include <cstdint>
#include <memory>
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

/// What a service keeps of a token that it has given out: enough to know who holds the token and to prove
/// itself to him, and not enough to be let in by it. 32 bytes each.
struct TokenKeys {
    /// Which the service's proofs are made with.
    std::string service;
    /// SHA-256 of the client's key.
    std::string clientDigest;
};

/// Throws Error when the crypto library fails.
TokenKeys keysOf(std::string_view token);
/// What a client proves instead that holds such a token: its key, 32 bytes.
std::string clientKeyOf(std::string_view token);

/// The proof of one side for one greeting, 64 hexadecimal digits. Nothing of one version, side or connection
/// serves for another. Throws Error when the crypto library fails.
std::string makeProof(Side side, Terms const& terms, std::string_view clientNonce,
                      std::string_view serviceNonce);
/// The client's proof by the key of such a token, and the key that a proof shows: who knows the digest of the
/// key alone, as the service does, learns it by the proof and can make none. The terms have the digest for
/// their token. An empty key is one that no proof shows. Throws Error.
std::string makeKeyProof(std::string_view clientKey, Terms const& terms, std::string_view clientNonce,
                         std::string_view serviceNonce);
std::string keyShownBy(std::string_view proof, Terms const& terms, std::string_view clientNonce,
                       std::string_view serviceNonce);
/// The key under which that side seals its messages, 32 bytes. Throws Error.
std::string makeSealKey(Side side, Terms const& terms, std::string_view clientNonce,
                        std::string_view serviceNonce);
/// Shows that a service's answer to a question of discovery came from one that knows the token. Throws Error.
std::string makeDiscoveryProof(std::string_view token, std::string_view nonce, std::string_view host,
                               std::uint16_t port);
/// Takes the same time wherever the two differ. An empty proof is never the same.
bool isSameProof(std::string_view a, std::string_view b);

/// A key of HMAC-SHA-256 that is prepared once for many messages. Used by one thread. Throws Error when the
/// crypto library fails.
class HmacKey {
public:
    explicit HmacKey(std::string_view key);

    /// 32 bytes.
    std::string codeOf(std::string_view message) const;

private:
    struct Release {
        void operator()(void* context) const;
    };

    std::unique_ptr<void, Release> context_;
};

/// HMAC-SHA-256, 32 bytes. Throws Error when the crypto library fails.
std::string hmac(std::string_view key, std::string_view message);

} // namespace Channel
