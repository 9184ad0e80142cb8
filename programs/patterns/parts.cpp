#include "programs/patterns/parts.h"

#include "programs/patterns/outline.h"

#include "vlservice/extract/extract_field.h"

#include <algorithm>
#include <array>

namespace Patterns {
namespace {

using Kind = Piece::Kind;

/// Joins literals that stand next to each other in every text, also across the brackets of groups.
class LiteralCollector {
public:
    void add(Sequence const& pieces) {
        for (Piece const& piece : pieces)
            add(piece);
    }

    std::vector<std::string> take() {
        endRun();
        return std::move(runs_);
    }

private:
    void add(Piece const& piece) {
        bool const isOnce = piece.least == 1 && piece.most == 1;
        if (piece.least == 0)
            endRun();
        else if (piece.kind == Kind::Literal && piece.literal != "\n")
            run_ += piece.literal;
        else if (piece.kind == Kind::Group && piece.alternatives.size() == 1)
            add(piece.alternatives.front());
        else
            endRun();
        if (!isOnce)
            endRun();
    }

    void endRun() {
        std::size_t const first = run_.find_first_not_of(' ');
        if (first != std::string::npos)
            runs_.push_back(run_.substr(first, run_.find_last_not_of(' ') + 1 - first));
        run_.clear();
    }

    std::string run_;
    std::vector<std::string> runs_;
};

/// The two ways to write a named group.
std::array<std::string, 2> valueGroups() {
    std::string const& name = Cfg::ExtractField::REGEX_VALUE_GROUP_MARK;
    return {"(?<" + name + ">", "(?'" + name + "'"};
}

} // namespace

std::vector<std::string> literalsOf(std::string_view pattern) {
    std::vector<Sequence> const alternatives = outlineOf(pattern);
    LiteralCollector collector;
    if (alternatives.size() == 1)
        collector.add(alternatives.front());
    std::vector<std::string> literals = collector.take();
    std::stable_sort(literals.begin(), literals.end(),
                     [](std::string const& a, std::string const& b) { return a.size() > b.size(); });
    return literals;
}

std::vector<Cut> cutsOf(std::string_view pattern) {
    std::vector<Sequence> const alternatives = outlineOf(pattern);
    std::vector<Cut> cuts;
    if (alternatives.size() != 1)
        return cuts;
    std::size_t at = 0;
    for (Piece const& piece : withJoinedLiterals(alternatives.front())) {
        if (at > 0)
            cuts.push_back({std::string(pattern.substr(0, at)), std::string(pattern.substr(at))});
        at += piece.text.size();
    }
    std::reverse(cuts.begin(), cuts.end());
    return cuts;
}

Anchors anchorsOf(std::string_view pattern) {
    std::vector<Sequence> const alternatives = outlineOf(pattern);
    Anchors anchors{{}, std::string(pattern), {}};
    if (alternatives.size() != 1 || alternatives.front().empty())
        return anchors;
    // By the outline: "\\$" is no anchor.
    if (alternatives.front().back().text == "$") {
        anchors.end = "$";
        anchors.core.pop_back();
    }
    if (alternatives.front().front().text == "^" && !anchors.core.empty()) {
        anchors.front = "^";
        anchors.core.erase(0, 1);
    }
    return anchors;
}

std::string withAnyBlanks(std::string_view pattern) {
    std::string result;
    for (std::size_t i = 0; i < pattern.size(); ++i) {
        if (pattern[i] != ' ')
            result += pattern[i];
        else if (i + 1 == pattern.size() || pattern[i + 1] != ' ')
            result += "\\h*";
    }
    return result;
}

std::string labelIn(std::string_view pattern) {
    std::array const groups = valueGroups();
    for (Cut const& cut : cutsOf(pattern))
        if (std::any_of(groups.begin(), groups.end(),
                        [&](std::string const& group) { return cut.rest.starts_with(group); }))
            return cut.front;
    return {};
}

std::string withWholeAsValue(std::string_view pattern) {
    std::string inner(pattern);
    for (std::string const& group : valueGroups())
        for (std::size_t at = inner.find(group); at != std::string::npos; at = inner.find(group, at))
            inner.replace(at, group.size(), "(?:");
    return valueGroups().front() + inner + ")";
}

bool hasValueGroup(std::string_view pattern) {
    auto const groups = valueGroups();
    return std::any_of(groups.begin(), groups.end(), [&](std::string const& group) {
        return pattern.find(group) != std::string_view::npos;
    });
}

} // namespace Patterns
