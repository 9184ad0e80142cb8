#pragma once
// Numbers as people write them, for fields that take them as "1234.5": rewritten by what a preset says of
// them, and doubted where it says nothing.

#include "programs/reader/reading_rules.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extracted_field.h"

#include <string>
#include <vector>

namespace Reader {

/// What a text means as a number: one plain form such as "-1234.5", two when it is ambiguous, none when it is
/// no number.
std::vector<std::string> numberForms(std::string const& text, NumberRules const& rules);

/// Why a number that was read from the text as it stands may not be what the text says, as the end of a
/// sentence that begins with the text; empty when there is no doubt.
std::string doubtAbout(std::string const& text, json::Value const& number);

} // namespace Reader
