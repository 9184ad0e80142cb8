#include "programs/reader/pdf_extras.h"

#include "programs/reader/page_parts.h"
#include "programs/reader/printed_annotations.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFEmbeddedFileDocumentHelper.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>

#include <algorithm>
#include <utility>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;

/// Of a form's button.
constexpr int PUSH_BUTTON = 1 << 16;
/// More are hardly a page's.
constexpr std::size_t MOST_ANNOTATIONS = 1000;
constexpr std::size_t MOST_FILES = 1000;

int intIn(Handle dictionary, char const* key) {
    Handle value = dictionary.getKey(key);
    return value.isInteger() ? value.getIntValueAsInt() : 0;
}

bool isPushButton(Handle annotation) {
    return annotation.getKey("/FT").isNameAndEquals("/Btn") && (intIn(annotation, "/Ff") & PUSH_BUTTON) != 0;
}

/// Null when a print has what a screen has of it.
char const* kindOfLost(Handle annotation) {
    if (!annotation.isDictionary() || !annotation.getKey("/Subtype").isName())
        return nullptr;
    bool const isLost = isOnScreen(annotation) && !isPrinted(annotation) && !isPushButton(annotation);
    return isLost ? kindOf(annotation).inWords : nullptr;
}

/// A box of the page, told from the top left of the page as it is shown.
PdfAnnotation placed(char const* kind, Handle::Rectangle box, QPDFPageObjectHelper page) {
    Handle::Rectangle const sheet = page.getCropBox().getArrayAsRectangle();
    Handle turned = page.getAttribute("/Rotate", false);
    double const left = box.llx - sheet.llx;
    double const right = box.urx - sheet.llx;
    double const top = sheet.ury - box.ury;
    double const bottom = sheet.ury - box.lly;
    double const width = sheet.urx - sheet.llx;
    double const height = sheet.ury - sheet.lly;
    switch (((turned.isInteger() ? turned.getIntValueAsInt() : 0) % 360 + 360) % 360) {
    case 90:
        return {kind, height - bottom, left, height - top, right};
    case 180:
        return {kind, width - right, height - bottom, width - left, height - top};
    case 270:
        return {kind, top, width - right, bottom, width - left};
    default:
        return {kind, left, top, right, bottom};
    }
}

} // namespace

struct PdfExtras::Parsed {
    QPDF pdf;
    std::vector<QPDFPageObjectHelper> pages;
};

PdfExtras::PdfExtras(std::string_view pdf, std::string where) : pdf_(pdf), where_(std::move(where)) {}

PdfExtras::~PdfExtras() = default;

PdfExtras::Parsed* PdfExtras::parsed() {
    if (std::exchange(isTried_, true))
        return parsed_.get();
    try {
        auto parsed = std::make_unique<Parsed>();
        parsed->pdf.setSuppressWarnings(true);
        parsed->pdf.processMemoryFile(where_.c_str(), pdf_.data(), pdf_.size());
        parsed->pages = QPDFPageDocumentHelper(parsed->pdf).getAllPages();
        parsed_ = std::move(parsed);
    } catch (std::exception const&) {
        // Its pages are not written either, which is told then.
    }
    return parsed_.get();
}

bool PdfExtras::printsOtherwise(int number, int pageCount) {
    if (!parsed() || parsed_->pages.size() != static_cast<std::size_t>(pageCount))
        return false;
    try {
        return printsOtherAnnotations(parsed_->pages.at(static_cast<std::size_t>(number) - 1));
    } catch (std::exception const&) {
        return false;
    }
}

std::string printedPage(std::string const& pdf, std::string const& where) {
    QPDF page;
    page.setSuppressWarnings(true);
    page.processMemoryFile(where.c_str(), pdf.data(), pdf.size());
    for (QPDFPageObjectHelper const& only : QPDFPageDocumentHelper(page).getAllPages())
        keepPrintedAnnotations(only);
    return bytesOf(page, Packing::AsItIs);
}

std::vector<PdfAnnotation> PdfExtras::lostAnnotations(int number, int pageCount) {
    std::vector<PdfAnnotation> lost;
    if (!parsed() || parsed_->pages.size() != static_cast<std::size_t>(pageCount))
        return lost;
    try {
        QPDFPageObjectHelper page = parsed_->pages.at(static_cast<std::size_t>(number) - 1);
        Handle annotations = page.getObjectHandle().getKey("/Annots");
        int const count = annotations.isArray() ? annotations.getArrayNItems() : 0;
        for (int i = 0; i < count && lost.size() < MOST_ANNOTATIONS; ++i) {
            Handle annotation = annotations.getArrayItem(i);
            if (char const* const kind = kindOfLost(annotation))
                lost.push_back(placed(kind, annotation.getKey("/Rect").getArrayAsRectangle(), page));
        }
    } catch (std::exception const&) {
        // What was seen before stays.
    }
    return lost;
}

std::vector<std::string> PdfExtras::embeddedFiles() {
    std::vector<std::string> names;
    if (!parsed())
        return names;
    try {
        for (auto const& file : QPDFEmbeddedFileDocumentHelper(parsed_->pdf).getEmbeddedFiles())
            if (names.size() < MOST_FILES)
                names.push_back(file.second->getFilename().empty() ? file.first : file.second->getFilename());
    } catch (std::exception const&) {
        // What was seen before stays.
    }
    return names;
}

} // namespace Reader
