#include "programs/database/postgres_connection.h"

#include "programs/base/plain_text.h"
#include "programs/database/migration.h"

#include <libpq-fe.h>
#include <pqxx/pqxx>

#include <charconv>
#include <cstring>
#include <optional>
#include <utility>

namespace Database {
namespace {

/// One that holds what others wait for, and does nothing, is dropped.
constexpr char const* SETTINGS =
    "SET synchronous_commit = on; SET idle_in_transaction_session_timeout = '10s'; "
    "SET statement_timeout = '120s'; SET lock_timeout = '60s'; "
    "SET client_min_messages = warning; SET client_encoding = 'UTF8'";
/// What an address leaves open: seconds, and milliseconds.
constexpr std::pair<char const*, char const*> DEFAULTS[] = {
    {"connect_timeout", "5"},     {"tcp_user_timeout", "20000"}, {"keepalives_idle", "10"},
    {"keepalives_interval", "5"}, {"keepalives_count", "3"},     {"application_name", "vlserviced"}};
/// Those that are alone take it; a number that no other program is likely to take.
constexpr char const* ALONE_LOCK = "SELECT pg_advisory_xact_lock(94807251)";
constexpr char const* MIGRATION_LOCK = "SELECT pg_advisory_xact_lock(94807252)";

/// Of the texts that a server's failure has, the first line says what it is.
std::string firstLine(std::string const& text) {
    std::string const line = text.substr(0, text.find('\n'));
    return Base::oneLine(line.starts_with("ERROR:  ") ? line.substr(8) : line);
}

struct OptionsFreed {
    void operator()(PQconninfoOption* options) const { PQconninfoFree(options); }
};
using Options = std::unique_ptr<PQconninfoOption, OptionsFreed>;

Options optionsIn(std::string const& address) {
    char* problem = nullptr;
    Options options(PQconninfoParse(address.c_str(), &problem));
    std::string const why = problem ? firstLine(problem) : std::string();
    PQfreemem(problem);
    if (!options)
        throw DatabaseError(Base::Code::Usage, "the address of the database cannot be read: " + why);
    return options;
}

std::optional<std::string> optionOf(PQconninfoOption const* options, char const* name) {
    for (; options->keyword; ++options)
        if (std::strcmp(options->keyword, name) == 0 && options->val)
            return options->val;
    return std::nullopt;
}

std::string quoted(std::string const& value) {
    std::string text = "'";
    for (char const c : value)
        text += (c == '\'' || c == '\\') ? std::string("\\") + c : std::string(1, c);
    return text + "' ";
}

/// The address with what it leaves open; the environment and service files fill in the rest.
std::string connectionText(std::string const& address) {
    Options const options = optionsIn(address);
    std::string text;
    for (PQconninfoOption const* option = options.get(); option->keyword; ++option)
        if (option->val)
            text += std::string(option->keyword) + '=' + quoted(option->val);
    for (auto const& [name, value] : DEFAULTS)
        if (!optionOf(options.get(), name))
            text += std::string(name) + '=' + quoted(value);
    return text;
}

QueryError::Kind kindOf(std::string const& state) {
    if (state.starts_with("23"))
        return QueryError::Kind::Constraint;
    // Of the class of what a server has too little of: others pass by themselves.
    if (state == "53100")
        return QueryError::Kind::Full;
    // Taken down, or dropped for standing still.
    if (state.starts_with("57P") || state.starts_with("08") || state == "25P03")
        return QueryError::Kind::Lost;
    return QueryError::Kind::Other;
}

template<typename Operation>
decltype(auto) orQueryError(Operation operation) {
    try {
        return operation();
    } catch (pqxx::broken_connection const& failure) {
        throw QueryError(QueryError::Kind::Lost,
                         "the database cannot be reached: " + firstLine(failure.what()));
    } catch (pqxx::in_doubt_error const& failure) {
        throw QueryError(QueryError::Kind::Lost,
                         "the database went away in the middle of a change: " + firstLine(failure.what()));
    } catch (pqxx::sql_error const& failure) {
        throw QueryError(kindOf(failure.sqlstate()), firstLine(failure.what()));
    } catch (pqxx::failure const& failure) {
        throw QueryError(QueryError::Kind::Other, firstLine(failure.what()));
    } catch (pqxx::usage_error const& failure) {
        throw QueryError(QueryError::Kind::Lost, firstLine(failure.what()));
    }
}

/// A parameter in the form that libpqxx takes a list of.
using Parameter = std::optional<std::string>;

/// Values with the one that is no text apart.
struct Parameters {
    std::vector<Parameter> front;
    std::optional<pqxx::binarystring> bytes;
    std::vector<Parameter> behind;

    explicit Parameters(Values const& values) {
        for (Value const& value : values)
            std::visit(*this, value.get());
    }
    void operator()(std::monostate) { last().emplace_back(); }
    void operator()(long long number) { last().emplace_back(std::to_string(number)); }
    void operator()(std::string_view text) { last().emplace_back(text); }
    void operator()(Bytes const& data) { bytes.emplace(data.data.data(), data.data.size()); }

    std::vector<Parameter>& last() { return bytes ? behind : front; }
};

pqxx::result run(pqxx::transaction_base& transaction, std::string const& sql, Values const& values) {
    Parameters const parameters(values);
    auto const front = pqxx::prepare::make_dynamic_params(parameters.front);
    if (!parameters.bytes)
        return transaction.exec_params(sql, front);
    return transaction.exec_params(sql, front, *parameters.bytes,
                                   pqxx::prepare::make_dynamic_params(parameters.behind));
}

class ResultRows : public Rows::Cursor {
public:
    explicit ResultRows(pqxx::result const& result) : result_(result) {}

    bool next() override { return static_cast<pqxx::result::size_type>(++row_) < result_.size(); }
    bool isNull(int column) const override { return at(column).is_null(); }
    long long number(int column) const override {
        pqxx::field const value = at(column);
        long long number = 0;
        std::from_chars(value.c_str(), value.c_str() + value.size(), number);
        return number;
    }
    std::string_view bytes(int column) const override {
        constexpr pqxx::oid BYTEA = 17;
        pqxx::field const value = at(column);
        if (result_.column_type(column) != BYTEA || value.is_null())
            return {value.c_str(), value.size()};
        bytes_.emplace(value);
        return {reinterpret_cast<char const*>(bytes_->data()), bytes_->size()};
    }

private:
    pqxx::field at(int column) const { return result_[static_cast<pqxx::result::size_type>(row_)][column]; }

    pqxx::result result_;
    int row_ = -1;
    mutable std::optional<pqxx::binarystring> bytes_;
};

} // namespace

struct PostgresSession {
    explicit PostgresSession(std::string const& address) : connection(connectionText(address)) {
        // Within a transaction a new session would go on without what the former has done.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
        connection.inhibit_reactivation(true);
#pragma GCC diagnostic pop
        pqxx::nontransaction(connection).exec(SETTINGS);
    }

    pqxx::connection connection;
    std::unique_ptr<pqxx::transaction_base> transaction;
};

void requirePostgresAddress(std::string const& address) {
    if (!address.starts_with("postgresql://") && !address.starts_with("postgres://"))
        throw DatabaseError(Base::Code::Usage,
                            "the address of the database is none: wanted is postgresql://HOST/NAME");
    Options const options = optionsIn(address);
    for (char const* const secret : {"password", "sslpassword"})
        if (optionOf(options.get(), secret))
            throw DatabaseError(Base::Code::Usage,
                                "others on this machine can read a password that stands on the command line: "
                                "put it into ~/.pgpass or a service file");
}

std::string shownPostgresAddress(std::string const& address) { return Base::oneLine(address); }

PostgresConnection::PostgresConnection(std::string address) : address_(std::move(address)) {
    orQueryError([&] { session(); });
}

PostgresConnection::~PostgresConnection() = default;

PostgresSession& PostgresConnection::session() {
    if (!session_)
        session_ = std::make_unique<PostgresSession>(address_);
    return *session_;
}

/// In the transaction that is open, or in none.
template<typename Operation>
auto PostgresConnection::attempt(Operation operation) {
    try {
        return orQueryError([&] {
            PostgresSession& at = session();
            if (at.transaction)
                return operation(*at.transaction);
            pqxx::nontransaction alone(at.connection);
            return operation(alone);
        });
    } catch (QueryError const& failure) {
        // Whoever is within a transaction has to see it end.
        if (failure.kind() == QueryError::Kind::Lost && !(session_ && session_->transaction))
            session_.reset();
        throw;
    }
}

void PostgresConnection::run(std::string const& script) {
    attempt([&](pqxx::transaction_base& transaction) {
        transaction.exec(script);
        return 0;
    });
}

std::unique_ptr<Rows::Cursor> PostgresConnection::select(std::string const& sql, Values const& values) {
    return attempt([&](pqxx::transaction_base& transaction) {
        return std::make_unique<ResultRows>(Database::run(transaction, sql, values));
    });
}

long long PostgresConnection::execute(std::string const& sql, Values const& values) {
    return attempt([&](pqxx::transaction_base& transaction) {
        return static_cast<long long>(Database::run(transaction, sql, values).affected_rows());
    });
}

void PostgresConnection::begin(Isolation isolation) {
    attempt([](pqxx::transaction_base& alone) {
        // Finds out whether the session is there still.
        alone.exec("SELECT 1");
        return 0;
    });
    orQueryError([&] {
        if (isolation == Isolation::Snapshot)
            session_->transaction =
                std::make_unique<pqxx::transaction<pqxx::repeatable_read, pqxx::read_only>>(
                    session_->connection);
        else
            session_->transaction = std::make_unique<pqxx::work>(session_->connection);
    });
    try {
        if (isolation == Isolation::Alone)
            beAlone();
    } catch (...) {
        rollback();
        throw;
    }
}

void PostgresConnection::beAlone() { run(ALONE_LOCK); }

void PostgresConnection::commit() {
    orQueryError([&] { session_->transaction->commit(); });
    session_->transaction.reset();
}

void PostgresConnection::rollback() noexcept {
    if (!session_)
        return;
    try {
        if (session_->transaction)
            session_->transaction->abort();
        session_->transaction.reset();
        if (session_->connection.is_open())
            return;
    } catch (std::exception const&) {
        // With its session what was begun is gone as well.
    }
    session_.reset();
}

struct PostgresListener::Impl {
    class Receiver : public pqxx::notification_receiver {
    public:
        Receiver(pqxx::connection_base& connection, std::string const& channel, Hear const& hear)
            : notification_receiver(connection, channel), hear_(hear) {}
        void operator()(std::string const& payload, int) override { hear_(channel(), payload); }

    private:
        Hear const& hear_;
    };

    Impl(std::string const& address, std::vector<std::string> const& channels, Hear told)
        : hear(std::move(told)), session(address) {
        for (std::string const& name : channels)
            receivers.push_back(std::make_unique<Receiver>(session.connection, name, hear));
    }

    /// A receiver that signs off makes the connection tell what came meanwhile, to whoever listens still.
    ~Impl() {
        hear = [](std::string const&, std::string const&) {};
    }

    Hear hear;
    PostgresSession session;
    std::vector<std::unique_ptr<Receiver>> receivers;
};

PostgresListener::PostgresListener(std::string const& address, std::vector<std::string> const& channels,
                                   Hear hear)
    : impl_(orQueryError([&] { return std::make_unique<Impl>(address, channels, std::move(hear)); })) {}

PostgresListener::~PostgresListener() = default;

int PostgresListener::descriptor() const { return impl_->session.connection.sock(); }

void PostgresListener::take() {
    orQueryError([&] { return impl_->session.connection.get_notifs(); });
    if (!impl_->session.connection.is_open())
        throw QueryError(QueryError::Kind::Lost, "the database cannot be reached");
}

bool migratePostgres(Connection& connection, DatabaseKind const& kind, std::string const& address) {
    Transaction transaction(connection);
    connection.run(MIGRATION_LOCK);
    connection.run("CREATE TABLE IF NOT EXISTS schema_versions (application BIGINT NOT NULL PRIMARY KEY, "
                   "version BIGINT NOT NULL)");
    Rows versions =
        connection.query("SELECT version FROM schema_versions WHERE application = $1", kind.applicationId);
    auto const version = versions.next() ? versions.number(0) : 0;
    auto const known = static_cast<long long>(kind.migrations.size());
    requireKnownVersion(kind, "the " + std::string(kind.name) + ' ' + shownPostgresAddress(address), version);
    if (version == known)
        return false;
    for (auto at = static_cast<std::size_t>(version); at < kind.migrations.size(); ++at)
        connection.run(kind.migrations[at].scriptFor(Backend::PostgreSql));
    connection.change("INSERT INTO schema_versions (application, version) VALUES ($1, $2) "
                      "ON CONFLICT (application) DO UPDATE SET version = excluded.version",
                      kind.applicationId, known);
    transaction.commit();
    return version == 0;
}

} // namespace Database
