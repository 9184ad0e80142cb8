#pragma once
// What the page shows of a document: its letters as reports draw them, with how each field came about.

#include "programs/reader/document.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/workbench/settings_in_work.h"

namespace VlMail::Workbench {

/// {"left", "top", "right", "bottom"} in 1/100 mm.
json::Object toJson(Reader::Box const& box);

/// Adds what the settings make of a document to what is told of both. Errors of the reading are told in it.
/// With a maker it is looked what would go wrong on paper, too.
void addEvaluation(json::Object& answer, Reader::Document& document, SettingsInWork& settings,
                   MakingReady* making);

/// The same of a letter as the texts of its zones, of which nothing has a place on a page.
void addReading(json::Object& answer, DocumentReading const& reading, SettingsInWork& settings);

} // namespace VlMail::Workbench
