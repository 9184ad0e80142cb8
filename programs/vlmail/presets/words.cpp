#include "programs/vlmail/presets/words.h"

#include <cstdlib>

namespace VlMail {

std::string inQuotes(std::string const& text) { return '"' + text + '"'; }

std::string inMillimetres(long long hundredths) {
    std::string text = (hundredths < 0 ? "-" : "") + std::to_string(std::llabs(hundredths) / 100);
    long long const rest = std::llabs(hundredths) % 100;
    if (rest == 0)
        return text;
    text += '.' + std::to_string(rest / 10);
    return rest % 10 == 0 ? text : text + std::to_string(rest % 10);
}

std::string inWords(Cfg::Rect const& rect) {
    return "left " + std::to_string(rect.left) + ", top " + std::to_string(rect.top) + ", right " +
           std::to_string(rect.right) + ", bottom " + std::to_string(rect.bottom);
}

} // namespace VlMail
