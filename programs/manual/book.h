#pragma once
// All that a program's own command line and docs/ give, as files.

#include "programs/manual/man_page.h"
#include "programs/manual/topic.h"

#include <filesystem>
#include <span>

namespace Manual {

/// Writes man/NAME.SECTION for the program and each of its commands, with what the topics of their names
/// explain and the exit statuses, and completion/ with the scripts of bash, zsh and fish. The files of an
/// earlier run go. Throws std::exception.
void writeBook(std::filesystem::path const& folder, Base::CommandInfo const& program,
               std::span<Topic const> topics, Book const& book);

} // namespace Manual
