#pragma once
// JSON as text: parsing and compact printing.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <cstddef>
#include <iosfwd>
#include <string>

namespace json {

/// Parses text of that length; it needs no terminator. Throws Exc with "JSON error: ", the parser's words,
/// line and column when it is bad or no object.
VLSERVICE_EXPORT Object strToObject(char const* text, std::size_t length);

/// Print compact text: no blank outside strings, keys in insertion order, reals in a form that reads back as
/// the same real, whatever the locale. Throw Exc for the empty handle and for keys and strings that are not
/// valid UTF-8.
VLSERVICE_EXPORT std::ostream& operator<<(std::ostream& out, Object const& object);
VLSERVICE_EXPORT std::ostream& operator<<(std::ostream& out, Array const& array);

/// The form for people: "#absent#" for the empty handle, a string in double quotes as it stands, numbers in
/// the default format of a stream with the classic locale, objects and arrays as above.
VLSERVICE_EXPORT std::ostream& operator<<(std::ostream& out, Value const& value);

/// Any value as compact JSON text; the empty text for the empty handle. Throws Exc as the operators above do.
VLSERVICE_EXPORT std::string toText(Value const& value);

} // namespace json
