#pragma once
// Fingerprints by which changed files are noticed.

#include <memory>
#include <string>
#include <string_view>

namespace Base {

/// Called ahead of the crypto library: where it found no memory to begin with it would break down at the next
/// call of anything. Throws std::bad_alloc then.
void requireCrypto();

/// SHA-256 in hexadecimal, 64 lower-case digits.
std::string sha256(std::string_view bytes);

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
