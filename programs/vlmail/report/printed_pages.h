#pragma once
// The pages of a document's letters as they are printed.

#include "programs/production/letter_parts.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/report.h"

#include <string>
#include <vector>

namespace VlMail::Report {

class PrintedPages {
public:
    /// All must outlive this object.
    PrintedPages(Reader::Document& document, Cfg::PackPreset const& preset, MakingReady& making)
        : document_(document), preset_(preset), making_(making) {}

    Reader::Document& document() const { return document_; }
    /// By how many quarters a page is turned clockwise.
    int quarterTurns(int page) const;
    Production::PageSize size(int page) const;
    /// A PNG of a page of a letter that goes out by itself. Throws Base::Error.
    std::string picture(LetterReading const& letter, int page, double dotsPerInch);
    /// All sides of such a letter with what goes out with it, small; none when it is made of its pages alone.
    std::vector<Side> sides(LetterReading const& letter);

private:
    struct Part;

    std::vector<Part> partsOf(LetterReading const& letter);
    Part attachment(std::size_t position) const;

    Reader::Document& document_;
    Cfg::PackPreset const& preset_;
    MakingReady& making_;
};

/// Where a box on a page of that size lies when the page is turned.
Reader::Box turned(Reader::Box const& box, Production::PageSize page, int quarterTurns);

} // namespace VlMail::Report
