#include "programs/vlmail/workbench/changes.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/reader/reading_rules.h"
#include "programs/vlmail/explain/near_miss_change.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <utility>

namespace VlMail::Workbench {
namespace {

namespace Key = Change;

/// A changed text, and what was done to it.
struct Changed {
    SettingsText text;
    std::string says;
};
using MaybeChanged = std::optional<Changed>;

/// The owner of a key: where it stands, and what it is called.
struct Owner {
    Place place;
    std::string name;
};

template<typename Listed>
std::optional<Owner> ownerAt(Listed const* listed, std::string const& name) {
    return listed ? std::optional<Owner>({listed->place, name}) : std::nullopt;
}

std::optional<Owner> ownerOf(ChangePlaces const& places, std::string const& of) {
    auto const nameOf = [](auto const* listed) { return listed ? Base::inQuotes(listed->name) : ""; };
    if (of == Key::FIELD)
        return ownerAt(places.field, "the field " + nameOf(places.field));
    if (of == Key::ZONE)
        return ownerAt(places.zone, "the zone " + nameOf(places.zone));
    if (of == Key::PACK_PRESET)
        return ownerAt(places.pack, "the pack preset " + nameOf(places.pack));
    return ownerAt(places.preset, "the preset " + (places.preset ? inWords(places.preset->preset) : ""));
}

std::string pathInWords(json::Array const& path) {
    std::string words;
    for (json::Value const& step : path)
        words += (words.empty() ? "" : "/") + step.textOrEmpty();
    return words;
}

MaybeChanged set(SettingsText const& text, ChangePlaces const& places, json::Object const& change) {
    std::optional<Owner> const owner = ownerOf(places, change.get(Key::OF).textOrEmpty());
    if (!owner)
        return std::nullopt;
    json::Array const path = change.get(Key::PATH).toArray();
    Place place = owner->place;
    for (json::Value const& step : path)
        place = place / step.textOrEmpty();
    json::Value const value = change.get(Key::VALUE);
    std::string const key = pathInWords(path) + " of " + owner->name;
    if (value)
        return Changed{text.with(place.pointer(), value), key + ": " + json::toText(value)};
    if (!text.find(place.pointer()))
        return std::nullopt;
    return Changed{text.without(place.pointer()), key + ": left out"};
}

Place fieldsOf(ListedZone const& zone) { return zone.place / "fields"; }

MaybeChanged moveBefore(SettingsText const& text, ChangePlaces const& places, std::string const& before) {
    std::vector<ListedField> const& fields = places.zone->fields;
    auto const earlier = std::ranges::find(fields, before, &ListedField::name);
    auto const own = static_cast<std::size_t>(places.field - fields.data());
    if (earlier == fields.end())
        return std::nullopt;
    SettingsText const inserted = text.withInserted(earlier->place.pointer(), places.field->json);
    return Changed{inserted.without((fieldsOf(*places.zone) / (own + 1)).pointer()),
                   "the field " + Base::inQuotes(places.field->name) + " stands in front of " +
                       Base::inQuotes(before)};
}

MaybeChanged moveToZone(SettingsText const& text, ChangePlaces const& places, std::string const& name) {
    auto const& zones = places.preset->zones;
    auto const zone = std::ranges::find(zones, name, &ListedZone::name);
    if (zone == zones.end())
        return std::nullopt;
    SettingsText const added = text.with((fieldsOf(*zone) / "-").pointer(), places.field->json);
    // A zone without fields would be searched for nothing.
    Place const& left = places.zone->fields.size() == 1 ? places.zone->place : places.field->place;
    return Changed{added.without(left.pointer()), "the field " + Base::inQuotes(places.field->name) +
                                                      " stands in the zone " + Base::inQuotes(name)};
}

std::string freeZoneName(ListedExtractPreset const& preset, std::string const& wanted) {
    auto const isTaken = [&](std::string const& name) {
        return std::ranges::find(preset.zones, name, &ListedZone::name) != preset.zones.end();
    };
    std::string name = wanted;
    for (int number = 2; isTaken(name); ++number)
        name = wanted + ' ' + std::to_string(number);
    return name;
}

/// A zone for the field alone: its own when it has no other field, else a new one.
std::pair<SettingsText, std::string> withOwnZone(SettingsText const& text, ChangePlaces const& places,
                                                 json::Object const& where) {
    if (places.zone->fields.size() == 1) {
        SettingsText changed = text;
        for (auto const& [key, value] : where)
            changed = changed.with((places.zone->place / key).pointer(), value);
        return {changed, places.zone->name};
    }
    std::string const name = freeZoneName(*places.preset, places.field->name);
    json::Object zone{{"name", name}};
    for (auto const& [key, value] : where)
        zone.set(key, value);
    json::Array fields;
    fields.append(places.field->json);
    zone.set("fields", fields);
    SettingsText const without = text.without(places.field->place.pointer());
    return {without.with((places.preset->place / "zones" / "-").pointer(), zone), name};
}

MaybeChanged moveToOwnZone(SettingsText const& text, ChangePlaces const& places, json::Object const& change) {
    json::Value const page = change.get(Key::PAGE);
    if (page && !places.pack)
        return std::nullopt;
    auto [changed, name] = withOwnZone(text, places, change.get(Key::OWN_ZONE).toObject());
    std::string says =
        "the field " + Base::inQuotes(places.field->name) + " stands in the zone " + Base::inQuotes(name);
    if (!page)
        return Changed{changed, says};
    Place const place = places.pack->place / Reader::ReadingRules::KEY / "zones" / name / "page";
    return Changed{changed.with(place.pointer(), page), says + " on page " + json::toText(page)};
}

MaybeChanged changed(SettingsText const& text, ChangePlaces const& places, json::Object const& change) {
    if (change.get(Key::PATH))
        return set(text, places, change);
    if (!places.preset || !places.zone || !places.field)
        return std::nullopt;
    if (json::Value const before = change.get(Key::BEFORE))
        return moveBefore(text, places, before.textOrEmpty());
    if (json::Value const zone = change.get(Key::TO_ZONE))
        return moveToZone(text, places, zone.textOrEmpty());
    return moveToOwnZone(text, places, change);
}

} // namespace

ProposedEdits editsFor(SettingsText const& text, ChangePlaces const& places, json::Value const& change) {
    if (!change.isObject())
        return std::nullopt;
    MaybeChanged const result = changed(text, places, change.toObject());
    if (!result)
        return std::nullopt;
    return Proposal{editsBetween(text, result->text.text()), result->says};
}

} // namespace VlMail::Workbench
