#pragma once
// How a type stands in JSON: the trait by which the keys of records, settings fields and list elements are
// read, written and described.

#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"

#include <concepts>
#include <string>
#include <type_traits>
#include <vector>

namespace json {

/// The plain JSON form of a T. The general case is a record: a class with a constructor from json::Value or,
/// for classes whose form is always an object, from json::Object, with `serialize() const` and, to be
/// described, with a static `keys()`, or `describe()` when it is no record. Other forms are specialisations
/// with the same functions. `read` throws Exc on a wrong type; what it does with the empty handle is the
/// type's affair. A form that `fits` tests a node for is one that another type may stand for a missing key
/// of.
template<typename T>
struct Form {
    static T read(Value const& node) {
        if constexpr (std::constructible_from<T, Value const&>)
            return T(node);
        else
            return T(node.toObject());
    }
    static Value write(T const& value) { return value.serialize(); }
    static KeyForm describe() {
        if constexpr (requires { T::describe(); })
            return T::describe();
        else
            return {KeyType::Record, &T::keys()};
    }
};

template<>
struct Form<bool> {
    static bool fits(Value const& node) { return node.isTrue(); }
    static bool read(Value const& node) { return node.toBool(); }
    static Value write(bool value) { return value; }
    static KeyForm describe() { return {KeyType::Flag}; }
};

/// Integers are cut to the width of the member.
template<std::integral T>
struct Form<T> {
    static bool fits(Value const& node) { return node.isInt(); }
    static T read(Value const& node) { return static_cast<T>(node.toInt()); }
    static Value write(T value) { return value; }
    static KeyForm describe() {
        static_assert(sizeof(T) >= 4, "there is no type for numbers that are cut to fewer bits");
        if constexpr (sizeof(T) == 4)
            return {std::is_signed_v<T> ? KeyType::Int32 : KeyType::UInt32};
        else
            return {std::is_signed_v<T> ? KeyType::Int64 : KeyType::UInt64};
    }
};

/// Enumerations travel as their integers; no value is refused.
template<typename T>
requires std::is_enum_v<T>
struct Form<T> {
    using Integer = std::underlying_type_t<T>; ///< what it travels as
    static bool fits(Value const& node) { return node.isInt(); }
    static T read(Value const& node) { return static_cast<T>(static_cast<Integer>(node.toInt())); }
    // By way of 64 bits, since the smallest underlying types are character types.
    static Value write(T value) { return static_cast<long long>(value); }
    static KeyForm describe() { return Form<Integer>::describe(); }
};

/// An integer passes for a real.
template<>
struct Form<double> {
    static bool fits(Value const& node) { return node.isInt() || node.isReal(); }
    static double read(Value const& node) {
        return node.isInt() ? static_cast<double>(node.toInt()) : node.toReal();
    }
    static Value write(double value) { return value; }
    static KeyForm describe() { return {KeyType::Number}; }
};

/// Whatever stands there, shared with what it was read from.
template<>
struct Form<Value> {
    static Value read(Value const& node) { return node; }
    static Value write(Value const& value) { return value; }
    static KeyForm describe() { return {KeyType::Any}; }
};

template<>
struct Form<std::string> {
    static bool fits(Value const& node) { return node.isString(); }
    static std::string read(Value const& node) { return node.toString(); }
    static Value write(std::string const& value) { return value; }
    static KeyForm describe() { return {KeyType::Text}; }
};

/// The empty handle reads as no elements.
template<typename T>
struct Form<std::vector<T>> {
    static std::vector<T> read(Value const& node) {
        std::vector<T> elements;
        if (!node)
            return elements;
        Array const& array = node.toArray();
        elements.reserve(array.size());
        for (Value const& element : array)
            elements.push_back(Form<T>::read(element));
        return elements;
    }
    static Value write(std::vector<T> const& elements) {
        Array array;
        for (T const& element : elements)
            array.append(Form<T>::write(element));
        return array;
    }
    static KeyForm describe() {
        KeyForm const element = Form<T>::describe();
        return element.record ? KeyForm{KeyType::Records, element.record} : KeyForm{KeyType::Texts};
    }
};

} // namespace json
