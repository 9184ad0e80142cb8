#include "programs/patterns/hard_lines.h"

#include "programs/base/utf8.h"

#include "programs/patterns/outline.h"
#include "programs/patterns/sampler.h"

#include <algorithm>
#include <numeric>
#include <optional>
#include <set>
#include <tuple>
#include <utility>

namespace Patterns {
namespace {

using Base::characterCount;

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
    void collect(Sequence const& pieces, std::string lead) {
        for (Piece const& piece : pieces) {
            if (piece.kind == Piece::Kind::Literal)
                addUnique(literals_, piece.literal);
            auto const unit = sampler_.once(piece, plain_);
            if (piece.most > 1)
                add(lead, unit);
            for (Sequence const& alternative : piece.alternatives)
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

std::vector<std::string> hardLinesFor(Pattern const& pattern, std::size_t length) {
    constexpr std::size_t MAX_LITERALS = 6;
    constexpr std::size_t MAX_TAILS = 3;
    RunCollector collector;
    for (Sequence const& alternative : outlineOf(pattern.text()))
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
