#pragma once
// Fingerprints by which changed files are noticed.

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace Base {

/// Called ahead of the crypto library: where it found no memory to begin with it would break down at the next
/// call of anything. Throws std::bad_alloc then.
void requireCrypto();

constexpr std::size_t SHA256_DIGITS = 64;

/// SHA-256 in hexadecimal, 64 lower-case digits.
std::string sha256(std::string_view bytes);
/// Whether a text is written as one.
bool isSha256(std::string_view text);

/// The same over what comes in pieces.
class Sha256 {
public:
    Sha256();

    void add(std::string_view bytes);
    /// Of all that was added. Nothing is added behind it.
    std::string digest();

private:
    struct Release {
        void operator()(void* context) const;
    };

    std::unique_ptr<void, Release> context_;
};

} // namespace Base
