#pragma once
// Settings as the text that their writer sees: where each value stands in it, and changes that leave
// everything else as it was written.

#include "vlservice/json/json.h"

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace VlMail::Workbench {

/// Where a character stands as editors of a browser count: both from 0, in units of UTF-16.
struct Position {
    std::size_t line = 0;
    std::size_t column = 0;
};

/// What stands between two positions becomes `text`.
struct Edit {
    Position from;
    Position to;
    std::string text;
};

/// A value in a JSON text, with what is in it.
struct JsonPlace {
    /// Of the value, in bytes.
    std::size_t begin = 0;
    std::size_t end = 0;
    /// Of the key in front of it; that of the value where there is none.
    std::size_t keyBegin = 0;
    char kind = ' '; ///< '{', '[' or ' '
    /// Of an object with their keys, of an array with their numbers.
    std::vector<std::pair<std::string, JsonPlace>> members = {};
};

/// A text of settings and where its values stand. Throws Base::Error, with the place, for a text that is no
/// JSON object.
class SettingsText {
public:
    explicit SettingsText(std::string text);

    std::string const& text() const { return text_; }
    /// By a JSON pointer; the last of equal keys, as parsers have it. Nothing when it leads nowhere.
    JsonPlace const* find(std::string const& pointer) const;
    /// The nearest that there is above a pointer.
    JsonPlace const& nearest(std::string const& pointer) const;
    Position positionOf(std::size_t byte) const;

    /// Gives the value at the pointer another, or adds it, with the objects above it that are missing; "-"
    /// stands behind the last element of a list. Throws Base::Error.
    SettingsText with(std::string const& pointer, json::Value const& value) const;
    /// The element of a list comes to stand in front of what has that number now.
    SettingsText withInserted(std::string const& pointer, json::Value const& value) const;
    SettingsText without(std::string const& pointer) const;

private:
    SettingsText replaced(std::size_t begin, std::size_t end, std::string_view by) const;
    SettingsText withMember(JsonPlace const& parent, std::string const& key, json::Value const& value) const;
    std::string indentAt(std::size_t byte) const;
    std::string unit() const;
    bool isOnOneLine(JsonPlace const& place) const;

    std::string text_;
    JsonPlace root_;
    std::vector<std::size_t> lines_;
};

/// What has to be done to the first text to make it the second; nothing when they are the same.
std::vector<Edit> editsBetween(SettingsText const& before, std::string const& after);

/// Why a text is no JSON object, and where that shows.
struct BrokenText {
    std::string says;
    Position place;
};
std::optional<BrokenText> whatIsBroken(std::string const& text);

/// The steps of a JSON pointer.
std::vector<std::string> stepsOf(std::string const& pointer);

} // namespace VlMail::Workbench
