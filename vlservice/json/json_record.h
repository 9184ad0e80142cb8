#pragma once
// Records as tables: each row binds a JSON key to a member and to the value that stands for a missing key.
// The one reader, the one writer and the one description below walk the rows in wire order, so a new key is a
// new row.
//
//     struct Person::Keys {
//         static constexpr std::tuple TABLE{
//             json::Required{"name", &Person::name_},
//             json::Key{"colour", &Person::colour_, Colour::Red},
//             json::Key{"age", &Person::age_},
//             json::Dropped{"id"},
//         };
//     };

#include "vlservice/json/json.h"
#include "vlservice/json/json_form.h"
#include "vlservice/json/json_text.h"
#include "vlservice/json/record_keys.h"

#include <concepts>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

namespace json {

/// Whether a missing key's default may stand for a value of another type.
template<typename T>
concept Lenient = requires(Value const& node) {
    { Form<T>::fits(node) } -> std::same_as<bool>;
};

/// Whether a node is read where a T is wanted; anything else stands for a missing key.
template<typename T>
bool passesFor(Value const& node) {
    if constexpr (Lenient<T>)
        return Form<T>::fits(node);
    else
        return static_cast<bool>(node);
}

/// The default of a row that names none: the member's zero value.
struct Zero {};

/// A row for a key that may be missing. A T stands there in its Form; a member that equals the default is not
/// written. What is of another type reads as the default where the form is Lenient, and is refused otherwise.
template<typename Record, typename T, typename Missing = Zero>
class Key {
public:
    constexpr Key(char const* name, T Record::*member, Missing missing = {})
        : name_(name), member_(member), missing_(missing) {}

    // Rows with a rule of their own.

    /// Another type is refused although the form is lenient.
    constexpr Key checked() const { return with(&Key::isChecked_); }
    constexpr Key alwaysWritten() const { return with(&Key::isAlwaysWritten_); }
    /// A record that keeps keys it does not know keeps this one among them too.
    constexpr Key notClaimed() const { return with(&Key::isNotClaimed_); }
    /// What stands there is read by this function.
    constexpr Key readBy(T (*reader)(Value const&)) const {
        Key row = *this;
        row.read_ = reader;
        return row;
    }

    void read(Object const& from, Record& into) const {
        Value const node = from.get(name_);
        into.*member_ = stands(node) ? read_(node) : missing();
    }
    void write(Record const& from, Object& into) const {
        if (!isAlwaysWritten_ && from.*member_ == missing())
            return;
        // A real without a JSON form gives the empty handle, which is nothing to write.
        if (Value value = Form<T>::write(from.*member_))
            into.set(name_, std::move(value));
    }
    bool same(Record const& a, Record const& b) const {
        if constexpr (requires { Form<T>::same(a.*member_, b.*member_); })
            return Form<T>::same(a.*member_, b.*member_);
        else
            return a.*member_ == b.*member_;
    }
    bool claims(std::string_view key) const { return !isNotClaimed_ && key == name_; }
    KeyRow describe() const {
        KeyUse const use = Lenient<T> && !isChecked_ ? KeyUse::Lenient : KeyUse::Checked;
        return {name_, Form<T>::describe(), use, toText(Form<T>::write(missing()))};
    }

private:
    constexpr Key with(bool Key::*rule) const {
        Key row = *this;
        row.*rule = true;
        return row;
    }
    static constexpr auto formsReader() -> T (*)(Value const&) {
        if constexpr (requires { &Form<T>::read; })
            return &Form<T>::read;
        else
            return nullptr;
    }
    bool stands(Value const& node) const { return isChecked_ ? static_cast<bool>(node) : passesFor<T>(node); }
    constexpr T missing() const {
        if constexpr (std::same_as<Missing, Zero>)
            return T{};
        else
            return missing_;
    }

    char const* name_;
    T Record::*member_;
    Missing missing_;
    T (*read_)(Value const&) = formsReader();
    bool isChecked_ = false;
    bool isAlwaysWritten_ = false;
    bool isNotClaimed_ = false;
};

/// A row for what the record cannot be without, a text or a list: a missing key throws Exc as another type
/// does, and it is always written.
template<typename Record, typename T>
class Required {
public:
    constexpr Required(char const* name, T Record::*member) : name_(name), member_(member) {}

    void read(Object const& from, Record& into) const {
        Value const node = from.get(name_);
        if constexpr (!std::same_as<T, std::string>)
            node.toArray();
        into.*member_ = Form<T>::read(node);
    }
    void write(Record const& from, Object& into) const { into.set(name_, Form<T>::write(from.*member_)); }
    bool same(Record const& a, Record const& b) const { return a.*member_ == b.*member_; }
    bool claims(std::string_view key) const { return key == name_; }
    KeyRow describe() const { return {name_, Form<T>::describe(), KeyUse::Required}; }

private:
    char const* name_;
    T Record::*member_;
};

/// A row for a key of other programs: it is not read, and not kept among keys that the record does not know.
class Dropped {
public:
    constexpr explicit Dropped(char const* name) : name_(name) {}

    template<typename Record>
    void read(Object const&, Record&) const {}
    template<typename Record>
    void write(Record const&, Object&) const {}
    template<typename Record>
    bool same(Record const&, Record const&) const {
        return true;
    }
    bool claims(std::string_view key) const { return key == name_; }
    KeyRow describe() const { return {name_, {KeyType::Any}, KeyUse::Dropped}; }

private:
    char const* name_;
};

/// A row for a key that is read and written by hand: it describes the key and no more.
class Named {
public:
    /// `missing` as in KeyRow.
    constexpr Named(char const* name, KeyType type, char const* missing = "")
        : name_(name), type_(type), missing_(missing) {}

    KeyRow describe() const { return {name_, {type_}, KeyUse::Lenient, missing_}; }

private:
    char const* name_;
    KeyType type_;
    char const* missing_;
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

/// Whether the key is one of the table's own, and so none of those that the record does not know.
template<typename... Rows>
bool claimsKey(std::tuple<Rows...> const& table, std::string_view key) {
    return std::apply([&](auto const&... rows) { return (rows.claims(key) || ...); }, table);
}

/// The rows of several tables, one behind the other.
template<typename... Tables>
std::vector<KeyRow> describeKeys(Tables const&... tables) {
    std::vector<KeyRow> described;
    std::apply([&](auto const&... rows) { (described.push_back(rows.describe()), ...); },
               std::tuple_cat(tables...));
    return described;
}

} // namespace json
