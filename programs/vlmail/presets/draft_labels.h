#pragma once
// Words that stand in front of values in letters, in six languages, and how such values look.

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>

namespace VlMail {

enum class DraftKind { Number, Date, Amount, Customer, Email };

/// What a draft makes of a kind of value.
struct DraftField {
    DraftKind kind;
    char const* name;
    char const* zone;
    /// Pattern of the value, for the group VAL.
    char const* value;
};

std::span<DraftField const> draftFields();

/// A label at the start of a line, and the value behind it.
struct LabelledValue {
    std::string label;
    std::string value;
};

/// Nothing when the line does not begin with a label of that kind, or has no such value behind it.
std::optional<LabelledValue> labelledValue(DraftField const& field, std::string_view line);

/// The extraction pattern for values of the kind behind that label.
std::string patternFor(DraftField const& field, std::string const& label);

} // namespace VlMail
