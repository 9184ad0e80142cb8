#pragma once
// PDFs of one page, written with qpdf: out of a PDF, or out of what shows text.
// Without anything that needs C++20: clang takes qpdf's headers up to C++17 only.

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Reader {

/// Of the library that pages are written with.
std::string writerVersion();

/// Gives the one file that a PDF has inside, unpacked as far as the library that draws pages gets; nothing
/// when it does not find it.
using EmbeddedFileReader = std::function<std::optional<std::string>(std::string const& pdf)>;

/// Writes pages of one PDF as PDFs of their own. The PDF is parsed when the first page is written.
class PdfPageWriter {
public:
    /// `pdf` must live as long as the writer; `where` names it in messages.
    PdfPageWriter(std::string_view pdf, std::string where, EmbeddedFileReader readEmbeddedFile);
    ~PdfPageWriter();

    /// Page `number`, from 1, of a PDF that should have so many pages. The same page gives the same bytes.
    /// Throws Error when the PDF is damaged; pages that cannot be told apart for certain are not written.
    /// Contents that are damaged are written anew, as far as they are shown.
    std::string write(int number, int pageCount);
    /// Whether write() writes some contents of the page anew.
    bool writesAnew(int number, int pageCount);

private:
    struct Parsed;

    /// What `work` gives for the page, with what it needs and no more.
    template<typename Work>
    auto ofPage(int number, int pageCount, Work const& work);
    [[noreturn]] void failToWrite(int number) const;

    std::string_view pdf_;
    std::string where_;
    EmbeddedFileReader readEmbeddedFile_;
    std::unique_ptr<Parsed> parsed_;
    /// Of the pages that were looked through.
    std::map<int, bool> writesAnew_;
};

/// A font of which a PDF carries the letters it shows; all are equally wide.
struct CarriedFont {
    std::string name;
    /// A TrueType file.
    std::string file;
    // In thousandths of the font size.
    int ascent = 0;
    int descent = 0;
    int advance = 0;
    /// The characters that the glyphs used in the content stand for.
    std::map<std::uint16_t, char32_t> characters;
};

/// What a page shows: operators of PDF, in which the font /Courier is in Windows-1252 and /Carried, where
/// there is one, is by glyph numbers. Sizes are in points.
struct ShownPage {
    std::string width;
    std::string height;
    std::string content;
    CarriedFont const* carried = nullptr;
};

/// The same page gives the same bytes.
std::string pdfOf(ShownPage const& page);

} // namespace Reader
