#include "programs/production/prepared_document.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/safe_name.h"
#include "programs/base/utf8.h"
#include "programs/production/colour.h"
#include "programs/reader/document.h"

#include <algorithm>
#include <new>
#include <utility>

namespace Production {
namespace {

/// What is wrong with a document beside that it cannot be read.
class Unusable : public Base::Error {
public:
    using Base::Error::Error;
};

std::string hasMoreThan(std::filesystem::path const& name, std::string const& what) {
    return DOCUMENT_SIZE + Base::validUtf8(name.string()) + ": has more than " + what +
           "; leave out what is not to be printed";
}

PreparedPage preparedPage(Reader::Document& document, int number, std::string const& where) {
    PreparedPage made{document.singlePagePdf(number), document.pageSize(number)};
    if (!document.showsTheSame(number, made.pdf))
        throw Base::Error(Base::Code::DocumentUnreadable,
                          where + ": page " + std::to_string(number) +
                              " would look different when it stands alone; print the document to a new PDF");
    made.isColoured = hasColour(document, number, made.pdf);
    return made;
}

/// Without the digest.
PreparedDocument takenApart(std::string bytes, std::filesystem::path const& name) {
    std::string const where = name.string();
    if (bytes.size() > MAX_DOCUMENT_BYTES)
        throw Unusable(Base::Code::DocumentTooLarge, whyTooLarge(name));
    Reader::Document document = Reader::openDocument(std::move(bytes), name);
    if (document.pageCount() > MAX_DOCUMENT_PAGES)
        throw Unusable(Base::Code::DocumentTooLarge,
                       hasMoreThan(name, std::to_string(MAX_DOCUMENT_PAGES) + " pages"));
    PreparedDocument prepared;
    for (int number = 1; number <= document.pageCount(); ++number) {
        prepared.pages.push_back(preparedPage(document, number, where));
        if (document.isWrittenAnew(number))
            prepared.redrawnPages.push_back(number);
    }
    return prepared;
}

} // namespace

bool isDocumentId(std::string const& id) { return Base::safeFileName(id) == id; }

std::string whyTooLarge(std::filesystem::path const& name) {
    return hasMoreThan(name, std::to_string(MAX_DOCUMENT_BYTES >> 20) + " MiB");
}

Finding findingOf(std::string const& line) {
    Code const code = line.starts_with(DOCUMENT_SIZE)      ? Code::DocumentSize
                      : line.starts_with(DOCUMENT_UNKNOWN) ? Code::DocumentUnknown
                                                           : Code::DocumentDamaged;
    std::size_t const behindCode = line.find(": ") + 2;
    std::size_t const semicolon = std::min(line.rfind("; "), line.size());
    std::string const fix = semicolon < line.size() ? line.substr(semicolon + 2) : std::string();
    return {code, Severity::Error, {}, {}, line.substr(behindCode, semicolon - behindCode), fix};
}

PreparedDocument prepare(std::string bytes, std::filesystem::path const& name) {
    PreparedDocument document;
    try {
        std::string sha256 = Base::sha256(bytes);
        document.sha256 = sha256;
        document = takenApart(std::move(bytes), name);
        document.sha256 = std::move(sha256);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (Unusable const& failure) {
        document.error = failure.what();
    } catch (std::exception const& failure) {
        document.error = DOCUMENT_DAMAGED + Base::validUtf8(failure.what());
    }
    return document;
}

} // namespace Production
