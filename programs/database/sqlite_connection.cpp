#include "programs/database/sqlite_connection.h"

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <chrono>
#include <cstdint>
#include <utility>

namespace Database {
namespace {

/// Texts that are no constants would fill the memory.
constexpr std::size_t MAX_IDLE = 200;

QueryError::Kind kindOf(int code) {
    switch (code) {
    case SQLITE_CONSTRAINT:
        return QueryError::Kind::Constraint;
    case SQLITE_FULL:
        return QueryError::Kind::Full;
    default:
        return QueryError::Kind::Other;
    }
}

template<typename Operation>
decltype(auto) orQueryError(Operation operation) {
    try {
        return operation();
    } catch (SQLite::Exception const& failure) {
        throw QueryError(kindOf(failure.getErrorCode()), failure.what());
    }
}

struct Binding {
    SQLite::Statement& statement;
    int index;

    void operator()(std::monostate) const { statement.bind(index); }
    void operator()(long long number) const { statement.bind(index, static_cast<std::int64_t>(number)); }
    // SQLite takes a null pointer for no value at all.
    void operator()(std::string_view text) const { statement.bind(index, std::string(text)); }
    void operator()(Bytes bytes) const {
        statement.bindNoCopy(index, bytes.data.empty() ? "" : bytes.data.data(),
                             static_cast<int>(bytes.data.size()));
    }
};

long long systemClock() {
    using namespace std::chrono;
    return duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count();
}

void tellTime(sqlite3_context* call, int, sqlite3_value**) {
    auto const& clock = *static_cast<std::function<long long()>*>(sqlite3_user_data(call));
    sqlite3_result_int64(call, clock());
}

} // namespace

class SqliteConnection::StatementRows : public Rows::Cursor {
public:
    StatementRows(SqliteConnection& connection, std::string sql, Statement statement)
        : connection_(connection), sql_(std::move(sql)), statement_(std::move(statement)) {}
    ~StatementRows() override { connection_.giveBack(sql_, std::move(statement_)); }

    bool next() override {
        return orQueryError([&] { return statement_.run->executeStep(); });
    }
    bool isNull(int column) const override { return statement_.run->getColumn(column).isNull(); }
    long long number(int column) const override { return statement_.run->getColumn(column).getInt64(); }
    std::string_view bytes(int column) const override {
        SQLite::Column const value = statement_.run->getColumn(column);
        auto const* const data = static_cast<char const*>(value.getBlob());
        return data ? std::string_view(data, static_cast<std::size_t>(value.getBytes())) : std::string_view();
    }

private:
    SqliteConnection& connection_;
    std::string sql_;
    Statement statement_;
};

SqliteConnection::SqliteConnection(SQLite::Database database)
    : database_(std::move(database)), clock_(std::make_unique<std::function<long long()>>(&systemClock)) {
    sqlite3_create_function_v2(database_.getHandle(), "clock_ms", 0, SQLITE_UTF8, clock_.get(), &tellTime,
                               nullptr, nullptr, nullptr);
}
SqliteConnection::~SqliteConnection() = default;

void SqliteConnection::run(std::string const& script) {
    orQueryError([&] { database_.exec(script); });
}

/// The library looks for a name among all of a statement's.
int SqliteConnection::Statement::placeOf(std::size_t value) {
    for (std::size_t i = places.size(); i <= value; ++i)
        places.push_back(run->getIndex(('$' + std::to_string(i + 1)).c_str()));
    return places[value];
}

SqliteConnection::Statement SqliteConnection::prepared(std::string const& sql, Values const& values) {
    Statement statement;
    if (auto const found = idle_.find(sql); found != idle_.end())
        statement = std::move(idle_.extract(found).mapped());
    else
        statement.run = std::make_unique<SQLite::Statement>(database_, sql);
    for (std::size_t i = 0; i < values.size(); ++i) {
        // One that the text does not name is of no use.
        if (int const place = statement.placeOf(i); place > 0)
            std::visit(Binding{*statement.run, place}, values[i].get());
    }
    return statement;
}

void SqliteConnection::giveBack(std::string const& sql, Statement statement) noexcept {
    statement.run->tryReset();
    if (idle_.size() >= MAX_IDLE)
        return;
    try {
        statement.run->clearBindings();
        idle_.emplace(sql, std::move(statement));
    } catch (std::exception const&) {
        // The next one is prepared anew.
    }
}

std::unique_ptr<Rows::Cursor> SqliteConnection::select(std::string const& sql, Values const& values) {
    return orQueryError([&] { return std::make_unique<StatementRows>(*this, sql, prepared(sql, values)); });
}

long long SqliteConnection::execute(std::string const& sql, Values const& values) {
    return orQueryError([&] {
        StatementRows rows(*this, sql, prepared(sql, values));
        while (rows.next()) {
        }
        return database_.getChanges();
    });
}

void SqliteConnection::begin(Isolation isolation) {
    run(isolation == Isolation::Snapshot ? "BEGIN" : "BEGIN IMMEDIATE");
}

void SqliteConnection::commit() { run("COMMIT"); }

void SqliteConnection::rollback() noexcept {
    // A full disk ends a transaction by itself.
    sqlite3_exec(database_.getHandle(), "ROLLBACK", nullptr, nullptr, nullptr);
}

} // namespace Database
