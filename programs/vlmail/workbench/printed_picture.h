#pragma once
// Pictures of what goes out: pages with their letterheads, and what is sent along with a letter.

#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/report.h"
#include "programs/vlmail/workbench/settings_in_work.h"

#include <optional>
#include <string>
#include <vector>

namespace Reader {
class Document;
} // namespace Reader

namespace VlMail::Workbench {

struct WantedPicture {
    int page = 1;
    /// Of the letter that the page belongs to; the page itself without one.
    std::optional<Report::Side> side = {};
    double dotsPerInch = 0;

    bool isCover() const { return side && side->kind == Report::Side::Kind::Cover; }
};

/// What pictures of a document's letters are made from.
struct PrintedLetters {
    /// None of a document that the settings make no letters of.
    std::vector<LetterReading> letters = {};
    Cfg::PackPreset packPreset = {};
    /// Only a look at the paper tells which letter gets a cover page.
    bool areChecked = false;
};

PrintedLetters lettersIn(Reader::Document& document, SettingsInWork& settings, Along::Checks checks);

/// A PNG; empty for a blank side. Without letters a page is as it is. Throws Base::Error.
std::string printedPicture(Reader::Document& document, PrintedLetters const& letters, MakingReady& making,
                           WantedPicture const& wanted);

/// {"kind", "width", "height", "page", "attachment", "id"}.
json::Object toJson(Report::Side const& side);
/// As toJson() gives it; null is none. Throws Base::Error and json::Exc.
std::optional<Report::Side> sideIn(json::Value const& value);

} // namespace VlMail::Workbench
