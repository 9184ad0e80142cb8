#pragma once
// Rows for the tables of what client and service say to each other, beside those of json_record.h.
// What is asked is tested strictly, and refused with a line that names key and owner; what is answered is
// read as it comes.

#include "programs/base/error.h"
#include "programs/base/json_schema.h"
#include "vlservice/json/json_record.h"

#include <limits>
#include <string>
#include <vector>

namespace Protocol {

/// A row of an answer: always written, also where it holds its zero value. Another type reads as that.
template<typename Record, typename T>
class Always {
public:
    constexpr Always(char const* name, T Record::*member) : name_(name), member_(member) {}

    char const* name() const { return name_; }
    void read(json::Object const& from, Record& into) const {
        json::Value const node = from.get(name_);
        if constexpr (std::same_as<T, json::Object>)
            into.*member_ = node.isObject() ? node.toObject() : json::Object();
        else if constexpr (std::same_as<T, json::Array>)
            into.*member_ = node.isArray() ? node.toArray() : json::Array();
        else
            into.*member_ = json::passesFor<T>(node) ? json::Form<T>::read(node) : T{};
    }
    void write(Record const& from, json::Object& into) const {
        if constexpr (std::derived_from<T, json::Value>)
            into.set(name_, from.*member_);
        else
            into.set(name_, json::Form<T>::write(from.*member_));
    }
    bool same(Record const& a, Record const& b) const { return a.*member_ == b.*member_; }

private:
    char const* name_;
    T Record::*member_;
};

/// A row of a question: a key that may be missing, whose value has to be of one form. The record's IN_WORDS
/// names it in messages. `Form` has `fits(json::Value const&)`, `wanted()` for people and `schema()`.
template<typename Record, typename T, typename Form, typename Missing = json::Zero>
class Asked {
public:
    constexpr Asked(char const* name, T Record::*member, Form form, Missing missing = {})
        : name_(name), member_(member), form_(form), missing_(missing) {}

    char const* name() const { return name_; }
    void read(json::Object const& from, Record& into) const {
        json::Value const node = from.get(name_);
        into.*member_ = node ? checked(node) : missing();
    }
    void write(Record const& from, json::Object& into) const {
        if (from.*member_ != missing())
            into.set(name_, json::Form<T>::write(from.*member_));
    }
    bool same(Record const& a, Record const& b) const { return a.*member_ == b.*member_; }
    json::Object schema() const {
        if constexpr (std::same_as<Missing, json::Zero>)
            return form_.schema();
        else
            return Base::Schema::with(form_.schema(), "default", json::Form<T>::write(missing()));
    }

private:
    constexpr T missing() const {
        if constexpr (std::same_as<Missing, json::Zero>)
            return T{};
        else
            return missing_;
    }
    T checked(json::Value const& node) const {
        if (!form_.fits(node))
            throw Base::Error(Base::Code::RequestInvalid, '"' + std::string(name_) + "\" of " +
                                                              Record::IN_WORDS + " has to be " +
                                                              form_.wanted());
        return json::Form<T>::read(node);
    }

    char const* name_;
    T Record::*member_;
    Form form_;
    Missing missing_;
};

struct TextForm {
    static bool fits(json::Value const& node) { return node.isString(); }
    static std::string wanted() { return "a text"; }
    static json::Object schema() { return Base::Schema::text(); }
};

struct TextsForm {
    std::size_t most;

    bool fits(json::Value const& node) const {
        if (!node.isArray() || node.toArray().size() > most)
            return false;
        for (json::Value const& element : node.toArray())
            if (!element.isString())
                return false;
        return true;
    }
    std::string wanted() const { return "an array of at most " + std::to_string(most) + " texts"; }
    json::Object schema() const { return Base::Schema::listOfAtMost(Base::Schema::text(), most); }
};

struct FlagForm {
    static bool fits(json::Value const& node) { return json_is_boolean(node.node()); }
    static std::string wanted() { return "true or false"; }
    static json::Object schema() { return Base::Schema::flag(); }
};

/// An integer within bounds, which belong to it.
struct IntegerForm {
    long long lowest = 0;
    long long highest = std::numeric_limits<long long>::max();

    bool fits(json::Value const& node) const {
        return node.isInt() && node.toInt() >= lowest && node.toInt() <= highest;
    }
    std::string wanted() const {
        return highest == std::numeric_limits<long long>::max()
                   ? "an integer above " + std::to_string(lowest - 1)
                   : "an integer from " + std::to_string(lowest) + " to " + std::to_string(highest);
    }
    json::Object schema() const { return Base::Schema::integer(lowest, highest); }
};

/// Whether a row of the table has that key.
template<typename... Rows>
bool hasKey(std::tuple<Rows...> const& table, std::string const& key) {
    return std::apply([&](auto const&... rows) { return ((key == rows.name()) || ...); }, table);
}

/// Adds the keys of a table of questions.
template<typename... Rows>
void describeTable(std::tuple<Rows...> const& table, Base::Schema::Members& into) {
    std::apply([&](auto const&... rows) { (into.add(rows.name(), rows.schema()), ...); }, table);
}

/// The record that an object holds.
template<typename Record>
Record readRecord(json::Object const& from) {
    Record record;
    json::readKeys(Record::Keys::TABLE, from, record);
    return record;
}

/// The object of a record.
template<typename Record>
json::Object writeRecord(Record const& from) {
    json::Object into;
    json::writeKeys(Record::Keys::TABLE, from, into);
    return into;
}

} // namespace Protocol
