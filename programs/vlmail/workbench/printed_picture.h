#pragma once
// Pictures of what goes out: pages with their letterheads, and what is sent along with a letter.

#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/report/report.h"
#include "programs/vlmail/workbench/settings_in_work.h"

#include <optional>
#include <string>

namespace Reader {
class Document;
} // namespace Reader

namespace VlMail::Workbench {

struct WantedPicture {
    int page = 1;
    /// Of the letter that the page belongs to; the page itself without one.
    std::optional<Report::Side> side = {};
    double dotsPerInch = 0;
};

/// A PNG; empty for a blank side. A page of a document that the settings make no letters of is as it is.
/// Throws Base::Error.
std::string printedPicture(Reader::Document& document, SettingsInWork& settings, MakingReady& making,
                           WantedPicture const& wanted);

/// {"kind", "width", "height", "page", "attachment", "id"}.
json::Object toJson(Report::Side const& side);
/// As toJson() gives it; null is none. Throws Base::Error and json::Exc.
std::optional<Report::Side> sideIn(json::Value const& value);

} // namespace VlMail::Workbench
