#include "programs/reader/pdf_page.h"

#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/reader/page_contents.h"
#include "programs/reader/page_parts.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>

#include <stdexcept>
#include <utility>
#include <vector>

namespace Reader {
namespace {

std::string hex(unsigned value) { return Base::hexNumber(value, 4); }

std::string utf16Hex(char32_t c) {
    if (c <= 0xFFFF)
        return hex(c);
    return hex(0xD7C0 + (c >> 10)) + hex(0xDC00 + (c & 0x3FF));
}

/// Tells readers of the PDF which characters the glyphs are.
std::string characterMap(CarriedFont const& font) {
    std::string map = "/CIDInit /ProcSet findresource begin\n12 dict begin\nbegincmap\n"
                      "/CMapName /Carried def\n/CMapType 2 def\n"
                      "1 begincodespacerange\n<0000> <FFFF>\nendcodespacerange\n";
    for (auto const& [glyph, c] : font.characters)
        map += "1 beginbfchar\n<" + hex(glyph) + "> <" + utf16Hex(c) + ">\nendbfchar\n";
    return map + "endcmap\nCMapName currentdict /CMap defineresource pop\nend\nend\n";
}

QPDFObjectHandle fontDescriptor(QPDF& pdf, CarriedFont const& font) {
    std::string const ascent = std::to_string(font.ascent);
    std::string const descent = std::to_string(font.descent);
    QPDFObjectHandle descriptor = QPDFObjectHandle::parse(
        "<< /Type /FontDescriptor /FontName /" + font.name +
        " /Flags 5 /ItalicAngle 0 /StemV 80 /FontBBox [0 " + descent + " " + std::to_string(font.advance) +
        " " + ascent + "] /Ascent " + ascent + " /Descent " + descent + " /CapHeight " + ascent + " >>");
    descriptor.replaceKey("/FontFile2", pdf.newStream(font.file));
    return pdf.makeIndirectObject(descriptor);
}

QPDFObjectHandle fontOf(QPDF& pdf, CarriedFont const& font) {
    QPDFObjectHandle glyphs =
        QPDFObjectHandle::parse("<< /Type /Font /Subtype /CIDFontType2 /BaseFont /" + font.name +
                                " /CIDToGIDMap /Identity /CIDSystemInfo << /Registry (Adobe) /Ordering "
                                "(Identity) /Supplement 0 >> /DW " +
                                std::to_string(font.advance) + " >>");
    glyphs.replaceKey("/FontDescriptor", fontDescriptor(pdf, font));
    QPDFObjectHandle whole = QPDFObjectHandle::parse("<< /Type /Font /Subtype /Type0 /BaseFont /" +
                                                     font.name + " /Encoding /Identity-H >>");
    whole.replaceKey("/DescendantFonts", QPDFObjectHandle::newArray({pdf.makeIndirectObject(glyphs)}));
    whole.replaceKey("/ToUnicode", pdf.newStream(characterMap(font)));
    return pdf.makeIndirectObject(whole);
}

} // namespace

struct PdfPageWriter::Parsed {
    QPDF pdf;
    std::vector<QPDFPageObjectHelper> pages;
    PageContents contents;

    Parsed(std::string_view bytes, std::string const& where, EmbeddedFileReader const& readEmbeddedFile)
        : contents(pdf, readEmbeddedFile) {
        pdf.setSuppressWarnings(true);
        pdf.processMemoryFile(where.c_str(), bytes.data(), bytes.size());
        QPDFPageDocumentHelper document(pdf);
        document.pushInheritedAttributesToPage();
        pages = document.getAllPages();
    }
};

std::string writerVersion() { return QPDF::QPDFVersion(); }

PdfPageWriter::PdfPageWriter(std::string_view pdf, std::string where, EmbeddedFileReader readEmbeddedFile)
    : pdf_(pdf), where_(std::move(where)), readEmbeddedFile_(std::move(readEmbeddedFile)) {}

PdfPageWriter::~PdfPageWriter() = default;

template<typename Work>
auto PdfPageWriter::ofPage(int number, int pageCount, Work const& work) {
    try {
        if (!parsed_)
            parsed_ = std::make_unique<Parsed>(pdf_, where_, readEmbeddedFile_);
        if (parsed_->pages.size() != static_cast<std::size_t>(pageCount))
            throw std::runtime_error("Some pages are lost.");
        QPDFPageObjectHelper page = parsed_->pages.at(static_cast<std::size_t>(number - 1));
        dropLostContents(page);
        writesAnew_[number] = dropUnusedResources(page, parsed_->contents);
        return work(page);
    } catch (QPDFExc const& failure) {
        if (failure.getErrorCode() == qpdf_e_password)
            throw Base::Error(Base::Code::DocumentEncrypted,
                              where_ + ": is a PDF whose encryption is not known; save it without one");
        failToWrite(number);
    } catch (std::exception const&) {
        failToWrite(number);
    }
}

std::string PdfPageWriter::write(int number, int pageCount) {
    return ofPage(number, pageCount, [this](QPDFPageObjectHelper page) {
        separateFormFields(page);
        QPDF single;
        single.setSuppressWarnings(true);
        single.emptyPDF();
        QPDFPageDocumentHelper added(single);
        added.addPage(page, false);
        carryCatalog(parsed_->pdf, single, added.getAllPages().at(0));
        return bytesOf(single);
    });
}

bool PdfPageWriter::writesAnew(int number, int pageCount) {
    if (auto const known = writesAnew_.find(number); known != writesAnew_.end())
        return known->second;
    return ofPage(number, pageCount, [&](QPDFPageObjectHelper) { return writesAnew_[number]; });
}

void PdfPageWriter::failToWrite(int number) const {
    throw Base::Error(Base::Code::DocumentUnreadable,
                      where_ + ": page " + std::to_string(number) + " is damaged; export the document again");
}

std::string pdfOf(ShownPage const& page) {
    QPDF pdf;
    pdf.emptyPDF();
    QPDFObjectHandle sheet =
        QPDFObjectHandle::parse("<< /Type /Page /MediaBox [0 0 " + page.width + " " + page.height + "] >>");
    sheet.replaceKey("/Contents", pdf.newStream(page.content));
    QPDFObjectHandle fonts = QPDFObjectHandle::parse(
        "<< /Courier << /Type /Font /Subtype /Type1 /BaseFont /Courier /Encoding /WinAnsiEncoding >> >>");
    if (page.carried)
        fonts.replaceKey("/Carried", fontOf(pdf, *page.carried));
    sheet.replaceKey("/Resources", QPDFObjectHandle::newDictionary({{"/Font", fonts}}));
    QPDFPageDocumentHelper(pdf).addPage(QPDFPageObjectHelper(pdf.makeIndirectObject(sheet)), false);
    return bytesOf(pdf);
}

} // namespace Reader
