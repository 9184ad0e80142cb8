#pragma once
// Lines that bear a code behind their words.

#include "programs/base/error.h"

#include <string>

/// The words alone.
inline std::string wordsOf(std::string const& line) {
    return Base::errorSaid(line, Base::Code::Unexpected).what();
}

/// The code's name; "no code" where there is none.
inline std::string codeIn(std::string const& line) {
    Base::Error const said = Base::errorSaid(line, Base::Code::Unexpected);
    return said.what() == line ? "no code" : Base::nameOf(said.code());
}
