#pragma once
// Fingerprints by which changed files are noticed.

#include <string>
#include <string_view>

namespace Base {

/// SHA-256 in hexadecimal, 64 lower-case digits.
std::string sha256(std::string_view bytes);

} // namespace Base
