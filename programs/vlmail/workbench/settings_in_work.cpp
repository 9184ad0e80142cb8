#include "programs/vlmail/workbench/settings_in_work.h"

#include "programs/vlmail/presets/lint.h"

#include <algorithm>
#include <iterator>

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

SettingsInWork::SettingsInWork(std::string text) : text_(std::move(text)), document_(text_.text()) {}

json::Array const& SettingsInWork::findings() {
    if (!findings_) {
        findings_.emplace();
        for (Finding const& finding : lint(document_))
            findings_->append(placed(finding, text_));
    }
    return *findings_;
}

SettingsInWork::Used::Used(std::string const& text)
    : node(NodeSettings::fromText(text, NAME)), presets(node.presets()), index(presets) {}

SettingsInWork::Used& SettingsInWork::used() {
    if (!used_)
        used_.emplace(text_.text());
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
