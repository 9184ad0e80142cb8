// What is printed where nothing may be.
#include "programs/base/millimetres.h"
#include "programs/production/checks.h"
#include "programs/production/words.h"

#include <algorithm>
#include <array>
#include <utility>
#include <vector>

namespace Production {
namespace {

/// A side of the print area, and what lies beyond it.
struct Side {
    char const* name;
    Box beyond;
    /// How far something reaches beyond the print area.
    int (*by)(Box const& found, Box const& area);
};

/// On a page with what a printer may do within the tolerance.
std::array<Side, 4> sidesOf(Box const& area, int tolerance, Box const& page) {
    return {Side{"left",
                 {page.left, page.top, area.left - tolerance, page.bottom},
                 [](Box const& found, Box const& in) { return in.left - found.left; }},
            Side{"top",
                 {page.left, page.top, page.right, area.top - tolerance},
                 [](Box const& found, Box const& in) { return in.top - found.top; }},
            Side{"right",
                 {area.right + tolerance, page.top, page.right, page.bottom},
                 [](Box const& found, Box const& in) { return found.right - in.right; }},
            Side{"bottom",
                 {page.left, area.bottom + tolerance, page.right, page.bottom},
                 [](Box const& found, Box const& in) { return found.bottom - in.bottom; }}};
}

bool hasArea(Box const& box) { return box.left < box.right && box.top < box.bottom; }

/// The part of a box that lies in another.
Box clipped(Box const& box, Box const& room) {
    return {std::clamp(box.left, room.left, room.right), std::clamp(box.top, room.top, room.bottom),
            std::clamp(box.right, room.left, room.right), std::clamp(box.bottom, room.top, room.bottom)};
}

} // namespace

void checkPrintArea(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    if (page.ink.isEmpty())
        return;
    Box const sheet = page.sheet();
    Box const area = rules.printAreaOn({sheet.right, sheet.bottom});
    Box all = clipped(*page.ink.bounds(), area);
    std::vector<std::pair<Side, Box>> beyond;
    for (Side const& side : sidesOf(area, rules.production.tolerance, sheet))
        if (std::optional<Box> const found =
                hasArea(side.beyond) ? page.ink.inside(side.beyond) : std::nullopt) {
            beyond.emplace_back(side, *found);
            all = all.united(*found);
        }
    for (auto const& [side, found] : beyond)
        findings.add(Code::ContentOutsidePrintArea, page.at(found),
                     textInWords(page.page, found) + " reaches " +
                         Base::withMillimetres(side.by(found, area)) + " beyond the print area on the " +
                         side.name,
                     fixFor(all, area));
}

void checkClearZones(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    int const tolerance = rules.production.tolerance;
    for (ClearZone const& zone : rules.production.clearZones) {
        Box const inner{zone.box.left + tolerance, zone.box.top + tolerance, zone.box.right - tolerance,
                        zone.box.bottom - tolerance};
        if ((!zone.isOnEveryPage && !page.isFirst) || !hasArea(inner))
            continue;
        if (std::optional<Box> const found = page.ink.inside(inner))
            findings.add(Code::ClearZone, page.at(*found),
                         textInWords(page.page, *found) + " stands where nothing may, " +
                             placeInWords(zone.box),
                         "move it " + inWords(wayOutOf(*found, zone.box, page.sheet())));
    }
}

} // namespace Production
