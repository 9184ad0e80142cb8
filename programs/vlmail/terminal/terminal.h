#pragma once
// Where a command writes, and how it ends.

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

    /// "vlmail: " and the text, as one line in which nothing acts.
    void complain(std::string const& text) const;
};

} // namespace VlMail
