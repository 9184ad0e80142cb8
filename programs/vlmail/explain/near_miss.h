#pragma once
// Why a field was not found, or found and refused: what would have to be different on the page or in the
// settings. Every answer was tried: the field's pattern, on text as reading makes it.

#include "programs/reader/field_search.h"
#include "programs/reader/letters.h"
#include "programs/vlmail/explain/read_pages.h"
#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlMail {

/// In the order in which they are told, the likeliest first; docs/explain.md has a table of them.
enum class NearMissKind {
    NoText,
    Failure,
    ValueGroup,
    EarlierField,
    Limit,
    LetterCase,
    Normalisation,
    LookAlike,
    Blanks,
    Gaps,
    JoinedLines,
    Anchor,
    LineDistance,
    Zone,
    Block,
    ValidationPattern,
    Width,
    OtherZone,
    OtherPage,
    Elsewhere,
    Rest,
    Literal,
};

/// As it stands in JSON, such as "letter_case".
char const* nameOf(NearMissKind kind);

struct NearMiss {
    NearMissKind kind;
    /// What is different and what to do, as a clause.
    std::string says;
    /// The text in question and where it stands; page 0 when it stands nowhere.
    std::string text;
    int page = 0;
    Reader::Box box;
    /// What it would change in the settings; the empty handle when that cannot be told.
    json::Value change = {};
};

/// A field that a letter lacks or has an invalid value of, with the search for it.
struct MissedField {
    Cfg::ExtractPreset const& preset;
    Reader::ReadingRules const& rules;
    Reader::ZoneTrace const& zone;
    /// One of the zone's.
    Reader::FieldTrace const& field;
    /// The letter's first page.
    int firstPage = 0;
    /// Those of the letter on which it was not searched, and the one that the preset skips.
    std::vector<int> otherPages;

    /// Where it was searched; 0 when the letter has no such page.
    int page() const { return zone.place.page; }
    int lastPage() const;
    /// Null for a zone that nothing is said about.
    Reader::ZoneRules const* rulesFor(Cfg::ExtractZone const& one) const { return rules.forZone(one.name()); }
    /// Whether that zone of the preset may lie on the page.
    bool mayLieOn(int number, Cfg::ExtractZone const& one) const;
};

/// At most three, the likeliest first; those that would give a valid value stand in front of those that would
/// not. What the library says about patterns that fail meanwhile is not logged. Ends in `time`; when that is
/// up before, it is the only thing that is told.
std::vector<NearMiss> nearMissesOf(MissedField const& missed, ReadPages& pages, Reader::PatternTime& time);

} // namespace VlMail
