#pragma once
// Single-page PDFs out of a PDF.

#include <memory>
#include <string>
#include <string_view>
#include <vector>

class QPDF;

namespace Reader {

/// A PDF as it is written to a file, the same at any time and place.
std::string bytesOf(QPDF& pdf);

/// Writes pages of one PDF as PDFs of their own. The PDF is parsed when the first page is written.
class PdfPageWriter {
public:
    /// `pdf` must live as long as the writer; `where` names it in messages.
    PdfPageWriter(std::string_view pdf, std::string where);
    ~PdfPageWriter();

    /// Page `number`, from 1, of a PDF that should have so many pages. The same page gives the same bytes.
    /// Throws Error when the PDF is damaged; pages that cannot be told apart for certain are not written.
    std::string write(int number, int pageCount);

private:
    struct Parsed;

    std::string_view pdf_;
    std::string where_;
    std::unique_ptr<Parsed> parsed_;
};

} // namespace Reader
