#pragma once
// The search for a field whose label and value stand apart: in lines of a zone that are read as one.

#include "programs/reader/trace.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extracted_field.h"

#include <functional>
#include <memory>

namespace Reader {

/// Whether a value is as it should be; a search goes on for a better one where it is not.
using IsGood = std::function<bool(Cfg::ExtractedField const&)>;

/// Tries the field's pattern on joined lines of the text, each join by itself. The first good value counts,
/// or else the first; the lines that it was found in leave the text. Gives null, and adds nothing to the
/// trace but a failure, when there is none.
std::shared_ptr<Cfg::ExtractedField> cutJoinedField(Cfg::ExtractField const& field, ZoneText& text,
                                                    FieldTrace& trace, IsGood const& isGood);

} // namespace Reader
