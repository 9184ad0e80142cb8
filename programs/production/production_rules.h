#pragma once
// What a carrier wants of letters: the object "production" of a pack preset. docs/check.md has its keys.

#include "programs/mailing/print_wishes.h"
#include "programs/production/letter_parts.h"
#include "programs/reader/geometry.h"
#include "programs/reader/reading_rules.h"

#include "vlservice/presets/pack_preset.h"

#include <optional>
#include <string>
#include <vector>

namespace Production {

using Reader::Box;

constexpr PageSize A4_SHEET{21000, 29700};
constexpr PageSize LETTER_SHEET{21590, 27940};

/// Where nothing may stand.
struct ClearZone {
    Box box;
    bool isOnEveryPage = false;
};

struct ProductionRules {
    static constexpr char const* KEY = Mailing::PrintWishes::PRODUCTION;
    /// No sheet is longer, and no length on one.
    static constexpr int MAX_LENGTH = 200000;
    static constexpr int MAX_TOLERANCE = 2000;
    static constexpr int MAX_LINES = 100;
    static constexpr std::size_t MAX_ZONES = 100;

    /// The pack preset has the object. Without it little is looked at.
    bool isGiven = false;
    /// Without the object a letter may be on A4 or Letter.
    PageSize sheet = A4_SHEET;
    std::optional<Box> window = {};
    std::vector<ClearZone> clearZones = {};
    /// By so much what is printed may stand elsewhere than it should.
    int tolerance = 100;
    // Of the address; 0 where nothing is said.
    int minLines = 0;
    int maxLines = 0;
    /// Searched in the address; empty when nothing is.
    std::string postcode = {};
    /// An address that does not show in the window gets a sheet of its own.
    bool makesCoverPage = false;

    /// Whether the size is that of a sheet, within the tolerance.
    bool takes(PageSize page) const;

    /// Adds what is wrong to `faults`; such a value counts as not said.
    static ProductionRules from(json::Value const& production, std::vector<Reader::RulesFault>& faults);
    /// What `production` may be, as a JSON schema.
    static json::Object schema();
    static ProductionRules of(Cfg::PackPreset const& preset, std::vector<Reader::RulesFault>& faults);
};

/// The names of the keys of "production", in the order of the documents.
std::vector<std::string> productionKeys();

} // namespace Production
