#include "programs/production/check_letter.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/production/checks.h"

#include <algorithm>
#include <cctype>
#include <string_view>

namespace Production {
namespace {

Box boxOf(Cfg::Rect const& rect) { return {rect.left, rect.top, rect.right, rect.bottom}; }

/// The setting of a node that says nothing of it.
Box standardPrintArea() {
    static Box const area = boxOf(Cfg::App(json::Value(), true, false).value<Cfg::AppFieldIdxs::PrintArea>());
    return area;
}

/// Neither an e-mail address nor a number.
bool isPostal(std::string_view value) {
    bool const hasLetters =
        std::ranges::any_of(value, [](unsigned char c) { return std::isalpha(c) || c >= 0x80; });
    return value.find('\n') != value.npos || (hasLetters && value.find('@') == value.npos);
}

/// Where the search found the value that counts.
void place(PlacedAddress& address, std::string const& name, Reader::PageTrace const& trace) {
    for (Reader::ZoneTrace const& zone : trace.zones)
        for (Reader::FieldTrace const& field : zone.fields)
            if (field.counts && field.value && field.value->name() == name && field.match) {
                address.page = zone.place.page == 0 ? trace.page : zone.place.page;
                address.parts = field.joined ? field.joined->parts : std::vector{field.match->box};
            }
}

class LetterCheck {
public:
    LetterCheck(LetterOnPaper const& letter, PrintRules const& rules)
        : letter_(letter), rules_(rules), findings_(rules.deviation) {}

    std::vector<Finding> run() {
        if (!rules_.refused.empty())
            for (int const page : letter_.pages)
                findings_.add(Code::ProductionRefused, {page}, rules_.refused, rules_.advice);
        else
            checkAll();
        return findings_.take();
    }

private:
    void checkAll() {
        for (int const page : letter_.pages)
            checkReadable(page);
        if (letter_.address)
            checkAddress(*letter_.address, rules_, findings_);
        if (rules_.production.isGiven)
            checkEmbeddedFiles(letter_.document, findings_);
    }

    void checkReadable(int number) {
        try {
            Reader::Page const& page = letter_.document.page(number);
            if (checkSize(page, rules_, findings_))
                checkPlaces(page);
            checkContents(letter_.document, number, findings_);
            if (rules_.production.isGiven)
                checkExtras(letter_.document, page, findings_);
        } catch (Base::Error const& failure) {
            addUnreadable(number, failure.what(), findings_);
        }
    }

    void checkPlaces(Reader::Page const& page) {
        std::optional<Reader::Document> printed = letter_.document.printed(page.number);
        if (!printed)
            return checkPlaces(page, PageInk(letter_.document, page.number));
        Reader::Page asPrinted = printed->page(1);
        asPrinted.number = page.number;
        checkPlaces(asPrinted, PageInk(*printed, 1));
    }

    void checkPlaces(Reader::Page const& page, PageInk ink) {
        PlacedAddress const* const address = letter_.address;
        PageOnPaper const paper{page, ink, page.number == letter_.pages.front(),
                                address && address->page == page.number ? address : nullptr};
        checkEmpty(paper, rules_, findings_);
        checkPrintArea(paper, rules_, findings_);
        checkClearZones(paper, rules_, findings_);
        checkWindow(paper, rules_, findings_);
    }

    LetterOnPaper const& letter_;
    PrintRules const& rules_;
    Findings findings_;
};

} // namespace

PrintRules::PrintRules(Cfg::PackPreset const& preset, Cfg::App const& app, std::string const& place)
    : printArea(boxOf(app.value<Cfg::AppFieldIdxs::PrintArea>())) {
    std::vector<Reader::RulesFault> faults;
    production = ProductionRules::of(preset, faults);
    if (app.value<Cfg::AppFieldIdxs::LooseLetterDeviation>())
        deviation = Findings::Deviation::Loose;
    if (printArea == Box())
        printArea = standardPrintArea();
    if (!faults.empty()) {
        refused = Reader::placeInWords(ProductionRules::KEY, faults.front()) + " of the pack preset " +
                  Base::inQuotes(preset.name()) + ' ' + faults.front().what;
        advice = faults.front().advice;
    } else if (printArea.left >= printArea.right || printArea.top >= printArea.bottom) {
        refused = "\"print_area\" of the part \"app\" in " + place + " has no area";
        advice = "write \"left\" less than \"right\", and \"top\" less than \"bottom\"";
    }
}

Box PrintRules::printAreaOn(PageSize page) const {
    if (printArea != standardPrintArea())
        return printArea;
    return {printArea.left, printArea.top, page.width - (A4_SHEET.width - printArea.right),
            page.height - (A4_SHEET.height - printArea.bottom)};
}

Box PlacedAddress::box() const {
    Box all = parts.empty() ? Box() : parts.front();
    for (Box const& part : parts)
        all = all.united(part);
    return all;
}

std::optional<PlacedAddress> postalAddressOf(Cfg::ExtractedFields const& fields,
                                             Reader::PageTrace const* trace) {
    Cfg::ExtractedField const* const field = fields.primaryAddressField();
    if (!field || !isPostal(field->valueToStr()))
        return std::nullopt;
    PlacedAddress address{field->valueToStr()};
    if (trace)
        place(address, field->name(), *trace);
    return address;
}

std::vector<Finding> checkLetter(LetterOnPaper const& letter, PrintRules const& rules) {
    return LetterCheck(letter, rules).run();
}

} // namespace Production
