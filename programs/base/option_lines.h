#pragma once
// A program's options in a file: a line for each, "name = value" with the option's long name. Empty lines and
// those that begin with # are left out.

#include "programs/base/command_tree.h"
#include "programs/base/error.h"

#include <iosfwd>
#include <string>
#include <vector>

namespace Base {

/// What is wrong with a line, such as "line 3: there is no option \"prot\"".
class OptionLineError : public Error {
public:
    explicit OptionLineError(std::string const& line) : Error(Code::Usage, line) {}
};

struct OptionLine {
    /// As on the command line, without "--".
    std::string name;
    /// "true" or "false" for an option without a value.
    std::string value;
};

/// The lines in their order. Throws OptionLineError for the first that names no option of the command, names
/// one again, has no value, or holds something else than plain text: a file that is cut off anywhere else
/// than behind a line has one, and so has one of more than 64 KiB.
std::vector<OptionLine> readOptionLines(std::istream& in, CommandInfo const& command);

} // namespace Base
