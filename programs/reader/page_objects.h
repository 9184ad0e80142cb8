#pragma once
// Whether a page that was written is made of the very objects of the document's page. Without anything that
// needs C++20: clang takes qpdf's headers up to C++17 only.

#include <memory>
#include <string_view>

namespace Reader {

/// Compares pages of a PDF with PDFs of one page, both as their bytes say, without drawing them. The PDF is
/// parsed when the first page is compared.
class PageObjects {
public:
    /// `pdf` must live as long as this object.
    explicit PageObjects(std::string_view pdf);
    ~PageObjects();

    /// Whether page `number`, from 1, and the only page of `single` have the same contents, boxes, layers,
    /// annotations and resources, but for resources that no content names; then they show the same whoever
    /// draws them. False says nothing: neither of what it does not look into, such as documents with several
    /// revisions, damaged ones and very large pages. Throws nothing derived from std::exception.
    bool areSame(int number, std::string_view single);

private:
    struct Parsed;

    std::string_view pdf_;
    std::unique_ptr<Parsed> parsed_;
};

} // namespace Reader
