#include "programs/patterns/required_words.h"

#include "programs/base/utf8.h"
#include "programs/patterns/outline.h"

#include <algorithm>
#include <cctype>
#include <utility>

namespace Patterns {
namespace {

/// More of them could make the engine give up on a long name, which must then be left to it.
constexpr std::size_t MOST_REPETITIONS = 3;
constexpr int MAX_DEPTH = 3;

bool isAlnum(char c) {
    return std::isalnum(static_cast<unsigned char>(c)) && static_cast<unsigned char>(c) < 0x80;
}

bool isSimpleLiteral(std::string const& body) {
    constexpr std::string_view SPECIAL = "*+?{}()[]|^$\\";
    constexpr std::string_view ESCAPED = ".*+?{}()[]|^$\\-_ #&@!,;:=%~/\"";
    if (body.size() == 2 && body[0] == '\\')
        return ESCAPED.find(body[1]) != ESCAPED.npos;
    return static_cast<unsigned char>(body[0]) >= 0x20 && SPECIAL.find(body[0]) == SPECIAL.npos;
}

/// Of letters, digits and some plain signs, with ranges that rise.
bool isSimpleSet(std::string_view set) {
    constexpr std::string_view SIGNS = " _.,#";
    if (set.empty())
        return false;
    for (std::size_t i = 0; i < set.size(); ++i) {
        bool const isRange = set[i] == '-' && i > 0 && i + 1 < set.size() && isAlnum(set[i - 1]) &&
                             isAlnum(set[i + 1]) && set[i - 1] < set[i + 1];
        if (!isRange && !isAlnum(set[i]) && SIGNS.find(set[i]) == SIGNS.npos)
            return false;
    }
    return true;
}

bool isSimpleClass(std::string_view body) {
    constexpr std::string_view KINDS = "dDwWsSh";
    if (body == ".")
        return true;
    if (body.size() == 2 && body[0] == '\\')
        return KINDS.find(body[1]) != KINDS.npos;
    if (!body.starts_with('[') || !body.ends_with(']'))
        return false;
    body = body.substr(1, body.size() - 2);
    return isSimpleSet(body.starts_with('^') ? body.substr(1) : body);
}

std::string textOf(std::vector<Sequence> const& alternatives) {
    std::string text;
    for (Sequence const& pieces : alternatives) {
        text += &pieces == &alternatives.front() ? "" : "|";
        for (Piece const& piece : pieces)
            text += piece.text;
    }
    return text;
}

/// Looks for whatever might mean something else than its outline shows.
class Simplicity {
public:
    bool holds(std::vector<Sequence> const& alternatives, int depth) {
        return std::ranges::all_of(alternatives, [&](Sequence const& pieces) {
            return !pieces.empty() &&
                   std::ranges::all_of(pieces, [&](Piece const& piece) { return holds(piece, depth); });
        });
    }

    std::size_t repetitions() const { return repetitions_; }

private:
    bool holds(Piece const& piece, int depth) {
        std::string const repetition = piece.text.substr(piece.body.size());
        repetitions_ += repetition.empty() ? 0 : 1;
        bool const isKnown = repetition.empty() || repetition == "?" ||
                             (piece.kind != Piece::Kind::Group && (repetition == "*" || repetition == "+"));
        return isKnown && bodyHolds(piece, depth);
    }

    bool bodyHolds(Piece const& piece, int depth) {
        switch (piece.kind) {
        case Piece::Kind::Literal:
            return isSimpleLiteral(piece.body);
        case Piece::Kind::Class:
            return isSimpleClass(piece.body);
        case Piece::Kind::Group:
            return depth < MAX_DEPTH && isSimpleGroup(piece) && holds(piece.alternatives, depth + 1);
        case Piece::Kind::Assertion:
        case Piece::Kind::Other:
            break;
        }
        return false;
    }

    static bool isSimpleGroup(Piece const& piece) {
        std::string const inside = textOf(piece.alternatives) + ')';
        return piece.body == '(' + inside || piece.body == "(?:" + inside;
    }

    std::size_t repetitions_ = 0;
};

class WordCollector {
public:
    std::vector<std::string> wordsOf(Sequence const& pieces) {
        collect(pieces);
        endWord();
        return std::move(words_);
    }

private:
    void collect(Sequence const& pieces) {
        for (Piece const& piece : pieces)
            collect(piece);
    }

    void collect(Piece const& piece) {
        bool const isOne = piece.kind == Piece::Kind::Literal && piece.literal.size() == 1;
        if (piece.least > 0 && isOne && isAlnum(piece.literal[0])) {
            word_ += static_cast<char>(std::tolower(static_cast<unsigned char>(piece.literal[0])));
            if (piece.most > 1)
                endWord();
            return;
        }
        endWord();
        if (piece.kind == Piece::Kind::Group && piece.least > 0 && piece.alternatives.size() == 1) {
            collect(piece.alternatives.front());
            endWord();
        }
    }

    void endWord() {
        if (!word_.empty())
            words_.push_back(std::exchange(word_, {}));
    }

    std::string word_;
    std::vector<std::string> words_;
};

} // namespace

std::optional<std::vector<std::vector<std::string>>> requiredWords(std::string_view pattern) {
    std::vector<Sequence> const alternatives = outlineOf(pattern);
    Simplicity simplicity;
    if (textOf(alternatives) != pattern || !Base::isUtf8(pattern) || !simplicity.holds(alternatives, 0) ||
        simplicity.repetitions() > MOST_REPETITIONS)
        return std::nullopt;
    std::vector<std::vector<std::string>> words;
    for (Sequence const& pieces : alternatives)
        words.push_back(WordCollector().wordsOf(pieces));
    return words;
}

} // namespace Patterns
