#pragma once
// The command line of a program: options, subcommands and the help that explains them. One source stands on
// the parsing library, which costs seconds to compile.

#include "programs/base/command_tree.h"
#include "programs/base/error.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <iosfwd>
#include <memory>
#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
} // namespace CLI

namespace Base {

/// What is wrong with a command line, such as "--output or --send is required".
class UsageError : public Error {
public:
    explicit UsageError(std::string const& line) : Error(Code::Usage, line) {}
};

/// An option that was added to a command; a handle, valid as long as its CommandLine. Changes give the option
/// again.
class Option {
public:
    explicit Option(CLI::Option& option) : option_(&option) {}

    Option const& required() const;
    /// What the help calls its value, such as "FILE".
    Option const& valueName(char const* name) const;
    /// The help shows what the value is without the option.
    Option const& showDefault() const;
    Option const& needs(Option const& other) const;
    Option const& excludes(Option const& other) const;

private:
    CLI::Option* option_;
};

/// A command or subcommand; a handle, valid as long as its CommandLine. What an option is read into has to
/// outlive the reading. Names are like "-o,--output", or "FILE" for what is told by its place.
class Command {
public:
    explicit Command(CLI::App& app) : app_(&app) {}

    Command addCommand(std::string const& name, std::string const& description) const;
    /// Behind its name the options of the command above may stand, too.
    void takeOptionsAbove() const;
    /// The command line has to name one of the subcommands.
    void requireCommand() const;

    Option addOption(std::string const& names, std::string& value, std::string const& help) const;
    Option addOption(std::string const& names, std::filesystem::path& value, std::string const& help) const;
    /// Takes one value or more.
    Option addOption(std::string const& names, std::vector<std::string>& values,
                     std::string const& help) const;
    Option addOption(std::string const& names, std::uint16_t& value, std::string const& help) const;
    /// Takes numbers above 0.
    Option addCount(std::string const& names, std::size_t& value, std::string const& help) const;
    /// Sets `value`.
    Option addFlag(std::string const& names, bool& value, std::string const& help) const;
    /// Clears `value`.
    Option addOffFlag(std::string const& names, bool& value, std::string const& help) const;

    /// What is called when the command line names this command and its options are read. It may throw
    /// UsageError.
    void whenNamed(std::function<void()> call) const;

    /// What has been added until now, commands in their order.
    CommandInfo info() const;
    /// The help of the command that these words name below this one; empty when there is none.
    std::string helpOf(std::vector<std::string> const& words) const;

private:
    CLI::App* app_;
};

class CommandLine {
public:
    CommandLine(std::string const& description, std::string const& program);
    ~CommandLine();

    Command command() const { return Command(*app_); }
    /// Adds --version, which prints what the function gives.
    void addVersion(std::function<std::string()> text);
    /// Adds --config FILE for the options that were added before; what the command line says counts before
    /// what the file says.
    void addConfigFile();
    /// Whether there is something to do: false when help or the version was asked for, which stands in `out`
    /// then. Throws UsageError.
    bool read(int argc, char const* const* argv, std::ostream& out);

private:
    std::unique_ptr<CLI::App> app_;
};

} // namespace Base
