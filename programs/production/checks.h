#pragma once
// The checks of a letter, a family a source. Each adds what it finds; none depends on another.

#include "programs/production/check_letter.h"
#include "programs/production/page_ink.h"

namespace Production {

/// A page of a letter that can be read and drawn.
struct PageOnPaper {
    Reader::Page const& page;
    PageInk& ink;
    bool isFirst = false;
    /// The letter's address when it stands on this page, or null.
    PlacedAddress const* address = nullptr;

    Box sheet() const { return {0, 0, page.width, page.height}; }
    Place at(Box const& box = {}) const { return {page.number, box}; }
};

// check_pages.cpp
/// Whether the page is like the sheet: on another one no place means anything.
bool checkSize(Reader::Page const& page, PrintRules const& rules, Findings& findings);
void checkEmpty(PageOnPaper const& page, PrintRules const& rules, Findings& findings);
void checkContents(Reader::Document& document, int page, Findings& findings);
void addUnreadable(int page, std::string const& why, Findings& findings);

// check_ink.cpp
void checkPrintArea(PageOnPaper const& page, PrintRules const& rules, Findings& findings);
void checkClearZones(PageOnPaper const& page, PrintRules const& rules, Findings& findings);

// check_window.cpp
void checkWindow(PageOnPaper const& page, PrintRules const& rules, Findings& findings);

// check_address.cpp
void checkAddress(PlacedAddress const& address, PrintRules const& rules, Findings& findings);

// check_document.cpp
void checkExtras(Reader::Document& document, Reader::Page const& page, Findings& findings);
void checkEmbeddedFiles(Reader::Document& document, Findings& findings);

} // namespace Production
