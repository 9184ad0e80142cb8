#pragma once
// Makes PDFs for tests, whole ones and others. Without anything that needs C++20, as qpdf's headers have it.

#include <memory>
#include <string>

namespace Reader {

/// Pages have the font /F, which is Courier in Windows-1252.
class PdfMaker {
public:
    PdfMaker();
    ~PdfMaker();

    /// `keys` go into the page's dictionary, `content` shows something on it.
    PdfMaker& page(std::string const& content, std::string const& keys = "/MediaBox [0 0 595 842]");
    /// Every page lists one picture of that many bytes, and none shows it.
    PdfMaker& listPicture(std::string const& bytes);
    /// Says something once for all pages.
    PdfMaker& sayOfAllPages(std::string const& key, std::string const& value);
    /// There should be one more page, but it is none.
    PdfMaker& losePage();

    std::string bytes();
    /// With the first page in front, for readers that get it piece by piece.
    std::string linearized();
    /// The password opens it; an empty one is not asked for.
    std::string encrypted(char const* password);

private:
    struct Pdf;
    std::unique_ptr<Pdf> pdf_;
};

} // namespace Reader
