#pragma once
// The command line of vlserviced.

#include "programs/base/command_tree.h"

#include <cstdint>
#include <filesystem>
#include <iosfwd>
#include <string>
#include <variant>

namespace VlServiced {

/// What the program is started for.
enum class Task { Serve, BackUp, Restore, MoveDatabase };

struct Options {
    Task task = Task::Serve;
    /// Of a backup.
    std::filesystem::path file;
    /// Of a PostgreSQL database that is to hold what the data folder does.
    std::string migrateTo;
    /// Whether the service did nothing behind the backup.
    bool nothingSince = false;
    std::filesystem::path data;
    /// Of a PostgreSQL database that several services may share; empty for the data folder's own file.
    std::string database;
    /// How many seconds a service that stands still keeps what it works on from the others.
    std::uint16_t lease = 60;
    /// Empty for the data folder's own.
    std::filesystem::path outbox;
    /// File with the access token; empty for the data folder's own.
    std::string token;
    /// Below which clients may name pack databases; empty where they may name none.
    std::filesystem::path localPacks;
    std::string listen = "127.0.0.1";
    std::uint16_t port = 0;
    std::string certificate;
    std::string key;
    /// The host that discovery answers with; empty for the listening address or, where that is any address,
    /// the host's name.
    std::string announce;
    bool answersDiscovery = true;
    /// Where metrics are asked for, "ADDRESS:PORT" or "unix:PATH"; empty for nowhere.
    std::string metrics;
    /// Listens already, at `listen` and `port`; below 0 when there is none.
    int socket = -1;
    bool verbose = false;
    /// What the program was built from, as --version tells it.
    std::string commit;
};

/// The options, or the exit status of a run that ends here: help or the version was wanted, or the command
/// line is wrong. `commit` is what --version tells.
std::variant<Options, int> parseOptions(int argc, char const* const* argv, std::ostream& out,
                                        std::ostream& err, std::string const& commit = {});

/// All that the command line knows, for the manual.
Base::CommandInfo commandInfo();

} // namespace VlServiced
