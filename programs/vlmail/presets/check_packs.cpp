// Pack presets: whether each is found, used, and read as it is meant.
#include "programs/base/email_address.h"
#include "programs/base/local_offset.h"
#include "programs/policy/limits.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/nearest_name.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <ctime>
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

struct ModeRow {
    char const* key;
    Cfg::ModeRules rules;
};

ModeRow const MODES[] = {
    {"process_mode", Cfg::ProcessMode::RULES},
    {"process_mode_client", Cfg::ProcessModeClient::RULES},
};

/// "the bits 1, 2 and 16"
std::string inWords(std::uint32_t bits) {
    std::string words;
    for (std::uint32_t bit = 1; bit != 0 && bit <= bits; bit <<= 1)
        if (bits & bit)
            words += (words.empty() ? "" : (bits >> 1) < bit ? " and " : ", ") + std::to_string(bit);
    return "the bits " + words;
}

/// Empty when the mode may stand.
std::string whyRefused(Cfg::ModeRules const& rules, long long mode) {
    // As it is read: cut to 32 bits.
    auto const bits = static_cast<std::uint32_t>(mode);
    if (rules.allows(bits))
        return {};
    if (bits > Cfg::ModeRules::WIDTH)
        return "it has more than eight bits";
    if (rules.excludesItself(bits))
        return inWords(rules.exclusive) + " exclude each other";
    return "it has none of " + inWords(rules.required);
}

/// Whether a letterhead is stored as its id alone.
bool hasFlag(json::Object const& letterhead) {
    return std::ranges::any_of(Cfg::LetterheadInf::keys().rows, [&](json::KeyRow const& row) {
        return row.form.type == json::KeyType::Flag && letterhead.get(row.name).isTrue();
    });
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

/// Empty for a delay that ends, and for one that cannot be read, which is told of its keys.
std::string whyNeverEnding(json::Value const& delay) {
    if (!delay.isObject())
        return {};
    try {
        return Policy::whyImpossible(Cfg::PackPreset::DelayInfo(delay.toObject()),
                                     {std::time(nullptr), &Base::localOffset});
    } catch (json::Exc const&) {
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
            if (!mode.isInt())
                continue;
            if (std::string const why = whyRefused(row.rules, mode.toInt()); !why.empty())
                findings.add(ProcessModeRefused, pack.place / row.key,
                             {std::to_string(mode.toInt()), why, inWords(row.rules.required)});
        }
    }
}

void checkDelays(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets())
        if (std::string const why = whyNeverEnding(pack.json.get("delay")); !why.empty())
            findings.add(DelayImpossible, pack.place / "delay",
                         {why, std::to_string(Policy::MAX_DELAY_DAYS)});
}

void checkEmails(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets()) {
        std::string const email = pack.json.get("customer_email").textOrEmpty();
        if (!email.empty() && !Base::isEmailAddress(email))
            findings.add(EmailMalformed, pack.place / "customer_email", {inQuotes(email)});
        if (email.empty() && pack.json.get("confirmation_email").isTrue())
            findings.add(ConfirmationNotSent, pack.place / "confirmation_email");
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
