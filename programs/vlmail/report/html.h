#pragma once
// The small change of HTML: texts from outside, pictures and places in it.

#include <string>
#include <string_view>

namespace VlMail::Report {

/// A text from outside as HTML text or as an attribute's value in double quotes. Control characters that HTML
/// does not allow and bytes that are not UTF-8 become U+FFFD.
std::string escaped(std::string const& text);

/// The same kept together in its own direction, so that a name with marks of right-to-left text cannot turn
/// the words around it.
std::string isolated(std::string const& text);

/// `part` of `whole` such as "12.5%", at most two decimals, in any locale. `whole` is not 0.
std::string percent(double part, double whole);

/// "data:" and the picture, for an img element.
std::string pngUri(std::string_view png);

} // namespace VlMail::Report
