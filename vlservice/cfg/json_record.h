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

#include "vlservice/cfg/json.h"

#include <concepts>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

namespace json {

/// How a member of type T stands under its key. Reading is lenient: another JSON type reads as a missing key.
/// Types with a form of their own specialise this with the same two functions.
template<typename T>
struct Form;

template<>
struct Form<bool> {
    /// Only JSON true sets a flag.
    static bool read(Value const& value, bool) { return value.isTrue(); }
    static Value write(bool flag) { return flag; }
};

/// Integers are cut to the member's width.
template<detail::Integer T>
struct Form<T> {
    static T read(Value const& value, T missing) {
        return value.isInt() ? static_cast<T>(value.toInt()) : missing;
    }
    static Value write(T number) { return number; }
};

/// Enumerations travel as plain numbers; a number without a name is kept.
template<typename T>
requires std::is_enum_v<T>
struct Form<T> {
    static T read(Value const& value, T missing) {
        return value.isInt() ? static_cast<T>(static_cast<std::underlying_type_t<T>>(value.toInt()))
                             : missing;
    }
    static Value write(T number) { return static_cast<long long>(number); }
};

template<>
struct Form<double> {
    /// An integer passes for a real.
    static double read(Value const& value, double missing) {
        return value.isInt() || value.isReal() ? value.numberOrZero() : missing;
    }
    static Value write(double number) { return number; }
};

template<>
struct Form<std::string> {
    static std::string read(Value const& value, std::string missing) {
        return value.isString() ? std::string(value.toString()) : std::move(missing);
    }
    static Value write(std::string const& text) { return text; }
};

/// Whatever stands there, shared with the object it was read from.
template<>
struct Form<Value> {
    static Value read(Value const& value, Value const&) { return value; }
    static Value write(Value const& value) { return value; }
};

/// The default of a row that names none: the member's zero value.
struct Zero {};

/// A row for a key that may be missing; a member that equals the default is not written.
template<typename Record, typename T, typename Missing = Zero>
class Key {
public:
    constexpr Key(char const* name, T Record::*member, Missing missing = {})
        : name_(name), member_(member), missing_(missing) {}

    void read(Object const& from, Record& into) const {
        into.*member_ = Form<T>::read(from.get(name_), missing());
    }
    void write(Record const& from, Object& into) const {
        if (from.*member_ == missing())
            return;
        // A real without a JSON form gives the empty handle, which is nothing to write.
        if (Value value = Form<T>::write(from.*member_))
            into.set(name_, std::move(value));
    }

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

/// A list of records, each built from its element; a missing key gives none.
/// Throws Exc when the value is no array, and whatever an element's constructor throws.
template<typename T>
std::vector<T> readList(Value const& value) {
    std::vector<T> list;
    if (!value)
        return list;
    Array const& array = value.toArray();
    list.reserve(array.size());
    for (Value const& element : array)
        list.emplace_back(element);
    return list;
}

/// The records in their JSON form, in list order.
template<typename T>
Array writeList(std::vector<T> const& list) {
    Array array;
    for (T const& element : list)
        array.append(element.serialize());
    return array;
}

} // namespace json
