#include "programs/reader/zone_place.h"

#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/patterns/pattern.h"

#include <limits>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractZone;
using Patterns::Pattern;

constexpr Box EVERYWHERE{std::numeric_limits<int>::min(), std::numeric_limits<int>::min(),
                         std::numeric_limits<int>::max(), std::numeric_limits<int>::max()};

ZonePlace placeOn(Page const& page, ExtractZone const& zone, Point origin) {
    ZonePlace place;
    place.page = page.number;
    place.hasAddress = zone.hasAddress();
    Cfg::Rect const& at = zone.location();
    if (zone.hasLocation())
        place.location = Box{at.left, at.top, at.right, at.bottom}.movedBy(origin);
    Point const point = zone.mostProbablePoint();
    Box const moved = Box{point.x, point.y, point.x, point.y}.movedBy(origin);
    place.point = {moved.left, moved.top};
    return place;
}

ZonePlace nowhere(Page const& page, ExtractZone const& zone, std::string const& anchor, bool isGivenUp) {
    ZonePlace place = placeOn(page, zone, {});
    std::string const name = "its anchor " + Base::inQuotes(Base::plainLine(anchor));
    std::string const where = " on page " + std::to_string(page.number);
    place.isGivenUp = isGivenUp;
    place.whyNowhere = isGivenUp
                           ? name + " was given up" + where +
                                 ", since it looks at too much text; \"vlmail presets lint\" tells what "
                                 "makes it slow"
                           : name + " matches nothing" + where;
    return place;
}

ZonePlace anchoredPlace(Page const& page, Layout const& layout, ExtractZone const& zone,
                        std::string const& anchor) {
    Pattern const pattern(anchor, Pattern::Use::Extract);
    ZoneText const all = ZoneText::inside(page, layout, EVERYWHERE);
    std::optional<Pattern::Place> const found = pattern.find(all.text());
    Stretch const match = found ? all.stretch(found->offset, found->length) : Stretch();
    if (match.box == Box{})
        return nowhere(page, zone, anchor, !found && pattern.fits(all.text()) == Pattern::Answer::TooHard);
    ZonePlace place = placeOn(page, zone, {match.box.left, match.box.top});
    place.anchor = match.box;
    return place;
}

} // namespace

ZoneView viewOf(Page const& page, Layout const& layout, ExtractZone const& zone, ZoneRules const& rules) {
    ZonePlace place =
        rules.anchor.empty() ? placeOn(page, zone, {}) : anchoredPlace(page, layout, zone, rules.anchor);
    place.order = rules.byColumn ? ReadingOrder::Columns : ReadingOrder::Rows;
    ZoneText text = textAt(page, layout, place);
    return {std::move(text), std::move(place)};
}

ZoneText textOf(Page const& page, Layout const& layout, ExtractZone const& zone) {
    return textAt(page, layout, placeOn(page, zone, {}));
}

ZoneText textAt(Page const& page, Layout const& layout, ZonePlace const& place) {
    if (!place.whyNowhere.empty())
        return {};
    if (place.location)
        return ZoneText::inside(page, layout, *place.location, place.order);
    return place.hasAddress ? ZoneText::nearestAddress(page, layout, place.point)
                            : ZoneText::nearest(page, layout, place.point);
}

} // namespace Reader
