#pragma once
// The kinds of near misses, one function each. They find nothing when their kind is not the cause.

#include "programs/vlmail/explain/near_miss_search.h"

#include <optional>

namespace VlMail::NearMisses {

// Of a field that was not found: the pattern or the writing of the text (near_miss_pattern.cpp).

std::optional<Found> failure(Search const& search);
std::optional<Found> valueGroup(Search const& search);
std::optional<Found> earlierField(Search const& search);
std::optional<Found> letterCase(Search const& search);
std::optional<Found> normalisation(Search const& search);
std::optional<Found> lookAlike(Search const& search);
std::optional<Found> blanks(Search const& search);
std::optional<Found> joinedLines(Search const& search);
std::optional<Found> anchor(Search const& search);
std::optional<Found> literal(Search const& search);
std::optional<Found> rest(Search const& search);

// The place of the text (near_miss_place.cpp).

std::optional<Found> noText(Search const& search);
std::optional<Found> gaps(Search const& search);
std::optional<Found> lineDistance(Search const& search);
std::optional<Found> zone(Search const& search);
std::optional<Found> block(Search const& search);
std::optional<Found> otherZone(Search const& search);
std::optional<Found> otherPage(Search const& search);
std::optional<Found> elsewhere(Search const& search);

// Of a field whose value was refused (near_miss_value.cpp).

std::optional<Found> limit(Search const& search);
std::optional<Found> validationPattern(Search const& search);
std::optional<Found> width(Search const& search);

} // namespace VlMail::NearMisses
