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
constexpr std::size_t ID_BYTES = 8;
constexpr char BEHIND_ID = '.';
constexpr std::size_t MAX_TOKEN_FILE = 4096;
constexpr std::string_view WHITE = " \t\r\n";

bool isWordCharacter(char c) { return c > ' ' && c < '\x7f'; }

std::string randomHex(std::size_t size = RANDOM_BYTES) {
    Base::requireCrypto();
    std::array<unsigned char, RANDOM_BYTES> bytes;
    if (RAND_bytes(bytes.data(), static_cast<int>(size)) != 1)
        throw Base::Error(Base::Code::ProgramLimited, "The system gives no random numbers.");
    return Base::toHex(bytes.data(), size);
}

bool isHex(std::string_view text) {
    return text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
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
        throw Base::Error(Base::Code::TokenInvalid,
                          "The file \"" + file + "\" holds no access token, which is one word of at least " +
                              std::to_string(MIN_TOKEN_LENGTH) + " characters.");
    return std::string(token);
}

std::string readOrCreateToken(std::string const& file) {
    if (::access(file.c_str(), F_OK) != 0)
        Base::createPrivateFile(file, makeNamedToken() + '\n');
    return readToken(file);
}

std::string makeNamedToken() { return randomHex(ID_BYTES) + BEHIND_ID + randomHex(); }

std::string tokenIdOf(std::string const& token) {
    std::string_view const text = token;
    std::size_t const end = 2 * ID_BYTES;
    bool const isNamed = text.size() == end + 1 + 2 * RANDOM_BYTES && text[end] == BEHIND_ID &&
                         isHex(text.substr(0, end)) && isHex(text.substr(end + 1));
    return isNamed ? token.substr(0, end) : std::string();
}

std::string makeNonce() { return randomHex(); }

} // namespace Channel
