// Pages as such: whether each is a sheet's, and whether anything is on it.
#include "programs/base/millimetres.h"
#include "programs/production/checks.h"

#include <algorithm>
#include <utility>

namespace Production {
namespace {

std::string inWords(PageSize size) {
    return Base::inMillimetres(size.width) + " by " + Base::withMillimetres(size.height);
}

std::string sheetInWords(ProductionRules const& rules) {
    return rules.isGiven ? inWords(rules.sheet) : inWords(A4_SHEET) + " (A4)";
}

} // namespace

bool checkSize(Reader::Page const& page, PrintRules const& rules, Findings& findings) {
    ProductionRules const& production = rules.production;
    PageSize const size{page.width, page.height};
    if (production.takes(size))
        return true;
    std::string const sheet = sheetInWords(production);
    Place const place{page.number, {0, 0, page.width, page.height}};
    if (production.takes(size.turned()))
        findings.add(Code::PageOrientation, place,
                     "the page is turned: it is " + inWords(size) + ", the sheet " + sheet,
                     "turn the page in the document");
    else
        findings.add(Code::PageSize, place, "the page is " + inWords(size) + ", the sheet " + sheet,
                     "export the document for a sheet of " + sheet);
    return false;
}

void checkEmpty(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    if (rules.production.isGiven && page.ink.isEmpty())
        findings.add(Code::PageEmpty, page.at(), "nothing is printed on the page",
                     "take it out of the document, if it is not meant");
}

void checkContents(Reader::Document& document, int page, Findings& findings) {
    if (!document.isWrittenAnew(page))
        return;
    Finding const finding = redrawnFinding({page});
    findings.add(finding.code, {page}, finding.says, finding.fix);
}

void addUnreadable(int page, std::string const& why, Findings& findings) {
    std::size_t const remedy = why.find("; ");
    findings.add(Code::PageUnreadable, {page}, why.substr(0, remedy),
                 remedy == why.npos ? "export the document again" : why.substr(remedy + 2));
}

} // namespace Production
