#pragma once
// Where a zone lies: on which page of a letter, and on which part of that page.

#include "programs/reader/reading_rules.h"
#include "programs/reader/zone_text.h"

#include "vlservice/extract/extract_zone.h"

#include <optional>
#include <string>

namespace Reader {

struct ZonePlace {
    /// Of the document; 0 when the letter has no such page, or the text stands on none.
    int page = 0;
    /// The anchor's match, when there is an anchor and it has one.
    std::optional<Box> anchor = {};
    /// On the page, whatever the zone tells it from; none of a zone that is found by its point, ...
    std::optional<Box> location = {};
    /// ... which is here.
    Point point = {};
    ReadingOrder order = ReadingOrder::Rows;
    /// A postal address may be in it.
    bool hasAddress = false;
    /// Why the zone lies nowhere, as a clause; empty when it does.
    std::string whyNowhere = {};
    /// The anchor took so long that it was given up.
    bool isGivenUp = false;

    /// What places are told from in the settings.
    Point origin() const { return anchor ? Point(anchor->left, anchor->top) : Point(); }
};

/// A zone as it is seen on a page.
struct ZoneView {
    ZoneText text;
    ZonePlace place;
};

/// The zone on that page. An anchor is searched in all of the page's text, with so many looks at its
/// characters that a second is no limit to it; where it matches nothing that has a place, the zone lies
/// nowhere. Throws Patterns::Broken.
ZoneView viewOf(Page const& page, Layout const& layout, Cfg::ExtractZone const& zone, ZoneRules const& rules);

/// By the zone's location or, without one, its most probable point, as if no rules said anything of it.
ZoneText textOf(Page const& page, Layout const& layout, Cfg::ExtractZone const& zone);

/// The zone at that place of the page; the empty text for one that lies nowhere.
ZoneText textAt(Page const& page, Layout const& layout, ZonePlace const& place);

} // namespace Reader
