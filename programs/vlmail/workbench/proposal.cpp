#include "programs/vlmail/workbench/proposal.h"

#include "programs/base/error.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/presets/draft.h"
#include "programs/vlmail/workbench/evaluation.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace VlMail::Workbench {
namespace {

constexpr char const* FIELDS = "fields";
constexpr char const* NAME = "name";

/// Where a field was found, and what.
struct Sight {
    std::string value;
    int page = 0;
    Reader::Box box;
};

/// By the names of fields, in the first of the documents that has them.
std::map<std::string, Sight> sightsIn(std::vector<Reader::Document>& documents, SettingsInWork& settings) {
    std::map<std::string, Sight> sights;
    Along along;
    along.afterReading = [&](ReadResult&, OpenDocument const& read) {
        for (Reader::PageTrace const& page : read.trace.pages)
            for (Reader::ZoneTrace const& zone : page.zones)
                for (Reader::FieldTrace const& field : zone.fields)
                    if (field.isFound() && field.match && field.value->isValid())
                        sights.emplace(field.definition->name(),
                                       Sight{field.value->valueToStr(), page.page, field.match->box});
    };
    for (Reader::Document& document : documents)
        readDocument(document, settings.presets(), settings.node(), along);
    return sights;
}

/// The rest of the line that begins with the name and a colon.
std::string evidenceOf(std::string const& name, std::vector<std::string> const& evidence) {
    for (std::string const& line : evidence)
        if (line.starts_with(name + ": "))
            return line.substr(name.size() + 2);
    return {};
}

json::Object without(json::Object const& object, std::string_view left) {
    json::Object rest;
    for (auto const& [key, value] : object)
        if (key != left)
            rest.set(key, value);
    return rest;
}

/// An address is looked for in the zone that holds nothing else.
bool isAddressZone(json::Object const& zone) {
    json::Value const fields = zone.get(FIELDS);
    return fields.isArray() && fields.toArray().size() == 1 &&
           fields.toArray().at(0).toObject().get("priority").intOrZero() > 0;
}

json::Object sightToJson(std::map<std::string, Sight> const& sights, std::string const& name) {
    auto const seen = sights.find(name);
    if (seen == sights.end())
        return {{"value", ""}, {"page", json::Value(json_null())}, {"box", json::Value(json_null())}};
    Sight const& sight = seen->second;
    return {{"value", sight.value}, {"page", sight.page}, {"box", toJson(sight.box)}};
}

/// A proposal in the making.
class Proposer {
public:
    Proposer(std::vector<std::string> const& evidence, std::map<std::string, Sight> const& sights)
        : evidence_(evidence), sights_(sights) {}

    void add(json::Object const& zone) {
        if (isAddressZone(zone))
            return addAddress(zone);
        for (json::Value const& field : zone.get(FIELDS).toArray())
            addField(without(zone, FIELDS), field.toObject());
    }

    json::Value const& address() const { return address_; }
    json::Array const& fields() const { return fields_; }

private:
    void addAddress(json::Object const& zone) {
        std::string const name = zone.get(FIELDS).toArray().at(0).toObject().get(NAME).textOrEmpty();
        json::Object address = sightToJson(sights_, name);
        address.set("zone", zone);
        address.set("says", evidenceOf("address", evidence_));
        address_ = address;
    }

    void addField(json::Object const& zone, json::Object const& field) {
        std::string const name = field.get(NAME).textOrEmpty();
        json::Object proposed = sightToJson(sights_, name);
        proposed.set("id", static_cast<long long>(fields_.size()));
        proposed.set(NAME, name);
        proposed.set("zone", zone);
        proposed.set("field", field);
        proposed.set("says", evidenceOf(name, evidence_));
        fields_.append(proposed);
    }

    std::vector<std::string> const& evidence_;
    std::map<std::string, Sight> const& sights_;
    json::Value address_{json_null()};
    json::Array fields_;
};

/// Zones in the order in which their first fields stand, each with all of its fields.
json::Array zonesOf(json::Object const& proposal) {
    std::vector<std::pair<std::string, json::Object>> zones;
    if (json::Value const address = proposal.get("address"); address.isObject()) {
        json::Object const zone = address.toObject().get("zone").toObject();
        zones.emplace_back(zone.get(NAME).toString(), zone);
    }
    for (json::Value const& one : proposal.get(FIELDS).toArray()) {
        json::Object zone = one.toObject().get("zone").toObject();
        json::Object field = one.toObject().get("field").toObject();
        field.set(NAME, one.toObject().get(NAME).toString());
        std::string const name = zone.get(NAME).toString();
        auto const known = std::ranges::find(zones, name, &std::pair<std::string, json::Object>::first);
        bool const isKnown = known != zones.end();
        json::Array fields = isKnown ? known->second.get(FIELDS).toArray() : json::Array();
        fields.append(field);
        json::Object& into = isKnown ? known->second : zones.emplace_back(name, zone).second;
        into.set(FIELDS, fields);
    }
    json::Array array;
    for (auto const& [name, zone] : zones)
        array.append(zone);
    return array;
}

std::string freeName(PresetsDocument const& document, std::string const& wanted) {
    auto const isTaken = [&](std::string const& name) {
        return std::ranges::find(document.packPresets(), name, &ListedPackPreset::name) !=
               document.packPresets().end();
    };
    std::string name = wanted;
    for (int number = 2; isTaken(name); ++number)
        name = wanted + ' ' + std::to_string(number);
    return name;
}

/// In front of what the list has.
SettingsText withFirst(SettingsText const& text, std::string const& list, json::Value const& element) {
    JsonPlace const* const place = text.find(list);
    bool const isEmpty = !place || place->members.empty();
    return isEmpty ? text.with(list + "/-", element) : text.withInserted(list + "/0", element);
}

} // namespace

json::Object proposalFrom(std::vector<Reader::Document>& documents) {
    Draft const draft = draftFrom(documents);
    SettingsInWork settings(json::toText(draft.settings));
    std::map<std::string, Sight> const sights = sightsIn(documents, settings);
    json::Object const part = draft.settings.get(Cfg::Presets::PART_NAME).toObject();
    json::Object const preset = part.get("extract_presets").toArray().at(0).toObject();
    Proposer proposer(draft.evidence, sights);
    for (json::Value const& zone : preset.get("zones").toArray())
        proposer.add(zone.toObject());
    json::Array evidence;
    for (std::string const& line : draft.evidence)
        evidence.append(line);
    return {{"match", json::Object{{"proposal", preset.get("match")},
                                   {"says", "an expression that fits the names of the documents"}}},
            {NAME, preset.get(NAME)},
            {"address", proposer.address()},
            {FIELDS, proposer.fields()},
            {"pack_preset", part.get("pack_presets").toArray().at(0)},
            {"evidence", evidence}};
}

Adopted adopted(SettingsInWork const& settings, json::Object const& proposal) {
    std::string const name = freeName(settings.whole(), proposal.get(NAME).toString());
    json::Object pack = proposal.get("pack_preset").toObject();
    pack.set(NAME, name);
    json::Object const preset{{"match", proposal.get("match").toObject().get("proposal").toString()},
                              {"pack_preset", name},
                              {NAME, name},
                              {"zones", zonesOf(proposal)}};
    std::string const part = settings.document().isPartAlone() ? "" : '/' + Cfg::Presets::PART_NAME;
    SettingsText const withPack = withFirst(settings.text(), part + "/pack_presets", pack);
    return {withFirst(withPack, part + "/extract_presets", preset), part + "/extract_presets/0"};
}

} // namespace VlMail::Workbench
