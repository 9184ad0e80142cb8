#pragma once
// How a pack preset wants texts to be read: its object "reading".
//
//     {"decimal": ",", "grouping": ".' ", "months": "de",
//      "zones": {"Total": {"page": "last", "anchor": "^Sum:", "column": true}}}

#include "vlservice/presets/pack_preset.h"

#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace Reader {

/// How numbers are written.
struct NumberRules {
    enum class Decimal {
        Plain, ///< nothing is said: numbers are read as they stand
        Given, ///< by `decimal` and `grouping`
        Auto,  ///< each value decides, as far as it is not ambiguous
    };

    Decimal kind = Decimal::Plain;
    /// One character each, as UTF-8.
    std::string decimal = {};
    std::vector<std::string> grouping = {};
};

/// Where the text of a zone comes from, beyond what the zone itself says.
struct ZoneRules {
    enum class Pages {
        One,  ///< `page` of the letter, from 1
        Last, ///< the letter's last page
        Any,  ///< the first page of the letter on which a field of the zone is found
    };

    Pages pages = Pages::One;
    int page = 1;
    /// The zone's location is told from the top left of what this pattern matches; from the page's when it is
    /// empty.
    std::string anchor = {};
    /// The text is read column by column.
    bool byColumn = false;

    bool isOnFirstPage() const { return pages == Pages::One && page == 1; }
};

/// What is wrong with a "reading": the keys that lead to the place, and words for people.
struct RulesFault {
    std::vector<std::string> path;
    std::string what;
    std::string advice;
};

/// The key and those that lead to the place, in quotes: "reading/zones/Total/page".
std::string placeInWords(char const* key, RulesFault const& fault);

struct ReadingRules {
    static constexpr char const* KEY = "reading";
    /// A letter of more pages would be none.
    static constexpr int MAX_PAGE = 999;

    NumberRules numbers = {};
    /// The language in which months have names, as ICU calls it; empty when only English is read.
    std::string months = {};
    /// By the names of zones.
    std::map<std::string, ZoneRules> zones = {};

    /// Null for a zone that nothing is said about.
    ZoneRules const* forZone(std::string const& name) const;
    bool isOnFirstPage(std::string const& zone) const;

    /// Adds what is wrong to `faults`; such a value counts as not said.
    static ReadingRules from(json::Value const& reading, std::vector<RulesFault>& faults);
    /// What `reading` may be, as a JSON schema.
    static json::Object schema();
    /// Throws Base::Error with the first fault.
    static ReadingRules of(Cfg::PackPreset const& preset);
};

} // namespace Reader
