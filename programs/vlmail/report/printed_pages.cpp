#include "programs/vlmail/report/printed_pages.h"

#include "programs/mailing/page_blob.h"
#include "programs/production/cover_page.h"
#include "programs/production/maker.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace VlMail::Report {
namespace {

using Production::PageSize;

/// A letter of more shows its first.
constexpr std::size_t MOST_SIDES = 40;

std::string pictureOfPdf(std::string pdf, double dotsPerInch) {
    Reader::Document page = Reader::openDocument(std::move(pdf), "page.pdf");
    return pictureOf(page, 1, dotsPerInch);
}

} // namespace

std::string pictureOf(Reader::Document& document, int page, double dotsPerInch) {
    std::optional<Reader::Document> printed = document.printed(page);
    return printed ? printed->renderPage(1, dotsPerInch) : document.renderPage(page, dotsPerInch);
}

int PrintedPages::quarterTurns(int page) const {
    return Production::quarterTurnsFor(preset_.orientationForced(), document_.pageSize(page));
}

PageSize PrintedPages::size(int page) const {
    PageSize const size = document_.pageSize(page);
    return quarterTurns(page) % 2 == 0 ? size : size.turned();
}

std::string PrintedPages::picture(LetterReading const& letter, int page, double dotsPerInch) {
    auto const place = std::find(letter.pages.begin(), letter.pages.end(), page);
    if (place == letter.pages.end())
        return pictureOf(document_, page, dotsPerInch);
    Production::PreparedPage const content{document_.singlePagePdf(page), document_.pageSize(page)};
    Production::PreparedPage made = making_.makerFor(preset_).make(
        content, {Production::Part::Kind::FirstLetter}, static_cast<int>(place - letter.pages.begin()) + 1);
    return made.pdf == content.pdf ? pictureOf(document_, page, dotsPerInch)
                                   : pictureOfPdf(std::move(made.pdf), dotsPerInch);
}

std::string PrintedPages::picture(LetterReading const& letter, Side const& side, double dotsPerInch) {
    switch (side.kind) {
    case Side::Kind::Page:
        return picture(letter, side.page, dotsPerInch);
    case Side::Kind::Cover:
        return pictureOfPdf(Production::coverPage(letter.coverAddress, rules()), dotsPerInch);
    case Side::Kind::Attachment: {
        MadeAttachment const& made = making_.attachmentsOf(preset_.name()).at(side.attachment);
        PageBlob const& page = made.pages.at(static_cast<std::size_t>(side.page) - 1);
        return pictureOfPdf(std::string(Mailing::viewOf(Mailing::expanded(page.data))), dotsPerInch);
    }
    case Side::Kind::Blank:
        break;
    }
    return {};
}

Production::ProductionRules PrintedPages::rules() const {
    // What is wrong with them keeps the letter from having a cover page.
    std::vector<Reader::RulesFault> faults;
    return Production::ProductionRules::of(preset_, faults);
}

PrintedPages::Part PrintedPages::attachment(std::size_t position) const {
    MadeAttachment const& made = making_.attachmentsOf(preset_.name()).at(position);
    Part part;
    for (PageBlob const& page : made.pages)
        part.push_back(
            {Side::Kind::Attachment, page.size.width, page.size.height, page.number, position, made.id});
    return part;
}

PrintedPages::Part PrintedPages::pagesOf(LetterReading const& letter) const {
    Part part;
    for (int const page : letter.pages) {
        PageSize const shown = size(page);
        part.push_back({Side::Kind::Page, shown.width, shown.height, page});
    }
    return part;
}

std::vector<PrintedPages::Part> PrintedPages::partsOf(LetterReading const& letter) const {
    bool const areMade = !making_.attachmentsOf(preset_.name()).empty();
    Production::AttachmentOrder const order =
        areMade ? Production::orderOf(preset_.attachments()) : Production::AttachmentOrder{};
    std::vector<Part> parts;
    if (!letter.coverAddress.empty()) {
        PageSize const sheet = rules().sheet;
        parts.push_back({Side{Side::Kind::Cover, sheet.width, sheet.height}});
    }
    for (std::size_t const at : order.inFront)
        parts.push_back(attachment(at));
    parts.push_back(pagesOf(letter));
    for (std::size_t const at : order.behind)
        parts.push_back(attachment(at));
    return parts;
}

std::vector<Side> PrintedPages::sides(LetterReading const& letter) {
    if (preset_.letterheads().empty() && preset_.attachments().empty() && letter.coverAddress.empty())
        return {};
    auto const printed = preset_.duplex() ? Production::Sides::Both : Production::Sides::One;
    std::vector<Side> sides;
    std::vector<Part> const parts = partsOf(letter);
    for (Part const& part : parts) {
        sides.insert(sides.end(), part.begin(), part.end());
        if (&part != &parts.back() && Production::endsWithBlank(static_cast<int>(part.size()), printed))
            sides.push_back({Side::Kind::Blank, part.back().width, part.back().height});
    }
    sides.resize(std::min(sides.size(), MOST_SIDES));
    return sides;
}

Reader::Box turned(Reader::Box const& box, PageSize page, int quarterTurns) {
    switch (quarterTurns) {
    case 1:
        return {page.height - box.bottom, box.left, page.height - box.top, box.right};
    case 2:
        return {page.width - box.right, page.height - box.bottom, page.width - box.left,
                page.height - box.top};
    case 3:
        return {box.top, page.width - box.right, box.bottom, page.width - box.left};
    default:
        return box;
    }
}

} // namespace VlMail::Report
