#include "programs/vlmail/terminal/terminal.h"

#include <algorithm>
#include <ostream>

namespace VlMail {

void Terminal::complain(std::string const& text) const {
    std::string line = text;
    // Names from outside may hold line breaks; an error stays one line.
    std::replace_if(
        line.begin(), line.end(), [](char c) { return c == '\n' || c == '\r'; }, ' ');
    err << "vlmail: " << line << std::endl;
}

} // namespace VlMail
