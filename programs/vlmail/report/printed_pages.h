#pragma once
// The pages of a document's letters as they are printed.

#include "programs/production/letter_parts.h"
#include "programs/production/production_rules.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/report.h"

#include <string>
#include <vector>

namespace VlMail::Report {

/// The pages of a document as they are shown.
class ShownPages {
public:
    virtual ~ShownPages() = default;

    virtual Reader::Document& document() const = 0;
    /// By how many quarters a page is turned clockwise.
    virtual int quarterTurns(int page) const = 0;
    virtual Production::PageSize size(int page) const = 0;
    /// A PNG of a page of the letter; empty where pictures are shown in another way. Throws Base::Error.
    virtual std::string picture(LetterReading const& letter, int page, double dotsPerInch) = 0;
    /// All sides of the letter with what goes out with it, without their pictures; none when it is made of
    /// its pages alone.
    virtual std::vector<Side> sides(LetterReading const& letter) = 0;
    /// As that of a page; none of a blank side.
    virtual std::string picture(LetterReading const& letter, Side const& side, double dotsPerInch) = 0;
};

class PrintedPages : public ShownPages {
public:
    /// All must outlive this object.
    PrintedPages(Reader::Document& document, Cfg::PackPreset const& preset, MakingReady& making)
        : document_(document), preset_(preset), making_(making) {}

    Reader::Document& document() const override { return document_; }
    int quarterTurns(int page) const override;
    Production::PageSize size(int page) const override;
    /// Of a letter that goes out by itself.
    std::string picture(LetterReading const& letter, int page, double dotsPerInch) override;
    /// Of such a letter, the first of many.
    std::vector<Side> sides(LetterReading const& letter) override;
    std::string picture(LetterReading const& letter, Side const& side, double dotsPerInch) override;

private:
    using Part = std::vector<Side>;

    std::vector<Part> partsOf(LetterReading const& letter) const;
    Part pagesOf(LetterReading const& letter) const;
    Part attachment(std::size_t position) const;
    Production::ProductionRules rules() const;

    Reader::Document& document_;
    Cfg::PackPreset const& preset_;
    MakingReady& making_;
};

/// A PNG of a page of a document as it is, with the annotations that a print has. Throws Base::Error.
std::string pictureOf(Reader::Document& document, int page, double dotsPerInch);

/// Where a box on a page of that size lies when the page is turned.
Reader::Box turned(Reader::Box const& box, Production::PageSize page, int quarterTurns);

} // namespace VlMail::Report
