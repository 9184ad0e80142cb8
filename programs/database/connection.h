#pragma once
// A connection to a database, whichever it is: statements, rows, transactions, failures.

#include "programs/database/failure.h"

#include <chrono>
#include <concepts>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <variant>
#include <vector>

namespace Database {

/// What a statement failed by, in the database's words.
class QueryError : public DatabaseError {
public:
    enum class Kind {
        Other,
        /// A key that is there already, or a row that others need or that is missing.
        Constraint,
        /// There is no room.
        Full,
        /// The connection is gone; whether a commit that fails so has happened is not known.
        Lost,
    };

    QueryError(Kind kind, std::string const& what)
        : DatabaseError(kind == Kind::Lost ? Base::Code::DatabaseUnavailable : Base::Code::DatabaseFailed,
                        what),
          kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

/// Bytes that are no text.
struct Bytes {
    std::string_view data;
};

/// What stands for a placeholder of a statement. Texts and bytes have to outlive the statement's run.
class Value {
public:
    Value(std::nullptr_t) {}
    template<std::integral Number>
    Value(Number number) : value_(static_cast<long long>(number)) {}
    Value(std::string const& text) : value_(std::string_view(text)) {}
    Value(std::string_view text) : value_(text) {}
    Value(char const* text) : value_(std::string_view(text)) {}
    Value(Bytes bytes) : value_(bytes) {}
    Value(std::optional<long long> number) {
        if (number)
            value_ = *number;
    }

    std::variant<std::monostate, long long, std::string_view, Bytes> const& get() const { return value_; }

private:
    std::variant<std::monostate, long long, std::string_view, Bytes> value_;
};
using Values = std::vector<Value>;

/// The rows of a query, one after another.
class Rows {
public:
    class Cursor {
    public:
        virtual ~Cursor();
        virtual bool next() = 0;
        virtual bool isNull(int column) const = 0;
        virtual long long number(int column) const = 0;
        virtual std::string_view bytes(int column) const = 0;
    };

    explicit Rows(std::unique_ptr<Cursor> cursor) : cursor_(std::move(cursor)) {}

    /// Goes on to the next row, at first to the first; false when there is none.
    bool next() { return cursor_->next(); }

    // Of the row, by columns from 0. Null reads as 0 and as the empty text.

    bool isNull(int column) const { return cursor_->isNull(column); }
    long long number(int column) const { return cursor_->number(column); }
    bool isTrue(int column) const { return number(column) != 0; }
    std::string text(int column) const { return std::string(bytes(column)); }
    /// Until the next row.
    std::string_view bytes(int column) const { return cursor_->bytes(column); }

private:
    std::unique_ptr<Cursor> cursor_;
};

/// One connection, used by one thread at a time. Placeholders are $1, $2 and so on. Every operation throws
/// QueryError. A statement outside of a transaction is one of its own, and on the disk when it returns.
class Connection {
public:
    virtual ~Connection();

    virtual Backend backend() const = 0;
    bool isSqlite() const { return backend() == Backend::Sqlite; }

    template<typename... Each>
    Rows query(std::string const& sql, Each const&... values) {
        return queryAll(sql, {Value(values)...});
    }
    Rows queryAll(std::string const& sql, Values const& values);
    /// The first column of the first row; 0 when there is none.
    template<typename... Each>
    long long number(std::string const& sql, Each const&... values) {
        Rows rows = query(sql, values...);
        return rows.next() ? rows.number(0) : 0;
    }
    /// How many rows it has changed.
    template<typename... Each>
    long long change(std::string const& sql, Each const&... values) {
        return changeAll(sql, {Value(values)...});
    }
    long long changeAll(std::string const& sql, Values const& values);
    /// Statements without placeholders, one after another.
    virtual void run(std::string const& script) = 0;

    /// Has told how long each "query", with all its rows, each "change" and each "commit" made its caller
    /// wait.
    using Took = std::function<void(char const* operation, std::chrono::duration<double>)>;
    void onTook(Took took) { took_ = std::move(took); }

    /// Has nothing of what was deleted stay in a log beside the database.
    virtual void emptyLog() {}

    // What databases spell in different ways. A schema may make clock_ms() known on a server: milliseconds
    // since the epoch by its clock. SQLite's connections know it.

    /// The elements of a JSON array of texts, for IN.
    std::string elementsOf(std::string const& placeholder) const;
    /// How many bytes a text has.
    std::string bytesOf(std::string const& column) const;
    /// Behind the name of a table: the index that a query is to go by.
    std::string by(std::string const& index) const;
    /// What tells a row of a table from all others while nobody changes it.
    std::string rowId() const { return isSqlite() ? "rowid" : "ctid"; }
    /// Behind a query for rows that are to be changed: leaves those out that somebody else is changing.
    std::string skipLocked() const { return isSqlite() ? "" : " FOR UPDATE SKIP LOCKED"; }

protected:
    friend class Transaction;

    virtual std::unique_ptr<Rows::Cursor> select(std::string const& sql, Values const& values) = 0;
    virtual long long execute(std::string const& sql, Values const& values) = 0;

    enum class Isolation {
        /// Sees what others have committed meanwhile.
        Shared,
        /// Sees one state of the database and changes nothing.
        Snapshot,
        /// Only one such at a time.
        Alone,
    };
    virtual void begin(Isolation isolation) = 0;
    virtual void commit() = 0;
    /// Throws nothing.
    virtual void rollback() noexcept = 0;
    /// Has the transaction that is open be one that is alone from here on.
    virtual void beAlone() {}

private:
    class TimedCursor;

    Took took_;
    int depth_ = 0;
};

/// What happens as a whole or not at all: what was not committed is taken back. One inside of another is part
/// of it, and may be taken back alone.
class Transaction {
public:
    using Isolation = Connection::Isolation;
    static constexpr Isolation SHARED = Isolation::Shared;
    static constexpr Isolation SNAPSHOT = Isolation::Snapshot;
    static constexpr Isolation ALONE = Isolation::Alone;

    explicit Transaction(Connection& connection, Isolation isolation = SHARED);
    ~Transaction();
    Transaction(Transaction const&) = delete;
    Transaction& operator=(Transaction const&) = delete;

    void commit();

private:
    std::string name() const { return "inner_" + std::to_string(depth_); }

    Connection& connection_;
    int depth_;
    bool isOpen_ = true;
};

} // namespace Database
