#include "programs/reader/text_pdf.h"

#include "programs/reader/clean_text.h"
#include "programs/reader/error.h"
#include "programs/reader/pdf_page.h"
#include "programs/reader/typed_page.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QUtil.hh>

#include <optional>

namespace Reader {
namespace {

std::string inPoints(double hundredths) { return QUtil::double_to_string(hundredths / POINT, 3); }

/// The word as the content of a page shows it.
std::string shown(Word const& word, Page const& page, std::string const& where) {
    std::optional<std::string> const text = windows1252Of(word.text);
    if (!text)
        throw Error(where + ": page " + std::to_string(page.number) + ": no font for \"" + word.text +
                    "\"; export the document as PDF");
    int const baseline = page.height - word.box.top - TypedPage::ASCENT;
    return "1 0 0 1 " + inPoints(word.box.left) + " " + inPoints(baseline) + " Tm " +
           QPDFObjectHandle::newString(*text).unparse() + " Tj\n";
}

} // namespace

std::string pdfOfTypedPage(Page const& page, std::string const& where) {
    std::string content = "BT\n/Typed " + inPoints(TypedPage::POINTS * POINT) + " Tf\n";
    for (Word const& word : page.words)
        content += shown(word, page, where);
    content += "ET\n";

    QPDF pdf;
    pdf.emptyPDF();
    QPDFObjectHandle sheet = QPDFObjectHandle::parse(
        "<< /Type /Page /MediaBox [0 0 " + inPoints(page.width) + " " + inPoints(page.height) +
        "] /Resources << /Font << /Typed << /Type /Font /Subtype /Type1 /BaseFont /Courier "
        "/Encoding /WinAnsiEncoding >> >> >> >>");
    sheet.replaceKey("/Contents", pdf.newStream(content));
    QPDFPageDocumentHelper(pdf).addPage(QPDFPageObjectHelper(pdf.makeIndirectObject(sheet)), false);
    return bytesOf(pdf);
}

} // namespace Reader
