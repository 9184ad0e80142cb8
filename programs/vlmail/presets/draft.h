#pragma once
// A preset to begin with, made of letters that it is to read.

#include "programs/reader/document.h"
#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlMail {

/// Settings with one extraction preset and its pack preset, and what each of their parts was seen by.
struct Draft {
    json::Object settings;
    /// A line each.
    std::vector<std::string> evidence;
};

/// Throws Base::Error when a document cannot be read. Fields that reading the documents by the draft does not
/// find are left out, so that each that is in it was found in at least one.
Draft draftFrom(std::vector<Reader::Document>& documents);

/// An expression that fits all the names: digits become "\d+", and what differs otherwise ".*".
std::string expressionFor(std::vector<std::string> const& names);

} // namespace VlMail
