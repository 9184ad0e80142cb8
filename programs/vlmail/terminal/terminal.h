#pragma once
// Where a command writes, and how it ends.

#include "programs/base/error_code.h"

#include <exception>
#include <iosfwd>
#include <string>

namespace VlMail {

/// Exit statuses of every subcommand.
enum ExitStatus : int {
    FINE = 0,
    FAILED = 1,
    /// Done, but some letters cannot go out.
    INCOMPLETE = 2,
};

/// Where a subcommand writes. Results go to `out`; errors and progress to `err`.
struct Terminal {
    std::ostream& out;
    std::ostream& err;
    /// Whether a person watches `err`: progress is shown then.
    bool showsProgress = false;

    /// "vlmail: LINE [file-unreadable]", as one line in which nothing acts.
    void complain(Base::Code code, std::string const& line) const;
    void complain(std::exception const& failure) const;
    /// "vlmail: LINE", of what is no failure.
    void note(std::string const& line) const;
};

} // namespace VlMail
