#pragma once
// Records that programs write as JSON, as tables: a row is a key with how it is written, read and described.
// Tables stand in the order in which their keys are written.

#include "programs/base/json_schema.h"

#include <span>
#include <string_view>

namespace Base {

enum class Presence { Always, WhenThere };

template<typename Record>
struct JsonRow {
    char const* name;
    Presence presence;
    json::Object (*schema)();
    /// The empty handle is not written.
    json::Value (*write)(Record const&);
    /// Gets the empty handle for a missing key. Null for a key that is told and not read.
    void (*read)(json::Value const&, Record&) = nullptr;
};

template<typename Record>
void writeRows(std::span<JsonRow<Record> const> rows, Record const& record, json::Object& into) {
    for (JsonRow<Record> const& row : rows)
        if (json::Value value = row.write(record))
            into.set(row.name, std::move(value));
}

template<typename Record>
void readRows(std::span<JsonRow<Record> const> rows, json::Object const& from, Record& into) {
    for (JsonRow<Record> const& row : rows)
        if (row.read)
            row.read(from.get(row.name), into);
}

template<typename Record>
void describeRows(std::span<JsonRow<Record> const> rows, Schema::Members& into) {
    for (JsonRow<Record> const& row : rows) {
        if (row.presence == Presence::Always)
            into.require(row.name, row.schema());
        else
            into.add(row.name, row.schema());
    }
}

/// An object with the keys of the rows and no others.
template<typename Record>
json::Object schemaOf(std::span<JsonRow<Record> const> rows) {
    Schema::Members members(Schema::Members::Others::Refused);
    describeRows(rows, members);
    return members.schema();
}

} // namespace Base
