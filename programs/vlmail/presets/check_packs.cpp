// Pack presets: whether each is found, used, and read as it is meant.
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/nearest_name.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <exception>
#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;

/// The names that can be named, those that are added by default among them.
std::vector<std::string> availableNames(PresetsDocument const& document) {
    std::vector<std::string> names;
    Cfg::Presets const part = document.matchingPart();
    for (auto const& element : part.elements<Cfg::PresetFieldIdxs::PackPresets>())
        names.push_back(element.value.name());
    return names;
}

/// The nearest first, for advice.
std::string offered(std::vector<std::string> names, std::string const& wanted) {
    if (std::string const nearest = nearestName(wanted, names); !nearest.empty())
        return inQuotes(nearest);
    std::erase(names, std::string());
    std::string all;
    for (std::string const& name : names)
        all += (all.empty() ? "" : ", ") + inQuotes(name);
    return all;
}

ListedExtractPreset const* userOf(std::string const& name, PresetsDocument const& document) {
    auto const user = std::ranges::find_if(document.extractPresets(), [&](ListedExtractPreset const& preset) {
        return preset.preset.packPresetName() == name;
    });
    return user == document.extractPresets().end() ? nullptr : &*user;
}

/// Whether only the preset that is added by default uses it.
bool usedByDefault(std::string const& name, PresetsDocument const& document) {
    Cfg::Presets const part = document.matchingPart();
    auto const& presets = part.elements<Cfg::PresetFieldIdxs::ExtractPresets>();
    return std::any_of(presets.begin(), presets.end(),
                       [&](auto const& element) { return element.value.packPresetName() == name; });
}

/// A word of flags with the rules that the library has for it.
struct ModeRow {
    char const* key;
    long long exclusive;
    long long required;
    char const* requiredInWords;
};

constexpr long long MODE_WIDTH = 0xFF;
constexpr ModeRow MODES[] = {
    {"process_mode", 2 + 8, 1 + 2 + 8 + 128, "the bits 1, 2, 8 and 128"},
    {"process_mode_client", 0, 1 + 2 + 16, "the bits 1, 2 and 16"},
};

bool isRefused(ModeRow const& row, json::Value const& value) {
    try {
        Cfg::PackPreset(json::Object{{"name", ""}, {row.key, value}}, {});
        return false;
    } catch (std::exception const&) {
        return true;
    }
}

std::string whyRefused(ModeRow const& row, long long mode) {
    if (mode < 0 || mode > MODE_WIDTH)
        return "it has more than eight bits";
    if (row.exclusive != 0 && (mode & row.exclusive) == row.exclusive)
        return "the bits 2 and 8 exclude each other";
    return std::string("it has none of ") + row.requiredInWords;
}

/// Whether a letterhead is stored as its id alone.
bool hasFlag(json::Object const& letterhead) {
    for (char const* flag :
         {"skip_letters", "skip_attachments", "repeat_last_page", "apply_first_grouped_only", "on_top"})
        if (letterhead.get(flag).isTrue())
            return true;
    return false;
}

/// The keys that reading a letterhead keeps and writing it loses.
std::string lostKeys(json::Object const& object) {
    try {
        Cfg::LetterheadInf const letterhead((json::Value(object)));
        std::string lost;
        if (!letterhead.whichAttachments.empty())
            lost = inQuotes("which_attachments");
        if (letterhead.additional)
            for (auto const& [key, value] : letterhead.additional.toObject())
                lost += (lost.empty() ? "" : ", ") + inQuotes(key);
        return lost;
    } catch (std::exception const&) {
        return {};
    }
}

} // namespace

void checkPackPresetNames(PresetsDocument const& document, Findings& findings) {
    std::vector<std::string> const names = availableNames(document);
    for (ListedExtractPreset const& listed : document.extractPresets()) {
        std::string const& wanted = listed.preset.packPresetName();
        // Of a tombstone there is more to say than that.
        bool const isTombstone = wanted.empty() && listed.preset.eraseMe();
        if (isTombstone || std::ranges::find(names, wanted) != names.end())
            continue;
        if (wanted.empty())
            findings.add(PackPresetNotNamed, listed.place, {offered(names, wanted)});
        else
            findings.add(PackPresetMissing, listed.place / "pack_preset",
                         {inQuotes(wanted), offered(names, wanted)});
    }
}

void checkPackPresetsUsed(PresetsDocument const& document, Findings& findings) {
    auto const& packs = document.packPresets();
    for (auto pack = packs.begin(); pack != packs.end(); ++pack) {
        auto const first = std::ranges::find(packs, pack->name, &ListedPackPreset::name);
        ListedExtractPreset const* const user = userOf(pack->name, document);
        if (first != pack && !pack->inherited)
            findings.add(PackPresetTwice, pack->place, {inQuotes(pack->name), first->place.pointer()});
        else if (first == pack && user && pack->json.get("erase_me").isTrue())
            findings.add(ErasedPackPresetUsed, pack->place / "erase_me", {user->place.pointer()});
        else if (first == pack && !user && !pack->inherited && !usedByDefault(pack->name, document))
            findings.add(PackPresetUnused, pack->place, {inQuotes(pack->name)});
    }
}

void checkProcessModes(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets()) {
        for (ModeRow const& row : MODES) {
            json::Value const mode = pack.json.get(row.key);
            if (mode.isInt() && isRefused(row, mode))
                findings.add(
                    ProcessModeRefused, pack.place / row.key,
                    {std::to_string(mode.toInt()), whyRefused(row, mode.toInt()), row.requiredInWords});
        }
    }
}

void checkLetterheads(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets()) {
        json::Array const letterheads = arrayOf(pack.json, "letterheads");
        for (std::size_t i = 0; i < letterheads.size(); ++i) {
            json::Value const node = letterheads.at(i);
            if (!node.isObject() || hasFlag(node.toObject()))
                continue;
            if (std::string const lost = lostKeys(node.toObject()); !lost.empty())
                findings.add(LetterheadLosesKeys, pack.place / "letterheads" / i, {lost});
        }
    }
}

} // namespace VlMail
