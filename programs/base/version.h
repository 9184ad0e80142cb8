#pragma once
// What a program says when it is asked for its version.

#include <string>
#include <vector>

namespace Base {

struct LibraryVersion {
    std::string name;
    /// Of the library that runs, where it tells; else of the one that was compiled with.
    std::string version;
};

/// The version of the project, "0.2.0".
std::string projectVersion();

/// Of those that every program stands on.
std::vector<LibraryVersion> libraryVersions();

/// "vlmail 0.2.0 (commit 0123abc)" and a line with the libraries, by their names; an empty commit is left
/// out.
std::string versionText(std::string const& program, std::string const& commit,
                        std::vector<LibraryVersion> libraries);

} // namespace Base
