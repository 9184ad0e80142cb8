#pragma once
// Letters out of a document: where they begin, and what an extraction preset finds in them.

#include "programs/reader/document.h"
#include "programs/reader/zone_text.h"

#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/extract_zone.h"
#include "vlservice/extract/extracted_fields.h"

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Reader {

struct Letter {
    /// From 1, without gaps.
    std::vector<int> pages;
    /// What its first page holds, validated.
    Cfg::ExtractedFields fields;
    /// The obligatory fields that it does not have.
    std::vector<std::string> missing;
};

// How it came about. Definitions and zones point into the preset.

/// The search for one field in one zone.
struct FieldTrace {
    Cfg::ExtractField const* definition = nullptr;
    /// Where the pattern matched, and how wide that is.
    std::optional<Stretch> match;
    /// The match is wider than the definition allows: it stays in the text and gives no value.
    bool isTooWide = false;
    /// The lines that the match took out of the zone's text.
    std::string cut;
    /// The text of the value before it was validated; nothing when the value is the default.
    std::optional<std::string> rawText;
    /// The value, a copy; null when the field yields nothing.
    std::shared_ptr<Cfg::ExtractedField const> value;
};

struct ZoneTrace {
    Cfg::ExtractZone const* definition = nullptr;
    /// What was seen before the first field was searched.
    std::string text;
    Box box;
    std::vector<Box> blocks;
    std::vector<FieldTrace> fields;
};

struct PageTrace {
    int page = 0;
    bool beginsLetter = false;
    std::vector<ZoneTrace> zones;
};

/// The pages that were searched: the first of each letter, and every page where letters are told apart by a
/// mark.
struct Trace {
    std::vector<PageTrace> pages;
};

/// Each field with a mark other than None and SingleLetter that is found on a page begins a letter there;
/// pages in front of the first are a letter too. Without such fields, or with one that is marked
/// SingleLetter, the document is one letter. With skipFirstPage() the first page belongs to none. Without a
/// trace none of its texts is made. Throws Error when a page cannot be read or a field's validation pattern
/// fails; a failing extraction pattern is logged by the library and finds nothing.
std::vector<Letter> readLetters(Document& document, Cfg::ExtractPreset const& preset, Trace* trace = nullptr);

/// Takes one field out of a zone's text, as readLetters() does: not validated, or its default, or null.
/// Fills a trace but for its value.
std::shared_ptr<Cfg::ExtractedField> cutField(Cfg::ExtractField const& field, ZoneText& text,
                                              FieldTrace* trace = nullptr);

/// What a preset says about lines and blocks.
LayoutRules rulesOf(Cfg::ExtractPreset const& preset);

/// By the zone's location or, without one, its most probable point.
ZoneText textOf(Page const& page, Layout const& layout, Cfg::ExtractZone const& zone);

} // namespace Reader
