#pragma once
// Addresses of e-mails.

#include <string_view>

namespace Base {

/// Whether the text is one plain address NAME@HOST, without a person's name, comments and quotes; it may
/// have characters beyond ASCII.
bool isEmailAddress(std::string_view text);

} // namespace Base
