#include "programs/base/digest.h"

#include "programs/base/hex.h"

#include <openssl/crypto.h>
#include <openssl/evp.h>

#include <array>
#include <new>
#include <stdexcept>

namespace Base {

void requireCrypto() {
    if (!OSSL_LIB_CTX_get0_global_default())
        throw std::bad_alloc();
}

std::string sha256(std::string_view bytes) {
    requireCrypto();
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest;
    unsigned int size = 0;
    if (EVP_Digest(bytes.data(), bytes.size(), digest.data(), &size, EVP_sha256(), nullptr) != 1)
        throw std::runtime_error("cannot compute a SHA-256 digest");
    return toHex(digest.data(), size);
}

} // namespace Base
