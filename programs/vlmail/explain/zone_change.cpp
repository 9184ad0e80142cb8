#include "programs/vlmail/explain/zone_change.h"

#include "programs/vlmail/explain/words.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <set>

namespace VlMail {
namespace {

using Reader::Box;

constexpr long long MILLIMETRE = 100;

/// An edge of a rectangle. Coordinates grow outwards at the right and at the bottom.
struct Edge {
    int Box::*coordinate;
    int outwards;
    char const* name;
    /// Where text stands that lies beyond the edge.
    char const* beyond;
    int Box::*opposite;
    /// The edges that bound it.
    int Box::*from;
    int Box::*to;
};

constexpr std::array EDGES{
    Edge{&Box::bottom, +1, "bottom", "below", &Box::top, &Box::left, &Box::right},
    Edge{&Box::top, -1, "top", "above", &Box::bottom, &Box::left, &Box::right},
    Edge{&Box::right, +1, "right", "to the right of", &Box::left, &Box::top, &Box::bottom},
    Edge{&Box::left, -1, "left", "to the left of", &Box::right, &Box::top, &Box::bottom},
};

long long floorToMillimetre(long long at) {
    long long const rest = at % MILLIMETRE;
    return at - (rest < 0 ? rest + MILLIMETRE : rest);
}

/// Text is within its edges for certain when they stand on the next millimetre outwards.
int roundedOutwards(long long at, int outwards) {
    long long const down = floorToMillimetre(at);
    return static_cast<int>(outwards < 0 || down == at ? down : down + MILLIMETRE);
}

long long moved(Edge const& edge, Box const& before, Box const& after) {
    return std::llabs(static_cast<long long>(after.*edge.coordinate) - before.*edge.coordinate);
}

/// Outwards by so much; negative when the edge moves inwards.
long long outwardsBy(Edge const& edge, Box const& before, Box const& after) {
    return (static_cast<long long>(after.*edge.coordinate) - before.*edge.coordinate) * edge.outwards;
}

std::string edgeFromTo(Edge const& edge, Box const& before, Box const& after) {
    return std::string(edge.name) + " from " + Words::millimetres(before.*edge.coordinate) + " to " +
           Words::millimetres(after.*edge.coordinate);
}

void addJoined(std::string& list, std::string const& element) {
    if (!list.empty())
        list += " and ";
    list += element;
}

/// An edge at that place runs through the block, more than a millimetre from the block's own edges.
bool cuts(Edge const& edge, Box const& zone, Box const& block) {
    long long const at = zone.*edge.coordinate;
    long long const first = std::min(block.*edge.coordinate, block.*edge.opposite);
    long long const last = std::max(block.*edge.coordinate, block.*edge.opposite);
    bool const isBeside = block.*edge.to < zone.*edge.from || block.*edge.from > zone.*edge.to;
    return !isBeside && first + MILLIMETRE < at && at < last - MILLIMETRE;
}

bool cutsAny(Edge const& edge, Box const& zone, Reader::Layout const& layout) {
    return std::any_of(layout.blocks.begin(), layout.blocks.end(),
                       [&](Reader::Block const& block) { return cuts(edge, zone, block.box); });
}

Edge const& oppositeOf(Edge const& edge) {
    return *std::find_if(EDGES.begin(), EDGES.end(),
                         [&](Edge const& candidate) { return candidate.coordinate == edge.opposite; });
}

/// Collects candidates. They stand on whole millimetres, so that there are some hundreds at most however many
/// blocks a page has.
class Changes {
public:
    Changes(Box const& zone, Reader::Layout const& layout, long long limit)
        : zone_(zone), layout_(layout), limit_(limit) {}

    void addFor(Edge const& edge, Box const& block) {
        // Up to the far edge the zone holds the block, up to the near one it ends in front of it.
        for (int const at : {roundedOutwards(block.*edge.coordinate, edge.outwards),
                             roundedOutwards(block.*edge.opposite, -edge.outwards)}) {
            long long const by = static_cast<long long>(at) - zone_.*edge.coordinate;
            bool const isOutwards = by * edge.outwards > 0;
            bool const isNear = std::llabs(by) <= limit_;
            if (by != 0 && (isNear || !isOutwards))
                addEdge(edge, at, isOutwards ? ZoneChange::Kind::Grow : ZoneChange::Kind::Shrink);
            if (by != 0 && isNear)
                addShift(edge, at, by);
        }
    }

    std::vector<ZoneChange> sorted() {
        std::stable_sort(changes_.begin(), changes_.end(), isLikelier);
        return std::move(changes_);
    }

private:
    void addEdge(Edge const& edge, int at, ZoneChange::Kind kind) {
        ZoneChange change{kind, zone_, zone_};
        change.after.*edge.coordinate = at;
        if (isNew(change.after) && !cutsAny(edge, change.after, layout_))
            changes_.push_back(change);
    }

    void addShift(Edge const& edge, int at, long long by) {
        Edge const& other = oppositeOf(edge);
        long long const otherAt = zone_.*other.coordinate + by;
        if (otherAt != static_cast<int>(otherAt))
            return;
        ZoneChange change{ZoneChange::Kind::Shift, zone_, zone_};
        change.after.*edge.coordinate = at;
        change.after.*other.coordinate = static_cast<int>(otherAt);
        if (isNew(change.after) && !cutsAny(edge, change.after, layout_) &&
            !cutsAny(other, change.after, layout_))
            changes_.push_back(change);
    }

    bool isNew(Box const& box) {
        return box.left < box.right && box.top < box.bottom &&
               tried_.insert({box.left, box.top, box.right, box.bottom}).second;
    }

    Box const& zone_;
    Reader::Layout const& layout_;
    long long limit_;
    std::set<std::array<int, 4>> tried_;
    std::vector<ZoneChange> changes_;
};

} // namespace

long long ZoneChange::distance() const {
    long long sum = 0;
    for (Edge const& edge : EDGES)
        sum += moved(edge, before, after);
    return kind == Kind::Shift ? sum / 2 : sum;
}

bool ZoneChange::losesBeginning() const {
    return kind == Kind::Shrink && (after.left > before.left || after.top > before.top);
}

bool isLikelier(ZoneChange const& a, ZoneChange const& b) {
    return a.losesBeginning() != b.losesBeginning() ? b.losesBeginning() : a.distance() < b.distance();
}

std::string ZoneChange::where(std::string const& zone) const {
    if (kind == Kind::Shift) {
        long long const down = static_cast<long long>(after.top) - before.top;
        long long const right = static_cast<long long>(after.left) - before.left;
        std::string const direction = down > 0    ? "lower"
                                      : down < 0  ? "higher"
                                      : right > 0 ? "further right"
                                                  : "further left";
        return "with " + zone + " " + Words::millimetres(distance()) + " " + direction;
    }
    std::string words;
    for (Edge const& edge : EDGES) {
        long long const by = moved(edge, before, after);
        if (by == 0)
            continue;
        if (kind == Kind::Shrink)
            return "with " + zone + " " + Words::millimetres(by) + " smaller at its " + edge.name;
        addJoined(words, Words::millimetres(by) + " " + edge.beyond);
    }
    return words + " " + zone;
}

std::string ZoneChange::advice() const {
    std::string words;
    for (Edge const& edge : EDGES) {
        long long const by = outwardsBy(edge, before, after);
        if (by == 0)
            continue;
        bool const isMore = after.*edge.coordinate > before.*edge.coordinate;
        std::string const slack = kind == Kind::Shift ? "" : isMore ? " or more" : " or less";
        addJoined(words, "its " + edgeFromTo(edge, before, after) + slack);
    }
    return "move " + words;
}

ZoneChange grownToHold(Box const& zone, Box const& box) {
    ZoneChange change{ZoneChange::Kind::Grow, zone, zone};
    for (Edge const& edge : EDGES) {
        int const at = roundedOutwards(box.*edge.coordinate, edge.outwards);
        if ((static_cast<long long>(at) - zone.*edge.coordinate) * edge.outwards > 0 &&
            (static_cast<long long>(box.*edge.coordinate) - zone.*edge.coordinate) * edge.outwards > 0)
            change.after.*edge.coordinate = at;
    }
    return change;
}

std::vector<ZoneChange> changesByBlocks(Box const& zone, Reader::Layout const& layout, long long limit) {
    Changes changes(zone, layout, limit);
    for (Reader::Block const& block : layout.blocks)
        for (Edge const& edge : EDGES)
            changes.addFor(edge, block.box);
    return changes.sorted();
}

} // namespace VlMail
