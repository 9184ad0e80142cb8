#pragma once
// Why a field's validator refuses a text, in words.

#include "vlservice/extract/extract_field.h"

#include <optional>
#include <string>

namespace VlMail {

struct Refusal {
    enum class Reason {
        Pattern,      ///< the text does not fit
        NoDate,       ///< it fits, but there is no such month or hour
        BelowMinimum, ///< it is read, but the value is too small or too early
        AboveMaximum,
    };

    Reason reason;
    /// Such as "12.30 is above the maximum 10".
    std::string says;
    /// Of what is beyond a limit: the value, as the limit is written.
    json::Value value = {};
};

/// Nothing when the validator takes the text, or cannot be tried on it: its pattern is bad or takes too long.
std::optional<Refusal> refusalOf(Cfg::ExtractField const& field, std::string const& text);

/// The kind of a field's values in words: "text", "integer", "number", "date".
char const* typeInWords(Cfg::ExtractField const& field);

} // namespace VlMail
