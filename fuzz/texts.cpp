// Texts from anywhere: what people may read of them has nothing in it that acts, and is the same when it is
// made twice; names of files stay in their folder; addresses are read as they are written.
#include "programs/base/host_port.h"
#include "programs/base/plain_text.h"
#include "programs/base/safe_name.h"
#include "programs/base/utf8.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

void checkPlain(std::string const& text) {
    std::string const plain = Base::plainText(text);
    require(Base::isUtf8(plain) && Base::plainText(plain) == plain);
    for (std::size_t at = 0; at < plain.size();) {
        char32_t const character = Base::nextCharacter(plain, at);
        require(character == U'\n' || !Base::isControl(character));
    }
    std::string const line = Base::oneLine(text);
    require(line.size() <= 500 && line.find('\n') == std::string::npos && Base::isUtf8(line));
}

void checkCuts(std::string const& text) {
    std::size_t const count = Base::characterCount(text);
    require(Base::characterCount(Base::validUtf8(text)) == count);
    for (std::size_t const bytes : {std::size_t{1}, text.size() / 2, text.size()}) {
        std::string_view const start = Base::firstBytes(text, bytes);
        require(start.size() <= bytes && Base::isBetweenCharacters(text, start.size()));
        require(!Base::isUtf8(text) || Base::isUtf8(start));
    }
    require(Base::firstCharacters(text, count) == text);
}

void checkName(std::string const& text) {
    std::string const name = Base::safeFileName(text);
    require(!name.empty() && name.size() <= 200 && name.front() != '.' && Base::isUtf8(name));
    require(name.find('/') == std::string::npos && Base::safeFileName(name) == name);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string const text(reinterpret_cast<char const*>(data), size);
    checkPlain(text);
    checkCuts(text);
    checkName(text);
    if (auto const address = Base::hostPortIn(text)) {
        auto const again = Base::hostPortIn(Base::hostPortText(address->host, address->port));
        require(again && again->host == address->host && again->port == address->port);
    }
    return 0;
}
