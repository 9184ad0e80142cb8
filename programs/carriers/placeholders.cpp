#include "programs/carriers/placeholders.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"

#include <algorithm>
#include <string_view>

namespace Carriers {
namespace {

bool isName(std::string_view text) {
    return !text.empty() && std::ranges::all_of(text, [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_';
    });
}

std::string phoneNumberIn(std::string_view address) {
    std::string number;
    for (char const c : address)
        if ((c >= '0' && c <= '9') || (c == '+' && number.empty()))
            number += c;
    if (number.empty() || number == "+")
        throw Base::Error(Base::Code::LetterUnsuitable,
                          "the letter's address is no telephone number, which its carrier needs");
    return number;
}

std::string valueOf(std::string_view name, OutgoingLetter const& letter, std::string const& mailing) {
    if (name == "key")
        return letter.key;
    if (name == "id")
        return mailing;
    if (name == "phone_number")
        return phoneNumberIn(letter.address);
    auto const found = std::ranges::find(letter.fields, name, &std::pair<std::string, std::string>::first);
    if (found == letter.fields.end())
        throw Base::Error(Base::Code::LetterUnsuitable,
                          "the letter has no field \"" + std::string(name) + "\", which its carrier needs");
    std::string value = found->second;
    std::ranges::replace_if(
        value, [](char c) { return static_cast<unsigned char>(c) < ' ' || c == '\x7F'; }, ' ');
    return Base::plainLine(value);
}

} // namespace

std::string filledIn(std::string const& text, OutgoingLetter const& letter, std::string const& mailing) {
    std::string filled;
    std::size_t at = 0;
    while (at < text.size()) {
        std::size_t const end = text[at] == '{' ? text.find('}', at) : std::string::npos;
        std::string_view const name = end == std::string::npos
                                          ? std::string_view()
                                          : std::string_view(text).substr(at + 1, end - at - 1);
        if (isName(name)) {
            filled += valueOf(name, letter, mailing);
            at = end + 1;
        } else {
            filled += text[at++];
        }
    }
    return filled;
}

} // namespace Carriers
