#pragma once
// What would go wrong with a letter on paper.

#include "programs/production/finding.h"
#include "programs/production/production_rules.h"
#include "programs/reader/document.h"
#include "programs/reader/trace.h"

#include "vlservice/cfg/app.h"
#include "vlservice/extract/extracted_fields.h"
#include "vlservice/presets/pack_preset.h"

#include <optional>
#include <string>
#include <vector>

namespace Production {

/// What letters are held against: what a pack preset says of its carrier, and the node of its printer.
struct PrintRules {
    /// `place` names the settings in what is said of them. What cannot be used is `refused`.
    PrintRules(Cfg::PackPreset const& preset, Cfg::App const& app, std::string const& place);

    ProductionRules production;
    /// Where a printer prints, on a sheet of A4.
    Box printArea;
    Findings::Deviation deviation = Findings::Deviation::Strict;
    /// What is wrong and what to do about it; empty when all of it can be used.
    std::string refused;
    std::string advice;

    /// On a page of that size.
    Box printAreaOn(PageSize page) const;
};

/// Where an address stands on a page, and what it says.
struct PlacedAddress {
    std::string text;
    /// 0 when the place is not known.
    int page = 0;
    /// The lines, or all of them at once; empty when the place is not known.
    std::vector<Box> parts = {};

    Box box() const;
};

struct LetterOnPaper {
    Reader::Document& document;
    /// From 1, rising, not empty.
    std::vector<int> const& pages;
    /// The postal address that the letter goes to; null without one.
    PlacedAddress const* address = nullptr;
};

/// The address that counts and its place, as far as the search of the letter tells it, when it is a postal
/// one: a letter to an e-mail address or a telephone has no envelope. `trace` may be null.
std::optional<PlacedAddress> postalAddressOf(Cfg::ExtractedFields const& fields,
                                             Reader::PageTrace const* trace);

/// Looks at every page, and draws those on which something is printed.
std::vector<Finding> checkLetter(LetterOnPaper const& letter, PrintRules const& rules);

} // namespace Production
