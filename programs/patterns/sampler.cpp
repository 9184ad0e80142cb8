#include "programs/patterns/sampler.h"

#include "programs/patterns/pattern.h"

#include <algorithm>
#include <array>
#include <utility>

namespace Patterns {
namespace {

constexpr std::size_t MAX_SAMPLE = 400;

/// Texts for groups whose name says what they take, tried before others.
std::map<std::string, std::vector<std::string>> const TEXTS_BY_GROUP{
    {"day", {"05", "5"}},     {"month", {"03", "3", "Mar", "March", "mar", "march", "MAR", "MARCH"}},
    {"year", {"2021", "21"}}, {"hour", {"10"}},
    {"min", {"30"}},          {"sec", {"15"}},
    {"ampm", {"am", "AM"}},
};

bool fits(std::string const& pattern, std::string const& text) {
    try {
        return Pattern(pattern, Pattern::Use::Validate).fits(text) == Pattern::Answer::Yes;
    } catch (Broken const&) {
        return false;
    }
}

std::optional<std::string> byName(Piece const& piece, Choices& choices) {
    auto const named = TEXTS_BY_GROUP.find(piece.groupName);
    if (named == TEXTS_BY_GROUP.end())
        return std::nullopt;
    std::vector<std::string> fitting;
    for (std::string const& text : named->second)
        if (fits(piece.body, text))
            fitting.push_back(text);
    return fitting.empty() ? std::nullopt : std::optional(fitting[choices.pick(fitting.size())]);
}

} // namespace

std::size_t Choices::pick(std::size_t count) {
    if (variant_ < 2)
        return std::min<std::size_t>(variant_, count - 1);
    state_ ^= state_ << 13;
    state_ ^= state_ >> 7;
    state_ ^= state_ << 17;
    return static_cast<std::size_t>((state_ >> 11) % count);
}

std::optional<std::string> Sampler::sequence(Sequence const& pieces, Choices& choices) {
    std::string text;
    for (Piece const& piece : pieces) {
        auto const part = repeated(piece, choices);
        if (!part)
            return std::nullopt;
        text += *part;
    }
    return text;
}

std::optional<std::string> Sampler::repeated(Piece const& piece, Choices& choices) {
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

std::optional<std::string> Sampler::once(Piece const& piece, Choices& choices) {
    switch (piece.kind) {
    case Piece::Kind::Literal:
        return piece.literal;
    case Piece::Kind::Assertion:
        return std::string();
    case Piece::Kind::Class: {
        auto const& members = membersOf(piece.body);
        return members.empty() ? std::nullopt : std::optional(members[choices.pick(members.size())]);
    }
    case Piece::Kind::Group:
        if (auto const text = byName(piece, choices))
            return text;
        return sequence(piece.alternatives[choices.pick(piece.alternatives.size())], choices);
    case Piece::Kind::Other:
        break;
    }
    return std::nullopt;
}

std::vector<std::string> const& Sampler::membersOf(std::string const& characterClass) {
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

void addUnique(std::vector<std::string>& texts, std::string text) {
    if (std::find(texts.begin(), texts.end(), text) == texts.end())
        texts.push_back(std::move(text));
}

} // namespace Patterns
