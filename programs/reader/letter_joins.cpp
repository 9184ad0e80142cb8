#include "programs/reader/letter_joins.h"

#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/reader/address_text.h"
#include "programs/reader/letters.h"
#include "programs/reader/mark_sighting.h"
#include "programs/reader/page_numbering.h"

#include "vlservice/extract/extract_zone.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace Reader {
namespace {

using Nearness = MarkSighting::Nearness;

// Lengths are in 1/100 mm.

/// Printed in the same place of a form.
constexpr int SAME_PLACE = 1000;
/// Where a head stands that has moved a little.
constexpr int NEAR = 2500;
/// Heights of print that differ by less are of one size, in parts of a hundred.
constexpr int SAME_HEIGHT = 25;
/// Places that are kept to compare with: a form has one, a batch a few.
constexpr std::size_t MAX_PLACES = 16;

constexpr std::size_t MAX_QUOTED = 80;

int apart(int begin, int end, int otherBegin, int otherEnd) {
    return std::max({otherBegin - end, begin - otherEnd, 0});
}

bool isWithin(Box const& a, Box const& b, int distance) {
    return apart(a.left, a.right, b.left, b.right) <= distance && std::abs(a.top - b.top) <= distance;
}

bool isOfOneHeight(Box const& a, Box const& b) {
    auto const [smaller, larger] = std::minmax({a.height(), b.height()});
    return (larger - smaller) * 100LL <= static_cast<long long>(larger) * SAME_HEIGHT;
}

bool isSamePrint(Box const& a, Box const& b) { return isWithin(a, b, SAME_PLACE) && isOfOneHeight(a, b); }

/// A value that two letters hardly share.
bool isTelling(std::string const& value) {
    return value.size() >= 3 && value.find_first_of("0123456789") != value.npos;
}

std::string quoted(std::string const& text) {
    std::string const line = Base::plainLine(text);
    std::string const front(Base::firstBytes(line, MAX_QUOTED));
    return Base::inQuotes(front.size() < line.size() ? front + "\u2026" : line);
}

/// Distinct places, the first that were seen.
class Places {
public:
    void add(Box const& box) {
        bool const isKnown = any([&](Box const& known) { return isSamePrint(known, box); });
        if (!isKnown && places_.size() < MAX_PLACES)
            places_.push_back(box);
    }
    template<typename Condition>
    bool any(Condition const& condition) const {
        return std::any_of(places_.begin(), places_.end(), condition);
    }
    bool isEmpty() const { return places_.empty(); }

private:
    std::vector<Box> places_;
};

struct Address {
    std::string text;
    Box box;
};

/// What of a page could tell that it is the first of a letter.
struct Look {
    int page = 0;
    std::vector<MarkSighting> marks;
    /// By zone with an address; nothing where the text does not look like one.
    std::vector<std::optional<Address>> addresses;
    std::vector<PageNumbering> numberings;

    bool saysNothing() const {
        return marks.empty() &&
               std::none_of(addresses.begin(), addresses.end(),
                            [](auto const& address) { return address.has_value(); }) &&
               numberings.empty();
    }
};

std::vector<std::string> comparableLines(std::string const& text) {
    std::vector<std::string> lines;
    for (std::size_t begin = 0; begin <= text.size();) {
        std::size_t const end = std::min(text.find('\n', begin), text.size());
        lines.push_back(comparable(std::string_view(text).substr(begin, end - begin)));
        begin = end + 1;
    }
    return lines;
}

/// The same name, or two lines alike: one recipient in two writings.
bool isOneRecipient(Address const& a, Address const& b) {
    std::vector<std::string> const linesOfA = comparableLines(a.text);
    std::vector<std::string> const linesOfB = comparableLines(b.text);
    auto const shared = std::count_if(linesOfA.begin(), linesOfA.end(), [&](std::string const& line) {
        return std::find(linesOfB.begin(), linesOfB.end(), line) != linesOfB.end();
    });
    return shared >= 2 || linesOfA.front() == linesOfB.front();
}

/// What a field took for an address, without the sender's line say, or else what stands in the zone.
std::optional<Address> addressIn(ZoneTrace const& zone) {
    for (FieldTrace const& field : zone.fields)
        if (field.definition->priority() > 0 && field.match && looksLikePostalAddress(field.match->text))
            return Address{field.match->text, field.match->box};
    return looksLikePostalAddress(zone.text) ? std::optional(Address{zone.text, zone.box}) : std::nullopt;
}

} // namespace

class JoinWatch::Looks {
public:
    Looks(Cfg::ExtractPreset const& preset, ReadingRules const& rules, PatternLimits const& limits)
        : marks_(preset, rules), time_(limits) {
        for (Cfg::ExtractZone const& zone : preset.zones())
            if (zone.hasAddress())
                addressZones_.push_back(&zone);
        markPlaces_.resize(marks_.count());
        addressPlaces_.resize(addressZones_.size());
    }

    void see(Page const& page, Layout const& layout, PageTrace const& trace) {
        Look look{page.number, marks_.found(trace), addressesOn(trace), pageNumberingsOn(page, layout)};
        if (look.marks.empty())
            look.marks = marks_.nearly(page, layout, time_);
        if (time_.isUp() && givenUpAt_ == 0)
            givenUpAt_ = page.number;
        if (trace.beginsLetter) {
            remember(look);
            firsts_.push_back(std::move(look));
        } else if (!look.saysNothing()) {
            joined_.emplace_back(firsts_.size() - 1, std::move(look));
        }
    }

    std::vector<DoubtfulJoin> doubtful() const {
        std::vector<DoubtfulJoin> joins;
        for (auto const& [letter, look] : joined_) {
            Suspicion suspicion = this->suspicion(firsts_[letter], look);
            if (!suspicion.says.empty())
                joins.push_back({look.page, std::move(suspicion.says), suspicion.box});
        }
        return joins;
    }

    int givenUpAt() const { return givenUpAt_; }

private:
    std::vector<std::optional<Address>> addressesOn(PageTrace const& trace) const {
        std::vector<std::optional<Address>> addresses(addressZones_.size());
        for (ZoneTrace const& zone : trace.zones) {
            auto const known = std::find(addressZones_.begin(), addressZones_.end(), zone.definition);
            if (known != addressZones_.end())
                addresses[static_cast<std::size_t>(known - addressZones_.begin())] = addressIn(zone);
        }
        return addresses;
    }

    /// Of a page that begins a letter.
    void remember(Look const& look) {
        for (MarkSighting const& mark : look.marks)
            if (mark.nearness == Nearness::Found)
                markPlaces_[mark.mark].add(mark.box);
        for (std::size_t zone = 0; zone < look.addresses.size(); ++zone)
            if (look.addresses[zone])
                addressPlaces_[zone].add(look.addresses[zone]->box);
        for (PageNumbering const& numbering : look.numberings)
            if (numbering.number == 1)
                firstNumberPlaces_.add(numbering.box);
        // What counts the pages of the whole document says nothing of letters.
        countsLetters_ = countsLetters_ && !countsOn(look);
    }

    /// Why a page may begin a letter, and where that stands; empty when nothing strong enough says so.
    struct Suspicion {
        std::string says = {};
        Box box = {};
    };

    Suspicion suspicion(Look const& first, Look const& look) const {
        Suspicion const numbering = bySomeNumbering(look);
        if (!numbering.says.empty() || (countsLetters_ && countsOn(look)))
            return numbering;
        for (MarkSighting const& mark : look.marks)
            if (isMark(first, mark))
                return {quoted(mark.text) + " nearly is the mark \"" + marks_.nameOf(mark.mark) + "\", " +
                            mark.difference,
                        mark.box};
        return bySomeAddress(first, look);
    }

    Suspicion bySomeNumbering(Look const& look) const {
        for (PageNumbering const& numbering : look.numberings)
            if (numbering.number == 1 &&
                firstNumberPlaces_.any([&](Box const& place) { return isSamePrint(place, numbering.box); }))
                return {"it counts its pages from 1 again: " + quoted(numbering.line), numbering.box};
        return {};
    }

    static bool countsOn(Look const& look) {
        return std::any_of(look.numberings.begin(), look.numberings.end(),
                           [](PageNumbering const& numbering) { return numbering.number > 1; });
    }

    bool isMark(Look const& first, MarkSighting const& mark) const {
        auto const own = std::find_if(first.marks.begin(), first.marks.end(), [&](MarkSighting const& other) {
            return other.mark == mark.mark && other.nearness != Nearness::Label;
        });
        bool const hasOwn = own != first.marks.end();
        if (hasOwn && isTelling(own->value) && comparable(mark.text).find(own->value) != std::string::npos)
            return false; // the head of its letter once more
        Places const& places = markPlaces_[mark.mark];
        auto const isSame = [&](Box const& place) { return isSamePrint(place, mark.box); };
        auto const isNear = [&](Box const& place) { return isWithin(place, mark.box, NEAR); };
        if (mark.nearness == Nearness::Label)
            return hasOwn && isTelling(own->value) && places.any(isSame);
        if (hasOwn && own->value == mark.value)
            return places.any(isSame);
        return places.isEmpty() || places.any(isNear);
    }

    Suspicion bySomeAddress(Look const& first, Look const& look) const {
        for (std::size_t zone = 0; zone < look.addresses.size(); ++zone) {
            std::optional<Address> const& address = look.addresses[zone];
            if (!address || (first.addresses[zone] && isOneRecipient(*first.addresses[zone], *address)))
                continue;
            if (addressPlaces_[zone].any(
                    [&](Box const& place) { return isWithin(place, address->box, SAME_PLACE); }))
                return {"it has another address where letters begin: " + quoted(address->text), address->box};
        }
        return {};
    }

    MarkWatch marks_;
    std::vector<Cfg::ExtractZone const*> addressZones_;
    PatternTime time_;
    int givenUpAt_ = 0;
    std::vector<Look> firsts_;
    /// With the letter that each joined, by its place among firsts_.
    std::vector<std::pair<std::size_t, Look>> joined_;
    std::vector<Places> markPlaces_;
    std::vector<Places> addressPlaces_;
    Places firstNumberPlaces_;
    bool countsLetters_ = true;
};

JoinWatch::JoinWatch(Cfg::ExtractPreset const& preset, ReadingRules const& rules, PatternLimits const& limits)
    : looks_(std::make_unique<Looks>(preset, rules, limits)) {}
JoinWatch::~JoinWatch() = default;

void JoinWatch::see(Page const& page, Layout const& layout, PageTrace const& trace) {
    looks_->see(page, layout, trace);
}

std::vector<DoubtfulJoin> JoinWatch::doubtful() const { return looks_->doubtful(); }

int JoinWatch::givenUpAt() const { return looks_->givenUpAt(); }

} // namespace Reader
