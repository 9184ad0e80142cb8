#include "programs/base/base64.h"

#include <openssl/evp.h>

#include <algorithm>
#include <utility>

namespace Base {
namespace {

unsigned char const* bytesOf(std::string_view text) {
    return reinterpret_cast<unsigned char const*>(text.data());
}

} // namespace

std::string toBase64(std::string_view bytes) {
    // The library writes a zero behind it.
    std::string text((bytes.size() + 2) / 3 * 4 + 1, '\0');
    int const length = EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()), bytesOf(bytes),
                                       static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(length));
    return text;
}

std::optional<std::string> fromBase64(std::string_view text) {
    std::string bytes(text.size() / 4 * 3, '\0');
    int const length = EVP_DecodeBlock(reinterpret_cast<unsigned char*>(bytes.data()), bytesOf(text),
                                       static_cast<int>(text.size()));
    auto const padding = static_cast<std::size_t>(
        std::find_if(text.rbegin(), text.rend(), [](char c) { return c != '='; }) - text.rbegin());
    if (length < 0 || padding > 2 || padding > bytes.size())
        return std::nullopt;
    bytes.resize(bytes.size() - padding);
    // The library passes over blanks at both ends and bits that belong to no byte.
    return toBase64(bytes) == text ? std::optional(std::move(bytes)) : std::nullopt;
}

} // namespace Base
