#include "programs/base/millimetres.h"

namespace Base {

std::string inMillimetres(long long hundredths) {
    // Without a sign the smallest number has its opposite too.
    auto const size = hundredths < 0 ? 0 - static_cast<unsigned long long>(hundredths)
                                     : static_cast<unsigned long long>(hundredths);
    std::string text = (hundredths < 0 ? "-" : "") + std::to_string(size / 100);
    unsigned long long const rest = size % 100;
    if (rest == 0)
        return text;
    text += '.' + std::to_string(rest / 10);
    return rest % 10 == 0 ? text : text + std::to_string(rest % 10);
}

std::string withMillimetres(long long hundredths) { return inMillimetres(hundredths) + " mm"; }

} // namespace Base
