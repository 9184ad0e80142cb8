#include "programs/vlmail/utf8.h"

#include <unicode/unistr.h>

namespace VlMail {

std::string validUtf8(std::string const& text) {
    std::string valid;
    icu::UnicodeString::fromUTF8(text).toUTF8String(valid);
    return valid;
}

} // namespace VlMail
