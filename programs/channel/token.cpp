#include "programs/channel/token.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/base/private_file.h"

#include <openssl/rand.h>

#include <unistd.h>

#include <algorithm>
#include <array>
#include <string_view>

namespace Channel {
namespace {

constexpr std::size_t RANDOM_BYTES = 32;
constexpr std::size_t MAX_TOKEN_FILE = 4096;
constexpr std::string_view WHITE = " \t\r\n";

bool isWordCharacter(char c) { return c > ' ' && c < '\x7f'; }

std::string randomHex() {
    Base::requireCrypto();
    std::array<unsigned char, RANDOM_BYTES> bytes;
    if (RAND_bytes(bytes.data(), bytes.size()) != 1)
        throw Base::Error("The system gives no random numbers.");
    return Base::toHex(bytes.data(), bytes.size());
}

std::string_view trimmed(std::string_view text) {
    auto const first = text.find_first_not_of(WHITE);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(WHITE) - first + 1);
}

} // namespace

std::string readToken(std::string const& file) {
    std::string const contents = Base::readPrivateFile(file, MAX_TOKEN_FILE);
    std::string_view const token = trimmed(contents);
    if (token.size() < MIN_TOKEN_LENGTH || !std::all_of(token.begin(), token.end(), isWordCharacter))
        throw Base::Error("The file \"" + file + "\" holds no access token, which is one word of at least " +
                          std::to_string(MIN_TOKEN_LENGTH) + " characters.");
    return std::string(token);
}

std::string readOrCreateToken(std::string const& file) {
    if (::access(file.c_str(), F_OK) != 0)
        Base::createPrivateFile(file, randomHex() + '\n');
    return readToken(file);
}

std::string makeNonce() { return randomHex(); }

} // namespace Channel
