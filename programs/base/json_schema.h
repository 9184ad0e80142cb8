#pragma once
// What a JSON document may hold, as a JSON schema of draft 2020-12 says it: each call gives a schema.

#include "vlservice/json/json.h"

#include <cstddef>
#include <initializer_list>
#include <limits>
#include <string>

namespace Base::Schema {

/// What a document names its schema by, for editors.
inline constexpr char const* KEY = "$schema";
inline constexpr char const* DRAFT = "https://json-schema.org/draft/2020-12/schema";

/// Whatever there is.
json::Object anything();
json::Object text();
/// A text that fits the expression, which is anchored by itself where it is to be.
json::Object textLike(std::string const& expression);
json::Object textOfAtMost(std::size_t characters);
json::Object words(std::initializer_list<char const*> words);
json::Object flag();
json::Object number();
/// Bounds belong to it. A number with decimals is none, also where they are zeroes.
json::Object integer(long long least = std::numeric_limits<long long>::min(),
                     long long most = std::numeric_limits<long long>::max());
json::Object constant(json::Value value);
json::Object listOf(json::Object const& element);
json::Object listOfAtMost(json::Object const& element, std::size_t elements);
/// One of several, or several at once.
json::Object either(std::initializer_list<json::Object> schemas);
json::Object orNull(json::Object const& schema);
/// A definition of the same document.
json::Object definition(std::string const& name);

/// An object in the making.
class Members {
public:
    enum class Others { Taken, Refused };
    explicit Members(Others others = Others::Taken) : others_(others) {}

    Members& add(std::string const& key, json::Object const& schema);
    Members& require(std::string const& key, json::Object const& schema);
    /// A key that was added.
    Members& require(std::string const& key);
    /// A key that is of no use without the other.
    Members& needs(std::string const& key, std::string const& other);
    json::Object schema() const;

private:
    Others others_;
    json::Object members_;
    json::Array required_;
    json::Object dependent_;
};

/// An object whose keys are names of one kind.
json::Object mapOf(json::Object const& element);
/// The schema with more said of it: "default", "description".
json::Object with(json::Object schema, char const* key, json::Value value);
/// The object without the member.
json::Object without(json::Object const& object, char const* key);

} // namespace Base::Schema
