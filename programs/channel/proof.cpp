#include "programs/channel/proof.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/hex.h"

#include <openssl/core_names.h>
#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/params.h>
#include <openssl/sha.h>

#include <array>
#include <initializer_list>
#include <utility>

namespace Channel {
namespace {

std::string hex(std::string const& bytes) { return Base::toHex(bytes.data(), bytes.size()); }

/// Each part is ended by a byte that none of them holds.
std::string joined(std::string label, std::initializer_list<std::string_view> parts) {
    for (std::string_view const part : parts)
        label.append(1, '\0').append(part);
    return label;
}

constexpr char const* nameOf(Side side) { return side == Side::Client ? "client" : "service"; }

std::string versionLabel(Terms const& terms, char const* use, Side side) {
    return "VLCH " + std::to_string(terms.version) + ' ' + use + ' ' + nameOf(side);
}

/// From version 2 on.
std::string code(std::string label, Terms const& terms, std::string_view clientNonce,
                 std::string_view serviceNonce) {
    return hmac(terms.token, joined(std::move(label), {clientNonce, serviceNonce, terms.fingerprint,
                                                       terms.clientAddress, terms.serviceAddress}));
}

/// The proof's bytes for somebody who has the token of the terms.
std::string proofBytes(Side side, Terms const& terms, std::string_view clientNonce,
                       std::string_view serviceNonce) {
    if (terms.version == 1)
        return hmac(terms.token, joined(nameOf(side), {clientNonce, serviceNonce, terms.fingerprint}));
    return code(versionLabel(terms, "proof", side), terms, clientNonce, serviceNonce);
}

/// Of the same length.
std::string combined(std::string_view a, std::string_view b) {
    std::string bytes(a);
    for (std::size_t i = 0; i < bytes.size(); ++i)
        bytes[i] = static_cast<char>(bytes[i] ^ b[i]);
    return bytes;
}

void requireDone(bool isDone) {
    if (!isDone)
        throw Base::Error(Base::Code::ProgramLimited, "The crypto library cannot compute a proof.");
}

template<typename Pointer>
EVP_MAC_CTX* in(Pointer const& context) {
    return static_cast<EVP_MAC_CTX*>(context.get());
}

unsigned char const* bytesOf(std::string_view text) {
    return reinterpret_cast<unsigned char const*>(text.data());
}

} // namespace

TokenKeys keysOf(std::string_view token) {
    return {hmac(token, "VLCH token service"), Base::fromHex(Base::sha256(clientKeyOf(token))).value()};
}

std::string clientKeyOf(std::string_view token) { return hmac(token, "VLCH token client"); }

std::string makeKeyProof(std::string_view clientKey, Terms const& terms, std::string_view clientNonce,
                         std::string_view serviceNonce) {
    return hex(combined(clientKey, proofBytes(Side::Client, terms, clientNonce, serviceNonce)));
}

std::string keyShownBy(std::string_view proof, Terms const& terms, std::string_view clientNonce,
                       std::string_view serviceNonce) {
    std::string const bytes = Base::fromHex(proof).value_or("");
    std::string const mask = proofBytes(Side::Client, terms, clientNonce, serviceNonce);
    return bytes.size() == mask.size() ? combined(bytes, mask) : std::string();
}

std::string makeProof(Side side, Terms const& terms, std::string_view clientNonce,
                      std::string_view serviceNonce) {
    return hex(proofBytes(side, terms, clientNonce, serviceNonce));
}

std::string makeSealKey(Side side, Terms const& terms, std::string_view clientNonce,
                        std::string_view serviceNonce) {
    return code(versionLabel(terms, "seal", side), terms, clientNonce, serviceNonce);
}

std::string makeDiscoveryProof(std::string_view token, std::string_view nonce, std::string_view host,
                               std::uint16_t port) {
    return hex(hmac(token, joined("VLCH 2 discovery", {nonce, host, std::to_string(port)})));
}

bool isSameProof(std::string_view a, std::string_view b) {
    return !a.empty() && a.size() == b.size() && CRYPTO_memcmp(a.data(), b.data(), a.size()) == 0;
}

void HmacKey::Release::operator()(void* context) const {
    EVP_MAC_CTX_free(static_cast<EVP_MAC_CTX*>(context));
}

HmacKey::HmacKey(std::string_view key) {
    Base::requireCrypto();
    std::unique_ptr<EVP_MAC, decltype(&EVP_MAC_free)> const mac(EVP_MAC_fetch(nullptr, "HMAC", nullptr),
                                                                EVP_MAC_free);
    requireDone(mac != nullptr);
    context_.reset(EVP_MAC_CTX_new(mac.get()));
    requireDone(context_ != nullptr);
    std::string digest = "SHA256";
    OSSL_PARAM const parameters[] = {
        OSSL_PARAM_construct_utf8_string(OSSL_MAC_PARAM_DIGEST, digest.data(), digest.size()),
        OSSL_PARAM_construct_end()};
    // Without an address, the library would go on with the key that it has.
    requireDone(EVP_MAC_init(in(context_), bytesOf(key.empty() ? "" : key), key.size(), parameters) == 1);
}

std::string HmacKey::codeOf(std::string_view message) const {
    std::array<unsigned char, EVP_MAX_MD_SIZE> bytes;
    std::size_t length = 0;
    requireDone(EVP_MAC_init(in(context_), nullptr, 0, nullptr) == 1 &&
                EVP_MAC_update(in(context_), bytesOf(message), message.size()) == 1 &&
                EVP_MAC_final(in(context_), bytes.data(), &length, bytes.size()) == 1 &&
                length == SHA256_DIGEST_LENGTH);
    return {reinterpret_cast<char const*>(bytes.data()), length};
}

std::string hmac(std::string_view key, std::string_view message) { return HmacKey(key).codeOf(message); }

} // namespace Channel
