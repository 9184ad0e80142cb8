#include "programs/database/table_copy.h"

#include "programs/base/digest.h"

#include <algorithm>
#include <functional>
#include <optional>
#include <utility>

namespace Database {
namespace {

std::string namesOf(std::vector<Column> const& columns) {
    std::string names;
    for (Column const& column : columns)
        names += (names.empty() ? "" : ", ") + column.name;
    return names;
}

std::string placeholders(std::size_t count) {
    std::string all;
    for (std::size_t i = 1; i <= count; ++i)
        all += (i == 1 ? "$" : ", $") + std::to_string(i);
    return all;
}

/// Texts by their length first, so that whatever is below a node comes behind it.
std::string orderOf(Table const& table) {
    std::string order;
    for (Column const& column : table.key())
        order += (order.empty() ? " ORDER BY " : ", ") +
                 (column.type == Column::Type::Text ? "length(" + column.name + "), " : "") + column.name;
    return order;
}

Value valueOf(Rows const& row, int at, Column const& column) {
    if (row.isNull(at))
        return nullptr;
    if (column.type == Column::Type::Number)
        return row.number(at);
    return column.type == Column::Type::Text ? Value(row.bytes(at)) : Value(Bytes{row.bytes(at)});
}

Values valuesOf(Rows const& row, std::vector<Column> const& columns) {
    Values values;
    for (std::size_t i = 0; i < columns.size(); ++i)
        values.push_back(valueOf(row, static_cast<int>(i), columns[i]));
    return values;
}

/// Each value with its kind and its length in front, so that no two rows look alike.
class Summing {
public:
    void add(Values const& row) {
        for (Value const& value : row)
            std::visit([this](auto const& one) { add(one); }, value.get());
        ++sum_.rows;
    }
    TableSum sum() {
        sum_.sha256 = digest_.digest();
        return sum_;
    }

private:
    void add(std::monostate) { digest_.add("-"); }
    void add(long long number) { add('n', std::to_string(number)); }
    void add(std::string_view text) { add('t', text); }
    void add(Bytes bytes) { add('b', bytes.data); }
    void add(char kind, std::string_view bytes) {
        digest_.add(kind + std::to_string(bytes.size()) + ':');
        digest_.add(bytes);
    }

    TableSum sum_;
    Base::Sha256 digest_;
};

using TakeRow = std::function<void(Values const&)>;

/// A key whose texts outlive its row.
using KeptKey = std::vector<std::variant<long long, std::string>>;

KeptKey keptKey(Rows const& row, std::vector<Column> const& key) {
    KeptKey kept;
    for (std::size_t i = 0; i < key.size(); ++i) {
        int const at = static_cast<int>(i);
        if (key[i].type == Column::Type::Number)
            kept.emplace_back(row.number(at));
        else
            kept.emplace_back(row.text(at));
    }
    return kept;
}

std::vector<KeptKey> keysOf(Connection& connection, Table const& table) {
    std::vector<KeptKey> keys;
    Rows rows = connection.query("SELECT " + namesOf(table.key()) + " FROM " + table.name + orderOf(table));
    while (rows.next())
        keys.push_back(keptKey(rows, table.key()));
    return keys;
}

Values valuesOf(KeptKey const& key) {
    Values values;
    for (auto const& part : key)
        std::visit([&](auto const& one) { values.emplace_back(one); }, part);
    return values;
}

std::string conditionOf(std::vector<Column> const& key) {
    std::string condition;
    for (std::size_t i = 0; i < key.size(); ++i)
        condition += (i == 0 ? " WHERE " : " AND ") + key[i].name + " = $" + std::to_string(i + 1);
    return condition;
}

/// Large values one by one: a result may be in memory as a whole.
void walkSingly(Connection& connection, Table const& table, TakeRow const& take) {
    std::string const select =
        "SELECT " + namesOf(table.columns) + " FROM " + table.name + conditionOf(table.key());
    for (KeptKey const& key : keysOf(connection, table)) {
        Rows rows = connection.queryAll(select, valuesOf(key));
        while (rows.next())
            take(valuesOf(rows, table.columns));
    }
}

void walk(Connection& connection, Table const& table, TakeRow const& take) {
    if (table.hasBytes())
        return walkSingly(connection, table, take);
    Rows rows = connection.query("SELECT " + namesOf(table.columns) + " FROM " + table.name + orderOf(table));
    while (rows.next())
        take(valuesOf(rows, table.columns));
}

Column::Type typeNamed(std::string const& name) {
    if (name == "INTEGER")
        return Column::Type::Number;
    return name == "BLOB" ? Column::Type::Bytes : Column::Type::Text;
}

Table tableNamed(Connection& sqlite, std::string const& name) {
    Table table{name, {}};
    Rows rows = sqlite.query("SELECT name, type, pk FROM pragma_table_info($1) ORDER BY cid", name);
    while (rows.next())
        table.columns.push_back({rows.text(0), typeNamed(rows.text(1)), static_cast<int>(rows.number(2))});
    return table;
}

} // namespace

std::vector<Column> Table::key() const {
    std::vector<Column> key;
    std::ranges::copy_if(columns, std::back_inserter(key),
                         [](Column const& one) { return one.keyPlace > 0; });
    std::ranges::sort(key, {}, &Column::keyPlace);
    return key;
}

bool Table::hasBytes() const {
    return std::ranges::any_of(columns, [](Column const& one) { return one.type == Column::Type::Bytes; });
}

/// In the order in which they were made: a table refers to those that were there.
std::vector<Table> tablesOf(Connection& sqlite) {
    std::vector<std::string> names;
    Rows rows = sqlite.query(
        "SELECT name FROM sqlite_schema WHERE type = 'table' AND name NOT LIKE 'sqlite%' ORDER BY rowid");
    while (rows.next())
        names.push_back(rows.text(0));
    std::vector<Table> tables;
    for (std::string const& name : names)
        tables.push_back(tableNamed(sqlite, name));
    return tables;
}

TableSum copyTable(Connection& from, Connection& to, Table const& table) {
    std::string const insert = "INSERT INTO " + table.name + " (" + namesOf(table.columns) + ") VALUES (" +
                               placeholders(table.columns.size()) + ")";
    Summing summing;
    walk(from, table, [&](Values const& row) {
        to.changeAll(insert, row);
        summing.add(row);
    });
    return summing.sum();
}

TableSum sumOf(Connection& connection, Table const& table) {
    Summing summing;
    walk(connection, table, [&](Values const& row) { summing.add(row); });
    return summing.sum();
}

void goOnNumbering(Connection& connection, Table const& table) {
    std::vector<Column> const key = table.key();
    if (connection.isSqlite() || key.size() != 1 || key.front().type != Column::Type::Number)
        return;
    connection.number("SELECT setval(pg_get_serial_sequence('" + table.name + "', '" + key.front().name +
                      "'), coalesce(max(" + key.front().name + "), 0) + 1, false) FROM " + table.name);
}

} // namespace Database
