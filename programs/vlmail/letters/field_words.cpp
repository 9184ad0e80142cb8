#include "programs/vlmail/letters/field_words.h"

namespace VlMail {

std::string roleInWords(Cfg::ExtractedField const& field, bool isPrimary) {
    if (isPrimary)
        return "recipient, this one counts";
    if (field.isRcptAddress())
        return "recipient";
    return field.isNotifyAddress() ? "notification" : "";
}

} // namespace VlMail
