#include "programs/patterns/outline.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <cstdint>
#include <map>
#include <numeric>
#include <optional>
#include <set>
#include <utility>

namespace Patterns {
namespace {

using Kind = PatternPiece::Kind;

/// Deeper groups are not looked into.
constexpr int MAX_DEPTH = 40;

/// Bytes of the UTF-8 character that begins with this byte.
std::size_t characterLength(char first) {
    auto const byte = static_cast<unsigned char>(first);
    return byte < 0xC0 ? 1 : byte < 0xE0 ? 2 : byte < 0xF0 ? 3 : 4;
}

std::size_t characterCount(std::string_view text) {
    return static_cast<std::size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (c & 0xC0) != 0x80; }));
}

class OutlineParser {
public:
    explicit OutlineParser(std::string_view text) : text_(text) {}

    std::vector<PatternSequence> alternatives(int depth) {
        std::vector<PatternSequence> all(1);
        while (at_ < text_.size() && text_[at_] != ')') {
            if (text_[at_] == '|') {
                all.emplace_back();
                ++at_;
            } else {
                all.back().push_back(piece(depth));
            }
        }
        return all;
    }
    /// A pattern that closes more groups than it opens goes on behind the surplus one.
    std::vector<PatternSequence> whole() {
        std::vector<PatternSequence> all = alternatives(0);
        while (at_ < text_.size()) {
            ++at_;
            for (PatternSequence& rest : alternatives(0))
                all.push_back(std::move(rest));
        }
        return all;
    }

private:
    PatternPiece piece(int depth) {
        std::size_t const begin = at_;
        PatternPiece piece = unrepeated(depth);
        piece.body = text_.substr(begin, at_ - begin);
        repetition(piece);
        piece.text = text_.substr(begin, at_ - begin);
        return piece;
    }

    PatternPiece unrepeated(int depth) {
        switch (text_[at_]) {
        case '\\':
            return escape();
        case '[':
            return characterClass();
        case '(':
            return group(depth);
        case '.':
            ++at_;
            return ofKind(Kind::Class);
        case '^':
        case '$':
            ++at_;
            return ofKind(Kind::Assertion);
        default:
            return literal();
        }
    }

    static PatternPiece ofKind(Kind kind) {
        PatternPiece piece;
        piece.kind = kind;
        return piece;
    }
    static PatternPiece literalOf(std::string text) {
        PatternPiece piece = ofKind(Kind::Literal);
        piece.literal = std::move(text);
        return piece;
    }

    PatternPiece literal() {
        std::string character(text_.substr(at_, characterLength(text_[at_])));
        at_ += character.size();
        return literalOf(std::move(character));
    }

    PatternPiece escape() {
        ++at_;
        if (at_ == text_.size())
            return ofKind(Kind::Other);
        char const c = text_[at_];
        constexpr std::string_view CLASSES = "dDwWsShHvVlLuUN";
        constexpr std::string_view ASSERTIONS = "AzZbBG<>`'";
        if (CLASSES.find(c) != CLASSES.npos)
            return skip(1, Kind::Class);
        if (c == 'p' || c == 'P')
            return skip(1 + bracedLength(at_ + 1), Kind::Class);
        if (ASSERTIONS.find(c) != ASSERTIONS.npos)
            return skip(1, Kind::Assertion);
        if (c == 'x')
            return skip(1 + hexLength(at_ + 1), Kind::Other);
        if (c == 'k' || c == 'g')
            return skip(1 + bracedLength(at_ + 1), Kind::Other);
        if (c == 'Q')
            return quotation();
        if ((c >= '0' && c <= '9') || c == 'c' || c == 'R' || c == 'X' || c == 'C' || c == 'K' || c == 'E')
            return skip(1, Kind::Other);
        constexpr std::string_view CONTROLS = "nrtfae";
        constexpr std::string_view CONTROL_CHARACTERS = "\n\r\t\f\a\x1B";
        if (std::size_t const which = CONTROLS.find(c); which != CONTROLS.npos) {
            ++at_;
            return literalOf(std::string(1, CONTROL_CHARACTERS[which]));
        }
        return literal();
    }

    PatternPiece skip(std::size_t length, Kind kind) {
        at_ = std::min(at_ + length, text_.size());
        return ofKind(kind);
    }

    /// Of "{...}", "<...>" or a single character at that place.
    std::size_t bracedLength(std::size_t at) const {
        if (at >= text_.size())
            return 0;
        char const close = text_[at] == '{' ? '}' : text_[at] == '<' ? '>' : text_[at] == '\'' ? '\'' : '\0';
        if (close == '\0')
            return 1;
        std::size_t const end = text_.find(close, at + 1);
        return end == text_.npos ? text_.size() - at : end + 1 - at;
    }

    /// Of "{...}" or up to two digits.
    std::size_t hexLength(std::size_t at) const {
        if (at < text_.size() && text_[at] == '{')
            return bracedLength(at);
        std::size_t length = 0;
        while (length < 2 && at + length < text_.size() &&
               std::isxdigit(static_cast<unsigned char>(text_[at + length])))
            ++length;
        return length;
    }

    /// The text between \Q and \E, as a group of literals.
    PatternPiece quotation() {
        ++at_;
        std::size_t const end = std::min(text_.find("\\E", at_), text_.size());
        PatternPiece piece = ofKind(Kind::Group);
        piece.alternatives.emplace_back();
        while (at_ < end) {
            PatternPiece character = literal();
            character.text = character.body = '\\' + character.literal;
            piece.alternatives.back().push_back(std::move(character));
        }
        at_ = std::min(end + 2, text_.size());
        return piece;
    }

    PatternPiece characterClass() {
        ++at_;
        if (at_ < text_.size() && text_[at_] == '^')
            ++at_;
        // A bracket that closes nothing yet is a character.
        if (at_ < text_.size() && text_[at_] == ']')
            ++at_;
        while (at_ < text_.size() && text_[at_] != ']') {
            if (text_[at_] == '\\')
                ++at_;
            else if (text_[at_] == '[' && at_ + 1 < text_.size() &&
                     std::string_view(":.=").find(text_[at_ + 1]) != std::string_view::npos)
                at_ = std::min(text_.find(std::string{text_[at_ + 1], ']'}, at_ + 2), text_.size() - 1) + 1;
            ++at_;
        }
        return skip(1, Kind::Class);
    }

    PatternPiece group(int depth) {
        ++at_;
        PatternPiece piece = ofKind(Kind::Group);
        if (at_ < text_.size() && text_[at_] == '?')
            openSpecial(piece);
        std::vector<PatternSequence> inside;
        if (depth < MAX_DEPTH)
            inside = alternatives(depth + 1);
        else
            piece.kind = Kind::Other;
        if (piece.kind == Kind::Group)
            piece.alternatives = std::move(inside);
        return closed(std::move(piece));
    }

    /// Behind the groups that were not looked into, at the bracket that closes this one.
    PatternPiece closed(PatternPiece piece) {
        for (int open = 0; at_ < text_.size(); ++at_) {
            if (text_[at_] == '\\')
                ++at_;
            else if (text_[at_] == '(')
                ++open;
            else if (text_[at_] == ')' && open-- == 0)
                break;
        }
        at_ = std::min(at_ + 1, text_.size());
        return piece;
    }

    /// What stands behind "(?": says what kind of group it is.
    void openSpecial(PatternPiece& piece) {
        ++at_;
        std::string_view const rest = text_.substr(at_);
        bool const isNamed =
            rest.size() > 1 && ((rest[0] == '<' && rest[1] != '=' && rest[1] != '!') || rest[0] == '\'');
        if (isNamed) {
            std::size_t const length = bracedLength(at_);
            piece.groupName = rest.substr(1, length < 2 ? 0 : length - 2);
            at_ += length;
        } else if (rest.starts_with(':') || rest.starts_with('>') || rest.starts_with('|')) {
            ++at_;
        } else if (rest.starts_with('=') || rest.starts_with('!') || rest.starts_with("<=") ||
                   rest.starts_with("<!") || rest.starts_with('#')) {
            piece.kind = Kind::Assertion;
        } else {
            openWithOptions(piece);
        }
    }

    /// "(?i)" changes what follows, "(?i:...)" is a group.
    void openWithOptions(PatternPiece& piece) {
        std::size_t const end = text_.find_first_not_of("imsxn-", at_);
        if (end == text_.npos || (text_[end] != ':' && text_[end] != ')')) {
            piece.kind = Kind::Other;
            return;
        }
        at_ = end;
        if (text_[at_] == ')')
            piece.kind = Kind::Assertion;
        else
            ++at_;
    }

    void repetition(PatternPiece& piece) {
        if (at_ == text_.size())
            return;
        switch (text_[at_]) {
        case '*':
            set(piece, 0, PatternPiece::NO_LIMIT, 1);
            break;
        case '+':
            set(piece, 1, PatternPiece::NO_LIMIT, 1);
            break;
        case '?':
            set(piece, 0, 1, 1);
            break;
        case '{':
            if (!bounds(piece))
                return;
            break;
        default:
            return;
        }
        // Lazy or possessive.
        if (at_ < text_.size() && (text_[at_] == '?' || text_[at_] == '+'))
            ++at_;
    }

    void set(PatternPiece& piece, std::size_t least, std::size_t most, std::size_t length) {
        piece.least = least;
        piece.most = most;
        at_ += length;
    }

    bool bounds(PatternPiece& piece) {
        std::size_t const end = text_.find('}', at_);
        if (end == text_.npos)
            return false;
        char const* const last = text_.data() + end;
        std::size_t least = 0;
        auto const low = std::from_chars(text_.data() + at_ + 1, last, least);
        if (low.ec != std::errc())
            return false;
        std::size_t most = least;
        if (low.ptr != last) {
            if (*low.ptr != ',')
                return false;
            if (low.ptr + 1 == last)
                most = PatternPiece::NO_LIMIT;
            else if (std::from_chars(low.ptr + 1, last, most).ec != std::errc())
                return false;
        }
        set(piece, least, most, end + 1 - at_);
        return true;
    }

    std::string_view text_;
    std::size_t at_ = 0;
};

/// Numbers that look random and are the same everywhere.
class Choices {
public:
    explicit Choices(std::uint64_t variant) : variant_(variant), state_(variant * 0x9E3779B97F4A7C15) {}

    /// Below `count`. The first variants are plain: always the first choice, then always the second.
    std::size_t pick(std::size_t count) {
        if (variant_ < 2)
            return std::min<std::size_t>(variant_, count - 1);
        state_ ^= state_ << 13;
        state_ ^= state_ >> 7;
        state_ ^= state_ << 17;
        return static_cast<std::size_t>((state_ >> 11) % count);
    }

private:
    std::uint64_t variant_;
    std::uint64_t state_;
};

/// Texts for groups whose name says what they take, tried before others.
std::map<std::string, std::vector<std::string>> const TEXTS_BY_GROUP{
    {"day", {"05", "5"}},     {"month", {"03", "3", "Mar", "March", "mar", "march", "MAR", "MARCH"}},
    {"year", {"2021", "21"}}, {"hour", {"10"}},
    {"min", {"30"}},          {"sec", {"15"}},
    {"ampm", {"am", "AM"}},
};

/// Makes texts that pieces fit.
class Sampler {
public:
    std::optional<std::string> sequence(PatternSequence const& pieces, Choices& choices) {
        std::string text;
        for (PatternPiece const& piece : pieces) {
            auto const part = repeated(piece, choices);
            if (!part)
                return std::nullopt;
            text += *part;
        }
        return text;
    }

    std::optional<std::string> repeated(PatternPiece const& piece, Choices& choices) {
        constexpr std::array<std::size_t, 3> MORE{0, 1, 3};
        std::size_t const room = piece.most - piece.least;
        std::size_t const count = piece.least + std::min(MORE[choices.pick(MORE.size())], room);
        std::string text;
        for (std::size_t i = 0; i < count && text.size() < MAX_SAMPLE; ++i) {
            auto const part = once(piece, choices);
            if (!part)
                return std::nullopt;
            text += *part;
        }
        return text;
    }

    /// The piece without its repetition.
    std::optional<std::string> once(PatternPiece const& piece, Choices& choices) {
        switch (piece.kind) {
        case Kind::Literal:
            return piece.literal;
        case Kind::Assertion:
            return std::string();
        case Kind::Class: {
            auto const& members = membersOf(piece.body);
            return members.empty() ? std::nullopt : std::optional(members[choices.pick(members.size())]);
        }
        case Kind::Group:
            if (auto const text = byName(piece, choices))
                return text;
            return sequence(piece.alternatives[choices.pick(piece.alternatives.size())], choices);
        case Kind::Other:
            break;
        }
        return std::nullopt;
    }

    /// Some characters that a class has.
    std::vector<std::string> const& membersOf(std::string const& characterClass) {
        auto const known = members_.find(characterClass);
        if (known != members_.end())
            return known->second;
        std::vector<std::string> members;
        for (char const* character :
             {"1", "a", "A", " ", "-", "_", ".", ",", "@", "/", ":", "#", "é", "Z", "0", "\n"})
            if (fits(characterClass, character))
                members.push_back(character);
        return members_[characterClass] = std::move(members);
    }

private:
    static constexpr std::size_t MAX_SAMPLE = 400;

    static bool fits(std::string const& pattern, std::string const& text) {
        try {
            return Pattern(pattern, Pattern::Use::Validate).fits(text) == Pattern::Answer::Yes;
        } catch (BrokenPattern const&) {
            return false;
        }
    }

    std::optional<std::string> byName(PatternPiece const& piece, Choices& choices) {
        auto const named = TEXTS_BY_GROUP.find(piece.groupName);
        if (named == TEXTS_BY_GROUP.end())
            return std::nullopt;
        std::vector<std::string> fitting;
        for (std::string const& text : named->second)
            if (fits(piece.body, text))
                fitting.push_back(text);
        return fitting.empty() ? std::nullopt : std::optional(fitting[choices.pick(fitting.size())]);
    }

    std::map<std::string, std::vector<std::string>> members_;
};

void addUnique(std::vector<std::string>& texts, std::string text) {
    if (std::find(texts.begin(), texts.end(), text) == texts.end())
        texts.push_back(std::move(text));
}

/// A text that a pattern may take again and again, and what stands in front of it.
struct Run {
    std::string lead;
    std::string unit;

    friend bool operator<(Run const& a, Run const& b) {
        return std::tie(a.lead, a.unit) < std::tie(b.lead, b.unit);
    }
};

class RunCollector {
public:
    void collect(PatternSequence const& pieces, std::string lead) {
        for (PatternPiece const& piece : pieces) {
            if (piece.kind == Kind::Literal)
                addUnique(literals_, piece.literal);
            auto const unit = sampler_.once(piece, plain_);
            if (piece.most > 1)
                add(lead, unit);
            for (PatternSequence const& alternative : piece.alternatives)
                collect(alternative, lead);
            lead += unit.value_or("");
        }
    }

    std::vector<Run> const& runs() const { return runs_; }
    std::vector<std::string> const& literals() const { return literals_; }

private:
    void add(std::string const& lead, std::optional<std::string> const& unit) {
        if (!unit || unit->empty())
            return;
        runs_.push_back({lead, *unit});
        // A search may begin anywhere in the run.
        runs_.push_back({"", *unit});
    }

    Sampler sampler_;
    Choices plain_{0};
    std::vector<Run> runs_;
    std::vector<std::string> literals_;
};

std::string lineOf(Run const& run, std::string const& tail, std::size_t length) {
    std::string line = run.lead;
    std::size_t const room = length - std::min(length, characterCount(run.lead) + characterCount(tail));
    for (std::size_t i = 0, count = room / characterCount(run.unit); i < count; ++i)
        line += run.unit;
    return line + tail;
}

} // namespace

std::vector<PatternSequence> outlineOf(std::string_view pattern) { return OutlineParser(pattern).whole(); }

bool hasRepetition(std::vector<PatternSequence> const& outline) {
    return std::ranges::any_of(outline, [](PatternSequence const& pieces) {
        return std::ranges::any_of(pieces, [](PatternPiece const& piece) {
            return piece.most > 1 || hasRepetition(piece.alternatives);
        });
    });
}

PatternSequence withJoinedLiterals(PatternSequence const& pieces) {
    auto const isPlain = [](PatternPiece const& piece) {
        return piece.kind == Kind::Literal && piece.least == 1 && piece.most == 1;
    };
    PatternSequence joined;
    for (PatternPiece const& piece : pieces) {
        if (joined.empty() || !isPlain(piece) || !isPlain(joined.back())) {
            joined.push_back(piece);
            continue;
        }
        joined.back().text += piece.text;
        joined.back().body += piece.body;
        joined.back().literal += piece.literal;
    }
    return joined;
}

PatternPiece const* findGroup(std::vector<PatternSequence> const& outline, std::string const& name) {
    for (PatternSequence const& pieces : outline) {
        for (PatternPiece const& piece : pieces) {
            if (piece.groupName == name)
                return &piece;
            if (PatternPiece const* const inside = findGroup(piece.alternatives, name))
                return inside;
        }
    }
    return nullptr;
}

std::vector<std::string> samplesOf(Pattern const& pattern, std::size_t count) {
    auto const outline = outlineOf(pattern.text());
    Sampler sampler;
    std::vector<std::string> samples;
    std::size_t const tries = 3 * count + outline.size();
    for (std::uint64_t variant = 0; variant < tries && samples.size() < count; ++variant) {
        Choices choices(variant / outline.size());
        auto sample = sampler.sequence(outline[variant % outline.size()], choices);
        if (sample && pattern.fits(*sample) == Pattern::Answer::Yes)
            addUnique(samples, std::move(*sample));
    }
    return samples;
}

std::vector<std::string> hardLinesFor(Pattern const& pattern, std::size_t length) {
    constexpr std::size_t MAX_LITERALS = 6;
    constexpr std::size_t MAX_TAILS = 3;
    RunCollector collector;
    for (PatternSequence const& alternative : outlineOf(pattern.text()))
        collector.collect(alternative, {});
    std::set<Run> runs(collector.runs().begin(), collector.runs().end());
    for (char const* everyday : {"a", "1", " ", "-"})
        runs.insert({"", everyday});
    auto const& literals = collector.literals();
    runs.insert({"", std::accumulate(literals.begin(), literals.end(), std::string("a"))});
    for (std::size_t i = 0; i < std::min(literals.size(), MAX_LITERALS); ++i)
        runs.insert({"", literals[i]});
    std::vector<std::string> tails{"", "\x01"};
    // Behind a line another one may follow; a value is mostly a line's.
    if (pattern.use() == Pattern::Use::Extract)
        tails.push_back("\n");
    for (std::size_t i = 0; i < std::min(literals.size(), MAX_TAILS); ++i)
        tails.push_back(literals[literals.size() - 1 - i]);
    std::vector<std::string> lines;
    for (Run const& run : runs)
        for (std::string const& tail : tails)
            addUnique(lines, lineOf(run, tail, length));
    return lines;
}

} // namespace Patterns
