#include "tests/support/pdf_maker.h"

#include <qpdf/Buffer.hh>
#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFWriter.hh>

namespace Reader {
namespace {

std::string written(QPDFWriter& writer) {
    writer.setStaticID(true);
    writer.write();
    auto const buffer = writer.getBufferSharedPointer();
    return {reinterpret_cast<char const*>(buffer->getBuffer()), buffer->getSize()};
}

} // namespace

struct PdfMaker::Pdf {
    QPDF file;

    QPDFObjectHandle pages() { return file.getRoot().getKey("/Pages"); }
};

PdfMaker::PdfMaker() : pdf_(std::make_unique<Pdf>()) { pdf_->file.emptyPDF(); }

PdfMaker::~PdfMaker() = default;

PdfMaker& PdfMaker::page(std::string const& content, std::string const& keys) {
    QPDFObjectHandle sheet =
        QPDFObjectHandle::parse("<< /Type /Page " + keys +
                                " /Resources << /XObject << >> /Font << /F << /Type /Font /Subtype /Type1 "
                                "/BaseFont /Courier /Encoding /WinAnsiEncoding >> >> >> >>");
    sheet.replaceKey("/Contents", pdf_->file.newStream(content));
    QPDFPageDocumentHelper(pdf_->file)
        .addPage(QPDFPageObjectHelper(pdf_->file.makeIndirectObject(sheet)), false);
    return *this;
}

PdfMaker& PdfMaker::listPicture(std::string const& bytes) {
    QPDFObjectHandle picture = pdf_->file.newStream(bytes);
    picture.getDict().replaceKey("/Subtype", QPDFObjectHandle::newName("/Image"));
    for (QPDFPageObjectHelper& page : QPDFPageDocumentHelper(pdf_->file).getAllPages())
        page.getObjectHandle().getKey("/Resources").getKey("/XObject").replaceKey("/Picture", picture);
    return *this;
}

PdfMaker& PdfMaker::sayOfAllPages(std::string const& key, std::string const& value) {
    pdf_->pages().replaceKey(key, QPDFObjectHandle::parse(value));
    return *this;
}

PdfMaker& PdfMaker::losePage() {
    QPDFObjectHandle kids = pdf_->pages().getKey("/Kids");
    kids.appendItem(QPDFObjectHandle::newInteger(5));
    pdf_->pages().replaceKey("/Count", QPDFObjectHandle::newInteger(kids.getArrayNItems()));
    return *this;
}

std::string PdfMaker::bytes() {
    QPDFWriter writer(pdf_->file);
    writer.setOutputMemory();
    return written(writer);
}

std::string PdfMaker::linearized() {
    QPDFWriter writer(pdf_->file);
    writer.setOutputMemory();
    writer.setLinearization(true);
    return written(writer);
}

std::string PdfMaker::encrypted(char const* password) {
    QPDFWriter writer(pdf_->file);
    writer.setOutputMemory();
    writer.setStaticAesIV(true);
    writer.setR6EncryptionParameters(password, "owner", true, true, true, true, true, true, qpdf_r3p_full,
                                     true);
    return written(writer);
}

} // namespace Reader
