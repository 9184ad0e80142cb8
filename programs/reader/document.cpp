#include "programs/reader/document.h"

#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/reader/file_kind.h"
#include "programs/reader/page_source.h"

#include <algorithm>
#include <optional>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace Reader {
namespace {

namespace fs = std::filesystem;

/// Of A4 they take some 6 MB.
constexpr std::size_t KEPT_OVERVIEWS = 16;
constexpr std::size_t MOST_KEPT_BYTES = std::size_t{1} << 20;

bool isNamedPdf(fs::path const& name) {
    std::string ending = name.extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(), [](char c) {
        return c == 'P' || c == 'D' || c == 'F' ? static_cast<char>(c - 'A' + 'a') : c;
    });
    return ending == ".pdf";
}

} // namespace

Document::Document(std::string name, std::unique_ptr<PageSource> source)
    : name_(std::move(name)), source_(std::move(source)) {}

Document::Document(Document&&) noexcept = default;
Document& Document::operator=(Document&&) noexcept = default;
Document::~Document() = default;

int Document::pageCount() const { return source_->pageCount(); }

Page const& Document::page(int number) {
    checkNumber(number);
    auto page = pages_.find(number);
    if (page == pages_.end())
        page = pages_.emplace(number, source_->readPage(number)).first;
    return page->second;
}

PageSize Document::pageSize(int number) {
    checkNumber(number);
    return source_->pageSize(number);
}

std::string Document::singlePagePdf(int number) {
    checkNumber(number);
    return source_->singlePagePdf(number);
}

bool Document::isWrittenAnew(int number) {
    checkNumber(number);
    return source_->isWrittenAnew(number);
}

std::optional<Picture> Document::drawPage(int number, double dotsPerInch) {
    checkNumber(number);
    return source_->drawPage(number, dotsPerInch);
}

std::string Document::renderPage(int number, double dotsPerInch) {
    checkNumber(number);
    return source_->renderPage(number, dotsPerInch);
}

std::optional<Picture> const& Document::overview(int number) {
    checkNumber(number);
    if (auto const kept = overviews_.find(number); kept != overviews_.end())
        return kept->second;
    if (lastOverview_.first == number)
        return lastOverview_.second;
    std::optional<Picture> drawn = source_->drawPage(number, OVERVIEW_DOTS_PER_INCH);
    bool const isSmall = !drawn || drawn->points.size() <= MOST_KEPT_BYTES;
    if (isSmall && overviews_.size() < KEPT_OVERVIEWS)
        return overviews_.emplace(number, std::move(drawn)).first->second;
    lastOverview_ = {number, std::move(drawn)};
    return lastOverview_.second;
}

std::optional<Picture> Document::drawPart(int number, Raster const& raster) {
    checkNumber(number);
    return source_->drawPart(number, raster);
}

PageExtras Document::extrasOf(int number) {
    checkNumber(number);
    return source_->extrasOf(number);
}

std::vector<std::string> Document::embeddedFiles() { return source_->embeddedFiles(); }

std::optional<Document> Document::printed(int number) {
    checkNumber(number);
    std::string pdf = source_->printedPdf(number);
    return pdf.empty() ? std::nullopt : std::optional(Document(name_, openPdf(std::move(pdf), name_)));
}

bool Document::showsTheSame(int number, std::string const& pdf) {
    checkNumber(number);
    if (source_->hasSameObjects(number, pdf))
        return true;
    Page const& shown = page(number);
    std::optional<Picture> const& picture = overview(number);
    try {
        std::unique_ptr<PageSource> const written = openPdf(pdf, name_);
        return haveSameWords(shown, written->readPage(1)) &&
               (!picture || lookTheSame(*picture, *written->drawPage(1, OVERVIEW_DOTS_PER_INCH)));
    } catch (Base::Error const&) {
        return false;
    }
}

void Document::checkNumber(int number) const {
    if (number < 1 || number > pageCount())
        throw std::out_of_range("no page " + std::to_string(number));
}

Document openDocument(fs::path const& path) { return openDocument(Base::readFile(path), path); }

Document openDocument(std::string bytes, fs::path const& name) {
    std::string const where = name.string();
    if (bytes.empty())
        throw Base::Error(Base::Code::DocumentUnreadable, where + ": is empty; export the document again");
    if (isPdf(bytes))
        return Document(name.filename().string(), openPdf(std::move(bytes), where));
    if (isNamedPdf(name))
        throw Base::Error(Base::Code::DocumentUnreadable, where + ": is named .pdf but seems to be " +
                                                              std::string(kindInWords(bytes)) +
                                                              "; get the document again");
    return Document(name.filename().string(), openText(bytes, where));
}

} // namespace Reader
