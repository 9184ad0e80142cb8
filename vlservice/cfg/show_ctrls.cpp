#include "vlservice/cfg/show_ctrls.h"

#include <cstdint>

namespace Cfg {
namespace {

constexpr std::size_t WORD_BITS = 64;
constexpr std::size_t WORDS = (ShowCtrls::COUNT + WORD_BITS - 1) / WORD_BITS;

} // namespace

ShowCtrls::ShowCtrls(json::Value const& node) {
    if (!node)
        return;
    std::size_t first = 0;
    for (json::Value const& element : node.toArray()) {
        // Also read where no bits are left, since every element must be an integer.
        auto const word = static_cast<std::uint64_t>(element.toInt());
        if (first < COUNT)
            bits_ |= Bits(word) << first;
        first += WORD_BITS;
    }
}

json::Array ShowCtrls::serialize() const {
    Bits const lowWord(~std::uint64_t{0});
    json::Array words;
    for (std::size_t i = 0; i < WORDS; ++i)
        words.append(((bits_ >> (i * WORD_BITS)) & lowWord).to_ullong());
    return words;
}

} // namespace Cfg
