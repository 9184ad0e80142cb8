#pragma once
// A connection to a PostgreSQL database.

#include "programs/database/connection.h"

#include <functional>
#include <memory>
#include <string>

namespace Database {

/// Throws Base::Error unless the text is a postgresql:// address, and when it has a password in it.
void requirePostgresAddress(std::string const& address);
/// As texts for people name it, without what is nobody's affair.
std::string shownPostgresAddress(std::string const& address);

struct PostgresSession;

/// What is lost comes back with the next statement outside of a transaction. A server that does not answer is
/// given up after some seconds, and gives up a client that stands still in the middle of a transaction.
class PostgresConnection : public Connection {
public:
    /// Throws QueryError when the server cannot be reached.
    explicit PostgresConnection(std::string address);
    ~PostgresConnection() override;

    Backend backend() const override { return Backend::PostgreSql; }
    void run(std::string const& script) override;

private:
    std::unique_ptr<Rows::Cursor> select(std::string const& sql, Values const& values) override;
    long long execute(std::string const& sql, Values const& values) override;
    void begin(Isolation isolation) override;
    void commit() override;
    void rollback() noexcept override;
    void beAlone() override;

    PostgresSession& session();
    template<typename Operation>
    auto attempt(Operation operation);

    std::string address_;
    std::unique_ptr<PostgresSession> session_;
};

/// Hears what others tell by NOTIFY.
class PostgresListener {
public:
    using Hear = std::function<void(std::string const& channel, std::string const& payload)>;

    /// Throws QueryError.
    PostgresListener(std::string const& address, std::vector<std::string> const& channels, Hear hear);
    ~PostgresListener();

    /// To be watched for something to read.
    int descriptor() const;
    /// Tells what has come. Throws QueryError when the connection is gone.
    void take();

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

/// Brings the schema of a kind up to date; true when there was none before. One at a time does, whoever
/// else comes waits for him. Throws DatabaseError when the database has a newer one.
bool migratePostgres(Connection& connection, DatabaseKind const& kind, std::string const& address);

} // namespace Database
