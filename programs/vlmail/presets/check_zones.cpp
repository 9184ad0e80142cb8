// Zones: where they lie, and whether they have something to do.
#include "programs/patterns/pattern.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/sheet.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <tuple>

namespace VlMail {
namespace {

using enum FindingKind;

// Pages in 1/100 mm.
/// Any sheet of A4 or Letter, upright or not, lies within this length.
constexpr int LONGEST_EDGE = 29700;
/// Less than a short word in small print.
constexpr int TINY = 200;

bool isEmpty(Cfg::Rect const& rect) { return rect.left >= rect.right || rect.top >= rect.bottom; }

bool isOffPage(Cfg::Rect const& rect) {
    return rect.left >= LONGEST_EDGE || rect.top >= LONGEST_EDGE || rect.right <= 0 || rect.bottom <= 0;
}

bool isBeyondPage(Cfg::Rect const& rect) {
    return rect.left < 0 || rect.top < 0 || rect.right > UPRIGHT_WIDTH || rect.bottom > UPRIGHT_HEIGHT;
}

bool isOffPage(Cfg::Point const& point) {
    return point.x < 0 || point.y < 0 || point.x > LONGEST_EDGE || point.y > LONGEST_EDGE;
}

long long widthOf(Cfg::Rect const& rect) { return static_cast<long long>(rect.right) - rect.left; }
long long heightOf(Cfg::Rect const& rect) { return static_cast<long long>(rect.bottom) - rect.top; }

bool isAnchored(Reader::ReadingRules const& rules, ListedZone const& zone) {
    Reader::ZoneRules const* const said = rules.forZone(zone.name);
    return said && !said->anchor.empty();
}

/// Where an anchored zone lies on the page is known when a letter is read.
void checkLocation(ListedZone const& zone, bool isAnchored, Findings& findings) {
    Place const place = zone.place / "location";
    if (isEmpty(zone.location))
        findings.add(ZoneEmpty, place, {inWords(zone.location)});
    else if (!isAnchored && isOffPage(zone.location))
        findings.add(ZoneOffPage, place, {inWords(zone.location)});
    else if (widthOf(zone.location) < TINY || heightOf(zone.location) < TINY)
        findings.add(ZoneTiny, place,
                     {inMillimetres(widthOf(zone.location)), inMillimetres(heightOf(zone.location))});
    else if (!isAnchored && isBeyondPage(zone.location))
        findings.add(ZoneBeyondPage, place, {inWords(zone.location)});
}

std::optional<Cfg::Rect> shared(Cfg::Rect const& a, Cfg::Rect const& b) {
    Cfg::Rect const both(std::max(a.left, b.left), std::max(a.top, b.top), std::min(a.right, b.right),
                         std::min(a.bottom, b.bottom));
    return isEmpty(both) ? std::nullopt : std::optional(both);
}

/// The point that holds for a zone without a location.
Cfg::Point pointOf(ListedZone const& zone) {
    return zone.point.isZeroes() ? Cfg::ExtractZone::DEF_MOST_PROBABLE_POINT : zone.point;
}

bool contains(Cfg::Rect const& outer, Cfg::Rect const& inner) {
    return outer.left <= inner.left && outer.top <= inner.top && outer.right >= inner.right &&
           outer.bottom >= inner.bottom;
}

/// Whether the field's pattern is for no text in particular, so that it takes whatever stands in the zone.
bool takesAnything(ListedField const& field) {
    try {
        Patterns::Pattern const pattern(field.json.get("value_extract").textOrEmpty(),
                                        Patterns::Pattern::Use::Extract);
        return std::ranges::all_of(
            std::array{"Lena Brandt", "Total: 12.50", "x", "(4711)\n12 Long Street"},
            [&](char const* text) { return pattern.fits(text) == Patterns::Pattern::Answer::Yes; });
    } catch (Patterns::Broken const&) {
        return false;
    }
}

/// Whether what belongs to the other zone may be taken for a value here. A zone that lies within the other
/// holds nothing that is the other's alone.
bool mayTakeFrom(ListedZone const& zone, ListedZone const& other) {
    return !contains(other.location, zone.location) && std::ranges::any_of(zone.fields, takesAnything);
}

void checkApart(ListedZone const& zone, ListedZone const& other, Findings& findings) {
    if (zone.hasLocation() != other.hasLocation())
        return;
    if (!zone.hasLocation()) {
        Cfg::Point const point = pointOf(zone);
        if (point == pointOf(other))
            findings.add(ZonesAtOnePoint, zone.place,
                         {std::to_string(point.x), std::to_string(point.y), inQuotes(other.name),
                          other.place.pointer()});
    } else if (auto const both = shared(zone.location, other.location);
               both && (mayTakeFrom(zone, other) || mayTakeFrom(other, zone))) {
        findings.add(ZonesOverlap, zone.place / "location",
                     {inMillimetres(widthOf(*both)), inMillimetres(heightOf(*both)), inQuotes(other.name),
                      other.place.pointer()});
    }
}

/// Whether the places of both are told from one point of one page.
bool areToldAlike(Reader::ReadingRules const& rules, ListedZone const& zone, ListedZone const& other) {
    auto const told = [&](ListedZone const& one) {
        Reader::ZoneRules const* const said = rules.forZone(one.name);
        Reader::ZoneRules const place = said ? *said : Reader::ZoneRules();
        return std::tuple(place.pages, place.page, place.anchor);
    };
    return told(zone) == told(other);
}

void checkPlace(ListedZone const& zone, bool isAnchored, Findings& findings) {
    if (zone.hasLocation())
        checkLocation(zone, isAnchored, findings);
    if (!isAnchored && isOffPage(zone.point))
        findings.add(PointOffPage, zone.place / "most_probable_point",
                     {std::to_string(zone.point.x), std::to_string(zone.point.y)});
}

template<typename Look>
void forEachZone(PresetsDocument const& document, Look look) {
    for (ListedExtractPreset const& preset : document.extractPresets())
        for (ListedZone const& zone : preset.zones)
            look(zone);
}

} // namespace

void checkZonePlaces(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets()) {
        Reader::ReadingRules const rules = readingRulesFor(document, preset);
        for (ListedZone const& zone : preset.zones)
            checkPlace(zone, isAnchored(rules, zone), findings);
    }
}

void checkZonesApart(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets()) {
        Reader::ReadingRules const rules = readingRulesFor(document, preset);
        for (auto zone = preset.zones.begin(); zone != preset.zones.end(); ++zone)
            for (auto other = preset.zones.begin(); other != zone; ++other)
                if (areToldAlike(rules, *zone, *other))
                    checkApart(*zone, *other, findings);
    }
}

void checkZoneFields(PresetsDocument const& document, Findings& findings) {
    forEachZone(document, [&](ListedZone const& zone) {
        if (zone.json.get("fields").isArray() && arrayOf(zone.json, "fields").empty())
            findings.add(ZoneWithoutFields, zone.place);
    });
}

} // namespace VlMail
