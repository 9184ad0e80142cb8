#pragma once
// The system's own server for files over ssh, with keys and a folder of its own.

#include "tests/support/cutting_relay.h"
#include "tests/support/temporary_folder.h"

#include <filesystem>
#include <optional>
#include <string>
#include <sys/types.h>

/// Each connection is another process, of a user without rights.
class SshServer {
public:
    /// Files are put into `drop`, which everybody may write into. The server's files lie in `folder`.
    SshServer(std::filesystem::path const& folder, std::filesystem::path drop);

    /// Why there is no such server; empty where there is one.
    static std::string whyNot();

    std::string url() const;
    std::string const& hostKey() const { return hostKey_; }
    /// The key of the user that may put files there.
    std::filesystem::path identityFile() const { return folder_ / "user"; }
    /// A key that nobody knows.
    std::filesystem::path strangersFile() const { return folder_ / "stranger"; }
    VLServiceTest::CuttingRelay& relay() { return *relay_; }

private:
    void makeKey(char const* name) const;
    int connect() const;

    std::filesystem::path folder_;
    std::filesystem::path drop_;
    std::string hostKey_;
    std::optional<VLServiceTest::CuttingRelay> relay_;
};
