#include "programs/vlmail/report/html.h"

#include "programs/base/base64.h"
#include "programs/base/plain_text.h"

#include <charconv>
#include <cmath>
#include <cstddef>

namespace VlMail::Report {
namespace {

void appendEscaped(std::string& html, char c) {
    switch (c) {
    case '&':
        html += "&amp;";
        return;
    case '<':
        html += "&lt;";
        return;
    case '>':
        html += "&gt;";
        return;
    case '"':
        html += "&quot;";
        return;
    case '\'':
        html += "&#39;";
        return;
    default:
        html += c;
    }
}

} // namespace

std::string escaped(std::string const& text) {
    std::string html;
    for (char const c : Base::plainText(text))
        appendEscaped(html, c);
    return html;
}

std::string isolated(std::string const& text) { return "<bdi>" + escaped(text) + "</bdi>"; }

std::string percent(double part, double whole) {
    constexpr double HUNDREDTHS = 100;
    double const rounded = std::round(part / whole * 100 * HUNDREDTHS) / HUNDREDTHS;
    char digits[32];
    auto const end = std::to_chars(std::begin(digits), std::end(digits), rounded, std::chars_format::fixed);
    return std::string(digits, end.ptr) + '%';
}

std::string pngUri(std::string_view png) { return "data:image/png;base64," + Base::toBase64(png); }

} // namespace VlMail::Report
