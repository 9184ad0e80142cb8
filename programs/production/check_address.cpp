// The address as a text.
#include "programs/base/quoting.h"
#include "programs/patterns/pattern.h"
#include "programs/production/checks.h"

#include <algorithm>
#include <sstream>

namespace Production {
namespace {

using Patterns::Pattern;

int linesOf(std::string const& text) {
    std::istringstream in(text);
    int lines = 0;
    for (std::string line; std::getline(in, line);)
        lines += line.find_first_not_of(" \t\r") != line.npos;
    return lines;
}

std::string counted(int lines) { return std::to_string(lines) + (lines == 1 ? " line" : " lines"); }

void checkLines(PlacedAddress const& address, ProductionRules const& rules, Findings& findings) {
    int const lines = linesOf(address.text);
    Place const place{address.page, address.box()};
    if (lines < rules.minLines)
        findings.add(Code::AddressTooFewLines, place,
                     "the address has " + counted(lines) + ", " + std::to_string(rules.minLines) +
                         " are the least",
                     "complete the address, or let its field take all of it");
    if (rules.maxLines > 0 && lines > rules.maxLines)
        findings.add(Code::AddressTooManyLines, place,
                     "the address has " + counted(lines) + ", " + std::to_string(rules.maxLines) +
                         " are the most",
                     "shorten the address, or let its field take less");
}

void checkPostcode(PlacedAddress const& address, ProductionRules const& rules, Findings& findings) {
    if (rules.postcode.empty())
        return;
    Place const place{address.page, address.box()};
    switch (Pattern(rules.postcode, Pattern::Use::Extract).fits(address.text)) {
    case Pattern::Answer::Yes:
        return;
    case Pattern::Answer::No:
        return findings.add(Code::AddressNoPostcode, place,
                            "nothing in the address fits the postcode " + Base::inQuotes(rules.postcode),
                            "correct the address, or the \"postcode\" of the pack preset");
    case Pattern::Answer::TooHard:
        break;
    }
    findings.add(Code::ProductionRefused, place,
                 "the postcode's pattern " + Base::inQuotes(rules.postcode) +
                     " takes too long on this address",
                 "write it with fewer repetitions inside each other");
}

} // namespace

void checkAddress(PlacedAddress const& address, PrintRules const& rules, Findings& findings) {
    checkLines(address, rules.production, findings);
    checkPostcode(address, rules.production, findings);
}

} // namespace Production
