#include "programs/reader/document.h"

#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/reader/page_source.h"

#include <stdexcept>
#include <string_view>
#include <utility>

namespace Reader {
namespace {

namespace fs = std::filesystem;

/// A PDF may have other bytes in front of its header, up to here.
constexpr std::size_t PDF_HEADER_WITHIN = 1024;

bool isPdf(std::string_view bytes) {
    return bytes.substr(0, PDF_HEADER_WITHIN).find("%PDF-") != std::string_view::npos;
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

std::string Document::singlePagePdf(int number) {
    checkNumber(number);
    return source_->singlePagePdf(number);
}

std::string Document::renderPage(int number, double dotsPerInch) {
    checkNumber(number);
    return source_->renderPage(number, dotsPerInch);
}

void Document::checkNumber(int number) const {
    if (number < 1 || number > pageCount())
        throw std::out_of_range("no page " + std::to_string(number));
}

Document openDocument(fs::path const& path) { return openDocument(Base::readFile(path), path); }

Document openDocument(std::string bytes, fs::path const& name) {
    std::string const where = name.string();
    if (bytes.empty())
        throw Base::Error(where + ": is empty; export the document again");
    return Document(name.filename().string(),
                    isPdf(bytes) ? openPdf(std::move(bytes), where) : openText(bytes, where));
}

} // namespace Reader
