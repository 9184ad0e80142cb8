#pragma once
// What a PDF has beside what is printed of it. Without anything that needs C++20: clang takes qpdf's headers
// up to C++17 only.

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace Reader {

/// In points from the top left of the page as it is shown.
struct PdfAnnotation {
    std::string kind;
    double left = 0;
    double top = 0;
    double right = 0;
    double bottom = 0;
};

/// Looks through one PDF, which is parsed when something is asked for. What is damaged has nothing.
class PdfExtras {
public:
    /// `pdf` must live as long as this; `where` names it to the parser.
    PdfExtras(std::string_view pdf, std::string where);
    ~PdfExtras();

    /// Those that a screen shows on the page, from 1, of a PDF that should have so many pages, and that no
    /// print has.
    std::vector<PdfAnnotation> lostAnnotations(int number, int pageCount);
    /// Whether a print of that page shows other annotations than a screen.
    bool printsOtherwise(int number, int pageCount);
    /// The names of the files inside it.
    std::vector<std::string> embeddedFiles();

private:
    struct Parsed;

    /// Null when it cannot be parsed.
    Parsed* parsed();

    std::string_view pdf_;
    std::string where_;
    bool isTried_ = false;
    std::unique_ptr<Parsed> parsed_;
};

/// A PDF that shows on a screen what a print of this one shows. Throws std::exception.
std::string printedPage(std::string const& pdf, std::string const& where);

} // namespace Reader
