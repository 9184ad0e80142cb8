#pragma once
// What a near miss would change in the settings, for programs: {"of", "path", "value"} sets a key of the
// field, its zone or its presets, or leaves it out where there is no value; {"before"}, {"to_zone"} and
// {"own_zone", "page"} move the field.

#include "programs/reader/geometry.h"
#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlMail::Change {

constexpr char const* OF = "of";
constexpr char const* FIELD = "field";
constexpr char const* ZONE = "zone";
constexpr char const* PRESET = "preset";
constexpr char const* PACK_PRESET = "pack_preset";
constexpr char const* PATH = "path";
constexpr char const* VALUE = "value";
/// The name of a field of the same zone that is searched earlier.
constexpr char const* BEFORE = "before";
/// The name of another zone of the preset.
constexpr char const* TO_ZONE = "to_zone";
/// Where a zone for the field alone lies: {"location"} or {"most_probable_point"}.
constexpr char const* OWN_ZONE = "own_zone";
/// Of the letter, from 1.
constexpr char const* PAGE = "page";

json::Object setting(char const* of, std::vector<std::string> const& path, json::Value const& value = {});
/// The field with another pattern.
json::Object pattern(std::string const& pattern);
json::Object before(std::string const& field);
json::Object toZone(std::string const& zone);
json::Object toOwnZone(json::Object const& where);
json::Object toOwnZone(json::Object const& where, int page);

json::Object location(Reader::Box const& box);
json::Object point(Reader::Point point);

} // namespace VlMail::Change
