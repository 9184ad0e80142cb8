// The object "production" of a pack preset and a letter that is held against it: the first line of the input
// is the object, the rest a text file, whose first page is the address too.
#include "programs/production/check_letter.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using Production::ProductionRules;

/// Patterns are run over the text.
constexpr std::size_t LONGEST = 1000;

void require(bool holds) {
    if (!holds)
        std::abort();
}

bool liesOn(Production::PageSize sheet, Reader::Box const& box) {
    return box.left >= 0 && box.left < box.right && box.right <= sheet.width && box.top >= 0 &&
           box.top < box.bottom && box.bottom <= sheet.height;
}

void requireUsable(ProductionRules const& rules) {
    require(rules.sheet.width > 0 && rules.sheet.height > 0 && rules.tolerance >= 0);
    require(!rules.window || liesOn(rules.sheet, *rules.window));
    require(!rules.makesCoverPage || rules.window);
    for (Production::ClearZone const& zone : rules.clearZones)
        require(liesOn(rules.sheet, zone.box));
}

void checkText(std::string const& text, Production::PrintRules const& rules) {
    Reader::Document document = Reader::openDocument(text, "fuzz.txt");
    std::vector<int> pages;
    for (int page = 1; page <= document.pageCount(); ++page)
        pages.push_back(page);
    Production::PlacedAddress const address{text, 1, {{2500, 1000, 9000, 3000}}};
    for (Production::Finding const& finding : Production::checkLetter({document, pages, &address}, rules)) {
        require(!finding.says.empty() && !finding.fix.empty());
        require(Production::Finding::fromJson(finding.toJson()) == finding);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string const input(reinterpret_cast<char const*>(data), std::min(size, LONGEST));
    std::size_t const end = std::min(input.find('\n'), input.size());
    try {
        json::Object const production = json::strToObject(input.data(), end);
        std::vector<Reader::RulesFault> faults;
        requireUsable(ProductionRules::from(production, faults));
        for (Reader::RulesFault const& fault : faults)
            require(!fault.what.empty() && !fault.advice.empty());
        Cfg::PackPreset const preset(json::Object{{"name", "fuzz"}, {"production", production}}, {});
        checkText(input.substr(std::min(end + 1, input.size())),
                  {preset, Cfg::App(json::Value(), true, false), "fuzz"});
    } catch (json::Exc const&) {   // no JSON object
    } catch (Base::Error const&) { // no text
    }
    return 0;
}
