#pragma once
// What a test case expects a document to give: its presets and letters, as people can write them.
//
//     {"extract_preset": "invoice.*", "pack_preset": "Bills",
//      "letters": [{"pages": [1], "goes_to": "postal", "fields": {
//          "total": 1234.5, "due": {"date": "2021/03/05 00:00:00"}, "email": {"invalid": "jane"}}}]}
//
// "letters" is null for an attachment. Each letter has "fields"; what else an expectation leaves out is not
// compared.

#include "programs/vlmail/letters/reading.h"
#include "vlservice/extract/extract_zones.h"

#include <string>
#include <vector>

namespace VlMail {

/// The expectation that a reading meets.
json::Object expectationOf(DocumentReading const& reading);

/// Indented, with a line break at the end.
std::string printed(json::Object const& expectation);

/// Throws Error, without the name of its file, when the text is no expectation.
json::Object readExpectation(std::string const& text);

/// What differs, a sentence each; none when the reading meets the expectation. The definitions tell why
/// values are invalid.
std::vector<std::string> differences(json::Object const& expected, DocumentReading const& reading,
                                     Cfg::ExtractZones const& definitions);

} // namespace VlMail
