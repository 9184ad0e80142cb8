#pragma once
// Records as tables: each row binds a JSON key to a member and to the value that stands for a missing key.
// The one reader and the one writer below walk the rows in wire order, so a new key is a new row.
//
//     struct Person::Keys {
//         static constexpr std::tuple TABLE{
//             json::Required{"name", &Person::name_},
//             json::Key{"colour", &Person::colour_, Colour::Red},
//             json::Key{"age", &Person::age_},
//         };
//     };

#include "vlservice/json/json.h"
#include "vlservice/json/json_form.h"

#include <concepts>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>

namespace json {

/// Whether a node is read where a T is wanted. Anything else stands for a missing key, but a type with a form
/// of its own reads whatever is there, and may refuse it.
template<typename T>
bool passesFor(Value const& node) {
    if constexpr (std::same_as<T, bool>)
        return node.isTrue();
    else if constexpr (std::integral<T> || std::is_enum_v<T>)
        return node.isInt();
    else if constexpr (std::floating_point<T>)
        return node.isInt() || node.isReal();
    else if constexpr (std::same_as<T, std::string>)
        return node.isString();
    else
        return static_cast<bool>(node);
}

/// The default of a row that names none: the member's zero value.
struct Zero {};

/// A row for a key that may be missing. A T stands there in the form of Cfg::JsonForm; a member that equals
/// the default is not written.
template<typename Record, typename T, typename Missing = Zero>
class Key {
public:
    constexpr Key(char const* name, T Record::*member, Missing missing = {})
        : name_(name), member_(member), missing_(missing) {}

    void read(Object const& from, Record& into) const {
        Value const node = from.get(name_);
        into.*member_ = passesFor<T>(node) ? Cfg::JsonForm<T>::read(node) : missing();
    }
    void write(Record const& from, Object& into) const {
        if (from.*member_ == missing())
            return;
        // A real without a JSON form gives the empty handle, which is nothing to write.
        if (Value value = Cfg::JsonForm<T>::write(from.*member_))
            into.set(name_, std::move(value));
    }
    bool same(Record const& a, Record const& b) const { return a.*member_ == b.*member_; }

private:
    constexpr T missing() const {
        if constexpr (std::same_as<Missing, Zero>)
            return T{};
        else
            return missing_;
    }

    char const* name_;
    T Record::*member_;
    Missing missing_;
};

/// A row for the text that identifies the record: anything but a string throws Exc, and it is always written.
template<typename Record>
class Required {
public:
    constexpr Required(char const* name, std::string Record::*member) : name_(name), member_(member) {}

    void read(Object const& from, Record& into) const { into.*member_ = from.get(name_).toString(); }
    void write(Record const& from, Object& into) const { into.set(name_, from.*member_); }
    bool same(Record const& a, Record const& b) const { return a.*member_ == b.*member_; }

private:
    char const* name_;
    std::string Record::*member_;
};

/// Fills the members of `into` row by row, so a failure is that of the first bad row.
template<typename Record, typename... Rows>
void readKeys(std::tuple<Rows...> const& table, Object const& from, Record& into) {
    std::apply([&](auto const&... rows) { (rows.read(from, into), ...); }, table);
}

/// Sets the members that differ from their defaults in `into`, in the order of the rows.
template<typename Record, typename... Rows>
void writeKeys(std::tuple<Rows...> const& table, Record const& from, Object& into) {
    std::apply([&](auto const&... rows) { (rows.write(from, into), ...); }, table);
}

/// Whether two records agree in every member of the table.
template<typename Record, typename... Rows>
bool sameKeys(std::tuple<Rows...> const& table, Record const& a, Record const& b) {
    return std::apply([&](auto const&... rows) { return (rows.same(a, b) && ...); }, table);
}

} // namespace json
