#include "programs/database/connection.h"

namespace Database {

Rows::Cursor::~Cursor() = default;
Connection::~Connection() = default;

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
    if (depth_ == 0)
        connection_.commit();
    else
        connection_.run("RELEASE SAVEPOINT " + name());
    isOpen_ = false;
    --connection_.depth_;
}

} // namespace Database
