#pragma once
// The upload folder as the one that it was: a share that is not mounted leaves another folder under its name,
// and what does not lie there says nothing.

#include "programs/base/file_descriptor.h"

#include <filesystem>
#include <string>

namespace VlServiced {

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

/// A folder that is held open, so that whatever is mounted there meanwhile, everything happens in the one
/// that was tested. Names are those of files in it; links are never followed.
class UploadFolder {
public:
    /// The name of the file that holds the mark.
    static constexpr char const* MARK_FILE = ".vlserviced";

    /// Opens the folder that has this identity, as text; the empty text stands for any folder, which gets a
    /// mark unless it has one. Throws std::system_error when it is not there, and Error when it is another
    /// one.
    UploadFolder(std::filesystem::path const& folder, std::string const& identity);

    std::filesystem::path const& path() const { return folder_.file(); }
    FolderIdentity const& identity() const { return identity_; }
    int descriptor() const { return folder_.number(); }

private:
    void readIdentity();
    void requireIdentity(FolderIdentity const& wanted) const;
    void mark();

    Base::FileDescriptor folder_;
    FolderIdentity identity_;
};

} // namespace VlServiced
