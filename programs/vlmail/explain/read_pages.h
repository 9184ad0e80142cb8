#pragma once
// The pages of a document with their layout, read once for many looks at them.

#include "programs/reader/document.h"
#include "programs/reader/layout.h"

#include <map>
#include <optional>
#include <utility>

namespace VlMail {

struct LaidOutPage {
    Reader::Page const* page = nullptr;
    Reader::Layout layout;
};

class ReadPages {
public:
    ReadPages(Reader::Document& document, Reader::LayoutRules const& rules)
        : document_(document), rules_(rules) {}

    Reader::LayoutRules const& rules() const { return rules_; }
    int count() const { return document_.pageCount(); }
    /// Null when the page is damaged or there is none of that number.
    LaidOutPage const* page(int number);
    /// A page by other rules; kept until another page is asked for.
    LaidOutPage const& laidOut(Reader::Page const& page, Reader::LayoutRules const& rules);

private:
    Reader::Document& document_;
    Reader::LayoutRules rules_;
    std::map<int, std::optional<LaidOutPage>> pages_;
    /// By the gap and the distance of their rules; all of one page.
    std::map<std::pair<double, double>, LaidOutPage> byOtherRules_;
};

} // namespace VlMail
