#pragma once
// How a document's letters came about, as JSON: which presets were tried, what was seen in each zone, and for
// every field what was found, what became of it, and what would have to be different. docs/explain.md tells
// every key.

#include "programs/reader/letters.h"

#include "vlservice/presets/presets.h"

#include <chrono>
#include <string>

namespace VlMail {

/// The search for the presets of a document of that name; known before the document is read.
json::Object explainPresets(Cfg::Presets const& presets, std::string const& document);

constexpr Reader::PatternLimits NEAR_MISS_LIMITS{std::chrono::seconds(2), std::chrono::seconds(10)};

/// Adds what was seen on the pages to what explainPresets() gave. The trace is that of reading the document
/// by the preset and the rules. Near misses are sought on all pages of a letter, so that this costs more than
/// the reading itself; `limits` are those of all patterns that are tried for a field, and for all.
void explainPages(json::Object& explanation, Reader::Document& document, Cfg::ExtractPreset const& preset,
                  Reader::ReadingRules const& rules, Reader::Trace const& trace,
                  Reader::PatternLimits const& limits = NEAR_MISS_LIMITS);

/// The keys and words of an explanation, shared by those who read it.
namespace Explanation {

constexpr int VERSION = 1;

constexpr char const* VERSION_KEY = "version";
constexpr char const* PRESETS = "presets";
constexpr char const* PAGE_COUNT = "page_count";
constexpr char const* PAGES = "pages";

constexpr char const* ZONES = "zones";
constexpr char const* FIELDS = "fields";
constexpr char const* NEAR_MISSES = "near_misses";

constexpr char const* NAME = "name";
constexpr char const* PAGE = "page";
constexpr char const* TEXT = "text";
constexpr char const* BOX = "box";
constexpr char const* SAYS = "says";

/// Of a preset its expression, of a field what its pattern matched.
constexpr char const* MATCH = "match";

// Of a preset.
constexpr char const* PACK_PRESET = "pack_preset";
constexpr char const* INHERITED = "inherited";
constexpr char const* ANSWER = "answer";
constexpr char const* ANSWER_YES = "yes";
constexpr char const* ANSWER_NO = "no";
constexpr char const* ANSWER_FAILED = "failed";
constexpr char const* WHY = "why";

// Of a page.
constexpr char const* WIDTH = "width";
constexpr char const* HEIGHT = "height";
constexpr char const* BEGINS_LETTER = "begins_letter";
constexpr char const* MAY_BEGIN_LETTER = "may_begin_letter";

// Of a zone.
constexpr char const* LOCATION = "location";
constexpr char const* POINT = "point";
constexpr char const* BLOCKS = "blocks";
constexpr char const* ANCHOR = "anchor";
/// The location on the page, where an anchor moves it.
constexpr char const* PLACE = "place";
constexpr char const* BY_COLUMN = "column";
constexpr char const* NOWHERE = "nowhere";

// Of a field.
constexpr char const* PATTERN = "pattern";
constexpr char const* TYPE = "type";
constexpr char const* PRIORITY = "priority";
constexpr char const* OBLIGATORY = "obligatory";
constexpr char const* OUTCOME = "outcome";
constexpr char const* OUTCOME_FOUND = "found";
constexpr char const* OUTCOME_INVALID = "invalid";
constexpr char const* OUTCOME_TOO_WIDE = "too_wide";
constexpr char const* OUTCOME_NOT_FOUND = "not_found";
/// The pattern is empty.
constexpr char const* OUTCOME_NOT_SEARCHED = "not_searched";
constexpr char const* JOINED = "joined";
constexpr char const* JOINT = "joint";
constexpr char const* JOINT_RIGHT = "right";
constexpr char const* JOINT_BELOW = "below";
constexpr char const* PARTS = "parts";
constexpr char const* SENDERS_LINE = "senders_line";
constexpr char const* CUT = "cut";
constexpr char const* RAW = "raw";
constexpr char const* IS_DEFAULT = "default";
constexpr char const* VALUE = "value";
constexpr char const* SHOWN = "shown";
constexpr char const* IS_PASSED_OVER = "passed_over";

// Of a near miss.
constexpr char const* KIND = "kind";
/// What it would change in the settings, as near_miss_change.h has it.
constexpr char const* CHANGE = "change";

} // namespace Explanation

} // namespace VlMail
