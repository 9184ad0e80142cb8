#pragma once
// An explanation for people.

#include "vlservice/json/json.h"

#include <iosfwd>

namespace VlMail {

/// Takes what explain.h makes; indented as a part of the letters' report. Long texts are cut. Throws
/// json::Exc for anything else.
void printExplanation(std::ostream& out, json::Object const& explanation);

} // namespace VlMail
