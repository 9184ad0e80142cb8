#pragma once
// What a kind of document must be able to do; one source file for each kind.

#include "programs/reader/page.h"
#include "programs/reader/page_check.h"
#include "programs/reader/page_extras.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Reader {

/// Pages count from 1, and callers stay within pageCount(). All operations throw Error.
class PageSource {
public:
    virtual ~PageSource() = default;

    virtual int pageCount() const = 0;
    virtual Page readPage(int number) = 0;
    /// That of readPage(), without reading the page.
    virtual PageSize pageSize(int number) = 0;
    virtual std::string singlePagePdf(int number) = 0;
    /// Whether singlePagePdf() writes some contents anew, since they are damaged, as far as that has shown
    /// when the page was read, drawn or written.
    virtual bool isWrittenAnew(int /*number*/) { return false; }
    virtual std::string renderPage(int number, double dotsPerInch) = 0;
    /// Whether a PDF of one page is certain to show what the page shows, as its parts tell without drawing.
    virtual bool hasSameObjects(int number, std::string_view pdf) = 0;
    /// Nothing where a page has no other picture than the PDF that is made of it.
    virtual std::optional<Picture> drawPage(int number, double dotsPerInch) = 0;
    /// The same for a part, with hard edges: a point is dark when anything touches it.
    virtual std::optional<Picture> drawPart(int /*number*/, Raster const& /*raster*/) { return std::nullopt; }
    /// What a sheet of paper cannot show of the page, or may show otherwise.
    virtual PageExtras extrasOf(int /*number*/) { return {}; }
    /// A PDF of one page that shows what a print of the page does; empty where that is what is drawn.
    virtual std::string printedPdf(int /*number*/) { return {}; }
    /// The names of the files inside the document.
    virtual std::vector<std::string> embeddedFiles() { return {}; }
};

// `where` names the document in messages.

std::unique_ptr<PageSource> openPdf(std::string bytes, std::string const& where);
std::unique_ptr<PageSource> openText(std::string_view bytes, std::string const& where);

} // namespace Reader
