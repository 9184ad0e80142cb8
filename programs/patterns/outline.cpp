#include "programs/patterns/outline.h"

#include "programs/base/utf8.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <utility>

namespace Patterns {
namespace {

using Kind = Piece::Kind;

/// Deeper groups are not looked into.
constexpr int MAX_DEPTH = 40;

class OutlineParser {
public:
    explicit OutlineParser(std::string_view text) : text_(text) {}

    std::vector<Sequence> alternatives(int depth) {
        std::vector<Sequence> all(1);
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
    std::vector<Sequence> whole() {
        std::vector<Sequence> all = alternatives(0);
        while (at_ < text_.size()) {
            ++at_;
            for (Sequence& rest : alternatives(0))
                all.push_back(std::move(rest));
        }
        return all;
    }

private:
    Piece piece(int depth) {
        std::size_t const begin = at_;
        Piece piece = unrepeated(depth);
        piece.body = text_.substr(begin, at_ - begin);
        repetition(piece);
        piece.text = text_.substr(begin, at_ - begin);
        return piece;
    }

    Piece unrepeated(int depth) {
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

    static Piece ofKind(Kind kind) {
        Piece piece;
        piece.kind = kind;
        return piece;
    }
    static Piece literalOf(std::string text) {
        Piece piece = ofKind(Kind::Literal);
        piece.literal = std::move(text);
        return piece;
    }

    Piece literal() {
        std::string character(Base::firstCharacters(text_.substr(at_), 1));
        at_ += character.size();
        return literalOf(std::move(character));
    }

    Piece escape() {
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

    Piece skip(std::size_t length, Kind kind) {
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
    Piece quotation() {
        ++at_;
        std::size_t const end = std::min(text_.find("\\E", at_), text_.size());
        Piece piece = ofKind(Kind::Group);
        piece.alternatives.emplace_back();
        while (at_ < end) {
            Piece character = literal();
            character.text = character.body = '\\' + character.literal;
            piece.alternatives.back().push_back(std::move(character));
        }
        at_ = std::min(end + 2, text_.size());
        return piece;
    }

    Piece characterClass() {
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

    Piece group(int depth) {
        ++at_;
        Piece piece = ofKind(Kind::Group);
        if (at_ < text_.size() && text_[at_] == '?')
            openSpecial(piece);
        std::vector<Sequence> inside;
        if (depth < MAX_DEPTH)
            inside = alternatives(depth + 1);
        else
            piece.kind = Kind::Other;
        if (piece.kind == Kind::Group)
            piece.alternatives = std::move(inside);
        return closed(std::move(piece));
    }

    /// Behind the groups that were not looked into, at the bracket that closes this one.
    Piece closed(Piece piece) {
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
    void openSpecial(Piece& piece) {
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
    void openWithOptions(Piece& piece) {
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

    void repetition(Piece& piece) {
        if (at_ == text_.size())
            return;
        switch (text_[at_]) {
        case '*':
            set(piece, 0, Piece::NO_LIMIT, 1);
            break;
        case '+':
            set(piece, 1, Piece::NO_LIMIT, 1);
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

    void set(Piece& piece, std::size_t least, std::size_t most, std::size_t length) {
        piece.least = least;
        piece.most = most;
        at_ += length;
    }

    bool bounds(Piece& piece) {
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
                most = Piece::NO_LIMIT;
            else if (std::from_chars(low.ptr + 1, last, most).ec != std::errc())
                return false;
        }
        set(piece, least, most, end + 1 - at_);
        return true;
    }

    std::string_view text_;
    std::size_t at_ = 0;
};

} // namespace

std::vector<Sequence> outlineOf(std::string_view pattern) { return OutlineParser(pattern).whole(); }

bool hasRepetition(std::vector<Sequence> const& outline) {
    return std::ranges::any_of(outline, [](Sequence const& pieces) {
        return std::ranges::any_of(
            pieces, [](Piece const& piece) { return piece.most > 1 || hasRepetition(piece.alternatives); });
    });
}

Sequence withJoinedLiterals(Sequence const& pieces) {
    auto const isPlain = [](Piece const& piece) {
        return piece.kind == Kind::Literal && piece.least == 1 && piece.most == 1;
    };
    Sequence joined;
    for (Piece const& piece : pieces) {
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

Piece const* findGroup(std::vector<Sequence> const& outline, std::string const& name) {
    for (Sequence const& pieces : outline) {
        for (Piece const& piece : pieces) {
            if (piece.groupName == name)
                return &piece;
            if (Piece const* const inside = findGroup(piece.alternatives, name))
                return inside;
        }
    }
    return nullptr;
}

} // namespace Patterns
