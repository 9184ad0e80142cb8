#include "programs/vlserviced/settings/parts.h"

#include "programs/base/error.h"
#include "programs/protocol/settings.h"
#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <array>
#include <functional>
#include <stdexcept>
#include <utility>

namespace VlServiced {
namespace {

using Chain = std::vector<SettingsLevel>;

json::Value jsonNull() { return json::Value(json_null()); }

std::string shownNode(std::string const& id) { return id.empty() ? "the root" : "node " + id; }

template<typename Part>
Part readLevel(SettingsLevel const& level, bool global) {
    try {
        return Part(level.parts.get(Part::PART_NAME), global, true);
    } catch (std::exception const& failure) {
        throw Base::Error(Base::Code::SettingsMalformed, "the settings \"" + std::string(Part::PART_NAME) +
                                                             "\" of " + shownNode(level.id) +
                                                             " cannot be read: " + failure.what());
    }
}

/// Completes each level from the one above it, so that in every field and in every list the nearest node
/// comes first. The root is built as the global part: below its own values stand the built-in ones.
template<typename Part>
Part complete(Chain const& chain, std::size_t at) {
    bool const isRoot = at + 1 == chain.size();
    // The node itself is global too, because only a global part writes its inherited values.
    Part part = readLevel<Part>(chain[at], isRoot || at == 0);
    if (!isRoot)
        part.combineParent(complete<Part>(chain, at + 1));
    return part;
}

template<typename Part>
json::Object effective(Chain const& chain) {
    return complete<Part>(chain, 0).serialize().toObject();
}

template<typename Part>
json::Value readOwn(json::Value const& sent) {
    return Part(sent, false, false).serialize();
}

/// Erasing what bears an erase mark is left to whoever stores the presets.
template<auto List>
void dropErased(Cfg::Presets& presets) {
    auto const& elements = presets.elements<List>();
    std::vector<std::size_t> erased;
    std::size_t position = 0;
    for (auto const& element : elements) {
        if (element.inh)
            break;
        if (element.value.eraseMe())
            erased.push_back(position);
        ++position;
    }
    for (auto at = erased.rbegin(); at != erased.rend(); ++at)
        presets.eraseOwn<List>(*at);
}

/// One expression that cannot be compiled would end the search for every document that reaches it.
void requireUsable(Cfg::Presets const& presets) {
    for (auto const& element : presets.elements<Cfg::PresetFieldIdxs::ExtractPresets>()) {
        try {
            element.value.match("");
        } catch (std::exception const& failure) {
            throw Base::Error(Base::Code::PatternInvalid, "the expression " + element.value.strRegex() +
                                                              " cannot be used: " + failure.what());
        }
    }
}

template<>
json::Value readOwn<Cfg::Presets>(json::Value const& sent) {
    Cfg::Presets presets(sent, false, false);
    dropErased<Cfg::PresetFieldIdxs::ExtractPresets>(presets);
    dropErased<Cfg::PresetFieldIdxs::PackPresets>(presets);
    requireUsable(presets);
    return presets.serialize();
}

struct PartKind {
    std::string name;
    json::RecordKeys const& keys;
    json::Value (*own)(json::Value const& sent);
    json::Object (*effective)(Chain const& chain);
};

template<typename... Parts>
auto kindsOf(Cfg::PartList<Parts...>) {
    return std::array{PartKind{Parts::PART_NAME, Parts::keys(), &readOwn<Parts>, &effective<Parts>}...};
}

auto const& kinds() {
    static auto const all = kindsOf(Cfg::SettingsParts());
    return all;
}

PartKind const& kindNamed(std::string const& name) {
    auto const found =
        std::find_if(kinds().begin(), kinds().end(), [&](PartKind const& k) { return k.name == name; });
    if (found != kinds().end())
        return *found;
    std::string known;
    for (std::string const& part : partNames())
        known += (known.empty() ? "" : ", ") + part;
    throw Base::Error(Base::Code::SettingUnknown,
                      "there are no settings \"" + name + "\"; there are " + known);
}

void checkKeys(PartKind const& kind, json::Object const& sent) {
    for (auto const& [key, value] : sent)
        if (!kind.keys.find(key))
            throw Base::Error(Base::Code::SettingUnknown,
                              "the settings \"" + kind.name + "\" have no key \"" + key + "\"");
}

json::Value unwrapped(json::Value const& value) { return Cfg::isWrapper(value) ? Cfg::unwrap(value) : value; }

json::Array unwrappedElements(json::Array const& list) {
    json::Array plain;
    for (json::Value const& element : list)
        plain.append(unwrapped(element));
    return plain;
}

/// The nearest level that has the key itself: stored parts hold own values alone.
json::Value originOfValue(PartKind const& kind, char const* key, Chain const& chain) {
    for (SettingsLevel const& level : chain)
        if (json::Value const part = level.parts.get(kind.name); part && part.toObject().get(key))
            return level.id;
    return jsonNull();
}

/// The levels' own elements follow one another, and built-in ones come behind them.
json::Array originsOfElements(PartKind const& kind, char const* key, Chain const& chain, std::size_t count) {
    json::Array origins;
    for (SettingsLevel const& level : chain) {
        json::Value const part = level.parts.get(kind.name);
        json::Value const list = part ? part.toObject().get(key) : json::Value();
        for (std::size_t own = list ? list.toArray().size() : 0; own > 0; --own)
            origins.append(level.id);
    }
    while (origins.size() < count)
        origins.append(jsonNull());
    return origins;
}

json::Object resolvePart(PartKind const& kind, Chain const& chain) {
    Protocol::PartSettings settings;
    for (auto const& [key, written] : kind.effective(chain)) {
        if (kind.keys.find(key)->inheritance == json::Inheritance::ByElements) {
            json::Array const list = unwrappedElements(written.toArray());
            settings.origins.set(key, originsOfElements(kind, key, chain, list.size()));
            settings.values.set(key, list);
        } else {
            settings.origins.set(key, originOfValue(kind, key, chain));
            settings.values.set(key, unwrapped(written));
        }
    }
    if (json::Value const own = chain.front().parts.get(kind.name))
        settings.own = own.toObject();
    return settings.serialize();
}

} // namespace

std::vector<std::string> const& partNames() {
    static std::vector<std::string> const names = [] {
        std::vector<std::string> all;
        for (PartKind const& kind : kinds())
            all.push_back(kind.name);
        return all;
    }();
    return names;
}

json::Value ownForm(std::string const& part, json::Value const& sent) {
    PartKind const& kind = kindNamed(part);
    try {
        if (sent)
            checkKeys(kind, sent.toObject());
        return kind.own(sent);
    } catch (Base::Error const&) {
        throw;
    } catch (std::exception const& failure) {
        throw Base::Error(Base::Code::SettingInvalid,
                          "the settings \"" + part + "\" were not changed: " + failure.what());
    }
}

json::Object resolve(Chain const& chain, std::vector<std::string> const& wantedParts) {
    json::Object parts;
    for (std::string const& name : wantedParts)
        parts.set(name, resolvePart(kindNamed(name), chain));
    return parts;
}

} // namespace VlServiced
