#include "programs/base/json_schema.h"

#include <string_view>
#include <utility>

namespace Base::Schema {
namespace {

json::Object ofType(char const* type) { return {{"type", type}}; }

} // namespace

json::Object anything() { return {}; }
json::Object text() { return ofType("string"); }
json::Object textLike(std::string const& expression) { return with(text(), "pattern", expression); }
json::Object textOfAtMost(std::size_t characters) { return with(text(), "maxLength", characters); }

json::Object words(std::initializer_list<char const*> words) {
    json::Array all;
    for (char const* word : words)
        all.append(word);
    return {{"enum", all}};
}

json::Object flag() { return ofType("boolean"); }
json::Object number() { return ofType("number"); }

json::Object integer(long long least, long long most) {
    return {{"type", "integer"}, {"minimum", least}, {"maximum", most}};
}

json::Object constant(json::Value value) { return {{"const", std::move(value)}}; }

json::Object listOf(json::Object const& element) { return {{"type", "array"}, {"items", element}}; }

json::Object listOfAtMost(json::Object const& element, std::size_t elements) {
    return with(listOf(element), "maxItems", elements);
}

json::Object either(std::initializer_list<json::Object> schemas) {
    json::Array all;
    for (json::Object const& schema : schemas)
        all.append(schema);
    return {{"anyOf", all}};
}

json::Object orNull(json::Object const& schema) { return either({schema, ofType("null")}); }

json::Object definition(std::string const& name) { return {{"$ref", "#/$defs/" + name}}; }

Members& Members::add(std::string const& key, json::Object const& schema) {
    members_.set(key, schema);
    return *this;
}

Members& Members::require(std::string const& key, json::Object const& schema) {
    return add(key, schema).require(key);
}

Members& Members::require(std::string const& key) {
    required_.append(key);
    return *this;
}

Members& Members::needs(std::string const& key, std::string const& other) {
    json::Array others;
    others.append(other);
    dependent_.set(key, others);
    return *this;
}

json::Object Members::schema() const {
    json::Object schema{{"type", "object"}, {"properties", members_}};
    if (!required_.empty())
        schema.set("required", required_);
    if (!dependent_.empty())
        schema.set("dependentRequired", dependent_);
    if (others_ == Others::Refused)
        schema.set("additionalProperties", false);
    return schema;
}

json::Object mapOf(json::Object const& element) {
    return {{"type", "object"}, {"additionalProperties", element}};
}

json::Object with(json::Object schema, char const* key, json::Value value) {
    schema.set(key, std::move(value));
    return schema;
}

json::Object without(json::Object const& object, char const* key) {
    json::Object less;
    for (auto const& [name, value] : object)
        if (name != std::string_view(key))
            less.set(name, value);
    return less;
}

} // namespace Base::Schema
