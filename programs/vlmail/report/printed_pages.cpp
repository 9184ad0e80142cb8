#include "programs/vlmail/report/printed_pages.h"

#include "programs/base/quoting.h"
#include "programs/mailing/page_blob.h"
#include "programs/production/maker.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace VlMail::Report {
namespace {

using Production::PageSize;

/// What lies where can be seen, and a side is some 10 KB.
constexpr double SMALL_DOTS_PER_INCH = 36;
/// A letter of more shows its first.
constexpr std::size_t MOST_SIDES = 40;

std::string pictureOf(Reader::Document& document, int page, double dotsPerInch) {
    std::optional<Reader::Document> printed = document.printed(page);
    return printed ? printed->renderPage(1, dotsPerInch) : document.renderPage(page, dotsPerInch);
}

std::string pictureOf(std::string pdf, double dotsPerInch) {
    Reader::Document page = Reader::openDocument(std::move(pdf), "page.pdf");
    return pictureOf(page, 1, dotsPerInch);
}

std::string pictureOf(PageBlob const& page) {
    return pictureOf(std::string(Mailing::viewOf(Mailing::expanded(page.data))), SMALL_DOTS_PER_INCH);
}

} // namespace

struct PrintedPages::Part {
    std::vector<Side> sides;
    PageSize last;
};

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
                                   : pictureOf(std::move(made.pdf), dotsPerInch);
}

PrintedPages::Part PrintedPages::attachment(std::size_t position) const {
    MadeAttachment const& made = making_.attachmentsOf(preset_.name()).at(position);
    Part part;
    for (PageBlob const& page : made.pages) {
        part.last = page.size;
        std::string const name = "page " + std::to_string(page.number) + " of " + Base::inQuotes(made.id);
        part.sides.push_back({name, pictureOf(page), page.size.width, page.size.height});
    }
    return part;
}

std::vector<PrintedPages::Part> PrintedPages::partsOf(LetterReading const& letter) {
    Part own;
    for (int const page : letter.pages) {
        own.last = size(page);
        own.sides.push_back({"page " + std::to_string(page), picture(letter, page, SMALL_DOTS_PER_INCH),
                             own.last.width, own.last.height});
    }
    bool const areMade = !making_.attachmentsOf(preset_.name()).empty();
    Production::AttachmentOrder const order =
        areMade ? Production::orderOf(preset_.attachments()) : Production::AttachmentOrder{};
    std::vector<Part> parts;
    for (std::size_t const at : order.inFront)
        parts.push_back(attachment(at));
    parts.push_back(std::move(own));
    for (std::size_t const at : order.behind)
        parts.push_back(attachment(at));
    return parts;
}

std::vector<Side> PrintedPages::sides(LetterReading const& letter) {
    if (preset_.letterheads().empty() && preset_.attachments().empty())
        return {};
    auto const printed = preset_.duplex() ? Production::Sides::Both : Production::Sides::One;
    std::vector<Side> sides;
    std::vector<Part> parts = partsOf(letter);
    for (Part& part : parts) {
        bool const hasBlank =
            &part != &parts.back() && Production::endsWithBlank(static_cast<int>(part.sides.size()), printed);
        std::move(part.sides.begin(), part.sides.end(), std::back_inserter(sides));
        if (hasBlank)
            sides.push_back({"blank side", {}, part.last.width, part.last.height});
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
