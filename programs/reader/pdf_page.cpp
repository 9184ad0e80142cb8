#include "programs/reader/pdf_page.h"

#include "programs/reader/error.h"

#include <qpdf/Buffer.hh>
#include <qpdf/QPDF.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFWriter.hh>

#include <stdexcept>
#include <utility>

namespace Reader {

std::string bytesOf(QPDF& pdf) {
    QPDFWriter writer(pdf);
    writer.setOutputMemory();
    writer.setDeterministicID(true);
    writer.setObjectStreamMode(qpdf_o_generate);
    writer.write();
    auto const bytes = writer.getBufferSharedPointer();
    return std::string(reinterpret_cast<char const*>(bytes->getBuffer()), bytes->getSize());
}

struct PdfPageWriter::Parsed {
    QPDF pdf;
    std::vector<QPDFPageObjectHelper> pages;
};

PdfPageWriter::PdfPageWriter(std::string_view pdf, std::string where) : pdf_(pdf), where_(std::move(where)) {}

PdfPageWriter::~PdfPageWriter() = default;

std::string PdfPageWriter::write(int number, int pageCount) {
    try {
        if (!parsed_) {
            auto parsed = std::make_unique<Parsed>();
            parsed->pdf.setSuppressWarnings(true);
            parsed->pdf.processMemoryFile(where_.c_str(), pdf_.data(), pdf_.size());
            QPDFPageDocumentHelper document(parsed->pdf);
            document.pushInheritedAttributesToPage();
            parsed->pages = document.getAllPages();
            parsed_ = std::move(parsed);
        }
        if (parsed_->pages.size() != static_cast<std::size_t>(pageCount))
            throw std::runtime_error("Some pages are lost.");
        QPDFPageObjectHelper page = parsed_->pages.at(static_cast<std::size_t>(number - 1));
        // Documents often list the fonts and pictures of all pages at each of them.
        page.removeUnreferencedResources();

        QPDF single;
        single.setSuppressWarnings(true);
        single.emptyPDF();
        QPDFPageDocumentHelper(single).addPage(page, false);
        return bytesOf(single);
    } catch (std::exception const&) {
        throw Error(where_ + ": page " + std::to_string(number) + " is damaged; export the document again");
    }
}

} // namespace Reader
