#pragma once
// A PostgreSQL server for tests, on a socket in a temporary folder.

#include <filesystem>
#include <string>
#include <vector>

namespace VLServiceTest {

/// A server of its own.
class PostgresServer {
public:
    /// With all settings told, as "NAME=VALUE".
    explicit PostgresServer(std::vector<std::string> const& settings = {});
    ~PostgresServer();
    PostgresServer(PostgresServer const&) = delete;
    PostgresServer& operator=(PostgresServer const&) = delete;

    /// Empty when there is a server.
    std::string const& whyNot() const { return whyNot_; }
    std::filesystem::path const& folder() const { return folder_; }
    /// Ends it at once, or starts it anew.
    void crash() const { control("crash"); }
    void startAgain() const { control("again"); }

private:
    bool control(std::string const& command) const;

    std::filesystem::path folder_;
    std::string whyNot_;
};

/// An empty database on the server that the tests share, as long as it lives.
class PostgresDatabase {
public:
    PostgresDatabase();
    /// On that server.
    explicit PostgresDatabase(std::filesystem::path serverFolder);
    ~PostgresDatabase();
    PostgresDatabase(PostgresDatabase const&) = delete;
    PostgresDatabase& operator=(PostgresDatabase const&) = delete;

    /// Empty when there is a server.
    std::string const& whyNot() const { return whyNot_; }
    std::string const& address() const { return address_; }

private:
    void create();

    std::string whyNot_;
    std::filesystem::path server_;
    std::string name_;
    std::string address_;
};

} // namespace VLServiceTest
