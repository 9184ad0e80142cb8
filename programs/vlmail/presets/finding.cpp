#include "programs/vlmail/presets/finding.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>

namespace VlMail {
namespace {

using enum FindingKind;
using enum Severity;

constexpr char const* SIMPLER_PATTERN =
    "repeat nothing that is repeated inside, and let neighbouring repetitions take different characters";
constexpr char const* PAGE_COORDINATES =
    "coordinates are in 1/100 mm from the top left corner; an A4 page is 21000 wide and 29700 high";

constexpr FindingWords WORDS[] = {
    // clang-format off
    {UnknownPart, "unknown-part", Error,
     "{0} is no settings part: the whole document is refused",
     "name the parts {1}"},
    {MisspeltKey, "misspelt-key", Error,
     "{0} is no known key and changes nothing",
     "write {1}"},
    {UnknownKey, "unknown-key", Warning,
     "{0} is no known key and changes nothing",
     "remove it, or look its name up"},
    {DuplicateKey, "duplicate-key", Error,
     "a key stands twice in one object, and only the last one counts: {0}",
     "remove one of the two"},
    {DroppedKey, "dropped-key", Warning,
     "{0} is read by nobody and is gone when the settings are stored",
     "remove it"},
    {MissingKey, "missing-key", Error,
     "{0} is missing: all settings of the document are refused",
     "add it"},
    {WrongType, "wrong-type", Error,
     "a value of type {0} reads as {1} without a word",
     "write {2}"},
    {RefusedType, "refused-type", Error,
     "a value of type {0} is refused, and all settings of the document with it",
     "write {1}"},
    {CutNumber, "cut-number", Error,
     "{0} does not fit and reads as {1}",
     "write a number from {2} to {3}"},
    {UnknownNumber, "unknown-number", Warning,
     "{0} has no meaning: {1}",
     "write a number from {2}"},
    {CarriedOnly, "carried-only", Warning,
     "{0} is kept and handed on, and changes nothing here",
     "remove it unless another program reads it"},

    {EmptyMatch, "empty-match", Error,
     "an empty expression fits no document's name: the preset is never used",
     "write an expression that fits whole names, such as \"invoice.*\\.pdf\""},
    {MatchWithoutEnding, "match-without-ending", Warning,
     "the expression must fit the whole name, and fits only names without an ending, such as {0}",
     "let it go on to the end of the name: {1}"},
    {UnreachablePreset, "unreachable-preset", Error,
     "no document reaches this preset: {0} at {1} fits all its names, and is tried first because {2}",
     "give this one an \"order\" below {3} or the other one a greater \"order\", or remove this one"},
    {ShadowedPreset, "shadowed-preset", Warning,
     "it seems that no document reaches this preset: {0} at {1} fits all names that were tried, such as {4}, and is "
     "tried first because {2}",
     "give this one an \"order\" below {3} or the other one a greater \"order\", or remove this one"},
    {OrderTie, "order-tie", Warning,
     "{0} at {1} has the same \"order\" {2} and fits the same names, such as {3}: their sequence in the document decides",
     "give the one that is to be tried first a smaller \"order\""},
    {LastOrder, "last-order", Warning,
     "{0} is the last order there is, which a preset has that was never given one: nothing can be tried after it",
     "give it an \"order\" of its own"},
    {ErasedPresetMatches, "erased-preset-matches", Error,
     "the preset is marked for deletion and is tried all the same: documents that it fits reach no other",
     "take the preset out of the document"},
    {PackPresetMissing, "pack-preset-missing", Error,
     "there is no pack preset {0}: every document that this preset fits fails",
     "add a pack preset of that name, or name one that is there: {1}"},
    {PackPresetNotNamed, "pack-preset-not-named", Error,
     "the preset names no pack preset: every document that it fits fails",
     "add \"pack_preset\" with the name of one that is there: {0}"},
    {PackPresetTwice, "pack-preset-twice", Error,
     "the pack preset {0} at {1} stands in front of it and has the same name: this one is never used",
     "give it another name, or remove it"},
    {PackPresetUnused, "pack-preset-unused", Warning,
     "no extraction preset names {0}: it is never used",
     "name it in the \"pack_preset\" of an extraction preset, or remove it"},
    {ErasedPackPresetUsed, "erased-pack-preset-used", Error,
     "the pack preset is marked for deletion and is used all the same, by the extraction preset at {0}",
     "name another one there, then take this one out of the document"},
    {ProcessModeRefused, "process-mode-refused", Error,
     "{0} is refused, and all settings of the document with it: {1}",
     "write 0, or a number up to 255 with one of {2}"},
    {LetterheadLosesKeys, "letterhead-loses-keys", Warning,
     "a letterhead without flags is stored as its id alone, without {0}",
     "set one of \"skip_letters\", \"skip_attachments\", \"repeat_last_page\", \"apply_first_grouped_only\" and "
     "\"on_top\" to true"},

    {DelayImpossible, "delay-impossible", Error,
     "the delay never ends, and no mailing goes out by this preset: {0}",
     "write days of the week from 0 (Sunday) to 6, days of the month from 1 to 31 and minutes of the day from 0 to 1439 "
     "that come together within {1} days"},
    {EmailMalformed, "email-malformed", Error,
     "{0} is no e-mail address, and no mailing goes out by this preset",
     "write one address, such as name@example.com"},
    {ConfirmationNotSent, "confirmation-not-sent", Warning,
     "nobody gets an e-mail when the mailing is handed over: the pack preset does not say who is to get it",
     "write the sender's address as \"customer_email\", or remove it"},

    {PatternBroken, "broken-pattern", Error,
     "the pattern is broken at character {0} ({1}): {2}",
     "correct the pattern"},
    {RunawayPattern, "runaway-pattern", Error,
     "the pattern runs away on a text such as {0}: {1}",
     SIMPLER_PATTERN},
    {SlowPattern, "slow-pattern", Warning,
     "the pattern is slow on a line of 1,000 characters such as {0}: twice the length takes eight times as long, or more",
     SIMPLER_PATTERN},
    {ValueGroupMissing, "value-group-missing", Error,
     "the pattern has no group VAL, so that it finds nothing: the field yields its default, or nothing",
     "put what is the value into (?<VAL>...)"},
    {PatternNotComposed, "pattern-not-composed", Error,
     "the pattern has accents as characters of their own, which a document's text never has: it does not fit",
     "write the pattern in composed characters (NFC)"},

    {ZoneOffPage, "zone-off-page", Error,
     "the zone lies off the page ({0}): its fields are never found",
     PAGE_COORDINATES},
    {ZoneBeyondPage, "zone-beyond-page", Warning,
     "the zone goes beyond the edge of an upright page ({0})",
     PAGE_COORDINATES},
    {ZoneEmpty, "zone-empty", Error,
     "the zone has no area ({0}): its fields are never found",
     "\"left\" must be less than \"right\", and \"top\" less than \"bottom\""},
    {ZoneTiny, "zone-tiny", Warning,
     "the zone is {0} mm wide and {1} mm high: hardly a word lies in it",
     PAGE_COORDINATES},
    {ZonesOverlap, "zones-overlap", Warning,
     "the zone shares {0} mm by {1} mm with zone {2} at {3}: what stands there is read in both",
     "move the zones apart"},
    {ZonesAtOnePoint, "zones-at-one-point", Warning,
     "the zone takes the block of text nearest to {0}, {1}, as does zone {2} at {3}: both read the same text",
     "give one of them a \"location\" or another \"most_probable_point\""},
    {PointOffPage, "point-off-page", Error,
     "the point {0}, {1} lies off the page",
     PAGE_COORDINATES},
    {ZoneWithoutFields, "zone-without-fields", Warning,
     "the zone has no fields: nothing is read from it",
     "add fields, or remove the zone"},

    {FieldNameTwice, "field-name-twice", Error,
     "the field at {1} is called {0} too: a letter has one value of a name, the one that is found first",
     "give it another name, or remove it"},
    {FieldPriorityTwice, "field-priority-twice", Error,
     "the recipient address {0} at {1} has the same priority {2}: a letter with both goes to the one that was found first",
     "give it another \"priority\""},
    {AddressNotSent, "address-not-sent", Error,
     "the recipient address does not go to the server, so it never counts: a letter with no other cannot go out",
     "set \"send_to_server\" to true"},
    {NoAddress, "no-address", Warning,
     "no field of the preset is a recipient address: no letter in these documents can go out",
     "give a field a \"priority\" above 0, and set its \"send_to_server\" to true"},
    {NeverFound, "never-found", Error,
     "the field has neither a pattern nor a default: it never has a value",
     "add \"value_extract\" with the value in (?<VAL>...)"},
    {NameLowered, "name-lowered", Warning,
     "the name of an address is read in lower case: the field is called {0}",
     "write {0}"},
    {WidthTiny, "width-tiny", Warning,
     "what is wider than {0} mm is not taken: hardly a word is so narrow",
     "\"width\" is in 1/100 mm: 140 mm are 14000"},
    {TypeOverruled, "type-overruled", Warning,
     "a field with \"mark\" 2 has an integer whatever its \"value_type\" is",
     "remove \"value_type\""},
    {RealsNotMerged, "reals-not-merged", Error,
     "when letters are grouped, real numbers are not put together: two of them give {0}, whatever they are",
     "use integers, such as cents (\"value_type\" 1)"},

    {DefaultDropped, "default-dropped", Warning,
     "a recipient address has no default: this one is dropped",
     "remove it"},
    {DefaultIgnored, "default-ignored", Error,
     "{0} cannot be read as {1}: the field has no default",
     "write {1}"},
    {DefaultRefused, "default-refused", Error,
     "the field's own rules refuse {0}, but a letter goes out with it, since defaults are not tested: {1}",
     "change the default, or the rule"},
    {LimitIgnored, "limit-ignored", Error,
     "{0} is not read as a limit of {1}: there is none",
     "write {2}"},
    {LimitCut, "limit-cut", Warning,
     "the limit of an integer is cut: {0} reads as {1}",
     "write an integer"},
    {LimitsCrossed, "limits-crossed", Error,
     "the least value {0} is above the greatest value {1}: every value is refused",
     "exchange \"value_min\" and \"value_max\""},
    {DateWithoutYear, "date-without-year", Warning,
     "a date without a year, such as {0}, is taken for a time before 1970 and passes",
     "set \"value_min\" to 0"},
    {NumberWithoutMinimum, "number-without-minimum", Warning,
     "the text {0} passes as a number, the lowest there is: {1}",
     "set a \"value_min\", such as 0"},
    {DecimalComma, "decimal-comma", Warning,
     "a number with a decimal comma, such as {0}, passes and is read as {1}: commas are skipped, and reading ends at what "
     "is no number",
     "say \"decimal\" in the \"reading\" of the pack preset, or let \"value_match\" take a comma only in front of three "
     "digits"},

    {ReadingRefused, "reading-refused", Error,
     "{0}: no document that is sent by this pack preset can be read",
     "{1}"},
    {ReadingZoneMissing, "reading-zone-missing", Error,
     "no extraction preset that names this pack preset has a zone {0}: what is said about it changes nothing",
     "{1}"},
    {ReadingAgainstMatch, "reading-against-match", Error,
     "\"reading\" hands a number on as 1234.56, and the pattern fits no such number: every value with decimals is refused",
     "remove \"value_match\", or write one for numbers with a decimal point and without separators"},
    {ReadingMarkElsewhere, "reading-mark-elsewhere", Error,
     "the mark begins letters only where their first page has it, and \"reading\" puts the zone {0} on another: it "
     "separates nothing",
     "move the field to a zone of the first page, or remove \"mark\""},

    {ProductionRefused, "production-refused", Error,
     "{0}: no letter that is sent by this pack preset can go out",
     "{1}"},
    {PrintAreaEmpty, "print-area-empty", Error,
     "the print area has no area ({0}): no letter can go out",
     "\"left\" must be less than \"right\", and \"top\" less than \"bottom\""},
    // clang-format on
};

static_assert(std::size(WORDS) == static_cast<std::size_t>(COUNT_));
static_assert(std::ranges::is_sorted(WORDS, {}, &FindingWords::kind));

FindingWords const& wordsOf(FindingKind kind) { return WORDS[static_cast<std::size_t>(kind)]; }

/// Each "{n}" in the text becomes the argument of that number.
std::string fill(std::string text, std::vector<std::string> const& arguments) {
    std::size_t at = 0;
    while ((at = text.find('{', at)) != text.npos && at + 2 < text.size()) {
        std::string const& argument = arguments.at(static_cast<std::size_t>(text[at + 1] - '0'));
        text.replace(at, 3, argument);
        at += argument.size();
    }
    return text;
}

/// Cuts the next step off the front of a pointer.
std::string_view nextStep(std::string_view& pointer) {
    pointer.remove_prefix(std::min<std::size_t>(1, pointer.size()));
    std::string_view const step = pointer.substr(0, pointer.find('/'));
    pointer.remove_prefix(step.size());
    return step;
}

bool isBefore(std::string_view a, std::string_view b) {
    while (!a.empty() && !b.empty()) {
        std::string_view const stepA = nextStep(a);
        std::string_view const stepB = nextStep(b);
        if (stepA == stepB)
            continue;
        std::uint64_t numberA = 0;
        std::uint64_t numberB = 0;
        bool const areNumbers =
            std::from_chars(stepA.data(), stepA.data() + stepA.size(), numberA).ec == std::errc() &&
            std::from_chars(stepB.data(), stepB.data() + stepB.size(), numberB).ec == std::errc();
        return areNumbers ? numberA < numberB : stepA < stepB;
    }
    return a.size() < b.size();
}

} // namespace

std::span<FindingWords const> findingWords() { return WORDS; }

char const* Finding::id() const { return wordsOf(kind).id; }

Severity Finding::severity() const { return wordsOf(kind).severity; }

void Findings::add(FindingKind kind, Place const& place, std::vector<std::string> const& arguments) {
    FindingWords const& words = wordsOf(kind);
    findings_.push_back({kind, place, fill(words.what, arguments), fill(words.advice, arguments)});
}

std::vector<Finding> Findings::sorted() const {
    std::vector<Finding> all = findings_;
    std::stable_sort(all.begin(), all.end(), [](Finding const& a, Finding const& b) {
        if (a.severity() != b.severity())
            return a.severity() == Error;
        return isBefore(a.place.pointer(), b.place.pointer());
    });
    return all;
}

char const* inWords(Severity severity) { return severity == Error ? "error" : "warning"; }

} // namespace VlMail
