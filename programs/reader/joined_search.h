#pragma once
// The search for a field whose label and value stand apart: in lines of a zone that are read as one.

#include "programs/reader/trace.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extracted_field.h"

#include <functional>
#include <memory>

namespace Reader {

/// What a value is worth: a search goes on for a better one than a poor one.
enum class Worth { None, Poor, Good };
using Judge = std::function<Worth(Cfg::ExtractedField const&)>;

/// Tries the field's pattern on joined lines of the text, each join by itself. The first good value counts,
/// or else the first poor one; the lines that it was found in leave the text. Gives null, and adds nothing to
/// the trace but a failure, when there is none.
std::shared_ptr<Cfg::ExtractedField> cutJoinedField(Cfg::ExtractField const& field, ZoneText& text,
                                                    FieldTrace& trace, Judge const& judge);

} // namespace Reader
