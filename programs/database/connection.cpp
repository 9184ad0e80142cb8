#include "programs/database/connection.h"

#include <utility>

namespace Database {
namespace {

using Clock = std::chrono::steady_clock;

/// Adds how long an operation takes, whether it succeeds or not.
class Adding {
public:
    explicit Adding(Clock::duration& sum) : sum_(sum) {}
    ~Adding() { sum_ += Clock::now() - begin_; }
    Adding(Adding const&) = delete;
    Adding& operator=(Adding const&) = delete;

private:
    Clock::duration& sum_;
    Clock::time_point begin_ = Clock::now();
};

/// Tells how long an operation took; without somebody to tell it no clock is read.
template<typename Operation>
auto timed(Connection::Took const& took, char const* name, Operation operation) {
    Clock::duration time{};
    struct Telling {
        Connection::Took const& took;
        char const* name;
        Clock::duration const& time;
        ~Telling() { took(name, time); }
    } const telling{took, name, time};
    Adding const adding(time);
    return operation();
}

} // namespace

Rows::Cursor::~Cursor() = default;
Connection::~Connection() = default;

/// Between two rows their reader does something else.
class Connection::TimedCursor : public Rows::Cursor {
public:
    TimedCursor(Connection& connection, std::string const& sql, Values const& values)
        : took_(connection.took_) {
        Adding const adding(time_);
        inner_ = connection.select(sql, values);
    }
    ~TimedCursor() override { took_("query", time_); }

    bool next() override {
        Adding const adding(time_);
        return inner_->next();
    }
    bool isNull(int column) const override { return inner_->isNull(column); }
    long long number(int column) const override { return inner_->number(column); }
    std::string_view bytes(int column) const override { return inner_->bytes(column); }

private:
    Took const& took_;
    Clock::duration time_{};
    std::unique_ptr<Rows::Cursor> inner_;
};

Rows Connection::queryAll(std::string const& sql, Values const& values) {
    return Rows(took_ ? std::make_unique<TimedCursor>(*this, sql, values) : select(sql, values));
}

long long Connection::changeAll(std::string const& sql, Values const& values) {
    return took_ ? timed(took_, "change", [&] { return execute(sql, values); }) : execute(sql, values);
}

std::string Connection::elementsOf(std::string const& placeholder) const {
    return isSqlite() ? "(SELECT value FROM json_each(" + placeholder + "))"
                      : "(SELECT json_array_elements_text(CAST(" + placeholder + " AS json)))";
}

std::string Connection::bytesOf(std::string const& column) const {
    return isSqlite() ? "length(CAST(" + column + " AS BLOB))" : "octet_length(" + column + ")";
}

std::string Connection::by(std::string const& index) const {
    return isSqlite() ? "INDEXED BY " + index + " " : "";
}

Transaction::Transaction(Connection& connection, Isolation isolation)
    : connection_(connection), depth_(connection.depth_) {
    if (depth_ == 0)
        connection_.begin(isolation);
    else
        connection_.run("SAVEPOINT " + name());
    if (depth_ > 0 && isolation == ALONE)
        connection_.beAlone();
    ++connection_.depth_;
}

Transaction::~Transaction() {
    if (!isOpen_)
        return;
    --connection_.depth_;
    try {
        if (depth_ == 0)
            connection_.rollback();
        else
            connection_.run("ROLLBACK TO SAVEPOINT " + name() + "; RELEASE SAVEPOINT " + name());
    } catch (QueryError const&) {
        // The connection is gone, and the whole with it.
    }
}

void Transaction::commit() {
    if (depth_ == 0 && connection_.took_)
        timed(connection_.took_, "commit", [this] { connection_.commit(); });
    else if (depth_ == 0)
        connection_.commit();
    else
        connection_.run("RELEASE SAVEPOINT " + name());
    isOpen_ = false;
    --connection_.depth_;
}

} // namespace Database
