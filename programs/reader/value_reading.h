#pragma once
// From the text of a field to its value.

#include "programs/reader/reading_rules.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extracted_field.h"

#include <string>

namespace Reader {

/// Validates a value that was found, after its text was rewritten as the rules say of numbers and dates; an
/// invalid one keeps the text as it was found. Gives what a person should know of it, one line, or nothing.
/// Throws what ExtractField::validate() does.
std::string readValue(Cfg::ExtractField const& field, Cfg::ExtractedField& value, ReadingRules const& rules);

} // namespace Reader
