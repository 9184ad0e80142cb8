#include "programs/vlmail/workbench/settings_in_work.h"

#include "programs/vlmail/presets/lint.h"

#include <algorithm>
#include <iterator>
#include <span>
#include <utility>

namespace VlMail::Workbench {
namespace {

/// What the settings are called where a failure names them.
constexpr char const* NAME = "the workbench";

/// At the key, to the end of a value that is no more than a line.
json::Object placed(Finding const& finding, SettingsText const& text) {
    JsonPlace const& place = text.nearest(finding.place.pointer());
    bool const isWide = place.kind != ' ';
    return {{"severity", inWords(finding.severity())},
            {"kind", finding.id()},
            {"pointer", finding.place.pointer()},
            {"from", toJson(text.positionOf(place.keyBegin))},
            {"to", toJson(text.positionOf(isWide ? place.begin + 1 : place.end))},
            {"what", finding.what},
            {"advice", finding.advice}};
}

/// Presets that are inherited have places behind those in the text, which cannot change what is found there.
bool isOfInherited(Place const& place, SettingsText const& text) {
    std::vector<std::string> const steps = stepsOf(place.pointer());
    auto const list = std::ranges::find_if(
        steps, [](std::string const& step) { return step == "extract_presets" || step == "pack_presets"; });
    if (list == steps.end() || std::next(list) == steps.end())
        return false;
    return !text.find((Place() / std::span(steps.begin(), std::next(list, 2))).pointer());
}

/// The element of a list that the other list has at the same place, or by that name.
template<typename Listed, typename All, typename One>
Listed const* atSamePlace(std::vector<Listed> const& listed, All const& all, One const& one) {
    std::size_t index = 0;
    for (auto const& each : all) {
        if (&each == &one)
            break;
        ++index;
    }
    if (index < listed.size() && listed[index].name == one.name())
        return &listed[index];
    auto const named = std::ranges::find(listed, one.name(), &Listed::name);
    return named == listed.end() ? nullptr : &*named;
}

} // namespace

json::Object toJson(Position const& position) {
    return {{"line", static_cast<long long>(position.line)}, {"ch", static_cast<long long>(position.column)}};
}

json::Array toJson(std::vector<Edit> const& edits) {
    json::Array array;
    for (Edit const& edit : edits)
        array.append(json::Object{{"from", toJson(edit.from)}, {"to", toJson(edit.to)}, {"text", edit.text}});
    return array;
}

SettingsInWork::SettingsInWork(std::string text, std::shared_ptr<Protocol::SettingsAnswer const> inherited)
    : text_(std::move(text)), inherited_(std::move(inherited)), document_(text_.text()) {}

PresetsDocument SettingsInWork::whole() const {
    return inherited_ ? PresetsDocument(text_.text(), inherited_->part(Cfg::Presets::PART_NAME).values)
                      : document_;
}

json::Array const& SettingsInWork::findings() {
    if (!findings_) {
        findings_.emplace();
        for (Finding const& finding : lint(whole()))
            if (!isOfInherited(finding.place, text_))
                findings_->append(placed(finding, text_));
    }
    return *findings_;
}

SettingsInWork::Used::Used(NodeSettings settings)
    : node(std::move(settings)), presets(node.presets()), index(presets) {}

SettingsInWork::Used& SettingsInWork::used() {
    if (!used_) {
        NodeSettings const written = NodeSettings::fromText(text_.text(), NAME);
        used_.emplace(inherited_ ? written.over(*inherited_) : written);
    }
    return *used_;
}

ListedExtractPreset const* SettingsInWork::listed(Cfg::ExtractPreset const& preset) const {
    auto const& all = document_.extractPresets();
    auto const found = std::ranges::find_if(all, [&](ListedExtractPreset const& one) {
        return one.match() == preset.strRegex() && one.preset.packPresetName() == preset.packPresetName();
    });
    return found == all.end() ? nullptr : &*found;
}

ListedPackPreset const* SettingsInWork::listedPack(std::string const& name) const {
    auto const& all = document_.packPresets();
    auto const found = std::ranges::find(all, name, &ListedPackPreset::name);
    return found == all.end() ? nullptr : &*found;
}

ListedZone const* SettingsInWork::listed(ListedExtractPreset const* preset, Cfg::ExtractPreset const& of,
                                         Cfg::ExtractZone const& zone) {
    return preset ? atSamePlace(preset->zones, of.zones(), zone) : nullptr;
}

ListedField const* SettingsInWork::listed(ListedZone const* zone, Cfg::ExtractZone const& of,
                                          Cfg::ExtractField const& field) {
    return zone ? atSamePlace(zone->fields, of.fields(), field) : nullptr;
}

} // namespace VlMail::Workbench
