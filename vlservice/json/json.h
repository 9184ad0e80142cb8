#pragma once
// Handles over jansson nodes with typed access that fails loudly and copy on write for changes.
// Parsing and printing text is in json_text.h.

#include "vlservice/export.h"

#include <jansson.h>

#include <concepts>
#include <cstddef>
#include <initializer_list>
#include <iterator>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

namespace json {

class Array;
class Object;

/// The one failure of the JSON layer, whose texts begin with "JSON error: "; users of the layer have texts of
/// their own.
class VLSERVICE_EXPORT Exc : public std::runtime_error {
public:
    Exc(std::string const& message) : std::runtime_error(message) {} ///< the text as it stands
};

namespace detail {
template<typename T>
concept Character = std::same_as<T, char> || std::same_as<T, signed char> || std::same_as<T, unsigned char> ||
    std::same_as<T, wchar_t> || std::same_as<T, char8_t> || std::same_as<T, char16_t> ||
    std::same_as<T, char32_t>;
template<typename T>
concept Integer = std::integral<T> && !std::same_as<T, bool> && !Character<T>;
} // namespace detail

/// A reference to a JSON node, or the empty handle: a key that is not there, or nothing to write.
/// A handle and all its copies belong to one thread.
class Value {
public:
    Value() noexcept = default;
    /// Takes over the reference that the caller holds; null gives the empty handle.
    explicit Value(json_t* node) noexcept : node_(node) {}
    // A template, so that a raw pointer does not become a boolean.
    template<std::same_as<bool> T>
    Value(T flag) : node_(flag ? json_true() : json_false()) {}
    /// Any width and sign, as the 64-bit integer of the same bits.
    template<detail::Integer T>
    Value(T number) : node_(json_integer(static_cast<json_int_t>(number))) {}
    /// NaN and the infinities give the empty handle.
    template<std::floating_point T>
    Value(T number) : node_(json_real(static_cast<double>(number))) {}
    /// A null pointer gives the empty handle. The bytes are not tested for UTF-8.
    Value(char const* text) : node_(json_string_nocheck(text)) {}
    Value(std::string const& text) : node_(json_string_nocheck(text.c_str())) {}

    Value(Value const& other) noexcept : node_(json_incref(other.node_)) {}
    Value(Value&& other) noexcept : node_(std::exchange(other.node_, nullptr)) {}
    ~Value() { json_decref(node_); }

    Value& operator=(Value const& other) noexcept {
        if (node_ != other.node_) {
            json_decref(node_);
            node_ = json_incref(other.node_);
        }
        return *this;
    }
    Value& operator=(Value&& other) noexcept {
        if (node_ != other.node_) {
            json_decref(node_);
            node_ = std::exchange(other.node_, nullptr);
        }
        return *this;
    }

    /// The raw node, borrowed; null for the empty handle.
    json_t* node() const noexcept { return node_; }
    /// True when the handle holds a node, whatever its type.
    explicit operator bool() const noexcept { return node_ != nullptr; }

    bool isObject() const noexcept { return json_is_object(node_); } ///< false for the empty handle
    bool isArray() const noexcept { return json_is_array(node_); }   ///< false for the empty handle
    bool isString() const noexcept { return json_is_string(node_); } ///< false for the empty handle
    bool isInt() const noexcept { return json_is_integer(node_); }   ///< false for the empty handle
    bool isReal() const noexcept { return json_is_real(node_); }     ///< an integer is none
    bool isTrue() const noexcept { return json_is_true(node_); }     ///< the value true, and no other

    /// The type as messages name it; "empty" for the empty handle.
    char const* typeName() const noexcept {
        if (!node_)
            return "empty";
        switch (json_typeof(node_)) {
        case JSON_OBJECT:
            return "object";
        case JSON_ARRAY:
            return "array";
        case JSON_STRING:
            return "string";
        case JSON_INTEGER:
            return "integer";
        case JSON_REAL:
            return "float";
        case JSON_TRUE:
        case JSON_FALSE:
            return "boolean";
        case JSON_NULL:
            return "null";
        }
        return "unknown";
    }

    // Checked reading. Each throws Exc "JSON error: Wrong type: <actual>. Expected type: <wanted>".

    /// The same handle, seen as an object; by value on a temporary.
    inline Object const& toObject() const&;
    inline Object toObject() &&;
    inline Object toObject() const&&;
    /// The same handle, seen as an array; by value on a temporary.
    inline Array const& toArray() const&;
    inline Array toArray() &&;
    inline Array toArray() const&&;
    /// Points into the node and is valid as long as the node lives.
    char const* toString() const {
        require(isString(), "string");
        return json_string_value(node_);
    }
    long long toInt() const {
        require(isInt(), "integer");
        return json_integer_value(node_);
    }
    bool toBool() const {
        require(json_is_boolean(node_), "boolean");
        return json_is_true(node_);
    }
    /// Refuses an integer: callers that take both test the type first.
    double toReal() const {
        require(isReal(), "float");
        return json_real_value(node_);
    }

    // Lenient reading, for keys that have a default: anything of another type reads as that default.

    /// The integer, or 0.
    long long intOrZero() const noexcept { return json_integer_value(node_); }
    /// The integer or real as a real, or 0.
    double numberOrZero() const noexcept { return json_number_value(node_); }
    /// The text, or the empty text.
    std::string textOrEmpty() const {
        char const* const text = json_string_value(node_);
        return text ? std::string(text) : std::string();
    }

    /// Two empty handles are equal; an empty handle equals no node, not even JSON null.
    friend bool operator==(Value const& a, Value const& b) noexcept {
        return a.node_ && b.node_ ? json_equal(a.node_, b.node_) != 0 : a.node_ == b.node_;
    }

protected:
    /// Before a change: other handles of a shared node keep the former contents.
    void makeUnique() {
        if (node_ && node_->refcount > 1) {
            json_t* const copy = json_copy(node_);
            json_decref(node_);
            node_ = copy;
        }
    }

    json_t* node_ = nullptr; ///< a reference of its own, or null

private:
    void require(bool isWanted, char const* wanted) const {
        if (!isWanted)
            throw Exc(std::string("JSON error: Wrong type: ") + typeName() + ". Expected type: " + wanted);
    }
};

/// An object's handle. Default construction makes a new empty object.
class Object : public Value {
public:
    class Iterator;

    Object() : Value(json_object()) {}
    Object(std::initializer_list<std::pair<char const*, Value>> members) : Object() {
        for (auto const& [key, value] : members)
            set(key, value);
    }

    /// The member, or the empty handle when there is none.
    Value get(char const* key) const noexcept { return Value(json_incref(json_object_get(node_, key))); }
    Value get(std::string const& key) const noexcept { return get(key.c_str()); }

    /// Adds or replaces a member. An object set into itself stores its former contents.
    /// Throws Exc when the value is the empty handle.
    void set(char const* key, Value value) {
        makeUnique();
        if (json_object_set_new_nocheck(node_, key, json_incref(value.node())) != 0) {
            throw Exc(std::string("JSON error: object element can not be set. Key: ") + (key ? key : "") +
                      ". New value type: " + value.typeName());
        }
    }
    void set(std::string const& key, Value value) { set(key.c_str(), std::move(value)); }

    std::size_t size() const noexcept { return json_object_size(node_); }
    bool empty() const noexcept { return size() == 0; }

    /// Steps over (key, value) pairs in insertion order, as the object was when the iteration began.
    inline Iterator begin() const;
    inline Iterator end() const noexcept;

private:
    friend class Value;
    explicit Object(Value const& object) noexcept : Value(object) {}
    explicit Object(Value&& object) noexcept : Value(std::move(object)) {}
};

/// An array's handle. Default construction makes a new empty array.
class Array : public Value {
public:
    class Iterator;

    Array() : Value(json_array()) {}

    /// The element, or the empty handle when there is none.
    Value at(std::size_t index) const noexcept { return Value(json_incref(json_array_get(node_, index))); }

    /// Throws Exc when the value is the empty handle.
    void append(Value value) {
        makeUnique();
        if (json_array_append_new(node_, json_incref(value.node())) != 0) {
            throw Exc("JSON error: array element can not be appended. Size: " + std::to_string(size()) +
                      ". New value type: " + value.typeName());
        }
    }

    std::size_t size() const noexcept { return json_array_size(node_); }
    bool empty() const noexcept { return size() == 0; }

    /// Steps over the elements as they were when the iteration began.
    inline Iterator begin() const;
    inline Iterator end() const noexcept;

private:
    friend class Value;
    explicit Array(Value const& array) noexcept : Value(array) {}
    explicit Array(Value&& array) noexcept : Value(std::move(array)) {}
};

/// Holds a reference to the node, so that a change during the iteration goes to a copy.
class Object::Iterator {
public:
    using iterator_category = std::input_iterator_tag;
    using value_type = std::pair<char const*, Value>;
    using difference_type = std::ptrdiff_t;
    using reference = value_type;
    using pointer = void;

    Iterator() noexcept = default;
    explicit Iterator(Value object) noexcept
        : object_(std::move(object)), at_(json_object_iter(object_.node())) {}

    value_type operator*() const {
        return {json_object_iter_key(at_), Value(json_incref(json_object_iter_value(at_)))};
    }
    Iterator& operator++() noexcept {
        at_ = json_object_iter_next(object_.node(), at_);
        return *this;
    }
    Iterator operator++(int) noexcept {
        Iterator const before = *this;
        ++*this;
        return before;
    }
    friend bool operator==(Iterator const& a, Iterator const& b) noexcept { return a.at_ == b.at_; }

private:
    Value object_;
    void* at_ = nullptr;
};

/// Holds a reference to the node, so that a change during the iteration goes to a copy.
class Array::Iterator {
public:
    using iterator_category = std::input_iterator_tag;
    using value_type = Value;
    using difference_type = std::ptrdiff_t;
    using reference = Value;
    using pointer = void;

    Iterator() noexcept = default;
    explicit Iterator(Value array) noexcept : array_(std::move(array)) {}

    Value operator*() const noexcept { return Value(json_incref(json_array_get(array_.node(), index_))); }
    Iterator& operator++() noexcept {
        ++index_;
        return *this;
    }
    Iterator operator++(int) noexcept {
        Iterator const before = *this;
        ++*this;
        return before;
    }
    /// Positions are compared by what they stand on: every exhausted iterator is the end.
    friend bool operator==(Iterator const& a, Iterator const& b) noexcept {
        return a.exhausted() || b.exhausted() ? a.exhausted() == b.exhausted() : a.index_ == b.index_;
    }

private:
    bool exhausted() const noexcept { return index_ >= json_array_size(array_.node()); }

    Value array_;
    std::size_t index_ = 0;
};

inline Object::Iterator Object::begin() const { return Iterator(*this); }
inline Object::Iterator Object::end() const noexcept { return {}; }
inline Array::Iterator Array::begin() const { return Iterator(*this); }
inline Array::Iterator Array::end() const noexcept { return {}; }

inline Object const& Value::toObject() const& {
    require(isObject(), "object");
    return static_cast<Object const&>(*this);
}
inline Object Value::toObject() && {
    require(isObject(), "object");
    return Object(std::move(*this));
}
inline Object Value::toObject() const&& {
    require(isObject(), "object");
    return Object(*this);
}
inline Array const& Value::toArray() const& {
    require(isArray(), "array");
    return static_cast<Array const&>(*this);
}
inline Array Value::toArray() && {
    require(isArray(), "array");
    return Array(std::move(*this));
}
inline Array Value::toArray() const&& {
    require(isArray(), "array");
    return Array(*this);
}

} // namespace json
