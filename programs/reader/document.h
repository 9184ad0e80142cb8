#pragma once
// A document from outside, PDF or text, as pages with words on them.

#include "programs/base/error.h"
#include "programs/reader/page.h"
#include "programs/reader/page_check.h"
#include "programs/reader/page_extras.h"

#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace Reader {

class PageSource;

/// A page of words is some 100,000 points then.
constexpr double OVERVIEW_DOTS_PER_INCH = 36;

/// One document. Pages are read when they are first asked for, and stay where they are as long as it lives.
/// A document belongs to one thread; several threads may each have their own.
class Document {
public:
    Document(std::string name, std::unique_ptr<PageSource> source);
    Document(Document&&) noexcept;
    Document& operator=(Document&&) noexcept;
    ~Document();

    /// The name that presets are matched with: the file's, with its ending, without folders.
    std::string const& name() const { return name_; }
    int pageCount() const;

    /// Pages count from 1 in all calls. They throw Error when the page is damaged and std::out_of_range when
    /// there is none of that number.
    Page const& page(int number);
    /// That of page(), without reading what is on it.
    PageSize pageSize(int number);
    /// A PDF of this page alone. The same page gives the same bytes.
    std::string singlePagePdf(int number);
    /// Whether some contents of the page are damaged, so that singlePagePdf() writes anew what is shown of
    /// them. It shows when the page is read, drawn or written; before that it is not told.
    bool isWrittenAnew(int number);
    /// Whether a PDF of one page shows the words and the overview of this page. Both are drawn
    /// unless they are made of the same objects. One that cannot be opened shows nothing. Throws Error
    /// when this page cannot be drawn.
    bool showsTheSame(int number, std::string const& pdf);
    /// The page as it looks, upright or turned as it is shown; nothing for text, which is black on white.
    std::optional<Picture> drawPage(int number, double dotsPerInch);
    /// The page at OVERVIEW_DOTS_PER_INCH; nothing for one that is typed, whose words are all there is on it.
    /// Valid until the next call. Throws Error when the page cannot be drawn.
    std::optional<Picture> const& overview(int number);
    std::optional<Picture> drawPart(int number, Raster const& raster);
    PageExtras extrasOf(int number);
    std::vector<std::string> embeddedFiles();
    /// The page by itself as a print shows it; nothing where that is what is read and drawn of it here, as a
    /// screen shows it. Annotations may be meant for one of them alone.
    std::optional<Document> printed(int number);
    /// A PNG picture of the page.
    std::string renderPage(int number, double dotsPerInch);

private:
    void checkNumber(int number) const;

    std::string name_;
    std::unique_ptr<PageSource> source_;
    std::map<int, Page> pages_;
    /// Those of the first pages that were asked for, and the last one.
    std::map<int, std::optional<Picture>> overviews_;
    std::pair<int, std::optional<Picture>> lastOverview_;
};

/// Opens a PDF, or a text file whose pages end with form feeds. Throws Error.
Document openDocument(std::filesystem::path const& path);

/// The same for a document in memory; `name` stands for the path.
Document openDocument(std::string bytes, std::filesystem::path const& name);

} // namespace Reader
