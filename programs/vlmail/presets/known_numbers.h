#pragma once
// Numbers of settings that have a meaning here, where all others are kept without one.

namespace VlMail {

struct KnownNumbers {
    char const* key;
    long long least;
    long long most;
    /// What comes of another one.
    char const* otherwise;
};

inline constexpr KnownNumbers EXTRACT_PRESET_NUMBERS[] = {
    {"type", 0, 1, "the preset is neither for letters nor for attachments"},
};
inline constexpr KnownNumbers FIELD_NUMBERS[] = {
    {"value_type", 0, 3, "the value is taken for a text"},
    {"ignore_on_group", -1, 6,
     "letters with other values are grouped, or not, without a value being kept for them"},
};

} // namespace VlMail
