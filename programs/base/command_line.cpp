#include "programs/base/command_line.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <ostream>
#include <utility>

namespace Base {
namespace {

/// Empty, or what is wrong; as the parsing library asks its checks.
std::string whyNotCount(std::string const& text) {
    std::size_t value = 0;
    auto const [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    bool const isCount = error == std::errc() && end == text.data() + text.size() && value > 0;
    return isCount ? "" : "\"" + text + "\" is no number above 0";
}

} // namespace

Option const& Option::required() const {
    option_->required();
    return *this;
}

Option const& Option::valueName(char const* name) const {
    option_->type_name(name);
    return *this;
}

Option const& Option::showDefault() const {
    option_->capture_default_str();
    return *this;
}

Option const& Option::needs(Option const& other) const {
    option_->needs(other.option_);
    return *this;
}

Option const& Option::excludes(Option const& other) const {
    option_->excludes(other.option_);
    return *this;
}

Command Command::addCommand(std::string const& name, std::string const& description) const {
    return Command(*app_->add_subcommand(name, description));
}

void Command::requireCommand() const { app_->require_subcommand(1); }

Option Command::addOption(std::string const& names, std::string& value, std::string const& help) const {
    return Option(*app_->add_option(names, value, help));
}

Option Command::addOption(std::string const& names, std::filesystem::path& value,
                          std::string const& help) const {
    return Option(*app_->add_option(names, value, help));
}

Option Command::addOption(std::string const& names, std::vector<std::string>& values,
                          std::string const& help) const {
    return Option(*app_->add_option(names, values, help));
}

Option Command::addOption(std::string const& names, std::uint16_t& value, std::string const& help) const {
    return Option(*app_->add_option(names, value, help));
}

Option Command::addCount(std::string const& names, std::size_t& value, std::string const& help) const {
    return Option(
        *app_->add_option(names, value, help)->type_name("N")->check(CLI::Validator(whyNotCount, "")));
}

Option Command::addFlag(std::string const& names, bool& value, std::string const& help) const {
    return Option(*app_->add_flag(names, value, help));
}

Option Command::addOffFlag(std::string const& names, bool& value, std::string const& help) const {
    return Option(*app_->add_flag_callback(
        names, [&value] { value = false; }, help));
}

void Command::whenNamed(std::function<void()> call) const { app_->callback(std::move(call)); }

CommandLine::CommandLine(std::string const& description, std::string const& program)
    : app_(std::make_unique<CLI::App>(description, program)) {}

CommandLine::~CommandLine() = default;

bool CommandLine::read(int argc, char const* const* argv, std::ostream& out) {
    try {
        app_->parse(argc, argv);
        return true;
    } catch (CLI::ParseError const& wrong) {
        // Asking for help is one of them.
        if (wrong.get_exit_code() != 0)
            throw UsageError(wrong.what());
        app_->exit(wrong, out, out);
        return false;
    }
}

} // namespace Base
