#pragma once
// What people read of a field.

#include "vlservice/extract/extracted_field.h"

#include <string>

namespace VlMail {

/// What the field is to the letter as an address; empty for an ordinary field.
std::string roleInWords(Cfg::ExtractedField const& field, bool isPrimary);

} // namespace VlMail
