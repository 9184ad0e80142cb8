// What is printed where nothing may be.
#include "programs/base/millimetres.h"
#include "programs/production/checks.h"
#include "programs/production/words.h"

#include <algorithm>
#include <array>

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

} // namespace

void checkPrintArea(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    if (page.ink.isEmpty())
        return;
    Box const sheet{0, 0, page.page.width, page.page.height};
    Box const area = rules.printAreaOn({sheet.right, sheet.bottom});
    for (Side const& side : sidesOf(area, rules.production.tolerance, sheet)) {
        std::optional<Box> const found = hasArea(side.beyond) ? page.ink.inside(side.beyond) : std::nullopt;
        if (found)
            findings.add(Code::ContentOutsidePrintArea, page.at(*found),
                         textInWords(page.page, *found) + " reaches " +
                             Base::withMillimetres(side.by(*found, area)) + " beyond the print area on the " +
                             side.name,
                         fixFor(page.ink.bounds()->united(*found), area));
    }
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
                         "move it " + inWords(wayOutOf(*found, zone.box)));
    }
}

} // namespace Production
