#pragma once
// Fingerprints by which changed files are noticed.

#include <string>
#include <string_view>

namespace Base {

/// Called ahead of the crypto library: where it found no memory to begin with it would break down at the next
/// call of anything. Throws std::bad_alloc then.
void requireCrypto();

/// SHA-256 in hexadecimal, 64 lower-case digits.
std::string sha256(std::string_view bytes);

} // namespace Base
