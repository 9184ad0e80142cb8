#include "programs/base/digest.h"

#include "programs/base/hex.h"

#include <openssl/crypto.h>
#include <openssl/evp.h>

#include <array>
#include <new>
#include <stdexcept>

namespace Base {
namespace {

void requireDone(int result) {
    if (result != 1)
        throw std::runtime_error("cannot compute a SHA-256 digest");
}

template<typename Pointer>
EVP_MD_CTX* in(Pointer const& context) {
    return static_cast<EVP_MD_CTX*>(context.get());
}

} // namespace

void requireCrypto() {
    if (!OSSL_LIB_CTX_get0_global_default())
        throw std::bad_alloc();
}

std::string sha256(std::string_view bytes) {
    requireCrypto();
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest;
    unsigned int size = 0;
    requireDone(EVP_Digest(bytes.data(), bytes.size(), digest.data(), &size, EVP_sha256(), nullptr));
    return toHex(digest.data(), size);
}

bool isSha256(std::string_view text) {
    return text.size() == SHA256_DIGITS && text.find_first_not_of("0123456789abcdef") == text.npos;
}

void Sha256::Release::operator()(void* context) const { EVP_MD_CTX_free(static_cast<EVP_MD_CTX*>(context)); }

Sha256::Sha256() {
    requireCrypto();
    context_.reset(EVP_MD_CTX_new());
    if (!context_)
        throw std::bad_alloc();
    requireDone(EVP_DigestInit_ex(in(context_), EVP_sha256(), nullptr));
}

void Sha256::add(std::string_view bytes) {
    requireDone(EVP_DigestUpdate(in(context_), bytes.data(), bytes.size()));
}

std::string Sha256::digest() {
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest;
    unsigned int size = 0;
    requireDone(EVP_DigestFinal_ex(in(context_), digest.data(), &size));
    return toHex(digest.data(), size);
}

} // namespace Base
