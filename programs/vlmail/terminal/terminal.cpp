#include "programs/vlmail/terminal/terminal.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"

#include <ostream>

namespace VlMail {

void Terminal::complain(Base::Code code, std::string const& line) const { note(Base::codedLine(line, code)); }

void Terminal::complain(std::exception const& failure) const {
    complain(Base::codeOf(failure), failure.what());
}

void Terminal::note(std::string const& line) const {
    err << "vlmail: " << Base::plainLine(line) << std::endl;
}

} // namespace VlMail
