#pragma once
// A connection over which files are put into a folder of another machine.

#include "programs/carriers/carrier.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Carriers {

/// Where files go, and who puts them there.
struct SftpTarget {
    /// "sftp://USER@HOST:PORT/FOLDER/"
    std::string url;
    /// "SHA256:..." of the other machine.
    std::string hostKey;
    /// The file with the private key.
    std::string identityFile;
};

/// Connects when it is first used, and stays connected. Used by one thread at a time; every operation throws
/// Error with one line.
class SftpSession {
public:
    /// What hangs is given up when the sign is raised.
    explicit SftpSession(SftpTarget target, StopSign stop = {});
    ~SftpSession();

    /// Puts a file there under a temporary name, and renames it when it is whole; what had its name goes.
    /// `goesFirst` is the name of a file that is gone before; empty for none.
    void put(std::string const& name, std::string_view bytes, std::string const& goesFirst = {});
    /// Puts a file there and takes it away again. Gives how many bytes there is room for; nothing where that
    /// is not told.
    std::optional<unsigned long long> tryOut();

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace Carriers
