#pragma once
// Where in docs/ something is explained, and how that reads on a terminal.

#include <span>
#include <string>
#include <string_view>

namespace Manual {

/// A section of a page, or with an empty heading all of it.
struct Topic {
    /// The words of a command behind the program's name, "settings show", or a word of its own.
    std::string_view name;
    std::string_view page;
    /// What the section's heading begins with.
    std::string_view heading;
};

/// The topic of the exit statuses; every command's page has it.
constexpr std::string_view EXIT_STATUS = "exit-status";

/// The section without its heading, in Markdown. Throws std::out_of_range when there is none.
std::string textOf(Topic const& topic);

/// Markdown for eyes: links by their texts, tables as a list.
std::string plainFrom(std::string const& markdown);

/// Null when none of the topics has that name.
Topic const* topicNamed(std::string_view name, std::span<Topic const> topics);

} // namespace Manual
