#pragma once
// How the rectangle of a zone might be changed so that it takes in other text: candidates, the smallest
// change first, and their words.

#include "programs/reader/layout.h"

#include <string>
#include <vector>

namespace VlMail {

struct ZoneChange {
    enum class Kind {
        Grow,   ///< edges move outwards
        Shrink, ///< one edge moves inwards
        Shift,  ///< the zone moves and keeps its size
    };

    Kind kind = Kind::Grow;
    Reader::Box before;
    Reader::Box after;

    /// How far edges move in all, in 1/100 mm; a shift counts once.
    long long distance() const;
    /// The zone leaves out text at its beginning, at the left or at the top.
    bool losesBeginning() const;
    /// From where the zone's text would come: "7 mm below and 12 mm to the right of the zone", "with the zone
    /// 7 mm lower", "with the zone 20 mm shorter at the right".
    std::string where(std::string const& zone) const;
    /// The same with places told from there instead of the page's corner.
    ZoneChange toldFrom(Reader::Point origin) const {
        return {kind, before.movedBy({-origin.x, -origin.y}), after.movedBy({-origin.x, -origin.y})};
    }
    /// What to change: "move its bottom from 95 mm to 102 mm or more".
    std::string advice() const;
};

/// The zone, grown to hold the box as well; edges that move come to stand on whole millimetres.
ZoneChange grownToHold(Reader::Box const& zone, Reader::Box const& box);

/// The smaller change. What a zone has too much stands behind its text as a rule: changes that lose the
/// beginning come last.
bool isLikelier(ZoneChange const& a, ZoneChange const& b);

/// Changes of one edge, and shifts, that make the zone hold other blocks of the layout without cutting
/// through one, the likeliest first. Text beyond the zone is reached for up to `limit` 1/100 mm.
std::vector<ZoneChange> changesByBlocks(Reader::Box const& zone, Reader::Layout const& layout,
                                        long long limit);

} // namespace VlMail
