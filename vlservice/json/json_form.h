#pragma once
// How a type stands in JSON: the trait by which settings fields and list elements are read and written.

#include "vlservice/json/json.h"

#include <concepts>
#include <string>
#include <type_traits>
#include <vector>

namespace Cfg {

/// The plain JSON form of a T. The general case is a class with a constructor from json::Value or, for
/// classes whose form is always an object, from json::Object, and with `serialize() const`. Other forms are
/// specialisations with the same two functions. `read` throws json::Exc on a wrong type; what it does with
/// the empty handle is the type's affair.
template<typename T>
struct JsonForm {
    static T read(json::Value const& node) {
        if constexpr (std::constructible_from<T, json::Value const&>)
            return T(node);
        else
            return T(node.toObject());
    }
    static json::Value write(T const& value) { return value.serialize(); }
};

template<>
struct JsonForm<bool> {
    static bool read(json::Value const& node) { return node.toBool(); }
    static json::Value write(bool value) { return value; }
};

/// Integers are cut to the width of the member.
template<std::integral T>
struct JsonForm<T> {
    static T read(json::Value const& node) { return static_cast<T>(node.toInt()); }
    static json::Value write(T value) { return value; }
};

/// Enumerations travel as their integers; no value is refused.
template<typename T>
requires std::is_enum_v<T>
struct JsonForm<T> {
    using Integer = std::underlying_type_t<T>;
    static T read(json::Value const& node) { return static_cast<T>(static_cast<Integer>(node.toInt())); }
    // By way of 64 bits, since the smallest underlying types are character types.
    static json::Value write(T value) { return static_cast<long long>(value); }
};

/// An integer passes for a real.
template<>
struct JsonForm<double> {
    static double read(json::Value const& node) {
        return node.isInt() ? static_cast<double>(node.toInt()) : node.toReal();
    }
    static json::Value write(double value) { return value; }
};

/// Whatever stands there, shared with what it was read from.
template<>
struct JsonForm<json::Value> {
    static json::Value read(json::Value const& node) { return node; }
    static json::Value write(json::Value const& value) { return value; }
};

template<>
struct JsonForm<std::string> {
    static std::string read(json::Value const& node) { return node.toString(); }
    static json::Value write(std::string const& value) { return value; }
};

/// The empty handle reads as no elements.
template<typename T>
struct JsonForm<std::vector<T>> {
    static std::vector<T> read(json::Value const& node) {
        std::vector<T> elements;
        if (!node)
            return elements;
        json::Array const& array = node.toArray();
        elements.reserve(array.size());
        for (json::Value const& element : array)
            elements.push_back(JsonForm<T>::read(element));
        return elements;
    }
    static json::Value write(std::vector<T> const& elements) {
        json::Array array;
        for (T const& element : elements)
            array.append(JsonForm<T>::write(element));
        return array;
    }
};

} // namespace Cfg
