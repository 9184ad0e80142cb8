#pragma once
// A sheet in front of a letter whose own address does not show in the window, with that address and nothing
// else.

#include "programs/production/check_letter.h"

#include <string>
#include <vector>

namespace Production {

/// The sheet as a PDF: the same address gives the same bytes. Throws Base::Error when the rules have no
/// window, the address does not fit into it, or there is no font for it.
std::string coverPage(std::string const& address, ProductionRules const& rules);

/// Takes out of a letter's findings what a cover page puts right. False, and nothing is taken, where the
/// rules want none, nothing of that kind was found, or none can be made.
bool repairByCoverPage(std::vector<Finding>& findings, std::string const& address,
                       ProductionRules const& rules);

} // namespace Production
