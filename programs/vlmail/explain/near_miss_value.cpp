// What keeps a value that was found from being taken.
#include "programs/vlmail/explain/near_miss_change.h"
#include "programs/vlmail/explain/near_miss_kinds.h"
#include "programs/vlmail/explain/refusal.h"
#include "programs/vlmail/explain/words.h"

namespace VlMail::NearMisses {

using Reader::Stretch;
using Words::millimetres;

namespace {

std::optional<Refusal> refusalIn(Search const& search) {
    std::optional<std::string> const& text = search.trace().rawText;
    return text ? refusalOf(search.field(), *text) : std::nullopt;
}

bool isOfLimit(Refusal const& refusal) {
    return refusal.reason == Refusal::Reason::AboveMaximum || refusal.reason == Refusal::Reason::BelowMinimum;
}

Found certain(Search const& search, std::string says) {
    Stretch const match = search.trace().match.value_or(Stretch());
    return {std::move(says), match.text, search.pageNumber(), match.box, true};
}

} // namespace

std::optional<Found> limit(Search const& search) {
    auto const refusal = refusalIn(search);
    if (!refusal || !isOfLimit(*refusal))
        return std::nullopt;
    bool const isAbove = refusal->reason == Refusal::Reason::AboveMaximum;
    return certain(search, refusal->says + ": " + (isAbove ? "raise \"value_max\"" : "lower \"value_min\"") +
                               ", or correct the letter")
        .by(Change::setting(Change::FIELD, {isAbove ? "value_max" : "value_min"}, refusal->value));
}

std::optional<Found> validationPattern(Search const& search) {
    auto const refusal = refusalIn(search);
    if (!refusal || isOfLimit(*refusal))
        return std::nullopt;
    char const* const advice =
        refusal->reason == Refusal::Reason::NoDate
            ? ": let \"value_match\" take parts of the date that can be read"
            : ": let \"value_extract\" take another part of the text, or \"value_match\" "
              "accept this one";
    return certain(search, refusal->says + advice);
}

std::optional<Found> width(Search const& search) {
    if (!search.trace().isTooWide)
        return std::nullopt;
    int const is = search.trace().match->width;
    auto const most = static_cast<long long>(search.field().maxWidth());
    return certain(search, "the match is " + millimetres(is) + " wide and the field allows " +
                               millimetres(most) + ": raise \"width\" to " + std::to_string(is) +
                               " or more, or let the pattern or the zone take less text")
        .by(Change::setting(Change::FIELD, {"width"}, is));
}

} // namespace VlMail::NearMisses
