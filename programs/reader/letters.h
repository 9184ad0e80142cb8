#pragma once
// Letters out of a document: where they begin, and what an extraction preset finds in them.

#include "programs/reader/document.h"
#include "programs/reader/letter_joins.h"
#include "programs/reader/pattern_time.h"
#include "programs/reader/reading_rules.h"
#include "programs/reader/trace.h"

#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/extracted_fields.h"

#include <span>
#include <string>
#include <vector>

namespace Reader {

struct Letter {
    /// From 1, without gaps; none of a letter that was given as texts.
    std::vector<int> pages;
    /// What its first page holds, validated.
    Cfg::ExtractedFields fields;
    /// The obligatory fields that it does not have.
    std::vector<std::string> missing;
    /// What a person should know of its values, one line each.
    std::vector<std::string> warnings;
    /// Those of its pages that may begin another letter.
    std::vector<DoubtfulJoin> doubtfulJoins = {};
};

/// Each field with a mark other than None and SingleLetter that is found on a page begins a letter there;
/// pages in front of the first are a letter too. Without such fields, or with one that is marked
/// SingleLetter, the document is one letter. Fields of zones that the rules put on other pages mark nothing.
/// With skipFirstPage() the first page belongs to none. Throws Error when a page cannot be read, and what
/// FieldSearch::search() does.
std::vector<Letter> readLetters(Document& document, Cfg::ExtractPreset const& preset, Trace* trace = nullptr,
                                ReadingRules const& rules = {}, PatternLimits const& limits = {});

/// The text that stands in a zone, instead of a page that has it there.
struct GivenText {
    Cfg::ExtractZone const* zone = nullptr;
    std::string text;
};

/// A letter out of the texts of its zones, searched as those of a page are. Nothing of such a text has a
/// place or a width, so that no match is too wide. Throws what FieldSearch::search() does.
Letter readGivenTexts(std::string const& document, std::span<GivenText const> texts,
                      PageTrace* trace = nullptr, ReadingRules const& rules = {});

/// What a preset says about lines and blocks.
LayoutRules rulesOf(Cfg::ExtractPreset const& preset);

} // namespace Reader
