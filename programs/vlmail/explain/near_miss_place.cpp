// Near misses in which the text stands elsewhere: beyond the zone, in another line or block, on another page.
#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/vlmail/explain/near_miss_change.h"
#include "programs/vlmail/explain/near_miss_kinds.h"
#include "programs/vlmail/explain/words.h"
#include "programs/vlmail/explain/zone_change.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <set>
#include <span>

namespace VlMail::NearMisses {

using Reader::Box;
using Reader::LayoutRules;
using Reader::Point;
using Reader::ZoneText;
using Words::excerpt;
using Words::millimetres;

namespace {

/// Text this near to a zone was meant to be in it, in 1/100 mm.
constexpr long long NEAR = 2000;

/// A rule of the layout that a preset sets, and values to try for it, the nearest to the default first.
struct Rule {
    char const* key;
    double LayoutRules::*member;
    std::span<double const> larger;
    std::span<double const> smaller;
};

constexpr std::array LARGER_GAPS{4.0, 5.0, 7.0, 10.0, 15.0, 20.0, 30.0, 60.0, 120.0};
constexpr std::array SMALLER_GAPS{2.5, 2.0, 1.5};
constexpr Rule GAPS{"max_spaces_between_fragments", &LayoutRules::maxSpaces, LARGER_GAPS, SMALLER_GAPS};

/// With more than a blank line between them, lines are no block.
constexpr std::array LARGER_DISTANCES{2.0, 2.2, 2.5, 3.0};
constexpr std::array SMALLER_DISTANCES{1.6, 1.4, 1.2};
constexpr Rule LINE_DISTANCE{"max_line_distance", &LayoutRules::maxLineDistance, LARGER_DISTANCES,
                             SMALLER_DISTANCES};

/// The names of the preset's fields that are found on the page as it is laid out, in the zones that lie on
/// it; none when that fails.
std::set<std::string> foundOn(Search const& search, LaidOutPage const& page) {
    MissedField const& missed = search.missed();
    Reader::PageTrace trace;
    Reader::PatternTime time;
    Reader::FieldSearch fields({}, missed.rules, time);
    std::set<std::string> names;
    try {
        for (Cfg::ExtractZone const& zone : missed.preset.zones())
            if (missed.mayLieOn(page.page->number, zone))
                fields.search(zone, {search.textOn(page, zone), {}});
        fields.searchJoinedLines();
        fields.finish(&trace);
    } catch (Base::Error const&) {
        return names;
    }
    for (Reader::ZoneTrace const& zone : trace.zones)
        for (Reader::FieldTrace const& field : zone.fields)
            if (field.isFound())
                names.insert(field.definition->name());
    return names;
}

/// What a layout that holds for the whole preset would lose, as the end of a sentence; empty when it loses
/// nothing.
std::string lossesBy(Search const& search, LaidOutPage const& changed) {
    std::set<std::string> const after = foundOn(search, changed);
    std::string lost;
    for (std::string const& name : foundOn(search, search.page()))
        if (!after.contains(name))
            lost += (lost.empty() ? "" : ", ") + Base::inQuotes(name);
    return lost.empty() ? lost : ", but would lose " + lost;
}

/// As people write it: 60 rather than 60.0.
json::Value numberFor(double value) {
    return value == std::floor(value) ? json::Value(static_cast<long long>(value)) : json::Value(value);
}

std::optional<Found> withRule(Search const& search, Rule const& rule, double value) {
    LayoutRules rules = search.pages().rules();
    double const current = rules.*rule.member;
    rules.*rule.member = value;
    LaidOutPage const& page = search.pages().laidOut(*search.page().page, rules);
    auto found = search.told(
        search.find(search.remaining(search.textOn(page))), search.pageNumber(), [&](Hit const& hit) {
            return "would match " + excerpt(hit.match.text) + " with " + Base::inQuotes(rule.key) + " at " +
                   Words::number(value) + (value > current ? " or more" : " or less") + " instead of " +
                   Words::number(current);
        });
    if (!found)
        return found;
    found->change = Change::setting(Change::PRESET, {rule.key}, numberFor(value));
    // The rule is the whole preset's: advice that harms other fields stands behind all that does not.
    std::string const losses = lossesBy(search, page);
    if (search.isGivenUp())
        return std::nullopt; // What it loses is not known.
    found->says += losses;
    found->isValid = found->isValid && losses.empty();
    return found;
}

std::optional<Found> byRule(Search const& search, Rule const& rule) {
    double const current = search.pages().rules().*rule.member;
    Best best;
    for (double const value : rule.larger)
        if (value > current && !best.isValid())
            best.offer(withRule(search, rule, value));
    for (double const value : rule.smaller)
        if (value < current && !best.isValid())
            best.offer(withRule(search, rule, value));
    return best.take();
}

/// The places on a page where the field matches, in reading order.
std::vector<Hit> hitsOn(Search const& search, LaidOutPage const& page) {
    ZoneText text = Search::everythingOn(page);
    std::vector<Hit> hits;
    while (hits.size() < MAX_TRIES) {
        std::size_t const before = text.text().size();
        auto hit = search.cut(search.field(), text);
        if (!hit)
            break;
        hits.push_back(std::move(*hit));
        // A match that is too wide, or empty, stays in the text.
        if (text.text().size() == before)
            break;
    }
    return hits;
}

std::vector<ZoneChange> changesNearby(Search const& search) {
    std::vector<ZoneChange> changes;
    for (Hit const& hit : hitsOn(search, search.page())) {
        ZoneChange const change = grownToHold(search.location(), hit.match.box);
        if (change.distance() > 0 && change.distance() <= NEAR)
            changes.push_back(change);
    }
    for (ZoneChange const& change : changesByBlocks(search.location(), search.page().layout, NEAR))
        changes.push_back(change);
    std::stable_sort(changes.begin(), changes.end(), isLikelier);
    changes.resize(std::min(changes.size(), MAX_TRIES));
    return changes;
}

long long wholeMillimetres(double hundredths) { return std::llround(hundredths / 100) * 100; }

/// As near to the middle of the box as whole millimetres are.
Point middleOf(Box const& box) {
    Point const centre = box.centre();
    return {static_cast<int>(wholeMillimetres(centre.x)), static_cast<int>(wholeMillimetres(centre.y))};
}

std::string pointInWords(Point point) {
    return "(" + millimetres(point.x) + ", " + millimetres(point.y) + ")";
}

/// Only what takes all of a zone's text stands for the zone: other fields of it may be where they should.
std::string pointAdvice(Search const& search, Point onPage) {
    Point const from = search.zone().mostProbablePoint();
    Point const to(onPage.x - search.origin().x, onPage.y - search.origin().y);
    return search.takesWholeText() ? "move the point from " + pointInWords(from) + " to " + pointInWords(to)
                                   : "give the field a zone of its own with the point " + pointInWords(to);
}

json::Value changeForPoint(Search const& search, Point onPage) {
    json::Object const point = Change::point({onPage.x - search.origin().x, onPage.y - search.origin().y});
    return search.takesWholeText() ? Change::setting(Change::ZONE, {"most_probable_point"}, point)
                                   : Change::toOwnZone({{"most_probable_point", point}});
}

std::vector<Box> blocksByDistance(Search const& search, Point point) {
    std::vector<Box> boxes;
    for (Reader::Block const& block : search.page().layout.blocks)
        boxes.push_back(block.box);
    std::stable_sort(boxes.begin(), boxes.end(),
                     [&](Box const& a, Box const& b) { return a.distanceTo(point) < b.distanceTo(point); });
    boxes.resize(std::min(boxes.size(), MAX_TRIES));
    return boxes;
}

std::string otherPageAdvice(Search const& search, int page) {
    int const first = search.missed().firstPage;
    if (page < first)
        return "the preset skips the first page: leave \"skip_first_page\" out";
    Reader::ZoneRules const* const rules = search.missed().rulesFor(search.zone());
    if (rules && rules->pages == Reader::ZoneRules::Pages::Any)
        return "the zone lies on any page: move it, or give the field a zone of its own";
    std::string const rule = search.pageNumber() == first
                                 ? "fields are searched on the first page of a letter"
                                 : "the zone lies on page " + std::to_string(search.pageNumber());
    std::string const advice = rule + ": set the zone's \"page\" in \"reading\" to " +
                               std::to_string(page - first + 1) + ", or move the text";
    bool const maybeCovered = search.pageNumber() == 1 && page == 2;
    return maybeCovered ? advice + ", or set \"skip_first_page\" if page 1 is a cover sheet" : advice;
}

/// Room for the text, in whole millimetres.
json::Object placeFor(Search const& search, Box const& box) {
    constexpr int ROOM = 100;
    Box const onPage{static_cast<int>(wholeMillimetres(box.left - ROOM)),
                     static_cast<int>(wholeMillimetres(box.top - ROOM)),
                     static_cast<int>(wholeMillimetres(box.right + 2.0 * ROOM)),
                     static_cast<int>(wholeMillimetres(box.bottom + ROOM))};
    return {{"location", Change::location(onPage.movedBy({-search.origin().x, -search.origin().y}))}};
}

/// Where the letter's page of that number is wanted.
json::Value changeForPage(Search const& search, int page, json::Object const& where) {
    int const first = search.missed().firstPage;
    if (page < first)
        return Change::setting(Change::PRESET, {"skip_first_page"});
    int const place = page - first + 1;
    if (!where.empty())
        return Change::toOwnZone(where, place);
    return Change::setting(Change::PACK_PRESET, {"reading", "zones", search.zone().name(), "page"}, place);
}

std::optional<Found> onPage(Search const& search, LaidOutPage const& page) {
    int const number = page.page->number;
    auto const saying = [&](char const* where) {
        return [&, where](Hit const& hit) {
            return "would match " + excerpt(hit.match.text) + " on page " + std::to_string(number) + where +
                   search.zoneName() + "; " + otherPageAdvice(search, number);
        };
    };
    Best best;
    auto inside = search.told(search.find(search.remaining(search.textOn(page))), number, saying(" in the "));
    if (inside)
        inside->change = changeForPage(search, number, {});
    best.offer(std::move(inside));
    if (best.isValid() || search.takesWholeText())
        return best.take();
    auto outside = search.told(search.find(Search::everythingOn(page)), number, saying(" outside the "));
    if (outside)
        outside->change = changeForPage(search, number, placeFor(search, outside->box));
    best.offer(std::move(outside));
    return best.take();
}

} // namespace

std::optional<Found> noText(Search const& search) {
    if (!search.page().page->words.empty())
        return std::nullopt;
    return Found{
        "page " + std::to_string(search.pageNumber()) +
            " has no text at all, only pictures of it: let a program for character recognition make the "
            "document searchable",
        {},
        search.pageNumber(),
        {},
        true};
}

std::optional<Found> gaps(Search const& search) {
    // A pattern for all of a zone's text would fit columns that are joined to fewer lines.
    return search.takesWholeText() ? std::nullopt : byRule(search, GAPS);
}

std::optional<Found> lineDistance(Search const& search) {
    // The zone's text depends on blocks only where it is found by its point.
    return search.zone().hasLocation() ? std::nullopt : byRule(search, LINE_DISTANCE);
}

std::optional<Found> zone(Search const& search) {
    if (!search.zone().hasLocation())
        return std::nullopt;
    Best best;
    for (ZoneChange const& change : changesNearby(search)) {
        if (best.isValid())
            break;
        ZoneText text = search.textInside(change.after);
        ZoneChange const told = change.toldFrom(search.origin());
        auto found =
            search.told(search.find(search.remaining(std::move(text))), search.pageNumber(), [&](Hit const&) {
                return "would match " + change.where("the " + search.zoneName()) + ": " + told.advice();
            });
        if (found)
            found->change = Change::setting(Change::ZONE, {"location"}, Change::location(told.after));
        best.offer(std::move(found));
    }
    return best.take();
}

std::optional<Found> block(Search const& search) {
    if (search.zone().hasLocation())
        return std::nullopt;
    Point const point = search.point();
    Best best;
    for (Box const& box : blocksByDistance(search, point)) {
        if (best.isValid())
            break;
        Point const middle = middleOf(box);
        ZoneText text = ZoneText::nearest(*search.page().page, search.page().layout, middle);
        auto const says = [&](Hit const&) {
            return "would match in the text block " + millimetres(wholeMillimetres(box.distanceTo(point))) +
                   " away from the point of the " + search.zoneName() + ": " + pointAdvice(search, middle);
        };
        auto found = search.told(search.find(search.remaining(std::move(text))), search.pageNumber(), says);
        if (found)
            found->change = changeForPoint(search, middle);
        best.offer(std::move(found));
    }
    return best.take();
}

std::optional<Found> otherZone(Search const& search) {
    if (search.takesWholeText())
        return std::nullopt;
    Best best;
    for (Cfg::ExtractZone const& zone : search.missed().preset.zones()) {
        if (&zone == &search.zone() || !search.missed().mayLieOn(search.pageNumber(), zone))
            continue;
        auto const hit = search.find(search.textOn(search.page(), zone));
        auto found = search.told(hit, search.pageNumber(), [&](Hit const& at) {
            return "would match " + excerpt(at.match.text) + " in the zone " + Base::inQuotes(zone.name()) +
                   ": move the field there";
        });
        if (found)
            found->change = Change::toZone(zone.name());
        best.offer(std::move(found));
    }
    return best.take();
}

std::optional<Found> otherPage(Search const& search) {
    Best best;
    for (int const number : search.otherPages()) {
        LaidOutPage const* const page = search.pages().page(number);
        if (page && !best.isValid())
            best.offer(onPage(search, *page));
    }
    return best.take();
}

std::optional<Found> elsewhere(Search const& search) {
    // Of a zone at a point all blocks have been looked at.
    if (search.takesWholeText() || !search.zone().hasLocation())
        return std::nullopt;
    Best best;
    for (Hit const& hit : hitsOn(search, search.page())) {
        ZoneChange const change = grownToHold(search.location(), hit.match.box);
        if (change.distance() <= NEAR)
            continue;
        auto found = search.told(hit, search.pageNumber(), [&](Hit const& at) {
            return "would match " + excerpt(at.match.text) + " " + change.where("the " + search.zoneName()) +
                   ": move the zone there, or give the field a zone of its own";
        });
        if (found)
            found->change = Change::toOwnZone(placeFor(search, found->box));
        best.offer(std::move(found));
    }
    return best.take();
}

} // namespace VlMail::NearMisses
