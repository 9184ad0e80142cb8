// vlmail presets match: which presets a document's name gets, and why not the ones in front.
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/patterns/why_not.h"
#include "programs/reader/document.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/presets.h"
#include "programs/vlmail/explain/preset_walk.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/presets/presets_document.h"
#include "programs/vlmail/presets/words.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

using enum Cfg::PresetFieldIdxs;

struct Options {
    std::vector<std::string> names;
    std::string settings;
    bool json = false;
};

/// A preset that was tried, or the one that was taken.
struct Tried {
    std::size_t number = 0;
    Cfg::ExtractPreset const* preset = nullptr;
    /// None for one that comes from the defaults.
    std::optional<Place> place;
    Patterns::WhyNot why;
};

struct Found {
    std::string name;
    std::vector<Tried> earlier;
    std::optional<Tried> taken;
    std::string packPreset;
    /// None for one that comes from the defaults.
    std::optional<Place> packPlace;
    /// What failed and what to do; empty when both presets were found.
    std::string error;
    /// Of the error, when there is one.
    Base::Code code = Base::Code::PresetMissing;
};

/// The presets of the settings with their places. What it finds points into it.
class Finder {
public:
    Finder(NodeSettings const& settings, std::string const& text)
        : document_(text), presets_(settings.presets()) {}

    Found find(std::string const& name) const {
        Found found;
        found.name = name;
        NameTrial trial(name);
        for (auto const& element : presets_.elements<ExtractPresets>())
            if (endsWith(element.value, found, trial))
                return found;
        found.error = "no extraction preset fits; add one, such as \".*\"";
        return found;
    }

private:
    /// Whether the search ends with this preset, because it fits or fails.
    bool endsWith(Cfg::ExtractPreset const& preset, Found& found, NameTrial& trial) const {
        Tried tried{found.earlier.size() + 1, &preset, placeAt(found.earlier.size()), {}};
        try {
            if (trial.fits(preset)) {
                found.taken = std::move(tried);
                findPack(found);
                return true;
            }
        } catch (std::exception const& failure) {
            found.code = Base::Code::PatternInvalid;
            found.error = "preset " + std::to_string(tried.number) + ", " + inWords(preset) +
                          ", cannot be tried: " + failure.what() +
                          "; correct it, or no later preset is reached";
            return true;
        }
        tried.why = trial.whyNot(preset.strRegex());
        found.earlier.push_back(std::move(tried));
        return false;
    }

    std::optional<Place> placeAt(std::size_t index) const {
        auto const& all = document_.extractPresets();
        return index < all.size() ? std::optional(all[index].place) : std::nullopt;
    }

    void findPack(Found& found) const {
        found.packPreset = found.taken->preset->packPresetName();
        auto const& packs = presets_.elements<PackPresets>();
        bool const isThere = std::any_of(packs.begin(), packs.end(), [&](auto const& element) {
            return element.value.name() == found.packPreset;
        });
        if (!isThere)
            found.error = "there is no pack preset " + inQuotes(found.packPreset) +
                          "; add it, or name another one in " + inWords(*found.taken->preset);
        auto const listed =
            std::ranges::find(document_.packPresets(), found.packPreset, &ListedPackPreset::name);
        if (listed != document_.packPresets().end())
            found.packPlace = listed->place;
    }

    PresetsDocument document_;
    Cfg::Presets presets_;
};

json::Value placeOrNull(std::optional<Place> const& place) {
    return place ? json::Value(place->pointer()) : json::Value(json_null());
}

json::Object toJson(Tried const& tried) {
    return {{"number", tried.number},
            {"name", tried.preset->name()},
            {"match", tried.preset->strRegex()},
            {"place", placeOrNull(tried.place)}};
}

json::Object toJson(Found const& found) {
    json::Object object{{"name", found.name}};
    if (found.taken) {
        object.set("extract_preset", toJson(*found.taken));
        object.set("pack_preset",
                   json::Object{{"name", found.packPreset}, {"place", placeOrNull(found.packPlace)}});
    }
    json::Array earlier;
    for (Tried const& tried : found.earlier) {
        json::Object one = toJson(tried);
        one.set("why", tried.why.words);
        one.set("failed_part", tried.why.failedPart);
        one.set("fitted", tried.why.fitted);
        earlier.append(one);
    }
    object.set("earlier", earlier);
    if (!found.error.empty()) {
        object.set("error", found.error);
        object.set("code", Base::nameOf(found.code));
    }
    return object;
}

std::string placeInWords(std::optional<Place> const& place) {
    return place ? place->pointer() : "added by default";
}

std::string numbered(Tried const& tried) {
    return std::to_string(tried.number) + ". " + inWords(*tried.preset);
}

void print(std::ostream& out, Found const& found) {
    out << found.name << '\n';
    for (Tried const& tried : found.earlier)
        out << "  " << numbered(tried) << ": no, " << tried.why.words << '\n';
    if (found.taken)
        out << "  " << numbered(*found.taken) << ": yes, " << placeInWords(found.taken->place) << '\n';
    if (found.error.empty())
        out << "  sent by the pack preset " << inQuotes(found.packPreset) << ", "
            << placeInWords(found.packPlace) << '\n';
}

int match(Options const& options, Terminal const& terminal) {
    bool const hasSettings = !options.settings.empty();
    NodeSettings const settings = NodeSettings::fromFileIfNamed(options.settings);
    Finder const finder(settings, hasSettings ? Base::readFile(options.settings) : "{}");
    int status = FINE;
    for (std::string const& name : options.names) {
        Found const found = finder.find(Base::validUtf8(std::filesystem::path(name).filename().string()));
        if (options.json)
            terminal.out << toJson(found) << '\n';
        else
            print(terminal.out, found);
        if (found.error.empty())
            continue;
        terminal.complain(found.code, inQuotes(found.name) + ": " + found.error);
        status = FAILED;
    }
    return status;
}

} // namespace

void addPresetsMatchCommand(Base::Command const& presets, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = presets.addCommand(
        "match", "Tells which presets documents get by their names, and why not the others");
    command.addOption("NAME", options->names, "Names of documents; folders in front of them are left out")
        .required();
    command.addOption("--settings", options->settings, "A JSON document with settings parts of a node");
    command.addFlag("--json", options->json, "One JSON object a name, each on a line");
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return match(*options, terminal); }; });
}

} // namespace VlMail
