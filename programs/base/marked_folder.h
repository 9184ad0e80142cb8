#pragma once
// A folder as the one that it was: a share that is not mounted leaves another folder under its name, and what
// does not lie there says nothing.

#include "programs/base/file_descriptor.h"

#include <filesystem>
#include <string>

#include <sys/types.h>

namespace Base {

/// What tells a folder from another one of its name: its inode, and a mark, the text of a small file in it.
/// The device is on record for people; shares get another number each time they are mounted.
struct FolderIdentity {
    unsigned long long device = 0;
    unsigned long long inode = 0;
    std::string mark;

    /// Whether both are the same folder.
    bool isSameAs(FolderIdentity const& other) const { return inode == other.inode && mark == other.mark; }

    /// One line for the record; the empty text reads as no identity.
    std::string text() const;
    static FolderIdentity fromText(std::string const& text);
};

/// The name of a file until it is whole; whoever takes files leaves it alone.
std::string temporaryOf(std::string const& name);

/// A folder that is held open, so that whatever is mounted there meanwhile, everything happens in the one
/// that was tested. Names are those of files in it; links are never followed. Every operation throws
/// std::system_error, with the folder in its text.
class MarkedFolder {
public:
    /// The name of the file that holds the mark.
    static constexpr char const* MARK_FILE = ".vlserviced";

    /// Opens the folder that has this identity, as text; the empty text stands for any folder, which gets a
    /// mark unless it has one. `inWords` is what it is for people: "upload folder". Throws Error when it is
    /// another one.
    MarkedFolder(std::string inWords, std::filesystem::path const& folder, std::string const& identity);

    std::filesystem::path const& path() const { return folder_.file(); }
    FolderIdentity const& identity() const { return identity_; }
    int descriptor() const { return folder_.number(); }

    bool has(std::string const& name) const;
    /// For writing: whatever had its name, a link to some other file say, is gone and was not written to.
    FileDescriptor newFile(std::string const& name, mode_t mode) const;
    /// Replaces what has that name.
    void rename(std::string const& from, std::string const& to) const;
    void removeIfThere(std::string const& name) const;
    /// Makes the names last.
    void sync() const;

private:
    void readIdentity();
    void requireIdentity(FolderIdentity const& wanted) const;
    void mark();
    [[noreturn]] void failAt(char const* what, std::string const& name) const;

    std::string inWords_;
    FileDescriptor folder_;
    FolderIdentity identity_;
};

} // namespace Base
