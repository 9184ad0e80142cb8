#include "programs/base/email_address.h"

#include <algorithm>
#include <cstddef>

namespace Base {
namespace {

bool isLetterOrDigit(char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// Addresses may be international: what is beyond ASCII stands for itself.
bool isBeyondAscii(char c) { return static_cast<unsigned char>(c) >= 0x80; }

bool mayStandInName(char c) {
    constexpr std::string_view MARKS = "!#$%&'*+-/=?^_`{|}~.";
    return isLetterOrDigit(c) || isBeyondAscii(c) || MARKS.find(c) != MARKS.npos;
}

bool isMailboxName(std::string_view name) {
    constexpr std::size_t MAX_BYTES = 64;
    return !name.empty() && name.size() <= MAX_BYTES && name.front() != '.' && name.back() != '.' &&
           name.find("..") == name.npos && std::ranges::all_of(name, mayStandInName);
}

bool isHostLabel(std::string_view label) {
    constexpr std::size_t MAX_BYTES = 63;
    return !label.empty() && label.size() <= MAX_BYTES && label.front() != '-' && label.back() != '-' &&
           std::ranges::all_of(label,
                               [](char c) { return isLetterOrDigit(c) || isBeyondAscii(c) || c == '-'; });
}

/// Two labels at least.
bool isHostName(std::string_view host) {
    std::size_t const dot = host.rfind('.');
    if (dot == host.npos)
        return false;
    for (std::size_t begin = 0; begin <= host.size();) {
        std::string_view const label = host.substr(begin, host.find('.', begin) - begin);
        if (!isHostLabel(label))
            return false;
        begin += label.size() + 1;
    }
    return true;
}

} // namespace

bool isEmailAddress(std::string_view text) {
    constexpr std::size_t MAX_BYTES = 254;
    std::size_t const at = text.find('@');
    return text.size() <= MAX_BYTES && at != text.npos && isMailboxName(text.substr(0, at)) &&
           isHostName(text.substr(at + 1));
}

} // namespace Base
