#pragma once
// The command line of vlserviced.

#include <cstdint>
#include <filesystem>
#include <iosfwd>
#include <string>
#include <variant>

namespace VlServiced {

struct Options {
    std::filesystem::path data;
    /// Empty for the data folder's own.
    std::filesystem::path outbox;
    std::string listen = "127.0.0.1";
    std::uint16_t port = 0;
    std::string certificate;
    std::string key;
    /// The host that discovery answers with; empty for the listening address or, where that is any address,
    /// the host's name.
    std::string announce;
    bool answersDiscovery = true;
    bool verbose = false;
};

/// The options, or the exit status of a run that ends here: help was wanted, or the command line is wrong.
std::variant<Options, int> parseOptions(int argc, char const* const* argv, std::ostream& out,
                                        std::ostream& err);

} // namespace VlServiced
