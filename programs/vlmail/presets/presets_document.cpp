#include "programs/vlmail/presets/presets_document.h"
#include "programs/vlmail/presets/words.h"

#include "vlservice/json/json_text.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace VlMail {
namespace {

constexpr char const* EXTRACT_PRESETS = "extract_presets";
constexpr char const* PACK_PRESETS = "pack_presets";

/// Calls `add` with each object in the array and its place.
template<typename Add>
void forEachObject(json::Array const& array, Place const& place, Add add) {
    for (std::size_t i = 0; i < array.size(); ++i) {
        json::Value const node = array.at(i);
        if (node.isObject())
            add(node.toObject(), place / i);
    }
}

template<typename Add>
void forEachElement(json::Array const& array, Place const& place, Add add) {
    forEachObject(array, place, [&](json::Object const& object, Place const& at) {
        Unwrapped const element = unwrap(object, at);
        if (element.node.isObject())
            add(element.node.toObject(), element.place, element.inherited);
    });
}

std::shared_ptr<Cfg::ExtractField const> fieldFrom(json::Object const& object) {
    try {
        return std::make_shared<Cfg::ExtractField>(object);
    } catch (std::exception const&) {
        return nullptr;
    }
}

template<typename Geometry>
Geometry geometryFrom(json::Value const& node) {
    return node.isObject() ? Geometry(node) : Geometry();
}

ListedZone zoneFrom(json::Object const& object, Place const& place) {
    ListedZone zone{place,
                    object,
                    object.get("name").textOrEmpty(),
                    geometryFrom<Cfg::Rect>(object.get("location")),
                    geometryFrom<Cfg::Point>(object.get("most_probable_point")),
                    {}};
    forEachObject(arrayOf(object, "fields"), place / "fields",
                  [&](json::Object const& field, Place const& at) {
                      zone.fields.push_back({at, field, field.get("name").textOrEmpty(), fieldFrom(field)});
                  });
    return zone;
}

Cfg::ExtractPreset withoutZones(json::Object const& object) {
    json::Object rest;
    for (auto const& [key, value] : object)
        if (std::string_view(key) != "zones")
            rest.set(key, value);
    return rest;
}

ListedExtractPreset extractPresetFrom(json::Object const& object, Place const& place, bool inherited) {
    ListedExtractPreset listed{place, object, inherited, withoutZones(object), {}};
    forEachObject(arrayOf(object, "zones"), place / "zones", [&](json::Object const& zone, Place const& at) {
        listed.zones.push_back(zoneFrom(zone, at));
    });
    return listed;
}

/// The library's parser takes the last of two keys, as JSON has it.
std::string findDuplicateKey(std::string const& text) {
    json_error_t error;
    json::Value const strict(json_loadb(text.data(), text.size(), JSON_REJECT_DUPLICATES, &error));
    return strict ? std::string() : error.text + std::string(", line ") + std::to_string(error.line);
}

} // namespace

json::Array arrayOf(json::Object const& object, char const* key) {
    json::Value const node = object.get(key);
    return node.isArray() ? node.toArray() : json::Array();
}

Unwrapped unwrap(json::Value const& node, Place const& place) {
    if (!Cfg::isWrapper(node))
        return {node, place, false};
    return {Cfg::unwrap(node), place / Cfg::VALUE_KEY, true};
}

std::string inWords(Cfg::ExtractPreset const& preset) {
    std::string const match = inQuotes(preset.strRegex());
    return preset.name().empty() ? match : inQuotes(preset.name()) + " (" + match + ')';
}

PresetsDocument::PresetsDocument(std::string const& text, json::Object const& above)
    : document_(json::strToObject(text.data(), text.size())), duplicateKey_(findDuplicateKey(text)) {
    isPartAlone_ = document_.get(EXTRACT_PRESETS) || document_.get(PACK_PRESETS);
    if (!isPartAlone_)
        partPlace_ = partPlace_ / Cfg::Presets::PART_NAME;
    json::Value const node = isPartAlone_ ? json::Value(document_) : document_.get(Cfg::Presets::PART_NAME);
    json::Object const part = node.isObject() ? node.toObject() : json::Object();
    forEachElement(arrayOf(part, EXTRACT_PRESETS), partPlace_ / EXTRACT_PRESETS,
                   [&](json::Object const& object, Place const& place, bool inherited) {
                       extractPresets_.push_back(extractPresetFrom(object, place, inherited));
                   });
    std::stable_sort(extractPresets_.begin(), extractPresets_.end(),
                     [](auto const& a, auto const& b) { return a.preset.order() < b.preset.order(); });
    forEachElement(arrayOf(part, PACK_PRESETS), partPlace_ / PACK_PRESETS,
                   [&](json::Object const& object, Place const& place, bool inherited) {
                       packPresets_.push_back({place, object, inherited, object.get("name").textOrEmpty()});
                   });
    addInherited(above, arrayOf(part, EXTRACT_PRESETS).size(), arrayOf(part, PACK_PRESETS).size());
}

void PresetsDocument::addInherited(json::Object const& part, std::size_t ownExtract, std::size_t ownPack) {
    forEachElement(arrayOf(part, EXTRACT_PRESETS), {}, [&](json::Object const& object, Place const&, bool) {
        extractPresets_.push_back(
            extractPresetFrom(object, partPlace_ / EXTRACT_PRESETS / ownExtract++, true));
    });
    forEachElement(arrayOf(part, PACK_PRESETS), {}, [&](json::Object const& object, Place const&, bool) {
        packPresets_.push_back(
            {partPlace_ / PACK_PRESETS / ownPack++, object, true, object.get("name").textOrEmpty()});
    });
}

Cfg::Presets PresetsDocument::matchingPart() const {
    json::Array extractPresets;
    for (ListedExtractPreset const& listed : extractPresets_)
        extractPresets.append(
            Cfg::ExtractPreset(listed.match(), listed.preset.packPresetName(), nullptr).serialize());
    json::Array packPresets;
    for (ListedPackPreset const& listed : packPresets_)
        packPresets.append(json::Object{{"name", listed.name}});
    return Cfg::Presets(json::Object{{EXTRACT_PRESETS, extractPresets}, {PACK_PRESETS, packPresets}}, true,
                        false);
}

} // namespace VlMail
