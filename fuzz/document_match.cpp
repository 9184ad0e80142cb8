// An expression over document names, up to the first line feed, and a name behind it.
#include "vlservice/extract/extract_preset.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

enum class Answer { No, Yes, Refused };

template<typename Match>
Answer answerOf(Match match) {
    try {
        return match() ? Answer::Yes : Answer::No;
    } catch (std::runtime_error const&) { // a bad or a runaway expression
    } catch (std::out_of_range const&) {  // an expression or a name that is not UTF-8
    }
    return Answer::Refused;
}

/// The preset that is made for a name matches that name.
void checkAutoExpire(std::string const& name) {
    Cfg::ExtractPreset preset;
    preset.setAsAutoExpireFor(name);
    Answer const answer = answerOf([&] { return preset.match(name); });
    bool const isUtf8 = answerOf([&] { return Cfg::ExtractPreset::match(".*", name); }) != Answer::Refused;
    require(answer == (isUtf8 ? Answer::Yes : Answer::Refused));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string const input(reinterpret_cast<char const*>(data), size);
    std::string const regex = input.substr(0, input.find('\n'));
    std::string const name = input.substr(std::min(size, regex.size() + 1), 200);
    Cfg::ExtractPreset const preset(regex, "", nullptr);
    Answer const answer = answerOf([&] { return preset.match(name); });
    require(answerOf([&] { return preset.match(name); }) == answer);
    require(answerOf([&] { return Cfg::ExtractPreset::match(regex, name); }) == answer);
    checkAutoExpire(name);
    return 0;
}
