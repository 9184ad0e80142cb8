#pragma once
// Letters that were read, held against what a carrier and a printer want.

#include "programs/vlmail/letters/reading.h"

#include <cstddef>
#include <string>
#include <vector>

namespace VlMail {

/// Sets what would go wrong with each letter on paper; the trace must be that of its reading. Throws Error
/// when the part "app" of the settings cannot be understood.
void checkLetters(std::vector<LetterReading>& letters, OpenDocument const& read,
                  Cfg::PackPreset const& preset, NodeSettings const& settings);

/// "page-size: page 1: the page is ...; export ...".
std::string inWords(Production::Finding const& finding);
/// The same with its severity on two lines, the second with the remedy, indented by so many blanks.
std::string linesFor(Production::Finding const& finding, std::size_t indent);
/// The first error, and how many more there are; empty without one.
std::string errorsInWords(std::vector<Production::Finding> const& findings);

} // namespace VlMail
