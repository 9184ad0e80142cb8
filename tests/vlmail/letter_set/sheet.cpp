#include "tests/vlmail/letter_set/sheet.h"

#include "programs/reader/clean_text.h"
#include "tests/support/raw_pdf.h"

#include <locale>
#include <sstream>

namespace LetterSet {
namespace {

std::string inPoints(double millimetres) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << millimetres * 72 / 25.4;
    return text.str();
}

std::string literal(std::string const& text) {
    std::string const bytes = Reader::windows1252Of(text).value();
    std::string result = "(";
    for (char const c : bytes) {
        if (c == '(' || c == ')' || c == '\\')
            result += '\\';
        result += c;
    }
    return result + ')';
}

} // namespace

void Document::text(double x, double y, std::string const& text, double size) { spaced(x, y, text, 0, size); }

void Document::spaced(double x, double y, std::string const& text, double room, double size) {
    std::ostringstream content;
    content.imbue(std::locale::classic());
    content << "BT /F " << size << " Tf " << room << " Tc " << inPoints(x) << ' ' << inPoints(297 - y)
            << " Td " << literal(text) << " Tj ET\n";
    pages_.back() += content.str();
}

std::string Document::pdf() const {
    VLServiceTest::RawPdf pdf;
    std::string kids;
    int number = 10;
    for (std::string const& content : pages_) {
        pdf.stream(number + 1, "", content);
        pdf.object(number, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents " +
                               std::to_string(number + 1) + " 0 R /Resources << /Font << /F 4 0 R >> >> >>");
        kids += std::to_string(number) + " 0 R ";
        number += 2;
    }
    pdf.object(1, "<< /Type /Catalog /Pages 2 0 R >>");
    pdf.object(2, "<< /Type /Pages /Kids [" + kids + "] /Count " + std::to_string(pages_.size()) + " >>");
    pdf.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica /Encoding /WinAnsiEncoding >>");
    return pdf.bytes();
}

} // namespace LetterSet
