#pragma once
// How programs fail towards people.

#include "programs/base/error_code.h"

#include <stdexcept>
#include <string>

namespace Base {

/// A failure as a person reads it: one line that says what failed, where, and what to do; and its code, for
/// programs.
class Error : public std::runtime_error {
public:
    Error(Code code, std::string const& line) : std::runtime_error(line), code_(code) {}
    Code code() const { return code_; }

private:
    Code code_;
};

/// Of an Error its own; of what libraries and the system throw the one that is nearest.
Code codeOf(std::exception const& failure);

/// "LINE [file-unreadable]": with the code behind it, unless one is there already. Lines travel so between
/// programs.
std::string codedLine(std::string const& line, Code code);
std::string codedLine(std::exception const& failure);

/// Takes the code off a line that another program has sent; `otherwise` where it has none that is known.
Error errorSaid(std::string const& line, Code otherwise);

} // namespace Base
