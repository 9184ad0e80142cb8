#include "programs/reader/document.h"

#include "programs/base/error.h"
#include "programs/reader/page_source.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <stdexcept>
#include <string_view>
#include <system_error>
#include <utility>

namespace Reader {
namespace {

namespace fs = std::filesystem;

/// A PDF may have other bytes in front of its header, up to here.
constexpr std::size_t PDF_HEADER_WITHIN = 1024;

bool isPdf(std::string_view bytes) {
    return bytes.substr(0, PDF_HEADER_WITHIN).find("%PDF-") != std::string_view::npos;
}

[[noreturn]] void failToOpen(fs::path const& path, int error) {
    switch (error) {
    case ENOENT:
    case ENOTDIR:
        throw Base::Error(path.string() + ": there is no such file; check the name");
    case EACCES:
    case EPERM:
        throw Base::Error(path.string() + ": no right to read it; change its permissions");
    default:
        throw Base::Error(path.string() + ": cannot be read (" + std::strerror(error) +
                          "); copy it to another place");
    }
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

std::string readFile(fs::path const& path) {
    std::error_code failure;
    fs::file_status const status = fs::status(path, failure);
    if (failure)
        failToOpen(path, failure.value());
    if (fs::is_directory(status))
        throw Base::Error(path.string() + ": is a folder; name the documents in it");
    if (!fs::is_regular_file(status))
        throw Base::Error(path.string() + ": is no ordinary file; save the document to one");

    errno = 0;
    std::ifstream in(path, std::ios::binary);
    if (!in)
        failToOpen(path, errno);
    std::string bytes(fs::file_size(path), '\0');
    in.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    if (in.bad())
        failToOpen(path, errno ? errno : EIO);
    // The file may have become shorter meanwhile.
    bytes.resize(static_cast<std::size_t>(in.gcount()));
    return bytes;
}

Document openDocument(fs::path const& path) { return openDocument(readFile(path), path); }

Document openDocument(std::string bytes, fs::path const& name) {
    std::string const where = name.string();
    if (bytes.empty())
        throw Base::Error(where + ": is empty; export the document again");
    return Document(name.filename().string(),
                    isPdf(bytes) ? openPdf(std::move(bytes), where) : openText(bytes, where));
}

} // namespace Reader
