#pragma once
// Pages that are PDFs of their own as one document, as printers and recipients take it. Without anything that
// needs C++20, as qpdf's headers have it.

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace Production {

/// Each page looks as it does alone: with its own layers hidden, and fields of forms that know no others of
/// their name.
class JoinedPages {
public:
    JoinedPages();
    ~JoinedPages();
    JoinedPages(JoinedPages const&) = delete;
    JoinedPages& operator=(JoinedPages const&) = delete;

    /// Adds a PDF's first page, whose bytes may go then. Throws Base::Error for what is no PDF with a page,
    /// which leaves all as it was.
    void add(std::string_view pdf);
    /// Adds a page once more that was added as number `at`, from 0: its content is not stored again.
    void addAgain(std::size_t at);
    /// Adds an empty side in the size of the page in front of it, which has to be there.
    void addBlank();
    std::size_t size() const;
    /// Takes the last pages away again, down to that number.
    void shrink(std::size_t size);

    /// The document; the same for the same pages.
    std::string bytes();

private:
    struct Parts;
    std::unique_ptr<Parts> parts_;
};

} // namespace Production
