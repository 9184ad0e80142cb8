#include "programs/vlmail/presets/words.h"

namespace VlMail {

std::string inWords(Cfg::Rect const& rect) {
    return "left " + std::to_string(rect.left) + ", top " + std::to_string(rect.top) + ", right " +
           std::to_string(rect.right) + ", bottom " + std::to_string(rect.bottom);
}

} // namespace VlMail
