#include "programs/vlmail/golden/zones_text.h"

#include "programs/base/error.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <sstream>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;
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
            throw Base::Error("it does not begin with the name of a zone; put [Name] in front");
        else
            sections.back().text += (sections.back().text.empty() ? "" : "\n") + line;
    }
    if (sections.empty())
        throw Base::Error("it is empty; write [Name of a zone] and the zone's text");
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
        throw Base::Error("the preset for " + inQuotes(preset.strRegex()) + " has no zone " + inQuotes(name) +
                          "; it has " + namesOf(zones));
    return *zone;
}

/// Takes the lines of a match out of the text, as reading does. Without a page nothing is too wide.
unsigned long long cutLines(std::string& text, unsigned long long offset, unsigned long long length) {
    std::size_t const lineBreak = offset == 0 ? text.npos : text.rfind('\n', offset - 1);
    std::size_t const begin = lineBreak == text.npos ? 0 : lineBreak + 1;
    std::size_t const end = text.find('\n', length == 0 ? offset : offset + length - 1);
    text.erase(begin, end == text.npos ? text.npos : end + 1 - begin);
    return 0;
}

/// One letter in the making: it has one value of a name, the first that is found, or else the first default.
class LetterBuilder {
public:
    void search(ExtractField const& field, std::string& text) {
        auto const value = field.extractField(text, cutLines);
        if (!value) {
            if (field.mustHave())
                letter_.missing.push_back(field.name());
            return;
        }
        bool const isFound = !value->isValidated();
        field.validate(*value);
        take(*value, isFound);
    }

    LetterReading finish() {
        for (auto const& [value, isFound] : values_)
            letter_.fields.emplace(value.priority(), value);
        return std::move(letter_);
    }

private:
    void take(ExtractedField const& value, bool isFound) {
        auto const known = std::ranges::find_if(
            values_, [&](auto const& other) { return other.first.name() == value.name(); });
        if (known == values_.end())
            values_.emplace_back(value, isFound);
        else if (isFound && !known->second)
            *known = {value, true};
    }

    LetterReading letter_;
    std::vector<std::pair<ExtractedField, bool>> values_;
};

} // namespace

DocumentReading readZonesText(std::string const& text, std::string const& documentName,
                              Cfg::Presets const& presets) {
    auto const& [extractPreset, packPreset] = presets.findMatch(documentName);
    LetterBuilder builder;
    for (ZoneSection& section : sectionsOf(text))
        for (ExtractField const& field : zoneNamed(section.name, extractPreset).fields())
            builder.search(field, section.text);
    DocumentReading reading;
    reading.document = documentName;
    reading.extractPreset = extractPreset.strRegex();
    reading.packPreset = packPreset.name();
    reading.letters = {builder.finish()};
    return reading;
}

} // namespace VlMail
