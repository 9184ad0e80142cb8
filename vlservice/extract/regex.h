#pragma once
// Regular expressions over Unicode code points, in the two ways they are used here: to find fields in the
// text of a letter and to recognise documents by their names. Internal: the engine's headers are included by
// regex.cpp alone.

#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Cfg {

/// The groups of a match: pieces of the text that was matched, which must outlive this object.
class RegexGroups {
public:
    struct Results;

    explicit RegexGroups(std::unique_ptr<Results const> results);
    RegexGroups(RegexGroups&& other) noexcept;
    ~RegexGroups();

    /// Nothing when there is no group of that name or when it took no part in the match.
    std::optional<std::string_view> group(std::string_view name) const;

private:
    std::unique_ptr<Results const> results_;
};

/// A pattern for the text of a letter, in Perl syntax. "." crosses no line break; "^" and "$" match at each
/// one. Texts are UTF-8. Matching throws std::out_of_range where it meets an invalid sequence, and
/// std::runtime_error when the pattern is too complex for the text, or its time is up.
class FieldRegex {
public:
    /// The whole match, and one of its groups if it took part. Pieces of the text that was searched.
    struct Found {
        std::string_view whole;
        std::optional<std::string_view> group;
    };

    /// What search() gives beside the match is the group of that name. Throws boost::regex_error for a bad
    /// pattern and std::out_of_range for one that is not UTF-8.
    explicit FieldRegex(std::string_view pattern, std::string_view group = {});
    FieldRegex(FieldRegex const&) = delete;
    FieldRegex& operator=(FieldRegex const&) = delete;
    ~FieldRegex();

    /// The first place where the pattern fits.
    std::optional<Found> search(std::string_view text) const;
    /// The pattern over the whole text, with all groups.
    std::optional<RegexGroups> match(std::string_view text) const;

private:
    struct Compiled;
    std::unique_ptr<Compiled const> compiled_;
};

/// A pattern for the names of documents, in Perl syntax and without regard to case. "." fits any character at
/// all.
class NameRegex {
public:
    /// Throws boost::regex_error for a bad pattern and std::out_of_range for one that is not UTF-8.
    explicit NameRegex(std::string_view pattern);
    NameRegex(NameRegex const&) = delete;
    NameRegex& operator=(NameRegex const&) = delete;
    ~NameRegex();

    /// Whether the pattern fits the whole name. The name is decoded before it is matched: one that is not
    /// UTF-8 always throws std::out_of_range. Throws std::runtime_error when the pattern is too complex for
    /// the name, or its time is up.
    bool matches(std::string_view name) const;

private:
    struct Compiled;
    std::unique_ptr<Compiled const> compiled_;
};

} // namespace Cfg
