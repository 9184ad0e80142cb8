// Patterns: whether they compile, how hard they work, and whether they can fit what is read.
#include "programs/base/plain_text.h"
#include "programs/base/utf8.h"
#include "programs/patterns/hard_lines.h"
#include "programs/patterns/outline.h"
#include "programs/patterns/pattern.h"
#include "programs/production/production_rules.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/words.h"

#include <unicode/normalizer2.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;
using Use = Patterns::Pattern::Use;

/// What a pattern that does not compile does to documents.
char const* consequenceOfBreaking(Use use) {
    return use == Use::Name ? "every document whose name is tried on it fails"
                            : "no document that gets this preset can be read";
}

/// What a pattern that the matcher gives up does to them.
char const* consequenceOfGivingUp(Use use) {
    switch (use) {
    case Use::Name:
        return "documents with such names fail";
    case Use::Extract:
        return "in such a letter the field is not found and yields its default, or nothing";
    case Use::Validate:
        return "documents with such a value fail";
    }
    return "";
}

enum class Burden { Light, Slow, Runaway };

struct Trial {
    Burden burden = Burden::Light;
    std::string line;
};

/// The readers of documents cut lines at this length.
constexpr std::size_t LONG_LINE = 1000;
constexpr std::size_t BUDGET = Patterns::Pattern::DEFAULT_BUDGET;
/// Only what grows beyond every power of the length exceeds the budget on so short a line.
constexpr std::size_t SHORT_LINE = 40;
constexpr std::size_t MIDDLE_LINE = 200;

/// The line that costs most.
Trial hardest(Patterns::Pattern const& pattern, std::size_t length, std::size_t& cost) {
    Trial trial;
    cost = 0;
    for (std::string const& line : Patterns::hardLinesFor(pattern, length)) {
        std::size_t const found = pattern.cost(line, BUDGET);
        if (found <= cost)
            continue;
        cost = found;
        trial.line = line;
        if (cost == BUDGET)
            break;
    }
    return trial;
}

/// Whether the cost grows with more than the square of the length.
bool growsFast(Patterns::Pattern const& pattern) {
    constexpr std::size_t MORE_THAN_FOURFOLD = 6;
    std::size_t single = 0;
    std::size_t twofold = 0;
    hardest(pattern, MIDDLE_LINE, single);
    hardest(pattern, 2 * MIDDLE_LINE, twofold);
    return twofold == BUDGET || twofold > MORE_THAN_FOURFOLD * single;
}

Trial tryHardLines(Patterns::Pattern const& pattern) {
    if (!Patterns::hasRepetition(Patterns::outlineOf(pattern.text())))
        return {};
    std::size_t cost = 0;
    Trial trial = hardest(pattern, SHORT_LINE, cost);
    if (cost == BUDGET) {
        trial.burden = Burden::Runaway;
        return trial;
    }
    if (!growsFast(pattern))
        return {};
    trial = hardest(pattern, LONG_LINE, cost);
    trial.burden = cost == BUDGET ? Burden::Slow : Burden::Light;
    return trial;
}

/// The start of a line in quotes, with what cannot be seen as "\x01".
std::string startOf(std::string const& line) {
    constexpr std::size_t SHOWN = 24;
    std::string_view const start = Base::firstBytes(line, SHOWN);
    return inQuotes(Base::plainLine(start) + (start.size() < line.size() ? "..." : ""));
}

bool isComposed(std::string const& text) {
    UErrorCode error = U_ZERO_ERROR;
    icu::Normalizer2 const* const nfc = icu::Normalizer2::getNFCInstance(error);
    return U_FAILURE(error) || nfc->isNormalized(icu::UnicodeString::fromUTF8(text), error);
}

/// `givenUp` is what becomes of letters whose texts are too hard for it.
void checkPattern(std::string const& text, Use use, Place const& place, Findings& findings,
                  char const* givenUp) {
    if (text.empty())
        return;
    if (use != Use::Name && !isComposed(text))
        findings.add(PatternNotComposed, place);
    try {
        Trial const trial = tryHardLines(Patterns::Pattern(text, use));
        if (trial.burden == Burden::Runaway)
            findings.add(RunawayPattern, place, {startOf(trial.line), givenUp});
        else if (trial.burden == Burden::Slow)
            findings.add(SlowPattern, place, {startOf(trial.line)});
    } catch (Patterns::Broken const& broken) {
        findings.add(PatternBroken, place,
                     {std::to_string(broken.position + 1), broken.what(), consequenceOfBreaking(use)});
    }
}

void checkPattern(std::string const& text, Use use, Place const& place, Findings& findings) {
    checkPattern(text, use, place, findings, consequenceOfGivingUp(use));
}

void checkPatternsOf(ListedPackPreset const& pack, Findings& findings) {
    std::vector<Reader::RulesFault> faults;
    auto const reading = Reader::ReadingRules::from(pack.json.get(Reader::ReadingRules::KEY), faults);
    for (auto const& [name, zone] : reading.zones)
        checkPattern(zone.anchor, Use::Extract,
                     pack.place / Reader::ReadingRules::KEY / "zones" / name / "anchor", findings);
    using Production::ProductionRules;
    auto const production = ProductionRules::from(pack.json.get(ProductionRules::KEY), faults);
    checkPattern(production.postcode, Use::Extract, pack.place / ProductionRules::KEY / "postcode", findings,
                 "a letter with such an address cannot go out");
}

} // namespace

void checkPatterns(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets())
        checkPattern(preset.match(), Use::Name, preset.place / "match", findings);
    forEachField(document, [&](ListedExtractPreset const&, ListedZone const&, ListedField const& field) {
        checkPattern(field.json.get("value_extract").textOrEmpty(), Use::Extract,
                     field.place / "value_extract", findings);
        checkPattern(field.json.get("value_match").textOrEmpty(), Use::Validate, field.place / "value_match",
                     findings);
    });
    for (ListedPackPreset const& pack : document.packPresets())
        checkPatternsOf(pack, findings);
}

void checkValueGroups(PresetsDocument const& document, Findings& findings) {
    forEachField(document, [&](ListedExtractPreset const&, ListedZone const&, ListedField const& field) {
        std::string const text = field.json.get("value_extract").textOrEmpty();
        try {
            if (!text.empty() &&
                !Patterns::Pattern(text, Use::Extract).hasGroup(Cfg::ExtractField::REGEX_VALUE_GROUP_MARK))
                findings.add(ValueGroupMissing, field.place / "value_extract");
        } catch (Patterns::Broken const&) {
            // Told by checkPatterns.
        }
    });
}

} // namespace VlMail
