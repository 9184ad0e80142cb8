#pragma once
// What the subcommands of vlmail share: how they are registered, how they end, how they fail.

#include <functional>
#include <iosfwd>
#include <stdexcept>
#include <string>

namespace CLI {
class App;
}

namespace VlMail {

/// Exit statuses of every subcommand.
enum ExitStatus : int {
    FINE = 0,
    FAILED = 1,
    /// Done, but some letters cannot go out.
    INCOMPLETE = 2,
};

/// A failure as a person reads it: one line that says what failed, where, and what to do.
class Error : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Where a subcommand writes. Results go to `out`; errors and progress to `err`.
struct Terminal {
    std::ostream& out;
    std::ostream& err;
    /// Whether a person watches `err`: progress is shown then.
    bool showsProgress = false;

    /// "vlmail: " and the text, as one line.
    void complain(std::string const& text) const;
};

/// What a parsed command line asks for; gives the exit status.
using Task = std::function<int(Terminal const&)>;

// Each adds its subcommand to `app` and, when the command line names it, leaves its task in `task`.
// One source file a subcommand.
void addDiscoverCommand(CLI::App& app, Task& task);
void addLetterCommand(CLI::App& app, Task& task);
void addMailCommand(CLI::App& app, Task& task);
void addPackCommand(CLI::App& app, Task& task);
void addPlanCommand(CLI::App& app, Task& task);
void addPresetsCommand(CLI::App& app, Task& task);
void addPriceCommand(CLI::App& app, Task& task);
void addSettingsCommand(CLI::App& app, Task& task);
void addStatusCommand(CLI::App& app, Task& task);
void addUploadCommand(CLI::App& app, Task& task);

/// Parses the command line, carries it out and gives the exit status. Throws nothing derived from
/// std::exception.
int run(int argc, char const* const* argv, Terminal const& terminal);

} // namespace VlMail
