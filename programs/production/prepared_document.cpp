#include "programs/production/prepared_document.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/safe_name.h"
#include "programs/base/utf8.h"
#include "programs/production/colour.h"
#include "programs/reader/document.h"

#include <new>
#include <optional>
#include <utility>

namespace Production {
namespace {

/// What is wrong with a document beside that it cannot be read.
class Unusable : public Base::Error {
public:
    using Base::Error::Error;
};

void requireSize(bool fits, std::string const& where, std::string const& what) {
    if (!fits)
        throw Unusable(DOCUMENT_SIZE + where + ": has more than " + what +
                       "; leave out what is not to be printed");
}

PreparedPage prepared(Reader::Document& document, int number, std::string const& where) {
    Reader::Page const& page = document.page(number);
    PreparedPage made{document.singlePagePdf(number), {page.width, page.height}};
    if (!document.showsTheSame(number, made.pdf))
        throw Base::Error(where + ": page " + std::to_string(number) +
                          " would look different when it stands alone; print the document to a new PDF");
    std::optional<Reader::Picture> const picture = document.drawPage(number, LOOKED_AT_DOTS_PER_INCH);
    made.isColoured = picture && isColoured(*picture);
    return made;
}

std::vector<PreparedPage> pagesOf(std::string bytes, std::filesystem::path const& name) {
    std::string const where = name.string();
    requireSize(bytes.size() <= MAX_DOCUMENT_BYTES, where, std::to_string(MAX_DOCUMENT_BYTES >> 20) + " MiB");
    Reader::Document document = Reader::openDocument(std::move(bytes), name);
    requireSize(document.pageCount() <= MAX_DOCUMENT_PAGES, where,
                std::to_string(MAX_DOCUMENT_PAGES) + " pages");
    std::vector<PreparedPage> pages;
    for (int number = 1; number <= document.pageCount(); ++number)
        pages.push_back(prepared(document, number, where));
    return pages;
}

} // namespace

bool isDocumentId(std::string const& id) { return Base::safeFileName(id) == id; }

PreparedDocument prepare(std::string bytes, std::filesystem::path const& name) {
    PreparedDocument document;
    try {
        document.sha256 = Base::sha256(bytes);
        document.pages = pagesOf(std::move(bytes), name);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (Unusable const& failure) {
        document.error = Base::validUtf8(failure.what());
    } catch (std::exception const& failure) {
        document.error = DOCUMENT_DAMAGED + Base::validUtf8(failure.what());
    }
    return document;
}

} // namespace Production
