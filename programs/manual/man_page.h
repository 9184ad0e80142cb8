#pragma once
// Manual pages out of a program's own command line.

#include "programs/base/command_tree.h"

#include <string>
#include <vector>

namespace Manual {

/// What is explained beside the command line.
struct Section {
    std::string heading;
    /// As in docs/.
    std::string markdown;
};

/// What all pages of a program say alike.
struct Book {
    /// "libVLService 0.2.0".
    std::string source;
    /// Of the manual: 1 for programs of users, 8 for those of administrators.
    int section = 1;
};

/// The page of one command in the format of man(7); `path` are the words that name it, the program's first.
/// Commands below it are listed and have pages of their own.
std::string manPage(std::vector<std::string> const& path, Base::CommandInfo const& command,
                    std::vector<Section> const& more, Book const& book);

/// "vlmail-settings-show.1".
std::string manFileName(std::vector<std::string> const& path, Book const& book);

} // namespace Manual
