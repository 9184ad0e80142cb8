// Near misses in which the pattern, or the writing of the text, would have to be another.
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/patterns/parts.h"
#include "programs/patterns/repairs.h"
#include "programs/patterns/text_forms.h"
#include "programs/vlmail/explain/near_miss_change.h"
#include "programs/vlmail/explain/near_miss_kinds.h"
#include "programs/vlmail/explain/words.h"

#include <algorithm>
#include <limits>
#include <string_view>
#include <utility>

namespace VlMail::NearMisses {

using Patterns::codePointOf;
using Patterns::composed;
using Patterns::firstUnplainMark;
using Patterns::foldedCase;
using Patterns::Likeness;
using Patterns::likestPiece;
using Patterns::withPlainMarks;
using Reader::FieldTrace;
using Reader::Stretch;
using Reader::ZoneText;
using Words::excerpt;

namespace {

std::size_t lineBreaksIn(std::string_view text) {
    return static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

std::string_view matchIn(std::string_view text, PlainHit const& hit) {
    return text.substr(hit.begin, hit.end - hit.begin);
}

/// Whole lines of a text, counted from 0.
Stretch linesOf(ZoneText const& text, std::size_t first, std::size_t count) {
    std::string const& all = text.text();
    std::size_t begin = 0;
    for (; first > 0; --first)
        begin = all.find('\n', begin) + 1;
    std::size_t end = begin;
    for (; count > 0; --count)
        end = std::min(all.find('\n', end), all.size()) + 1;
    return text.stretch(begin, end - 1 - begin);
}

/// The lines in which something was found in another writing of the text that has the same line breaks.
Stretch linesOf(ZoneText const& text, std::string_view otherWriting, PlainHit const& hit) {
    return linesOf(text, lineBreaksIn(otherWriting.substr(0, hit.begin)),
                   lineBreaksIn(matchIn(otherWriting, hit)) + 1);
}

/// The field with another pattern, in the text where it was searched.
std::optional<Found> byPattern(Search const& search, std::string const& pattern, std::string const& how) {
    if (pattern == search.pattern())
        return std::nullopt;
    auto found =
        search.told(search.find(search.withPattern(pattern), search.searchedText()), search.pageNumber(),
                    [&](Hit const& hit) { return "would match " + excerpt(hit.match.text) + how; });
    if (found)
        found->change = Change::pattern(pattern);
    return found;
}

/// The first of the patterns by which the field has a valid value in the text where it was searched, as a
/// change.
json::Value firstThatFits(Search const& search, std::vector<std::string> const& patterns) {
    for (std::string const& pattern : patterns) {
        auto const hit = search.find(search.withPattern(pattern), search.searchedText());
        if (hit && hit->isValid)
            return Change::pattern(pattern);
    }
    return {};
}

std::string lookAlikeAdvice(std::string const& matched, std::string const& pattern) {
    auto const told = [](std::string const& mark) {
        return Base::inQuotes(mark) + " (" + codePointOf(mark) + ")";
    };
    if (auto const mark = firstUnplainMark(matched))
        return "the letter has " + told(*mark) + " where the pattern has " +
               Base::inQuotes(withPlainMarks(*mark)) + ": let the pattern take both";
    std::string const mark = firstUnplainMark(pattern).value_or("");
    return "the pattern has " + told(mark) + " where the letter has " + Base::inQuotes(withPlainMarks(mark)) +
           ": correct the pattern";
}

/// The field in the text with another joint in the place of one line break.
std::optional<Found> joinedAt(Search const& search, ZoneText const& text, std::size_t lineBreak,
                              std::string const& joint) {
    std::string joined = text.text();
    joined.replace(lineBreak, 1, joint);
    auto const hit = search.find(search.field(), joined);
    bool const runsOver = hit && hit->begin < lineBreak && hit->end > lineBreak + joint.size();
    // A match of many lines is no value that was broken over two: any two of them joined would do.
    if (!runsOver || !search.helps(hit->isValid) || lineBreaksIn(matchIn(joined, *hit)) > 1)
        return std::nullopt;
    Stretch const both = linesOf(text, lineBreaksIn(std::string_view(text.text()).substr(0, lineBreak)), 2);
    std::size_t const middle = both.text.find('\n');
    std::string says = "would match with the lines " + excerpt(both.text.substr(0, middle)) + " and " +
                       excerpt(both.text.substr(middle + 1)) + " joined" +
                       (joint.empty() ? "" : " by a blank") +
                       ": let the pattern take a line break there, \\s in the place of a blank or \\h";
    return Found{std::move(says), both.text, search.pageNumber(), both.box, hit->isValid}.by(
        firstThatFits(search, Patterns::withLineBreaks(search.pattern())));
}

/// The text of a letter, to look up what a pattern wants.
class Lookup {
public:
    /// A piece of a line that is like what was looked up.
    struct Likest {
        std::size_t distance = std::numeric_limits<std::size_t>::max();
        Stretch stretch;
        int page = 0;
    };

    explicit Lookup(Search const& search)
        : ignoresCase_(search.pattern().find("(?i") != std::string::npos),
          isComplete_(search.otherPages().size() == search.missed().otherPages.size()) {
        add(search.page());
        for (int const number : search.otherPages())
            if (LaidOutPage const* const page = search.pages().page(number))
                add(*page);
    }

    bool has(std::string const& literal) const {
        return std::any_of(texts_.begin(), texts_.end(), [&](auto const& page) {
            return placeIn(page.second.text(), literal) != std::string::npos;
        });
    }

    /// Its page and the whole of the first line that has the literal; it must be there.
    std::pair<int, Stretch> lineWith(std::string const& literal) const {
        auto const found = std::find_if(texts_.begin(), texts_.end(), [&](auto const& page) {
            return placeIn(page.second.text(), literal) != std::string::npos;
        });
        auto const& [page, text] = *found;
        // Folding case may change the length of a text, but not its line breaks.
        std::string const searched = written(text.text());
        std::string_view const before = std::string_view(searched).substr(0, placeIn(text.text(), literal));
        return {page, linesOf(text, lineBreaksIn(before), 1)};
    }

    /// Near enough to be what was meant.
    std::optional<Likest> likest(std::string const& literal) const {
        constexpr std::size_t MIN_LETTERS = 5;
        std::size_t const letters = Base::characterCount(literal);
        if (letters < MIN_LETTERS)
            return std::nullopt;
        Likest best;
        for (auto const& [page, text] : texts_)
            offerLines(best, page, text, literal);
        return best.distance <= letters / 4 ? std::optional(best) : std::nullopt;
    }

    std::string whereLooked() const {
        return isComplete_ ? "in the letter"
                           : "on the first " + std::to_string(texts_.size()) + " pages of the letter";
    }

private:
    std::string written(std::string const& text) const { return ignoresCase_ ? foldedCase(text) : text; }
    std::size_t placeIn(std::string const& text, std::string const& literal) const {
        return written(text).find(written(literal));
    }

    void add(LaidOutPage const& page) { texts_.emplace_back(page.page->number, Search::everythingOn(page)); }

    static void offerLines(Likest& best, int page, ZoneText const& text, std::string const& literal) {
        std::string_view const all = text.text();
        for (std::size_t begin = 0, end = 0; begin <= all.size(); begin = end + 1) {
            end = std::min(all.find('\n', begin), all.size());
            std::string_view const line = all.substr(begin, end - begin);
            Likeness const likeness = likestPiece(line, literal);
            if (likeness.distance < best.distance)
                best = {likeness.distance,
                        text.stretch(begin + line.find(likeness.piece), likeness.piece.size()), page};
        }
    }

    std::vector<std::pair<int, ZoneText>> texts_;
    bool ignoresCase_ = false;
    bool isComplete_ = false;
};

/// The longest literal that the letter does not have.
std::optional<std::string> absentLiteral(Lookup const& lookup, std::vector<std::string> const& literals) {
    auto const absent = std::find_if(literals.begin(), literals.end(),
                                     [&](std::string const& literal) { return !lookup.has(literal); });
    return absent == literals.end() ? std::nullopt : std::optional(*absent);
}

/// All literals of the pattern are in the letter: tells where the longest one stands.
std::optional<Found> standingSomewhere(Search const& search) {
    std::vector<std::string> const literals = Patterns::literalsOf(search.pattern());
    if (literals.empty())
        return std::nullopt;
    Lookup const lookup(search);
    if (absentLiteral(lookup, literals))
        return std::nullopt;
    auto const [page, line] = lookup.lineWith(literals.front());
    return Found{Base::inQuotes(literals.front()) + " of the pattern stands in " + excerpt(line.text) +
                     " on page " + std::to_string(page) + ", but the rest of the pattern does not fit there",
                 line.text, page, line.box, false};
}

/// Whether it says anything that the front of a pattern fits: a pattern that begins with ".*" fits
/// everywhere.
bool isTelling(Patterns::Cut const& cut) {
    return !Patterns::literalsOf(cut.front).empty() || Patterns::literalsOf(cut.rest).empty();
}

/// What the engine says, as part of a sentence.
std::string reasonIn(std::string message) {
    if (message.ends_with('.'))
        message.pop_back();
    return message;
}

bool isBlank(std::string_view text) { return text.find_first_not_of(" \n") == std::string_view::npos; }

} // namespace

std::optional<Found> failure(Search const& search) {
    std::string const whose = search.isGivenUp() ? "patterns of the fields before it" : "the pattern";
    std::size_t const before = search.isGivenUp() ? 0 : search.failures().size();
    search.find(search.searchedText());
    if (search.failures().size() == before)
        return std::nullopt;
    return Found{whose + " cannot be searched in this text: " + reasonIn(search.failures().back()) +
                 "; let it repeat fewer things inside each other"};
}

std::optional<Found> valueGroup(Search const& search) {
    auto const hit =
        search.find(search.withPattern(Patterns::withWholeAsValue(search.pattern())), search.searchedText());
    if (!hit || hit->match.text.empty())
        return std::nullopt;
    std::string const why =
        Patterns::hasValueGroup(search.pattern())
            ? "its group (?<VAL>...) takes no part in the match: put it where a value always is"
            : "has no group (?<VAL>...): put one round the part that is the value";
    return Found{"the pattern matches " + excerpt(hit->match.text) + ", but " + why, hit->match.text,
                 search.pageNumber(), hit->match.box, true}
        .by(firstThatFits(search, Patterns::withValueGroups(search.pattern())));
}

std::optional<Found> earlierField(Search const& search) {
    ZoneText text = search.textOn(search.page());
    auto const hit = search.find(text);
    if (!hit)
        return std::nullopt;
    for (FieldTrace const* const earlier : search.earlierFields()) {
        FieldTrace taken;
        cutField(*earlier->definition, text, taken);
        if (search.find(text))
            continue;
        auto found = search.told(hit, search.pageNumber(), [&](Hit const& at) {
            return "would match " + excerpt(at.match.text) + ", but the field " +
                   Base::inQuotes(earlier->definition->name()) +
                   ", which is searched before it, takes that line: put this field in front of it, or into a "
                   "zone "
                   "of its own";
        });
        if (found)
            found->change = Change::before(earlier->definition->name());
        return found;
    }
    return std::nullopt;
}

std::optional<Found> letterCase(Search const& search) {
    return byPattern(search, "(?i)" + search.pattern(),
                     " with another letter case: begin the pattern with (?i)");
}

std::optional<Found> normalisation(Search const& search) {
    std::string const nfc = composed(search.pattern());
    return byPattern(
        search, nfc,
        " after Unicode normalisation: the pattern has decomposed letters (NFD) and documents are "
        "read with composed ones (NFC); type it anew as " +
            Base::inQuotes(nfc));
}

std::optional<Found> lookAlike(Search const& search) {
    ZoneText const& text = search.searchedText();
    std::string const plainText = withPlainMarks(text.text());
    std::string const plainPattern = withPlainMarks(search.pattern());
    if (plainText == text.text() && plainPattern == search.pattern())
        return std::nullopt;
    auto const hit = search.find(search.withPattern(plainPattern), plainText);
    if (!hit || !search.helps(hit->isValid))
        return std::nullopt;
    Stretch const lines = linesOf(text, plainText, *hit);
    std::string says =
        "would match " + excerpt(lines.text) +
        " if characters that look alike were the same: " + lookAlikeAdvice(lines.text, search.pattern());
    return Found{std::move(says), lines.text, search.pageNumber(), lines.box, hit->isValid}.by(
        firstThatFits(search, Patterns::withLookAlikes(plainPattern, lines.text)));
}

std::optional<Found> blanks(Search const& search) {
    return byPattern(
        search, Patterns::withAnyBlanks(search.pattern()),
        " with other blanks: the words of a line are joined by one blank each; write \\h* in the "
        "pattern where it has blanks");
}

std::optional<Found> joinedLines(Search const& search) {
    // Joined lines are not measured.
    if (search.trace().isTooWide)
        return std::nullopt;
    ZoneText const& text = search.searchedText();
    Best best;
    std::size_t at = text.text().find('\n');
    for (std::size_t tries = 0; at != std::string::npos && tries < MAX_TRIES && !best.isValid(); ++tries) {
        best.offer(joinedAt(search, text, at, " "));
        best.offer(joinedAt(search, text, at, ""));
        at = text.text().find('\n', at + 1);
    }
    return best.take();
}

std::optional<Found> anchor(Search const& search) {
    // A pattern without literals fits something on every page once it may begin and end anywhere.
    if (Patterns::literalsOf(search.pattern()).empty())
        return std::nullopt;
    auto const [front, core, end] = Patterns::anchorsOf(search.pattern());
    Best best;
    if (!front.empty())
        best.offer(byPattern(search, core + end,
                             " without ^ at its front: other text stands before it in its line"));
    if (!end.empty() && !best.isValid())
        best.offer(byPattern(search, front + core,
                             " without $ at its end: other text stands behind it in its line"));
    if (!front.empty() && !end.empty() && !best.isValid())
        best.offer(byPattern(search, core,
                             " without ^ and $: other text stands before it and behind it in its line"));
    return best.take();
}

std::optional<Found> literal(Search const& search) {
    Lookup const lookup(search);
    std::optional<std::string> const absent = absentLiteral(lookup, Patterns::literalsOf(search.pattern()));
    if (!absent)
        return std::nullopt;
    Found found{Base::inQuotes(*absent) + " of the pattern occurs nowhere " + lookup.whereLooked()};
    auto const likest = lookup.likest(*absent);
    if (!likest)
        return found;
    found.says += "; the nearest is " + Base::inQuotes(likest->stretch.text) + " on page " +
                  std::to_string(likest->page) + ": correct the pattern";
    found.text = likest->stretch.text;
    found.page = likest->page;
    found.box = likest->stretch.box;
    found.isValid = true;
    found.change =
        firstThatFits(search, Patterns::withOtherLiteral(search.pattern(), *absent, likest->stretch.text));
    return found;
}

std::optional<Found> rest(Search const& search) {
    ZoneText const& text = search.searchedText();
    std::string_view const all = text.text();
    for (Patterns::Cut const& cut : Patterns::cutsOf(search.pattern())) {
        if (!isTelling(cut))
            continue;
        auto const hit =
            search.find(search.withPattern(Patterns::withWholeAsValue(cut.front)), std::string(all));
        if (!hit || isBlank(matchIn(all, *hit)))
            continue;
        std::size_t const lineEnd = std::min(all.find('\n', hit->end), all.size());
        std::string_view const behind = all.substr(hit->end, lineEnd - hit->end);
        Stretch const stretch = text.stretch(hit->begin, lineEnd - hit->begin);
        std::string says = excerpt(matchIn(all, *hit)) + " fits " + Base::inQuotes(cut.front) + ", but " +
                           (behind.empty() ? "the end of the line" : excerpt(behind)) +
                           " behind it does not fit " + Base::inQuotes(cut.rest);
        return Found{std::move(says), stretch.text, search.pageNumber(), stretch.box, false}.by(
            firstThatFits(search, Patterns::withOtherRest(cut, behind)));
    }
    return standingSomewhere(search);
}

} // namespace VlMail::NearMisses
