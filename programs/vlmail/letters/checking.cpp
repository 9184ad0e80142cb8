#include "programs/vlmail/letters/checking.h"

#include "programs/production/check_letter.h"
#include "programs/production/cover_page.h"
#include "programs/reader/trace.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/outcome.h"

#include <algorithm>
#include <optional>

namespace VlMail {
namespace {

void check(LetterReading& letter, OpenDocument const& read, Reader::PageTrace const* trace,
           Production::PrintRules const& rules) {
    auto const address = Production::postalAddressOf(letter.fields, trace);
    letter.findings =
        Production::checkLetter({read.document, letter.pages, address ? &*address : nullptr}, rules);
    if (address && Production::repairByCoverPage(letter.findings, address->text, rules.production))
        letter.coverAddress = address->text;
}

} // namespace

void checkLetters(std::vector<LetterReading>& letters, OpenDocument const& read,
                  Cfg::PackPreset const& preset, NodeSettings const& settings) {
    Production::PrintRules const rules(preset, settings.app(), settings.place());
    auto trace = read.trace.pages.begin();
    for (LetterReading& letter : letters) {
        trace = std::find_if(trace, read.trace.pages.end(), [&](Reader::PageTrace const& page) {
            return page.beginsLetter && page.page == letter.pages.front();
        });
        check(letter, read, trace == read.trace.pages.end() ? nullptr : &*trace, rules);
    }
}

std::string inWords(Production::Finding const& finding) {
    std::string const pages = finding.pages.empty() ? "" : pagesInWords(finding.pages) + ": ";
    return std::string(nameOf(finding.code)) + ": " + pages + finding.says + "; " + finding.fix;
}

std::string linesFor(Production::Finding const& finding, std::size_t indent) {
    std::string const blanks(indent, ' ');
    std::string const pages = finding.pages.empty() ? "" : ", " + pagesInWords(finding.pages);
    return blanks + inWords(finding.severity) + ' ' + nameOf(finding.code) + pages + ": " + finding.says +
           '\n' + blanks + "  " + finding.fix + '\n';
}

std::string errorsInWords(std::vector<Production::Finding> const& findings) {
    auto const errors = std::ranges::count_if(findings, &Production::Finding::isError);
    if (errors == 0)
        return {};
    // Errors stand first.
    std::string const first = inWords(findings.front());
    return errors == 1 ? first
                       : first + " (and " + counted(static_cast<std::size_t>(errors - 1), "more error") + ')';
}

} // namespace VlMail
