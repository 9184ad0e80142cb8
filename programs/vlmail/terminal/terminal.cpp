#include "programs/vlmail/terminal/terminal.h"

#include "programs/base/plain_text.h"

#include <ostream>

namespace VlMail {

void Terminal::complain(std::string const& text) const {
    err << "vlmail: " << Base::plainLine(text) << std::endl;
}

} // namespace VlMail
