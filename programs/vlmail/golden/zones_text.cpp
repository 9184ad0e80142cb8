#include "programs/vlmail/golden/zones_text.h"

#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/reader/letters.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <sstream>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

using Cfg::ExtractZone;

struct ZoneSection {
    std::string name;
    std::string text;
};

bool isHeading(std::string const& line) {
    return line.size() > 2 && line.front() == '[' && line.back() == ']';
}

std::vector<ZoneSection> sectionsOf(std::string const& text) {
    std::vector<ZoneSection> sections;
    std::istringstream in(text);
    std::string line;
    while (std::getline(in, line)) {
        if (line.ends_with('\r'))
            line.pop_back();
        if (isHeading(line))
            sections.push_back({line.substr(1, line.size() - 2), {}});
        else if (sections.empty())
            throw Base::Error(Base::Code::ExpectationMalformed,
                              "it does not begin with the name of a zone; put [Name] in front");
        else
            sections.back().text += (sections.back().text.empty() ? "" : "\n") + line;
    }
    if (sections.empty())
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "it is empty; write [Name of a zone] and the zone's text");
    return sections;
}

std::string namesOf(Cfg::ExtractZones const& zones) {
    std::string names;
    for (ExtractZone const& zone : zones)
        names += (names.empty() ? "" : ", ") + inQuotes(zone.name());
    return names.empty() ? "none" : names;
}

ExtractZone const& zoneNamed(std::string const& name, Cfg::ExtractPreset const& preset) {
    auto const& zones = preset.zones();
    auto const zone = std::ranges::find(zones, name, &ExtractZone::name);
    if (zone == zones.end())
        throw Base::Error(Base::Code::ExpectationMalformed, "the preset for " + inQuotes(preset.strRegex()) +
                                                                " has no zone " + inQuotes(name) +
                                                                "; it has " + namesOf(zones));
    return *zone;
}

} // namespace

DocumentReading readZonesText(std::string const& text, std::string const& documentName,
                              PresetIndex const& presets) {
    auto const& [extractPreset, packPreset] = presets.findMatch(documentName);
    std::vector<Reader::GivenText> texts;
    for (ZoneSection& section : sectionsOf(text))
        texts.push_back({&zoneNamed(section.name, extractPreset), std::move(section.text)});
    Reader::Letter letter =
        Reader::readGivenTexts(documentName, texts, nullptr, Reader::ReadingRules::of(packPreset));
    DocumentReading reading;
    reading.document = documentName;
    reading.extractPreset = extractPreset.strRegex();
    reading.packPreset = packPreset.name();
    reading.letters = {
        {{}, std::move(letter.fields), std::move(letter.missing), {}, std::move(letter.warnings)}};
    return reading;
}

DocumentReading readZonesFile(std::filesystem::path const& file, PresetIndex const& presets) {
    return readZonesText(Base::readFile(file), Base::validUtf8(file.stem().string()), presets);
}

} // namespace VlMail
