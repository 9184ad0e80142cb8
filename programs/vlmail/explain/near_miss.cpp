#include "programs/vlmail/explain/near_miss.h"

#include "programs/base/log_capture.h"
#include "programs/vlmail/explain/near_miss_kinds.h"

#include <algorithm>
#include <array>
#include <optional>
#include <utility>

namespace VlMail {
namespace {

constexpr std::size_t MAX_NEAR_MISSES = 3;

enum class AppliesTo { Missing, Refused, Both };

enum class Weight {
    Certain,    ///< nothing else is looked for behind it
    Likely,     ///< told beside others
    LastResort, ///< looked for when nothing gives a valid value
};

/// A kind of near miss and how it is looked for.
struct Way {
    NearMissKind kind;
    char const* name;
    AppliesTo appliesTo;
    Weight weight;
    std::optional<Found> (*look)(Search const&);

    bool isFor(bool isRefused) const {
        return appliesTo == AppliesTo::Both ||
               appliesTo == (isRefused ? AppliesTo::Refused : AppliesTo::Missing);
    }
};

using Kind = NearMissKind;

constexpr std::array WAYS{
    Way{Kind::NoText, "no_text", AppliesTo::Missing, Weight::Certain, NearMisses::noText},
    Way{Kind::Failure, "failure", AppliesTo::Missing, Weight::Certain, NearMisses::failure},
    Way{Kind::ValueGroup, "value_group", AppliesTo::Missing, Weight::Certain, NearMisses::valueGroup},
    Way{Kind::EarlierField, "earlier_field", AppliesTo::Missing, Weight::Certain, NearMisses::earlierField},
    Way{Kind::Limit, "limit", AppliesTo::Refused, Weight::Certain, NearMisses::limit},
    Way{Kind::LetterCase, "letter_case", AppliesTo::Missing, Weight::Likely, NearMisses::letterCase},
    Way{Kind::Normalisation, "normalisation", AppliesTo::Missing, Weight::Likely, NearMisses::normalisation},
    Way{Kind::LookAlike, "look_alike", AppliesTo::Missing, Weight::Likely, NearMisses::lookAlike},
    Way{Kind::Blanks, "blanks", AppliesTo::Missing, Weight::Likely, NearMisses::blanks},
    Way{Kind::Gaps, "gaps", AppliesTo::Both, Weight::Likely, NearMisses::gaps},
    Way{Kind::JoinedLines, "joined_lines", AppliesTo::Both, Weight::Likely, NearMisses::joinedLines},
    Way{Kind::Anchor, "anchor", AppliesTo::Missing, Weight::Likely, NearMisses::anchor},
    Way{Kind::LineDistance, "line_distance", AppliesTo::Both, Weight::Likely, NearMisses::lineDistance},
    Way{Kind::Zone, "zone", AppliesTo::Both, Weight::Likely, NearMisses::zone},
    Way{Kind::Block, "block", AppliesTo::Both, Weight::Likely, NearMisses::block},
    Way{Kind::ValidationPattern, "validation_pattern", AppliesTo::Refused, Weight::Likely,
        NearMisses::validationPattern},
    Way{Kind::Width, "width", AppliesTo::Refused, Weight::Likely, NearMisses::width},
    Way{Kind::OtherZone, "other_zone", AppliesTo::Both, Weight::Likely, NearMisses::otherZone},
    Way{Kind::OtherPage, "other_page", AppliesTo::Both, Weight::Likely, NearMisses::otherPage},
    Way{Kind::Elsewhere, "elsewhere", AppliesTo::Missing, Weight::Likely, NearMisses::elsewhere},
    Way{Kind::Rest, "rest", AppliesTo::Missing, Weight::LastResort, NearMisses::rest},
    Way{Kind::Literal, "literal", AppliesTo::Missing, Weight::LastResort, NearMisses::literal},
};

constexpr bool standInOrder() {
    for (std::size_t i = 0; i < WAYS.size(); ++i)
        if (WAYS[i].kind != static_cast<Kind>(i))
            return false;
    return WAYS.back().kind == Kind::Literal;
}
static_assert(standInOrder());

/// Those with a valid value in front, up to the number that is told.
class Collected {
public:
    bool isFull() const { return valid_.size() == MAX_NEAR_MISSES; }

    void add(Kind kind, Found found) {
        auto& list = found.isValid ? valid_ : others_;
        list.push_back({kind, std::move(found.says), std::move(found.text), found.page, found.box,
                        std::move(found.change)});
    }

    std::vector<NearMiss> take() {
        for (NearMiss& other : others_)
            if (!isFull())
                valid_.push_back(std::move(other));
        return std::move(valid_);
    }

private:
    std::vector<NearMiss> valid_;
    std::vector<NearMiss> others_;
};

std::vector<NearMiss> lookFor(Search const& search) {
    Collected collected;
    bool isExplained = false;
    for (Way const& way : WAYS) {
        bool const isNeeded = way.weight != Weight::LastResort || !isExplained;
        if (collected.isFull() || !isNeeded || !way.isFor(search.isRefused()))
            continue;
        std::optional<Found> found = way.look(search);
        if (!found)
            continue;
        isExplained = isExplained || (way.weight != Weight::LastResort && found->isValid);
        collected.add(way.kind, std::move(*found));
        if (way.weight == Weight::Certain)
            break;
    }
    return collected.take();
}

NearMiss outOfTime(Reader::PatternTime const& time) {
    return {Kind::Failure,
            "nothing was tried for this field, since that took " + Reader::inSeconds(time.limits().document) +
                " for the fields before it; \"vlmail presets lint\" tells which patterns are slow",
            {},
            0,
            {}};
}

} // namespace

int MissedField::lastPage() const {
    int last = std::max(firstPage, page());
    for (int const other : otherPages)
        last = std::max(last, other);
    return last;
}

bool MissedField::mayLieOn(int number, Cfg::ExtractZone const& one) const {
    using Pages = Reader::ZoneRules::Pages;
    Reader::ZoneRules const said = rulesFor(one) ? *rulesFor(one) : Reader::ZoneRules();
    if (said.pages == Pages::Any)
        return number >= firstPage;
    return number == (said.pages == Pages::Last ? lastPage() : firstPage + said.page - 1);
}

char const* nameOf(NearMissKind kind) { return WAYS[static_cast<std::size_t>(kind)].name; }

std::vector<NearMiss> nearMissesOf(MissedField const& missed, ReadPages& pages, Reader::PatternTime& time) {
    LaidOutPage const* const page = pages.page(missed.page());
    if (!page || !missed.zone.place.whyNowhere.empty() || missed.field.definition->strRegex().empty())
        return {};
    if (time.isUp())
        return {outOfTime(time)};
    // Each pattern that fails would be a line on the terminal, beside the near miss that says so.
    Base::LogCapture const quiet;
    Reader::PatternTime::Turn const turn(time);
    return lookFor(Search(missed, pages, *page, turn));
}

} // namespace VlMail
