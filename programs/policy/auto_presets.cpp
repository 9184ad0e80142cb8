#include "programs/policy/auto_presets.h"

#include <algorithm>
#include <map>
#include <utility>

namespace Policy {
namespace {

constexpr char const* LAST_USED = "last_used";

/// A list of presets, and the key that holds the pack preset's name in it.
struct PresetList {
    char const* key;
    char const* packPreset;
};
constexpr PresetList LISTS[] = {{"extract_presets", "pack_preset"}, {"pack_presets", "name"}};

/// The pack preset that an element belongs to; empty when it is none that expires.
std::string owner(json::Value const& element, PresetList const& list) {
    std::string name = element.isObject() ? element.toObject().get(list.packPreset).textOrEmpty() : "";
    return expiresUnused(name) ? name : std::string();
}

json::Array elementsOf(json::Object const& presets, PresetList const& list) {
    json::Value const elements = presets.get(list.key);
    return elements.isArray() ? elements.toArray() : json::Array();
}

/// Calls `change` with each element that expires and its owner: what it gives stands in its place, and the
/// empty handle erases it. The part, or the empty handle when nothing has changed.
template<typename Change>
json::Value changed(json::Object const& presets, Change change) {
    json::Object result = presets;
    for (PresetList const& list : LISTS) {
        json::Array elements;
        for (json::Value const& element : elementsOf(presets, list)) {
            std::string const name = owner(element, list);
            if (json::Value const kept = name.empty() ? element : change(element.toObject(), name))
                elements.append(kept);
        }
        if (!elements.empty() || presets.get(list.key))
            result.set(list.key, elements);
    }
    return result == presets ? json::Value() : result;
}

json::Value usedAt(json::Object element, long long now) {
    element.set(LAST_USED, now);
    return element;
}

std::map<std::string, long long> lastUses(json::Object const& presets) {
    std::map<std::string, long long> uses;
    for (PresetList const& list : LISTS)
        for (json::Value const& element : elementsOf(presets, list))
            if (std::string const name = owner(element, list); !name.empty())
                uses[name] = std::max(uses[name], element.toObject().get(LAST_USED).intOrZero());
    return uses;
}

} // namespace

bool expiresUnused(std::string const& packPreset) { return packPreset.starts_with("#auto_"); }

json::Value withUse(json::Object const& presets, std::string const& packPreset, long long now) {
    return changed(presets, [&](json::Object const& element, std::string const& name) {
        return name == packPreset ? usedAt(element, now) : json::Value(element);
    });
}

json::Value withoutUnused(json::Object const& presets, long long now) {
    std::map<std::string, long long> const uses = lastUses(presets);
    return changed(presets, [&](json::Object const& element, std::string const& name) {
        long long const used = uses.at(name);
        if (used <= 0)
            return usedAt(element, now);
        return now - used > MAX_UNUSED_SECONDS ? json::Value() : json::Value(element);
    });
}

} // namespace Policy
