#pragma once
// How letters came about: what was seen in each zone, and what became of each field. Definitions and zones
// point into the preset.

#include "programs/reader/zone_place.h"

#include "vlservice/extract/extract_zone.h"

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Reader {

/// Lines that stand apart on the page and were read as one.
struct JoinedMatch {
    Joint joint = Joint::Right;
    /// What the match takes of each line.
    std::vector<Box> parts;
};

/// The search for one field in one zone.
struct FieldTrace {
    Cfg::ExtractField const* definition = nullptr;
    /// Where the pattern matched, and how wide that is.
    std::optional<Stretch> match;
    /// There when the match was found in joined lines only.
    std::optional<JoinedMatch> joined = {};
    /// The match is wider than the definition allows: it stays in the text and gives no value.
    bool isTooWide = false;
    /// Smaller print above an address, the sender's, which was left out of what was searched.
    std::string sendersLine = {};
    /// The lines that the match took out of the zone's text.
    std::string cut;
    /// The text of the value before it was validated; nothing when the value is the default.
    std::optional<std::string> rawText;
    /// Why the pattern could not be searched, in the engine's words.
    std::optional<std::string> failure = {};
    /// The value, a copy; null when the field yields nothing.
    std::shared_ptr<Cfg::ExtractedField const> value;
    /// What a person should know of how the text became the value, one line; mostly empty.
    std::string doubt;
    /// The value is the one of its name that a letter takes: the first that was found, or else the first
    /// default.
    bool counts = false;

    /// The value was read on the page and is not the default.
    bool isFound() const { return rawText.has_value(); }
    /// Whether joined lines may have what the zone's text as it stands has not.
    bool wantsJoinedLines() const;
};

struct ZoneTrace {
    Cfg::ExtractZone const* definition = nullptr;
    ZonePlace place = {};
    /// What was seen before the first field was searched.
    std::string text;
    Box box;
    std::vector<Box> blocks;
    std::vector<FieldTrace> fields;
};

struct PageTrace {
    int page = 0;
    bool beginsLetter = false;
    /// In the order of the preset. Those that "reading" puts on other pages are there when a letter begins.
    std::vector<ZoneTrace> zones;
    /// What makes a page that begins no letter look like one that does, and where that stands.
    struct Doubt {
        std::string says;
        Box box = {};
    };
    std::optional<Doubt> doubtfulJoin = {};

    /// The field of that name whose value counts; null when none of them has a value.
    FieldTrace const* counting(std::string const& name) const;
};

/// The pages that were searched: the first of each letter, and every page where letters are told apart by a
/// mark.
struct Trace {
    std::vector<PageTrace> pages;
};

} // namespace Reader
