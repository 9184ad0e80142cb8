#include "programs/base/command_line.h"

#include "programs/base/option_lines.h"
#include "programs/base/read_file.h"

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

std::vector<std::string> namesOf(CLI::Option const& option) {
    std::vector<std::string> names;
    for (std::string const& name : option.get_snames())
        names.push_back("-" + name);
    for (std::string const& name : option.get_lnames())
        names.push_back("--" + name);
    if (names.empty())
        names.push_back(option.get_name());
    return names;
}

OptionInfo infoOf(CLI::Option const& option) {
    bool const isFlag = option.get_items_expected_max() == 0;
    return {namesOf(option),          isFlag ? "" : option.get_type_name(),
            option.get_description(), option.get_default_str(),
            option.get_required(),    option.get_items_expected_max() > 1};
}

CommandInfo infoOf(CLI::App const& app) {
    CommandInfo info{app.get_name(), app.get_description()};
    for (CLI::Option const* const option : app.get_options())
        info.options.push_back(infoOf(*option));
    for (CLI::App const* const command : app.get_subcommands([](CLI::App const*) { return true; }))
        info.commands.push_back(infoOf(*command));
    return info;
}

/// A file of options, in the terms of the parsing library.
class OptionFile : public CLI::Config {
public:
    explicit OptionFile(CommandInfo command) : command_(std::move(command)) {}

    std::string to_config(CLI::App const*, bool, bool, std::string) const override { return {}; }
    std::vector<CLI::ConfigItem> from_config(std::istream& lines) const override {
        std::vector<CLI::ConfigItem> options;
        for (OptionLine& line : readOptionLines(lines, command_))
            options.push_back({{}, std::move(line.name), {std::move(line.value)}});
        return options;
    }

private:
    CommandInfo command_;
};

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

void Command::takeOptionsAbove() const { app_->fallthrough(); }

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

CommandInfo Command::info() const { return infoOf(*app_); }

std::string Command::helpOf(std::vector<std::string> const& words) const {
    CLI::App const* app = app_;
    std::string above;
    for (std::string const& word : words) {
        above += (above.empty() ? "" : " ") + app->get_name();
        auto const named = app->get_subcommands([&](CLI::App const* each) { return each->check_name(word); });
        if (named.empty())
            return {};
        app = named.front();
    }
    return app->help(above);
}

CommandLine::CommandLine(std::string const& description, std::string const& program)
    : app_(std::make_unique<CLI::App>(description, program)) {}

CommandLine::~CommandLine() = default;

void CommandLine::addVersion(std::function<std::string()> text) {
    app_->set_version_flag("--version", std::move(text),
                           "Print the version of the program and of its libraries");
}

void CommandLine::addConfigFile() {
    app_->config_formatter(std::make_shared<OptionFile>(command().info()));
    app_->set_config("--config", "", "File with options, a line for each: name = value")->type_name("FILE");
}

bool CommandLine::read(int argc, char const* const* argv, std::ostream& out) {
    try {
        app_->parse(argc, argv);
        return true;
    } catch (OptionLineError const& wrong) {
        throw UsageError(app_->get_config_ptr()->as<std::string>() + ", " + wrong.what());
    } catch (CLI::FileError const& wrong) {
        // It does not tell why the file cannot be read.
        readFile(app_->get_config_ptr()->as<std::string>());
        throw UsageError(wrong.what());
    } catch (CLI::ParseError const& wrong) {
        // Asking for help is one of them.
        if (wrong.get_exit_code() != 0)
            throw UsageError(wrong.what());
        app_->exit(wrong, out, out);
        return false;
    }
}

} // namespace Base
