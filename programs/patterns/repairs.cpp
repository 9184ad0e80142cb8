#include "programs/patterns/repairs.h"

#include "programs/base/utf8.h"
#include "programs/patterns/text_forms.h"

#include <algorithm>

namespace Patterns {
namespace {

constexpr std::string_view SPECIAL = ".[{}()\\*+?|^$";

/// A character, an escape or a class of a pattern, with how often it may stand.
struct Token {
    std::string text;
    std::string repetition;

    bool isRepeated() const { return !repetition.empty() && repetition != "?"; }
    /// Something that has a width by itself.
    bool isAtom() const { return text.size() > 1 || SPECIAL.substr(1).find(text) == std::string_view::npos; }
};

std::size_t endOfClass(std::string_view pattern, std::size_t at) {
    std::size_t const first = pattern.substr(at, 2) == "[^" ? at + 2 : at + 1;
    for (std::size_t i = first; i < pattern.size(); ++i) {
        if (pattern[i] == '\\')
            ++i;
        else if (pattern[i] == ']' && i > first)
            return i + 1;
    }
    return pattern.size();
}

std::size_t endOfToken(std::string_view pattern, std::size_t at) {
    if (pattern[at] == '\\')
        return std::min(at + 2, pattern.size());
    if (pattern[at] == '[')
        return endOfClass(pattern, at);
    std::size_t end = at;
    Base::nextCharacter(pattern, end);
    return end;
}

std::size_t endOfRepetition(std::string_view pattern, std::size_t at) {
    if (at < pattern.size() && pattern[at] == '{')
        return std::min(pattern.find('}', at), pattern.size() - 1) + 1;
    return at < pattern.size() && std::string_view("*+?").find(pattern[at]) != std::string_view::npos ? at + 1
                                                                                                      : at;
}

std::vector<Token> tokensOf(std::string_view pattern) {
    std::vector<Token> tokens;
    for (std::size_t at = 0; at < pattern.size();) {
        std::size_t const end = endOfToken(pattern, at);
        // "(?" begins a group of some kind and repeats nothing.
        std::size_t const behind = pattern[at] == '(' ? end : endOfRepetition(pattern, end);
        tokens.push_back(
            {std::string(pattern.substr(at, end - at)), std::string(pattern.substr(end, behind - end))});
        at = behind;
    }
    return tokens;
}

/// The pattern with each token as the function writes it.
template<typename Write>
std::string rewritten(std::string_view pattern, Write const& write) {
    std::string text;
    for (Token const& token : tokensOf(pattern))
        text += write(token);
    return text;
}

std::string asItStands(Token const& token) { return token.text + token.repetition; }

std::string withBlankLines(Token const& token) {
    bool const isBlank = token.text == " " || token.text == "\\h";
    return (isBlank ? "\\s" : token.text) + token.repetition;
}

std::string withBreaksInside(Token const& token) {
    return token.isAtom() && token.isRepeated() ? "(?:" + token.text + "\\n?)" + token.repetition
                                                : asItStands(token);
}

} // namespace

std::string escaped(std::string_view text) {
    std::string pattern;
    for (char const c : text) {
        if (SPECIAL.find(c) != std::string_view::npos)
            pattern += '\\';
        pattern += c;
    }
    return pattern;
}

std::vector<std::string> withLineBreaks(std::string_view pattern) {
    std::string const blanks = rewritten(pattern, withBlankLines);
    return {blanks, rewritten(pattern, withBreaksInside), rewritten(blanks, withBreaksInside)};
}

std::vector<std::string> withValueGroups(std::string_view pattern) {
    std::vector<std::string> candidates;
    if (hasValueGroup(pattern))
        return candidates;
    std::vector<Token> const tokens = tokensOf(pattern);
    for (std::size_t i = 0; i < tokens.size(); ++i) {
        if (tokens[i].text != "(" || (i + 1 < tokens.size() && tokens[i + 1].text == "?"))
            continue;
        std::string candidate;
        for (std::size_t k = 0; k < tokens.size(); ++k)
            candidate += (k == i ? "(?<VAL>" : asItStands(tokens[k]));
        candidates.push_back(std::move(candidate));
    }
    candidates.push_back(withWholeAsValue(pattern));
    return candidates;
}

std::vector<std::string> withLookAlikes(std::string_view plainPattern, std::string_view text) {
    std::string pattern(plainPattern);
    for (std::size_t at = 0; at < text.size();) {
        std::size_t const begin = at;
        Base::nextCharacter(text, at);
        std::string const mark(text.substr(begin, at - begin));
        std::string const plain = withPlainMarks(mark);
        if (plain == mark || plain.size() != 1)
            continue;
        pattern = rewritten(pattern, [&](Token const& token) {
            bool const isIt = token.text == plain || token.text == '\\' + plain;
            return isIt ? '[' + plain + mark + ']' + token.repetition : asItStands(token);
        });
    }
    return {std::string(plainPattern), pattern};
}

std::vector<std::string> withOtherLiteral(std::string_view pattern, std::string_view literal,
                                          std::string_view text) {
    for (std::string const& written : {escaped(literal), std::string(literal)}) {
        std::size_t const at = pattern.find(written);
        if (at != std::string_view::npos)
            return {std::string(pattern).replace(at, written.size(), escaped(text))};
    }
    return {};
}

std::vector<std::string> withOtherRest(Cut const& cut, std::string_view behind) {
    return {cut.front + escaped(behind) + (cut.rest.ends_with('$') ? "$" : "")};
}

} // namespace Patterns
