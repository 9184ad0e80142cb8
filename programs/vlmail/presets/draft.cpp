#include "programs/vlmail/presets/draft.h"

#include "programs/base/millimetres.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/patterns/repairs.h"
#include "programs/reader/address_text.h"
#include "programs/reader/letters.h"
#include "programs/reader/month_names.h"
#include "programs/reader/number_reading.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/presets/draft_labels.h"
#include "programs/vlmail/presets/sheet.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/extract_zone.h"
#include "vlservice/presets/presets.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <optional>
#include <sstream>

namespace VlMail {
namespace {

using Reader::Box;

constexpr char const* PACK_PRESET = "Draft";

std::string shown(std::string const& text) { return Base::inQuotes(Base::plainLine(text)); }

/// A value that one of the documents has behind a label.
struct Sighting {
    DraftField const* field = nullptr;
    LabelledValue text;
    std::string document;
};

/// Where an address stands, and the smaller line above it.
struct AddressSighting {
    Box box;
    std::string text;
    std::string senderLine;
    std::string document;
};

std::string textOf(Reader::Page const& page, Reader::Layout const& layout, Reader::Block const& block) {
    std::string text;
    for (std::size_t i = block.firstLine; i < block.endLine; ++i)
        text += (text.empty() ? "" : " / ") + Reader::textOf(page, layout.lines[i]);
    return text;
}

/// The window of an envelope, generously, in 1/100 mm.
constexpr Box WINDOW{1000, 3000, 13000, 11000};

bool hasProse(Reader::Page const& page, Reader::Layout const& layout, Reader::Block const& block) {
    for (std::size_t i = block.firstLine; i < block.endLine; ++i)
        if (Reader::isProse(Reader::textOf(page, layout.lines[i])))
            return true;
    return false;
}

bool mayBeAddress(Reader::Page const& page, Reader::Layout const& layout, Reader::Block const& block) {
    std::size_t const lines = block.endLine - block.firstLine;
    return block.turn == Reader::Turn::Upright && lines >= 2 && lines <= 7 &&
           WINDOW.contains(block.box.centre()) && !hasProse(page, layout, block);
}

/// A line of smaller print right above the block.
std::string senderLineAbove(Reader::Page const& page, Reader::Layout const& layout,
                            Reader::Block const& address) {
    constexpr int NEAR = 1000;
    int const size = layout.lines[address.firstLine].size;
    for (Reader::Line const& line : layout.lines) {
        int const gap = address.box.top - line.box.bottom;
        if (gap >= 0 && gap < NEAR && line.size < size && line.box.left < address.box.right &&
            line.box.right > address.box.left)
            return Reader::textOf(page, line);
    }
    return {};
}

/// The block's box with room for more lines and longer ones, up to what stands below it.
Box withRoom(Box const& box, Reader::Layout const& layout, Reader::Page const& page) {
    constexpr int LINES_MORE = 1500;
    constexpr int WIDEST_ADDRESS = 9000;
    constexpr int MARGIN = 100;
    Box room{std::max(box.left - MARGIN, 0), box.top - MARGIN,
             std::min(std::max(box.right, box.left + WIDEST_ADDRESS) + MARGIN, page.width),
             box.bottom + LINES_MORE};
    for (Reader::Block const& other : layout.blocks) {
        if (other.box.top >= box.bottom && other.box.left < room.right)
            room.bottom = std::min(room.bottom, other.box.top - MARGIN);
        if (other.box.left >= box.right && other.box.top < room.bottom && other.box.bottom > room.top)
            room.right = std::min(room.right, other.box.left - MARGIN);
    }
    room.bottom = std::max(room.bottom, box.bottom + MARGIN);
    return room;
}

std::optional<AddressSighting> addressOn(Reader::Page const& page, std::string const& document) {
    Reader::Layout const layout = layOut(page);
    Reader::Block const* best = nullptr;
    auto const distance = [](Reader::Block const& block) {
        return block.box.distanceTo(Cfg::ExtractZone::DEF_MOST_PROBABLE_POINT);
    };
    for (Reader::Block const& block : layout.blocks)
        if (mayBeAddress(page, layout, block) && (!best || distance(block) < distance(*best)))
            best = &block;
    if (!best)
        return std::nullopt;
    return AddressSighting{withRoom(best->box, layout, page), textOf(page, layout, *best),
                           senderLineAbove(page, layout, *best), document};
}

std::optional<AddressSighting> findAddress(std::vector<Reader::Document>& documents) {
    for (Reader::Document& document : documents)
        if (auto const address = addressOn(document.page(1), document.name()))
            return address;
    return std::nullopt;
}

std::vector<std::string> linesOf(Reader::Document& document) {
    Reader::Page const& page = document.page(1);
    std::vector<std::string> lines;
    for (Reader::Line const& line : layOut(page).lines)
        lines.push_back(Reader::textOf(page, line));
    return lines;
}

std::optional<Sighting> findValue(DraftField const& field, std::vector<Reader::Document>& documents) {
    for (Reader::Document& document : documents)
        for (std::string const& line : linesOf(document))
            if (auto const value = labelledValue(field, line))
                return Sighting{&field, *value, document.name()};
    return std::nullopt;
}

/// How dates of such a look are read: a pattern with the groups that a date has.
json::Object dateKeys(std::string const& date) {
    json::Object keys{{"value_type", 3}, {"value_min", 0}};
    if (date.find('-') == 4)
        keys.set("value_match", R"((?<year>\d{4})-(?<month>\d\d)-(?<day>\d\d))");
    else if (date.find_first_not_of("0123456789.") == date.npos)
        keys.set("value_match", R"((?<day>\d\d?)\.(?<month>\d\d?)\.(?<year>\d{4}))");
    return keys;
}

json::Object keysOf(Sighting const& sighting) {
    switch (sighting.field->kind) {
    case DraftKind::Date:
        return dateKeys(sighting.text.value);
    case DraftKind::Amount:
        return {{"value_type", 2}, {"value_min", 0}};
    default:
        return {};
    }
}

json::Array listOf(json::Object const& element) {
    json::Array list;
    list.append(element);
    return list;
}

/// Sheets are rounded, a little cut off or other than what letters are printed on.
json::Object rectOf(Box const& box) {
    return {{"left", std::max(box.left, 0)},
            {"top", std::max(box.top, 0)},
            {"right", std::min(box.right, UPRIGHT_WIDTH)},
            {"bottom", std::min(box.bottom, UPRIGHT_HEIGHT)}};
}

json::Object zoneOf(Sighting const& sighting, Reader::Page const& page) {
    json::Object field{{"name", sighting.field->name},
                       {"value_extract", patternFor(*sighting.field, sighting.text.label)}};
    for (auto const& [key, value] : keysOf(sighting))
        field.set(key, value);
    return {{"name", sighting.field->zone},
            {"location", rectOf({0, 0, page.width, page.height})},
            {"fields", listOf(field)}};
}

json::Object addressZone(std::optional<AddressSighting> const& address) {
    json::Object zone{{"name", Cfg::ExtractZone::DEF_ZONE_NAME},
                      {"fields", listOf(Cfg::ExtractField::DefPostal().serialize())}};
    if (address)
        zone.set("location", rectOf(address->box));
    return zone;
}

/// What the amount and the date tell about how numbers and months are written.
json::Object readingFor(std::vector<Sighting> const& sightings) {
    using Reader::NumberRules;
    json::Object reading;
    for (Sighting const& sighting : sightings) {
        std::string const& text = sighting.text.value;
        if (sighting.field->kind == DraftKind::Amount) {
            bool const isComma =
                Reader::numberForms(text, {NumberRules::Decimal::Given, ",", {".", "'", " "}}).size() == 1;
            bool const isPoint =
                Reader::numberForms(text, {NumberRules::Decimal::Given, ".", {",", "'", " "}}).size() == 1;
            reading.set("decimal", isComma == isPoint ? "auto" : isComma ? "," : ".");
            if (isComma != isPoint)
                reading.set("grouping", isComma ? ".' " : ",' ");
        }
        if (sighting.field->kind != DraftKind::Date)
            continue;
        for (char const* language : {"en", "de", "fr", "nl", "it", "es"})
            if (!reading.get("months") && !Reader::datesInEnglish(text, language).empty())
                reading.set("months", language);
    }
    return reading;
}

json::Object settingsFor(std::string const& match, std::optional<AddressSighting> const& address,
                         std::vector<Sighting> const& sightings, Reader::Page const& page) {
    json::Array zones = listOf(addressZone(address));
    for (Sighting const& sighting : sightings)
        zones.append(zoneOf(sighting, page));
    json::Object pack{{"name", PACK_PRESET}, {"process_mode", 3}};
    if (json::Object const reading = readingFor(sightings); reading.size() > 0)
        pack.set(Reader::ReadingRules::KEY, reading);
    json::Object const extract{
        {"match", match}, {"pack_preset", PACK_PRESET}, {"name", PACK_PRESET}, {"zones", zones}};
    return {{Cfg::Presets::PART_NAME.c_str(),
             json::Object{{"extract_presets", listOf(extract)}, {"pack_presets", listOf(pack)}}}};
}

/// How many of the documents have a valid value of that name when they are read by the settings.
std::size_t countFound(json::Object const& settings, std::string const& name,
                       std::vector<Reader::Document>& documents) {
    Cfg::Presets const presets(settings.get(Cfg::Presets::PART_NAME.c_str()), false, false);
    PresetIndex const index(presets);
    std::size_t count = 0;
    for (Reader::Document& document : documents) {
        auto const& [extract, pack] = index.findMatch(document.name());
        auto const letters = Reader::readLetters(document, extract, nullptr, Reader::ReadingRules::of(pack));
        count += std::ranges::any_of(letters, [&](Reader::Letter const& letter) {
            return std::ranges::any_of(letter.fields, [&](auto const& entry) {
                return entry.second.name() == name && entry.second.isValid();
            });
        });
    }
    return count;
}

std::string foundIn(std::size_t count, std::size_t of) {
    return "found in " + std::to_string(count) + " of " + std::to_string(of);
}

std::vector<std::string> addressEvidence(std::optional<AddressSighting> const& address) {
    if (!address)
        return {"address: none was seen; the block of text nearest to the window of an envelope is taken"};
    Box const& box = address->box;
    std::vector<std::string> lines{"address: " + shown(address->text) + " in " + shown(address->document) +
                                   ", from " + Base::inMillimetres(box.left) + ", " +
                                   Base::inMillimetres(box.top) + " to " + Base::inMillimetres(box.right) +
                                   ", " + Base::inMillimetres(box.bottom) + " mm"};
    if (!address->senderLine.empty())
        lines.push_back("sender's line: " + shown(address->senderLine) +
                        " stands above the address in smaller print, and is "
                        "left out");
    return lines;
}

/// A name in runs of digits and of all else.
std::string withDigitRuns(std::string const& name) {
    std::string pattern;
    for (std::size_t at = 0; at < name.size();) {
        std::size_t const end = std::min(name.find_first_not_of("0123456789", at), name.size());
        if (end > at) {
            pattern += R"(\d+)";
            at = end;
        } else {
            std::size_t const digit = std::min(name.find_first_of("0123456789", at), name.size());
            pattern += Patterns::escaped(std::string_view(name).substr(at, digit - at));
            at = digit;
        }
    }
    return pattern;
}

std::string commonFront(std::string const& a, std::string const& b) {
    std::size_t length =
        static_cast<std::size_t>(std::mismatch(a.begin(), a.end(), b.begin(), b.end()).first - a.begin());
    while (length > 0 && length < a.size() && (a[length] & 0xC0) == 0x80)
        --length;
    return a.substr(0, length);
}

} // namespace

std::string expressionFor(std::vector<std::string> const& names) {
    std::string const first = withDigitRuns(names.front());
    bool const isOneShape =
        std::ranges::all_of(names, [&](std::string const& name) { return withDigitRuns(name) == first; });
    if (isOneShape)
        return first;
    std::string front = names.front();
    for (std::string const& name : names)
        front = commonFront(front, name);
    front.erase(front.find_last_not_of("0123456789") + 1);
    std::string const ending = names.front().substr(std::min(names.front().rfind('.'), names.front().size()));
    bool const shareEnding = std::ranges::all_of(names, [&](std::string const& name) {
        return name.ends_with(ending) && name.size() >= front.size() + ending.size();
    });
    return Patterns::escaped(front) + ".*" + (shareEnding ? Patterns::escaped(ending) : "");
}

Draft draftFrom(std::vector<Reader::Document>& documents) {
    std::vector<std::string> names;
    for (Reader::Document const& document : documents)
        names.push_back(document.name());
    std::string const match = expressionFor(names);
    auto const address = findAddress(documents);
    std::vector<Sighting> sightings;
    Draft draft{{}, {"match: " + match}};
    for (std::string& line : addressEvidence(address))
        draft.evidence.push_back(std::move(line));
    for (DraftField const& field : draftFields()) {
        auto const sighting = findValue(field, documents);
        if (!sighting)
            continue;
        sightings.push_back(*sighting);
        std::size_t const count = countFound(
            settingsFor(match, address, sightings, documents.front().page(1)), field.name, documents);
        if (count == 0)
            sightings.pop_back();
        else
            draft.evidence.push_back(std::string(field.name) + ": " + shown(sighting->text.value) +
                                     " behind " + shown(sighting->text.label) + " in " +
                                     shown(sighting->document) + ", " + foundIn(count, documents.size()));
    }
    draft.settings = settingsFor(match, address, sightings, documents.front().page(1));
    return draft;
}

} // namespace VlMail
