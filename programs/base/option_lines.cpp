#include "programs/base/option_lines.h"

#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"

#include <algorithm>
#include <istream>
#include <sstream>
#include <string_view>
#include <utility>

namespace Base {
namespace {

constexpr std::string_view BLANKS = " \t\r";
constexpr std::size_t MAX_LINE = 4096;
constexpr std::size_t MAX_FILE = 64 * 1024;

std::string_view trimmed(std::string_view text) {
    auto const first = text.find_first_not_of(BLANKS);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(BLANKS) - first + 1);
}

OptionInfo const* optionOf(CommandInfo const& command, std::string const& name) {
    for (OptionInfo const& option : command.options)
        if (option.names.back() == "--" + name)
            return &option;
    return nullptr;
}

/// "true" or "false" for what a person writes for a flag; empty for anything else.
std::string flagValue(std::string const& value) {
    if (value == "yes" || value == "true")
        return "true";
    return value == "no" || value == "false" ? "false" : "";
}

class Reader {
public:
    explicit Reader(CommandInfo const& command) : command_(command) {}

    void read(std::string const& line, bool isWhole) {
        ++number_;
        if (!isWhole)
            fail("does not end with a line feed; the file may be cut off");
        if (!isPlainText(trimmed(line), MAX_LINE))
            fail("is no line of plain text");
        std::string_view const text = trimmed(line);
        if (!text.empty() && text.front() != '#')
            add(text);
    }
    std::vector<OptionLine> lines() && { return std::move(lines_); }

private:
    void add(std::string_view text) {
        auto const equals = text.find('=');
        if (equals == std::string_view::npos)
            fail("has no =; write name = value");
        std::string name(trimmed(text.substr(0, equals)));
        OptionInfo const* const option = optionOf(command_, name);
        if (!option)
            fail("there is no option " + inQuotes(name));
        auto const isSame = [&](OptionLine const& line) { return line.name == name; };
        if (std::any_of(lines_.begin(), lines_.end(), isSame))
            fail("names " + inQuotes(name) + " again");
        std::string value = valueOf(*option, std::string(trimmed(text.substr(equals + 1))));
        lines_.push_back({std::move(name), std::move(value)});
    }

    std::string valueOf(OptionInfo const& option, std::string value) const {
        if (value.empty())
            fail("has no value");
        if (!option.value.empty())
            return value;
        std::string flag = flagValue(value);
        if (flag.empty())
            fail(inQuotes(value) + " is neither yes nor no");
        return flag;
    }

    [[noreturn]] void fail(std::string const& what) const {
        throw OptionLineError("line " + std::to_string(number_) + ": " + what);
    }

    CommandInfo const& command_;
    std::size_t number_ = 0;
    std::vector<OptionLine> lines_;
};

} // namespace

std::vector<OptionLine> readOptionLines(std::istream& in, CommandInfo const& command) {
    std::string text(MAX_FILE + 1, '\0');
    text.resize(static_cast<std::size_t>(in.read(text.data(), MAX_FILE + 1).gcount()));
    if (text.size() > MAX_FILE)
        throw OptionLineError("line 1: the file is larger than 64 KiB");
    Reader reader(command);
    std::istringstream lines(std::move(text));
    for (std::string line; std::getline(lines, line);)
        reader.read(line, !lines.eof());
    return std::move(reader).lines();
}

} // namespace Base
